#include <atomic>
#include <new>

#include "core/arch/threadend_p.h"
#include "core/document/blockmemory_p.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define QV_WATCHED_MEMORY 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define QV_WATCHED_MEMORY 1
#endif
#endif

namespace QvBlockMemory {

#ifdef QV_WATCHED_MEMORY

// A sanitizer is to see each piece for itself.
void* take(std::size_t size) { return ::operator new(size); }
void giveBack(void* piece) { ::operator delete(piece); }

#else

namespace {

constexpr std::size_t blockSize = std::size_t{1} << 16;
constexpr std::size_t alignment = alignof(std::max_align_t);

constexpr std::size_t aligned(std::size_t size) { return (size + alignment - 1) / alignment * alignment; }

// The head of a block, followed by its pieces.
struct Block {
    std::atomic<int> users{1};  // pieces in use, and the thread that cuts from it
    std::size_t used = aligned(sizeof(Block));

    void drop() {
        if (users.fetch_sub(1, std::memory_order_acq_rel) == 1) ::operator delete(this);
    }
};

// Lies in front of each piece. Null: the piece has memory of its own.
struct alignas(alignment) Head {
    Block* block;
};

thread_local Block* current = nullptr;

void dropCurrent(void* block) {
    current = nullptr;
    static_cast<Block*>(block)->drop();
}

// Makes `fresh` the block that this thread cuts from.
void useBlock(Block* fresh) {
    static const ThreadEnd threadEnd(dropCurrent);
    if (!threadEnd.set(fresh)) {
        fresh->drop();
        throw std::bad_alloc();
    }
    if (current) current->drop();
    current = fresh;
}

void* place(void* memory, Block* block) { return new (memory) Head{block} + 1; }

}  // namespace

void* take(std::size_t size) {
    const std::size_t whole = sizeof(Head) + aligned(size);
    if (whole > blockSize / 8) return place(::operator new(whole), nullptr);
    if (!current || current->used + whole > blockSize) useBlock(new (::operator new(blockSize)) Block);
    Block* const block = current;
    block->users.fetch_add(1, std::memory_order_relaxed);
    void* const piece = place(reinterpret_cast<char*>(block) + block->used, block);
    block->used += whole;
    return piece;
}

void giveBack(void* piece) {
    if (!piece) return;
    Head* const head = static_cast<Head*>(piece) - 1;
    if (head->block)
        head->block->drop();
    else
        ::operator delete(head);
}

#endif

}  // namespace QvBlockMemory
