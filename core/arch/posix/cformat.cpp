#include "core/arch/cformat.h"

#include <cstdio>

#include <locale.h>

namespace {

// Numbers as in the "C" locale for the calling thread alone, for the life of the object.
class PlainNumbers {
  public:
    PlainNumbers() : before_(uselocale(plain())) {}
    ~PlainNumbers() { uselocale(before_); }
    PlainNumbers(const PlainNumbers&) = delete;
    PlainNumbers& operator=(const PlainNumbers&) = delete;

  private:
    locale_t before_;

    // If it can't be made, null leaves the thread's locale as it is.
    static locale_t plain() {
        static const locale_t made = newlocale(LC_ALL_MASK, "C", nullptr);
        return made;
    }
};

}  // namespace

int qv_vformat(char* buffer, std::size_t size, const char* format, va_list args) {
    const PlainNumbers scope;
    return std::vsnprintf(buffer, size, format, args);
}
