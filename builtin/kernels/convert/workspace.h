// The memory that a band works in.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <new>
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

// What a plan needs for one band of either field.
class Workspace {
  public:
    explicit Workspace(const Plan& plan);

    Block<Byte> lines;        // as the buffers of the stages say
    std::vector<int> tags;    // which line of a stage lies at each place; -1: none
    Block<Byte> padded;       // a line with its ends repeated
    Block<float> paddedWide;  // the same for deep samples
    Block<Byte> neutral;
};

}  // namespace srk
