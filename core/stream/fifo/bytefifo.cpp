#include <algorithm>
#include <cstring>
#include <new>

#include "core/arch/platform.h"
#include "core/stream/fifo/bytefifo_p.h"

std::unique_ptr<bytefifo> bytefifo::make(unsigned size, unsigned chunk) {
    if (size < chunk) return nullptr;
    const unsigned headroom = chunk ? chunk - 1 : 0;
    if (size > ~headroom) return nullptr;
    std::unique_ptr<bytefifo> ring(new (std::nothrow) bytefifo);
    if (!ring) return nullptr;
    ring->bytes = size + headroom;
    ring->base = static_cast<unsigned char*>(qv_platform().allocate(std::max(ring->bytes, 1u), 64));
    if (!ring->base) return nullptr;
    ring->unit = 1;
    ring->start = ring->read = ring->write = headroom;
    ring->end = ring->bytes;
    ring->requested = 0;
    return ring;
}

bytefifo::~bytefifo() { qv_platform().release(base); }

unsigned char* bytefifo::requestWrite(unsigned n) {
    requested = 0;
    if (write < read) {
        if (read - write <= n) return nullptr;
        requested = write;
        return base + write;
    }
    const unsigned tail = end - write;
    if (tail >= n) {
        requested = write;
        return base + write;
    }
    const unsigned front = read > start ? read - start : 0;
    if (front < n - tail || start <= tail) return nullptr;
    requested = start - tail;
    return base + requested;
}

// How much of the latest block may still be committed. The indices may have moved since by copyIn or an
// earlier commit, and then the block is void.
unsigned bytefifo::blockRoom() const {
    if (requested == write) return write < read ? read - write : end - write;
    const bool inHeadroom =
        requested && requested <= start && write >= read && start - requested == end - write;
    return inHeadroom ? room() : 0;
}

unsigned bytefifo::confirmWrite(unsigned n) {
    n = std::min(n, blockRoom());
    if (!n) return 0;
    if (requested == write) {
        write += n;
    } else if (requested + n >= start) {
        std::memcpy(base + write, base + requested, start - requested);
        write = requested + n;
    } else {
        std::memcpy(base + write, base + requested, n);
        write += n;
    }
    return n;
}

unsigned bytefifo::copyIn(const unsigned char* p, unsigned n) {
    const unsigned count = std::min(n, room());
    if (!count) return 0;
    const unsigned tail = end - write;
    if (write < read || count <= tail) {
        std::memcpy(base + write, p, count);
        write += count;
    } else {
        std::memcpy(base + write, p, tail);
        std::memcpy(base + start, p + tail, count - tail);
        write = start - tail + count;
    }
    return count;
}

unsigned char* bytefifo::requestRead(unsigned n) {
    if (write < read) {
        const unsigned tail = end - read;
        if (n <= tail) return base + read;
        if (tail > start) return nullptr;
        std::memcpy(base + start - tail, base + read, tail);
        read = start - tail;
    }
    return n <= write - read ? base + read : nullptr;
}

unsigned bytefifo::confirmRead(unsigned n) {
    const unsigned count = std::min(n, data());
    const bool wrapped = write < read;
    const unsigned tail = end - read;
    read = wrapped && count >= tail ? start + (count - tail) : read + count;
    return count;
}

unsigned bytefifo::copyOut(unsigned char* p, unsigned n) {
    const unsigned char* block = requestRead(n);
    if (!block) return 0;
    if (n) std::memcpy(p, block, n);
    return confirmRead(n);
}
