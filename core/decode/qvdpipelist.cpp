#include "core/decode/qvdpipelist.h"

#include <memory>
#include <new>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"

QvDecodePipe* QvDPipeList::findByFilename(const Any& name, const QvDecodePipe* after) const {
    int first = 0;
    if (after) {
        while (first < size() && at(first) != after) ++first;
        QV_ASSERT(first < size());
        ++first;
    }
    for (int i = first; i < size(); ++i) {
        const Any filename = at(i)->getParam("filename");
        QV_ASSERT(filename.isText());
        if (filename == name) return at(i);
    }
    return nullptr;
}

// Sorted, so that those that are there twice are next to each other.
void QvDPipeList::deleteAll() {
    sortByAddress();
    while (!empty()) {
        const std::unique_ptr<QvDecodePipe> last(back());
        while (!empty() && back() == last.get()) remove(size() - 1);
        try {
            last->close();
        } catch (const std::bad_alloc&) {  // its destructor does the rest
        }
    }
}
