#include "core/engine/modules/codeccompat.h"

#include "core/arch/qvassert.h"
#include "core/value/any.h"

namespace {

AnyVector& entryOf(CodecCompat& list, const char* codec) {
    QV_ASSERT(codec && list.isSet(codec) && list.get(codec).isVector());
    return list.get(codec).asVector();
}

}  // namespace

void CodecCompat::addCodec(const char* codec) {
    QV_ASSERT(codec);
    if (!isSet(codec)) set(codec, AnyVector());
}

void CodecCompat::add(const char* codec, const char* name) {
    AnyVector& names = entryOf(*this, codec);
    if (!names.contains(Any(name))) names.append(Any(name));
}

void CodecCompat::removeName(const char* codec, const char* name) {
    AnyVector& names = entryOf(*this, codec);
    names.remove(names.indexOf(Any(name)));
}

bool CodecCompat::isCompatible(const char* codec, const char* name) const {
    return codec && name && names(codec).contains(Any(name));
}

const AnyVector& CodecCompat::names(const char* codec) const {
    const Any& entry = get(codec);
    return entry.isVector() ? entry.asVector() : AnyVector::null();
}
