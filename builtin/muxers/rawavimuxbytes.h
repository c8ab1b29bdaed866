// Little-endian fields and nested chunks of RIFF, one after the other.
#pragma once

#include <cstdint>
#include <vector>

class AviBytes {
  public:
    AviBytes& text(const char (&fourLetters)[5]) {
        for (int i = 0; i < 4; ++i) data_.push_back(static_cast<unsigned char>(fourLetters[i]));
        return *this;
    }
    AviBytes& u16(int64_t value) { return number(value, 2); }
    AviBytes& u32(int64_t value) { return number(value, 4); }
    AviBytes& u64(int64_t value) { return number(value, 8); }
    AviBytes& bytes(const std::vector<unsigned char>& more) {
        data_.insert(data_.end(), more.begin(), more.end());
        return *this;
    }
    AviBytes& zeros(size_t count) {
        data_.resize(data_.size() + count);
        return *this;
    }
    // "00db", "ix00": the number within the letters, 0 to 99.
    AviBytes& streamId(const char* letters, size_t number) {
        for (const char* at = letters; *at; ++at)
            if (*at != '#')
                data_.push_back(static_cast<unsigned char>(*at));
            else if (at[1] == '#')
                data_.push_back(static_cast<unsigned char>('0' + number / 10));
            else
                data_.push_back(static_cast<unsigned char>('0' + number % 10));
        return *this;
    }

    // The length of a chunk is filled in by close(), with the padding after an odd one.
    size_t open(const char (&fourLetters)[5]) {
        text(fourLetters).u32(0);
        return data_.size();
    }
    size_t openList(const char (&list)[5], const char (&kind)[5]) {
        const size_t start = open(list);
        text(kind);
        return start;
    }
    void close(size_t start) {
        const size_t length = data_.size() - start;
        for (size_t i = 0; i < 4; ++i) data_[start - 4 + i] = static_cast<unsigned char>(length >> 8 * i);
        if (length % 2) data_.push_back(0);
    }

    std::vector<unsigned char> take() { return std::move(data_); }
    size_t size() const { return data_.size(); }

  private:
    AviBytes& number(int64_t value, int width) {
        for (int i = 0; i < width; ++i) data_.push_back(static_cast<unsigned char>(value >> 8 * i));
        return *this;
    }

    std::vector<unsigned char> data_;
};
