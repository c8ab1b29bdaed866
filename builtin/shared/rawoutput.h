// Putting uncompressed data into the output stream of an encoder.
#pragma once

#include <cstdint>
#include <string>

class QvBufStream;

// Parameter of a stream whose `copybytes` takes any number of bytes and passes them on at once, as a file's
// does. Code that makes such a stream sets it to Int32 1; data then goes out without a copy in between.
constexpr char rawWriteThrough[] = "writeThrough";

enum class RawPutResult {
    ok,
    noBlock,  // the stream gave no room, for no known reason; `RawOutput::asked` is how much it was asked for
    failed,   // the target of the stream could not write: RawOutput::fault
};

// Holds the lock of the stream for as long as it lives.
class RawOutput {
  public:
    explicit RawOutput(QvBufStream& stream);
    ~RawOutput();
    RawOutput(const RawOutput&) = delete;
    RawOutput& operator=(const RawOutput&) = delete;

    RawPutResult put(const unsigned char* data, uint64_t bytes);
    unsigned asked() const { return asked_; }
    // False when the target of the stream has failed since it was opened. Some streams find out only
    // when a unit is announced.
    bool sound() const;
    std::string fault() const;
    // Whether the stream may take access units apart, so that the announced count must be what was put.
    bool cutsUnits() const { return !through_; }
    // The largest block that the stream takes as one; 0 for no limit.
    unsigned largestBlock() const;
    // Announces an access unit of `bytes` bytes that has been put. The info is a record of `infoBytes` (4 to
    // 32) whose first 32-bit word is the count. The result is the stream's answer.
    int announce(unsigned code, uint64_t bytes, unsigned infoBytes);
    void unlock();

  private:
    RawPutResult putThrough(const unsigned char* data, uint64_t bytes);
    RawPutResult putBlocks(const unsigned char* data, uint64_t bytes);

    QvBufStream& stream_;
    unsigned asked_ = 0;
    bool through_;
    bool locked_ = true;
};
