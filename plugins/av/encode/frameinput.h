// The engine's pictures in the layouts that encoders take.
//
//     frame   first layout        by
//     I420    4:2:0, 8 bits       rows; without a copy where the encoder makes one itself
//     W016    4:2:0, 10 bits...   shifting, rounded to the nearest
//     YUYV    4:2:2, 8 bits       taking the pairs apart
//     Y216    4:2:2, 10 bits...   both
//     BGR4    BGR0, BGRA          rows
//     b64a    BGRA64, RGBA64      rows
//
// An encoder of another layout gets that one by libswscale.
#pragma once

#include <memory>

#include "plugins/av/source/avheaders.h"

class QvFrame;
struct SwsContext;

namespace av {

class FrameInput {
  public:
    FrameInput() = default;
    ~FrameInput();
    FrameInput(const FrameInput&) = delete;
    FrameInput& operator=(const FrameInput&) = delete;

    // `borrows`: the encoder copies a picture before it returns, so that it may see the caller's memory.
    // `colour`: of YUV that is made of RGB. False if there is no way from the form to the layout, or no
    // memory.
    bool open(unsigned fourcc, AVPixelFormat layout, int width, int height, AVColorSpace colour,
              bool borrows);
    void close();
    // The picture in the layout, valid until the next call, with no time; null without memory. `from` has the
    // form and the size.
    AVFrame* take(const QvFrame& from);

  private:
    struct FreePool {
        void operator()(AVBufferPool* pool) const { av_buffer_pool_uninit(&pool); }
    };
    using Pool = std::unique_ptr<AVBufferPool, FreePool>;

    unsigned fourcc_ = 0;
    AVPixelFormat first_ = AV_PIX_FMT_NONE, layout_ = AV_PIX_FMT_NONE;
    int width_ = 0, height_ = 0;
    bool borrows_ = false;
    Pool pool_;
    FramePtr frame_, unpacked_;
    SwsContext* scaler_ = nullptr;

    bool blank(AVFrame& frame, AVPixelFormat layout) const;
    bool lend(const QvFrame& from);
    void unpack(const QvFrame& from, AVFrame& to) const;
};

}  // namespace av
