// Memory for many small objects of one life: a tree that is built, read and dropped. Each thread cuts pieces
// from a block of its own, one after the other; a piece may go back on any thread, and a block is freed with
// its last piece.
#pragma once

#include <cstddef>

namespace QvBlockMemory {

void* take(std::size_t size);  // throws std::bad_alloc
void giveBack(void* piece);    // null is ignored

}  // namespace QvBlockMemory
