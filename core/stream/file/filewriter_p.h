// The record of a file that is written: a buffer in front of the file, splitting into numbered files, and the
// gathering of DVD navigation data.
#pragma once

#include <cstdint>
#include <memory>

#include "core/stream/bufstream.h"
#include "core/stream/iofailure.h"
#include "core/stream/nav/navcollector_p.h"
#include "core/stream/platformblock_p.h"
#include "core/stream/stdfile_p.h"

// Blocks of request() are gathered in the buffer, a confirmed block is never split; copybytes() goes straight
// to the file after what is buffered. After a failed write nothing more is written, so that a file has no
// gap: every further block is refused.
class FileWriter {
  public:
    // Null if the file can't be opened for writing or there is no memory for the buffer.
    // `cancel`, which may be null, ends waits for the reader of a stream.
    static std::unique_ptr<FileWriter> open(const QvWideString& name, unsigned size,
                                            std::shared_ptr<QvIoFailure> failure,
                                            std::shared_ptr<QvCancel> cancel);

    unsigned usable() const { return capacity_ - fill_; }
    unsigned char* request(unsigned n);
    unsigned confirm(unsigned n);
    unsigned copybytes(const unsigned char* p, unsigned n);
    unsigned chunksize() const { return capacity_; }
    unsigned auxinfo(bufstream* record, unsigned offset, unsigned id, void* info, unsigned size);
    // NAME.EXT is followed by NAME001.EXT, NAME002.EXT and so on. All bits set on failure; there is no file
    // then.
    unsigned split();
    void done(int abort);

    // What was written can't be changed any more.
    bool isStream() const { return file_.isStream(); }

    // Brings what is buffered to the file system. False on failure.
    bool writeOut();

  private:
    FileWriter(const QvWideString& name, unsigned size, std::shared_ptr<QvIoFailure> failure,
               std::shared_ptr<QvCancel> cancel);
    bool flushBuffer();
    bool fail();
    bool closeFile();
    unsigned nameInfo(void* info, unsigned size) const;
    void takeStem();

    StdFile file_;
    PlatformBlock buffer_;
    unsigned fill_ = 0;
    unsigned capacity_;
    uint64_t total_ = 0;  // bytes of the current file, buffered ones included
    int splits_ = 0;
    QvWideString path_;
    QvWideString stem_;    // empty until the first split
    QvWideString suffix_;  // from the last dot on
    bool broken_ = false;
    NavCollector nav_;
    std::shared_ptr<QvIoFailure> failure_;
    std::shared_ptr<QvCancel> cancel_;
};
