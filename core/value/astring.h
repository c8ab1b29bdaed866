// The small string of dictionary keys: up to N characters inline, or for N = 0 a heap copy or an alias.
#pragma once

#include "core/arch/api.h"

// The five functions that AString is built on. They work on the three parts of such a string: the inline
// buffer `mbuf` of bufsize + 1 bytes, the pointer `mptr` to the text, and the flag `mflag`: whether the
// pointer is to an owned heap copy. A null source counts as the empty text.
//
// bufsize > 0: inline. `mbuf` must be given; at most bufsize characters are kept, zero-padded and terminated.
// bufsize = 0: the heap copy if `owned`, else an alias of `src`, which must then outlive the string.
QV_API void AS_construct(const char* src, int owned, int bufsize, char* mbuf, char** mptr, int* mflag);
// The same three forms, with `owned` taken from the source's flag.
QV_API void AS_copyconstruct(char* mbuf, char** mptr, int* mflag, int bufsize, const char* src, int srcflag);
// Inline: copies, and *mptr must be mbuf. Heap: replaces the copy. Alias: only the pointer changes.
QV_API void AS_assign(char* mbuf, char** mptr, int flag, int bufsize, const char* src);
// Frees a heap copy, that is only when bufsize is 0 and the flag is set.
QV_API void AS_destroy(char* ptr, int flag, int bufsize);
// -1, 0 or 1, by unsigned bytes.
QV_API int AS_compare(const char* a, const char* b);

template <int N>
class AString {
    static_assert(N >= 0);

  public:
    AString() : AString("") {}
    AString(const char* text, bool owned = true) {
        AS_construct(text, owned ? 1 : 0, N, buffer_, &text_, &flag_);
    }
    AString(const AString& other) { AS_copyconstruct(buffer_, &text_, &flag_, N, other.text_, other.flag_); }
    ~AString() { AS_destroy(text_, flag_, N); }

    AString& operator=(const AString& other) { return *this = other.text_; }
    AString& operator=(const char* text) {
        AS_assign(buffer_, &text_, flag_, N, text);
        return *this;
    }

    const char* c_str() const { return text_; }
    operator const char*() const { return text_; }

    bool operator==(const AString& other) const { return AS_compare(text_, other.text_) == 0; }
    bool operator==(const char* other) const { return AS_compare(text_, other) == 0; }
    bool operator<(const AString& other) const { return AS_compare(text_, other.text_) < 0; }

  private:
    char* text_;
    char buffer_[N + 1];
    int flag_;
};
