#pragma once

#include <algorithm>
#include <cstddef>
#include <string>
#include <utility>

#include "core/stream/qvbytesource.h"

// Bytes of memory. Counts what is read, and fails on demand.
class WatchedSource : public QvByteSource {
  public:
    explicit WatchedSource(std::string bytes) : bytes_(std::move(bytes)) {}
    bool fails = false;
    std::size_t taken = 0;  // bytes

  protected:
    long long readSome(void* to, std::size_t count) override {
        if (fails) {
            setReason("the cable was pulled");
            return -1;
        }
        const std::size_t n = std::min(count, bytes_.size() - std::min(bytes_.size(), at_));
        bytes_.copy(static_cast<char*>(to), n, at_);
        at_ += n;
        taken += n;
        return static_cast<long long>(n);
    }
    bool canMove() const override { return true; }
    bool moveTo(long long position) override {
        at_ = static_cast<std::size_t>(position);
        return true;
    }
    long long length() override { return static_cast<long long>(bytes_.size()); }

  private:
    std::string bytes_;
    std::size_t at_ = 0;
};
