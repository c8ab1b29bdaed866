#include "core/value/astring.h"

#include <cstring>

#include "core/arch/qvassert.h"

namespace {

char* heapCopy(const char* text) {
    const std::size_t bytes = std::strlen(text) + 1;
    auto* copy = new char[bytes];
    std::memcpy(copy, text, bytes);
    return copy;
}

// The source may be the buffer itself.
void copyInline(char* buffer, const char* source, int bufsize) {
    const auto room = static_cast<std::size_t>(bufsize);
    const std::size_t length = strnlen(source, room);
    std::memmove(buffer, source, length);
    std::memset(buffer + length, 0, room + 1 - length);
}

const char* orEmpty(const char* text) { return text ? text : ""; }

}  // namespace

void AS_construct(const char* src, int owned, int bufsize, char* mbuf, char** mptr, int* mflag) {
    src = orEmpty(src);
    if (bufsize != 0) {
        QV_ASSERT_MSG(mbuf, "mbuf");
        *mptr = mbuf;
        *mflag = 0;
        copyInline(mbuf, src, bufsize);
        return;
    }
    *mflag = owned;
    *mptr = owned ? heapCopy(src) : const_cast<char*>(src);  // an alias is never written through
}

void AS_copyconstruct(char* mbuf, char** mptr, int* mflag, int bufsize, const char* src, int srcflag) {
    AS_construct(src, srcflag, bufsize, mbuf, mptr, mflag);
}

void AS_assign(char* mbuf, char** mptr, int flag, int bufsize, const char* src) {
    src = orEmpty(src);
    if (bufsize != 0) {
        QV_ASSERT_MSG(*mptr == mbuf, "*mptr == mbuf");
        copyInline(mbuf, src, bufsize);
    } else if (flag) {
        char* const fresh = heapCopy(src);  // before the old copy goes: the source may be a part of it
        delete[] * mptr;
        *mptr = fresh;
    } else {
        *mptr = const_cast<char*>(src);
    }
}

void AS_destroy(char* ptr, int flag, int bufsize) {
    if (bufsize == 0 && flag) delete[] ptr;
}

int AS_compare(const char* a, const char* b) {
    const int order = std::strcmp(orEmpty(a), orEmpty(b));
    return (order > 0) - (order < 0);
}
