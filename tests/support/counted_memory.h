// Counts what is taken by operator new in the whole executable. One source of it includes this.
#pragma once

#include <atomic>
#include <cstdlib>
#include <new>

namespace {
std::atomic<int> allocations{0};

void* counted(std::size_t bytes, std::size_t align) {
    ++allocations;
    void* memory = std::aligned_alloc(align, (bytes + align - 1) / align * align + align);
    if (!memory) throw std::bad_alloc();
    return memory;
}
}  // namespace

// Apart, or the compiler sees through one of a pair and takes the other for a mismatch.
#define QV_APART [[gnu::noinline]]
QV_APART void* operator new(std::size_t bytes) { return counted(bytes, 16); }
QV_APART void* operator new(std::size_t bytes, const std::nothrow_t&) noexcept { return counted(bytes, 16); }
QV_APART void* operator new(std::size_t bytes, std::align_val_t align) {
    return counted(bytes, static_cast<std::size_t>(align));
}
QV_APART void operator delete(void* memory) noexcept { std::free(memory); }
QV_APART void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }
QV_APART void operator delete(void* memory, std::align_val_t) noexcept { std::free(memory); }
QV_APART void operator delete(void* memory, std::size_t, std::align_val_t) noexcept { std::free(memory); }
#undef QV_APART
