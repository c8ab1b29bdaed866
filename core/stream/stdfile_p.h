// A file of the C library that closes itself and keeps the reason of a failure.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <memory>

#include "core/arch/widename.h"

class QvCancel;

class StdFile {
  public:
    StdFile() = default;
    ~StdFile() { close(); }
    StdFile(const StdFile&) = delete;
    StdFile& operator=(const StdFile&) = delete;

    // Results are false, or short, on failure; error() then has the reason as an errno value.
    bool open(const QvWideString& name, const char* mode);
    // Creates or truncates what is written from its start to its end; see QvPlatform::openOutput.
    bool openOutput(const QvWideString& name, const std::shared_ptr<QvCancel>& cancel);
    // Opened by openOutput and no file: it can't be sought, nor opened again to change what was written.
    bool isStream() const { return isStream_; }
    // Passes each write to the system at once; to be called before the first.
    void setUnbuffered();
    bool isOpen() const { return file_ != nullptr; }
    bool write(const void* data, size_t bytes) { return writeSome(data, bytes) == bytes; }
    size_t writeSome(const void* data, size_t bytes);
    size_t read(void* data, size_t bytes);
    bool readAll(void* data, size_t bytes);  // fewer bytes than asked for are a failure too
    bool seek(long long offset, int origin);
    long long tell();    // -1 on failure
    long long length();  // keeps the position; -1 on failure
    bool flush();
    // False if what the C library still held could not be written. True for a file that isn't open.
    bool close();
    bool failedRead() const { return file_ && std::ferror(file_); }
    int error() const { return error_; }
    uint64_t written() const { return written_; }  // bytes since it was opened

  private:
    void begin();
    bool check(bool ok);

    std::FILE* file_ = nullptr;
    int error_ = 0;
    bool isStream_ = false;
    uint64_t written_ = 0;
};
