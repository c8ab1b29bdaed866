#include "core/decode/qvdpipelist.h"

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
    TPtrList<QvDecodePipe> distinct;
    for (int i = 0; i < size(); ++i)
        if (!distinct.contains(at(i))) distinct.append(at(i));
    clear();
    for (int i = 0; i < distinct.size(); ++i) {
        distinct.at(i)->close();
        delete distinct.at(i);
    }
}
