// The bytes of a container on their way into the output stream of a multiplexer.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "plugins/av/source/avheaders.h"

class QvBufStream;

namespace av {

// What follows the end goes out at once. What is written before it, where a container fills in its header, is
// kept and handed over as corrections by finish: the output makes them when it is closed.
class SinkBytes {
  public:
    SinkBytes(QvBufStream& output, bool seekable);
    SinkBytes(const SinkBytes&) = delete;
    SinkBytes& operator=(const SinkBytes&) = delete;
    ~SinkBytes();

    // Null if there is no memory. Owned by this object.
    AVIOContext* io() { return io_; }
    // What was skipped, and has zeros in the output until it is corrected. 0 bytes: nothing.
    std::int64_t gapStart() const { return gapStart_; }
    std::int64_t gapBytes() const { return gapBytes_; }
    // The correction that begins at the gap is too long for it: it goes to the end, and the gap becomes a
    // box that is skipped. False if there is none, or it can't be written.
    bool moveFromGap();
    // Hands the corrections over. False after any failure.
    bool finish();

    bool failed() const { return error_ != 0; }
    int error() const { return error_; }  // of the system, as that of the output; 0 for none
    const std::string& problem() const { return problem_; }

  private:
    struct Correction {
        std::int64_t position;
        std::vector<std::uint8_t> bytes;
    };

    QvBufStream& output_;
    AVIOContext* io_ = nullptr;
    std::int64_t position_ = 0, end_ = 0;
    std::int64_t gapStart_ = 0, gapBytes_ = 0;
    std::vector<Correction> corrections_;
    int error_ = 0;
    std::string problem_;

    static int writeBytes(void* self, std::uint8_t* data, int bytes);
    static std::int64_t seekBytes(void* self, std::int64_t offset, int origin);
    bool write(const std::uint8_t* data, std::int64_t bytes);
    bool append(const std::uint8_t* data, std::int64_t bytes);
    void correct(const std::uint8_t* data, std::int64_t bytes);
    std::int64_t endOfLast() const;
    bool fail(const char* what);
};

}  // namespace av
