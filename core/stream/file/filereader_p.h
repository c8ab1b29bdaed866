// The record of a file that is read, on wish with the bytes of each pair swapped.
#pragma once

#include <cstdint>
#include <memory>

#include "core/stream/bufstream.h"
#include "core/stream/iofailure.h"
#include "core/stream/platformblock_p.h"
#include "core/stream/stdfile_p.h"

class FileReader {
  public:
    // Null if the file can't be opened or there is no memory for the buffer.
    static std::unique_ptr<FileReader> open(const QvWideString& name, unsigned size,
                                            std::shared_ptr<QvIoFailure> failure);

    unsigned usable() const { return end_ - read_; }  // what is buffered
    unsigned char* request(unsigned n);
    unsigned confirm(unsigned n);
    unsigned copybytes(unsigned char* p, unsigned n);
    unsigned chunksize() const { return size_; }
    unsigned auxinfo(bufstream* record, unsigned offset, unsigned id, void* info, unsigned size);
    void done(int) { file_.close(); }

  private:
    FileReader(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure);
    unsigned fetch(unsigned char* target, unsigned n);
    unsigned fetchPlain(unsigned char* target, unsigned n);
    unsigned fetchSwapped(unsigned char* target, unsigned n);

    StdFile file_;
    PlatformBlock buffer_;
    unsigned read_ = 0;
    unsigned size_;
    unsigned end_ = 0;
    uint64_t position_ = 0;  // bytes handed out
    uint64_t fileSize_ = 0;  // when it was opened
    bool swap_ = false;
    unsigned char held_ = 0;  // first byte of a pair whose second has been delivered
    bool hasHeld_ = false;
    QvWideString name_;
    std::shared_ptr<QvIoFailure> failure_;
};
