// A file descriptor with an owner.
#pragma once

#include <utility>

#include <unistd.h>

class Descriptor {
  public:
    Descriptor() = default;
    explicit Descriptor(int number) : number_(number) {}
    ~Descriptor() { reset(); }
    Descriptor(Descriptor&& other) noexcept : number_(std::exchange(other.number_, -1)) {}
    Descriptor& operator=(Descriptor&& other) noexcept {
        if (this != &other) reset(std::exchange(other.number_, -1));
        return *this;
    }

    // Closes the one that it has. Takes no memory.
    void reset(int number = -1) {
        if (number_ >= 0) ::close(number_);
        number_ = number;
    }
    int get() const { return number_; }
    int release() { return std::exchange(number_, -1); }
    explicit operator bool() const { return number_ >= 0; }

  private:
    int number_ = -1;
};
