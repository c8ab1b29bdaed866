// The lines that a band works on: rings of the latest ones, by their number.
#pragma once

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <new>
#include <span>
#include <vector>

#include "builtin/kernels/convert/plan.h"

namespace srk {

// Uninitialised memory on cache lines.
template <class T>
class Block {
  public:
    explicit Block(size_t count = 0) { grow(count); }
    void grow(size_t count) {
        if (count <= count_) return;
        data_.reset(static_cast<T*>(::operator new(count * sizeof(T), align)));
        count_ = count;
    }
    T* get() const { return data_.get(); }

  private:
    static constexpr std::align_val_t align{64};
    struct Release {
        void operator()(T* memory) const { ::operator delete(memory, align); }
    };
    std::unique_ptr<T, Release> data_;
    size_t count_ = 0;
};

// At least `slots` lines of `length` items. A line is found by its number until as many others have come. The
// places are a power of two: a division for each of the lines that a target line takes would cost as much as
// the work on them.
template <class T>
class Ring {
  public:
    void set(int slots, int length) {
        slots_ = std::bit_ceil(static_cast<unsigned>(std::max(slots, 1)));
        length_ = (static_cast<size_t>(length) + 63) & ~size_t{63};
        block_.grow(slots_ * length_);
        tags_.assign(slots_, -1);
    }
    void forget() { std::fill(tags_.begin(), tags_.end(), -1); }
    // The place of line `y`; `fresh`: it must be filled.
    T* at(int y, bool& fresh) {
        const size_t slot = static_cast<size_t>(y) & (slots_ - 1);
        fresh = tags_[slot] != y;
        tags_[slot] = y;
        return block_.get() + slot * length_;
    }

  private:
    Block<T> block_;
    std::vector<int> tags_;
    size_t slots_ = 1;
    size_t length_ = 0;
};

template <class S>
struct Lines;  // pipeline.cpp

// What a plan needs for one band at a time.
class Workspace {
  public:
    explicit Workspace(const Plan& plan);
    ~Workspace();
    Workspace(const Workspace&) = delete;
    Workspace& operator=(const Workspace&) = delete;

    std::unique_ptr<Lines<Byte>> bytes;
    std::unique_ptr<Lines<uint16_t>> words;
};

}  // namespace srk
