// Writes pictures to an output and announces them as access units; those of v210 are converted first.
#pragma once

#include <memory>
#include <string>

class QvBufStream;
class QvFrame;
class QvVideoFilter;

// What became of one frame. Made on a worker's thread too, so it is reported apart.
struct RawVideoOutcome {
    int status = 0;
    bool noBlock = false;  // the output gave no block and knows no fault of its own
    unsigned asked = 0;    // bytes of that block
    std::string text{};
};

class RawVideoWriter {
  public:
    RawVideoWriter();
    ~RawVideoWriter();

    // `frame` has the default strides. `v210Bytes`: 0 to write it as it is; else it is Y216 and becomes v210
    // of that many bytes.
    RawVideoOutcome write(const QvFrame& frame, QvBufStream& output, int v210Bytes);
    // Deletes the converter. The next frame may have another size.
    void reset();

  private:
    RawVideoOutcome convert(const QvFrame& frame, int bytes, const QvFrame*& picture);
    RawVideoOutcome openConverter(const QvFrame& frame);

    std::unique_ptr<QvVideoFilter> converter_;
};
