// Makes the n-th operator new of this thread fail, or all from the n-th on. One source of an executable
// includes this.
//
//     FailingMemory memory(7);                       // the seventh from here on, and no other
//     FailingMemory none(7, FailingMemory::andAllLater);
//     ... memory.failed(): whether it was reached
#pragma once

#include <cstdlib>
#include <new>

// Compiled apart: inlined, the compiler takes a new that is given back with free for a mistake.
#if defined(__clang__)
#define QV_NEW_APART __attribute__((noinline))
#else
#define QV_NEW_APART __attribute__((noipa))
#endif

class FailingMemory {
  public:
    enum Extent { once, andAllLater };

    explicit FailingMemory(int nth, Extent extent = once) {
        left_ = nth;
        ever_ = extent == andAllLater;
    }
    ~FailingMemory() {
        left_ = 0;
        ever_ = false;
    }
    FailingMemory(const FailingMemory&) = delete;
    FailingMemory& operator=(const FailingMemory&) = delete;
    static bool failed() { return left_ < 0; }

    static void* allocate(std::size_t bytes, std::size_t align) {
        if (left_ < 0 && ever_) return nullptr;
        if (left_ > 0 && --left_ == 0) {
            left_ = -1;
            return nullptr;
        }
        return std::aligned_alloc(align, (bytes + align) / align * align);
    }

  private:
    static inline thread_local int left_ = 0;  // allocations until the one that fails; -1 after it
    static inline thread_local bool ever_ = false;
};

namespace failing_memory {
inline void* orThrow(void* block) {
    if (!block) throw std::bad_alloc();
    return block;
}
}  // namespace failing_memory

QV_NEW_APART void* operator new(std::size_t bytes) {
    return failing_memory::orThrow(FailingMemory::allocate(bytes, 16));
}
QV_NEW_APART void* operator new(std::size_t bytes, const std::nothrow_t&) noexcept {
    return FailingMemory::allocate(bytes, 16);
}
QV_NEW_APART void* operator new[](std::size_t bytes, std::align_val_t align, const std::nothrow_t&) noexcept {
    return FailingMemory::allocate(bytes, static_cast<std::size_t>(align));
}
QV_NEW_APART void operator delete(void* block) noexcept { std::free(block); }
QV_NEW_APART void operator delete(void* block, std::size_t) noexcept { std::free(block); }
QV_NEW_APART void operator delete(void* block, const std::nothrow_t&) noexcept { std::free(block); }
QV_NEW_APART void operator delete[](void* block, std::align_val_t) noexcept { std::free(block); }
