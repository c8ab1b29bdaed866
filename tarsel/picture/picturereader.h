// Single pictures of a source, as a run with the same options would write them.
#pragma once

#include <functional>
#include <memory>

#include "tarsel/picture/picture.h"

class PictureReader {
  public:
    // Throws Failure, as its operations do.
    PictureReader(Source& source, const EffectOptions& options);
    ~PictureReader();
    const QvVProcessPipe* pipe() const { return pipe_.get(); }  // null without filters

    const PictureFormat& format() const { return effects_.out(); }
    long long frames() const { return frames_; }  // that a run would write
    // Called with the number of each frame of the input that is read, from 0.
    void onRead(std::function<void(long long)> read) { onRead_ = std::move(read); }
    // Picture `number`, from 0. Valid until the next call. Where a picture depends on those before it, rising
    // numbers cost least.
    const QvFrame& at(long long number);

  private:
    const QvFrame& read(long long frame);
    const QvFrame& single(long long number);
    const QvFrame& inOrder(long long number);
    bool advance();
    void reopen();
    void checkFilters() const;

    Source& source_;
    PictureEffects effects_;
    long long inFrames_ = 0, frames_ = 0;
    std::unique_ptr<QvVProcessPipe> pipe_;
    long long nextInput_ = 0;
    bool holds_ = false;  // the pipe's frame has been handed out
    std::function<void(long long)> onRead_;
};
