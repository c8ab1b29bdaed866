// Memory that ends where a page without access begins, so that one byte too many is a crash, and that shows
// what was written before its start.
#pragma once

#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "tests/support/wav_bytes.h"

class Guarded {
  public:
    static constexpr std::size_t front = 64;

    explicit Guarded(std::size_t bytes, unsigned seed = 0) : bytes_(bytes) {
        const auto page = static_cast<std::size_t>(sysconf(_SC_PAGESIZE));
        mapped_ = (bytes + front + page - 1) / page * page + page;
        map_ = static_cast<unsigned char*>(
            mmap(nullptr, mapped_, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0));
        mprotect(map_ + mapped_ - page, page, PROT_NONE);
        data_ = map_ + mapped_ - page - bytes;
        std::memset(data_ - front, 0xA5, front);
        fill(seed);
    }
    ~Guarded() { munmap(map_, mapped_); }
    Guarded(const Guarded&) = delete;
    Guarded& operator=(const Guarded&) = delete;

    void fill(unsigned seed) { fillBytes(data_, bytes_, seed); }
    unsigned char* data() { return data_; }
    std::size_t size() const { return bytes_; }
    bool frontIntact() const {
        for (std::size_t i = 1; i <= front; ++i)
            if (data_[-static_cast<std::ptrdiff_t>(i)] != 0xA5) return false;
        return true;
    }

  private:
    std::size_t bytes_, mapped_;
    unsigned char *map_, *data_;
};
