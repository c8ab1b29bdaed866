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

void QvDPipeList::deleteAll() {
    while (!empty()) {
        const std::unique_ptr<QvDecodePipe> first(at(0));
        for (int i = size(); i-- > 0;)
            if (at(i) == first.get()) remove(i);
        try {
            first->close();
        } catch (const std::bad_alloc&) {  // its destructor does the rest
        }
    }
}
