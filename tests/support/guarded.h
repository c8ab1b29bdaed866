// Memory that ends at a page without access, so that one byte too many is a crash, and that shows writes in
// front of and after its bytes.
#pragma once

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>

#include "tests/support/wav_bytes.h"

class Guarded {
  public:
    explicit Guarded(std::size_t bytes = 4000, unsigned seed = 0) {
        const auto page = static_cast<std::size_t>(sysconf(_SC_PAGESIZE));
        mapped_ = (bytes + front + page - 1) / page * page + page;
        map_ = static_cast<unsigned char*>(
            mmap(nullptr, mapped_, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0));
        end_ = map_ + mapped_ - page;
        mprotect(end_, page, PROT_NONE);
        place(bytes, 0, seed);
    }
    ~Guarded() { munmap(map_, mapped_); }
    Guarded(const Guarded&) = delete;
    Guarded& operator=(const Guarded&) = delete;

    // From now on these are the bytes: some that end `gap` before the page, no more than there were at first.
    unsigned char* place(std::size_t bytes, std::size_t gap, unsigned seed) {
        bytes_ = bytes;
        data_ = end_ - gap - bytes;
        std::fill(data_ - front, end_, mark);
        fillBytes(data_, bytes, seed);
        return data_;
    }
    unsigned char* data() { return data_; }
    std::size_t size() const { return bytes_; }
    std::string bytes() const { return {reinterpret_cast<const char*>(data_), bytes_}; }
    bool intact() const {
        const auto isMark = [](unsigned char byte) { return byte == mark; };
        return std::all_of(data_ - front, data_, isMark) && std::all_of(data_ + bytes_, end_, isMark);
    }

  private:
    static constexpr std::size_t front = 64;
    static constexpr unsigned char mark = 0xA5;
    std::size_t bytes_, mapped_;
    unsigned char *map_, *end_, *data_;
};
