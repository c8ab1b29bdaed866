// What a decoder reads from: a file by its name, which is closed with this object, or a byte source that its
// owner keeps.
#pragma once

#include <cstddef>
#include <memory>
#include <string>

#include "core/stream/qvbytesource.h"

class Any;

class InputFile {
  public:
    // 0 if `name` is text and the file opens and has a length, else QvStatus::failed. `bufferBytes` is
    // the read-ahead for reads that are smaller than it; larger ones go straight into the caller's memory.
    int open(const Any& name, std::size_t bufferBytes);
    // 0 if the source knows its length and can be moved to its start, else QvStatus::failed with a problem().
    int open(QvByteSource& source);
    // The source if there is one, else the file.
    int open(const Any& name, std::size_t bufferBytes, QvByteSource* source);
    void close();
    bool isOpen() const { return source_ != nullptr; }

    long long length() const { return length_; }  // bytes when it was opened
    // Moves to a byte from the start. False for a negative one or when the system refuses.
    bool seek(long long position) { return source_->seek(position); }
    // Number of whole items that were read; fewer than `count` at the end of the file or on an error.
    std::size_t read(void* to, std::size_t itemBytes, std::size_t count) {
        return source_->read(to, itemBytes * count) / itemBytes;
    }
    // ": " and why a byte source gave no more, or could not be opened. "" for files, whose messages are
    // fixed, and when there is nothing to say.
    std::string problem() const;

  private:
    std::unique_ptr<QvByteSource> file_;
    QvByteSource* source_ = nullptr;  // file_, or borrowed
    long long length_ = 0;
    std::string refusal_;  // of a source that was not opened
};
