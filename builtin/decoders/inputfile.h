// A file that a decoder reads from, closed with its object.
#pragma once

#include <cstddef>
#include <cstdio>
#include <memory>

class Any;

class InputFile {
  public:
    // 0 if `name` is text and the file opens and tells its length, else QvStatus::failed. `bufferBytes` is
    // the read-ahead for reads that are smaller than it; larger ones go straight into the caller's memory.
    int open(const Any& name, std::size_t bufferBytes);
    void close() { file_.reset(); }
    bool isOpen() const { return file_ != nullptr; }

    long long length() const { return length_; }  // bytes when it was opened
    // Moves to a byte from the start. False for a negative one or when the system refuses.
    bool seek(long long position);
    // Number of whole items that were read; fewer than `count` at the end of the file or on an error.
    std::size_t read(void* to, std::size_t itemBytes, std::size_t count) {
        return std::fread(to, itemBytes, count, file_.get());
    }

  private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };
    std::unique_ptr<char[]> buffer_;  // outlives the file that reads through it
    std::unique_ptr<std::FILE, Close> file_;
    long long length_ = 0;
};
