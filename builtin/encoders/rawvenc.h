// RawVideoEnc: writes frames as they are. Module "rawvenc".
#pragma once

#include <condition_variable>
#include <memory>
#include <string>
#include <thread>

#include "core/encode/qvencoder.h"
#include "core/engine/modules/qvmodule.h"
#include "core/measure/qvgeometry.h"
#include "core/media/frameque.h"
#include "core/media/qvbuffer.h"

class QvVideoFilter;

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
    friend struct RawVideoParams;

    // What became of one frame. Made on the worker's thread too, so it is reported apart.
    struct Outcome {
        int status = 0;
        bool noBlock = false;
        unsigned asked = 0;
        std::string text{};
    };

    int remake(int width, int height, unsigned type);
    unsigned frameType() const;
    bool accepts(const QvFrame& frame) const;

    Outcome writeOut(const QvFrame& frame);
    Outcome writePicture(const QvFrame& picture, int announced);
    int report(const Outcome& outcome);
    Outcome convert(const QvFrame& frame, const QvFrame*& picture);
    Outcome openConverter(const QvFrame& frame);

    int enqueue(const QvFrame& frame);
    void work();
    Outcome writeQueued(const QvFrame& frame) noexcept;
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
    std::unique_ptr<QvVideoFilter> converter_;

    // Shared with the worker, under the queue's lock.
    QvFrameQue queue_;
    std::condition_variable_any workReady_;
    std::condition_variable_any slotFree_;
    bool stop_ = false;
    bool discard_ = false;
    Outcome failure_;
    std::thread worker_;
};
