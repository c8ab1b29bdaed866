// A large block of memory whose absence is an expected failure.
#pragma once

#include <cstddef>
#include <utility>

#include "core/arch/platform.h"

class PlatformBlock {
  public:
    explicit PlatformBlock(size_t bytes)
        : data_(static_cast<unsigned char*>(qv_platform().allocate(bytes ? bytes : 1, 64))) {}
    ~PlatformBlock() { qv_platform().release(data_); }
    PlatformBlock(const PlatformBlock&) = delete;
    PlatformBlock& operator=(const PlatformBlock&) = delete;

    unsigned char* data() const { return data_; }  // null if there was not enough

  private:
    unsigned char* data_;
};
