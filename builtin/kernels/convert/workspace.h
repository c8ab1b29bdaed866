// The lines that a band works on: rings of the latest ones, by their number.
#pragma once

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

// `slots` lines of `length` items. A line is found by its number until as many others have come.
template <class T>
class Ring {
  public:
    void set(int slots, int length) {
        slots_ = slots;
        length_ = (static_cast<size_t>(length) + 63) & ~size_t{63};
        block_.grow(static_cast<size_t>(slots) * length_);
        tags_.assign(static_cast<size_t>(slots), -1);
    }
    void forget() { std::fill(tags_.begin(), tags_.end(), -1); }
    // The place of line `y`; `fresh`: it must be filled.
    T* at(int y, bool& fresh) {
        const auto slot = static_cast<size_t>(y % slots_);
        fresh = tags_[slot] != y;
        tags_[slot] = y;
        return block_.get() + slot * length_;
    }

  private:
    Block<T> block_;
    std::vector<int> tags_;
    int slots_ = 1;
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
