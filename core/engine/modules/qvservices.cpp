#include "core/engine/modules/qvservices_p.h"

#include <cstdarg>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <span>

#include "core/arch/formattext_p.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"

namespace {

constexpr std::size_t maxText = 1023;

void* allocate(std::uint32_t size) {
    void* block = std::malloc(size ? size : 1);
    QV_ASSERT_MSG(block, "out of memory");
    return block;
}

void release(void* block) { std::free(block); }

void print(int mask, const char* format, va_list args) {
    qv_log()->logs(mask, QvFormattedText<maxText>(format, args).text());
}

template <int Mask>
void printAt(const char* format, ...) {
    va_list args;
    va_start(args, format);
    print(Mask, format, args);
    va_end(args);
}

template <int Mask>
void printAtWithContext(void*, const char* format, ...) {
    va_list args;
    va_start(args, format);
    print(Mask, format, args);
    va_end(args);
}

void printNothing(const char*, ...) {}
void printNothingWithContext(void*, const char*, ...) {}
int yieldNothing() { return 0; }
int promptIndexMode() { return 1; }
int promptIndexModeWithContext(void*) { return 1; }

struct Service {
    const char* name;
    void* function;
};

template <class F>
void* pointer(F* function) {
    return reinterpret_cast<void*>(function);
}

void* find(std::span<const Service> services, const char* name) {
    for (const auto& service : services)
        if (name && std::strcmp(service.name, name) == 0) return service.function;
    return nullptr;
}

}  // namespace

void* qvPlainService(const char* name) {
    static const Service services[] = {
        {"malloc", pointer(allocate)},
        {"free", pointer(release)},
        {"err_printf", pointer(printAt<QvLogMask::error>)},
        {"wrn_printf", pointer(printAt<QvLogMask::warning>)},
        {"inf_printf", pointer(printAt<QvLogMask::info>)},
        {"prg_printf", pointer(printNothing)},
        {"yield", pointer(yieldNothing)},
        {"prompt_index_mode", pointer(promptIndexMode)},
    };
    return find(services, name);
}

void* qvContextService(const char* name) {
    static const Service services[] = {
        {"err_printf", pointer(printAtWithContext<QvLogMask::error>)},
        {"wrn_printf", pointer(printAtWithContext<QvLogMask::warning>)},
        {"inf_printf", pointer(printAtWithContext<QvLogMask::info>)},
        {"prg_printf", pointer(printNothingWithContext)},
        {"err_printf_ex", pointer(printAtWithContext<QvLogMask::error>)},
        {"wrn_printf_ex", pointer(printAtWithContext<QvLogMask::warning>)},
        {"inf_printf_ex", pointer(printAtWithContext<QvLogMask::info>)},
        {"prg_printf_ex", pointer(printNothingWithContext)},
        {"prompt_index_mode", pointer(promptIndexModeWithContext)},
    };
    return find(services, name);
}
