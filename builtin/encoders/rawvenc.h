// RawVideoEnc: writes frames as they are. Module "rawvenc".
#pragma once

#include "builtin/encoders/rawvencworker.h"
#include "builtin/encoders/rawvencwriter.h"
#include "core/encode/qvencoder.h"
#include "core/engine/modules/qvmodule.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"

// Each frame goes to the output as the planes of its type, one after the other, with the default strides,
// and is announced as one access unit. Type v210 takes Y216 frames and converts them.
//
// With "accelerationOn" a worker writes from a queue of three frames: writeFrame copies the frame there and
// waits only while all three are taken. A failure of the worker is the result of the next writeFrame and of
// close.
class RawVideoEnc : public QvVideoEncoder {
  public:
    RawVideoEnc();
    ~RawVideoEnc() override;

    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;

    int attachOutStream(QvBufStream* stream) override;
    int open() override;
    int close() override;
    int abort() override;
    // QvStatus::invalidArgument for a null frame and for one whose size or FOURCC is not what was set.
    int writeFrame(QvFrame* frame) override;
    // The latest frame, packed; null before the first one and after close. With "accelerationOn" it is the
    // one in the queue, which is not to be changed.
    QvFrame* lastFrame() override;

  private:
    struct Params;  // the rows

    int remake(int width, int height, unsigned type);
    unsigned frameType() const;
    bool accepts(const QvFrame& frame) const;
    RawVideoOutcome writeOut(const QvFrame& frame);
    int report(const RawVideoOutcome& outcome);
    int finish(bool discard);

    int width_ = 0;
    int height_ = 0;
    unsigned type_ = 0;
    int frameBytes_ = 0;  // of one packed frame, v210 as it is put out
    QvFramerate rate_{25.0};
    int profile_ = 0x1000065;
    QvFrame picture_;  // the latest frame without a worker
    QvFrame* last_ = nullptr;
    bool getOut_ = false;
    bool accelerated_ = false;
    RawVideoWriter writer_;
    RawVideoWorker worker_;
};
