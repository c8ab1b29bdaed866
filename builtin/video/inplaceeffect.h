// Effects that change the samples of a frame and neither its format nor its size: in place when they follow
// another filter, on the way into their own frame when they are given it.
#pragma once

#include "builtin/video/samplelayout.h"
#include "builtin/video/videoeffect.h"

template <class Settings>
class InPlaceEffectOf : public VideoEffectOf<Settings> {
  public:
    bool applySupported() const override { return true; }

    // -18 before open, -12 for an empty frame, otherwise what the effect returns.
    int apply(QvFrame& frame) override {
        if (!this->opened()) return this->setError(QvStatus::illegalState, "Not opened");
        if (!frame.inited()) return this->setError(QvStatus::invalidArgument, "an empty frame");
        return change(frame, frame);
    }

  protected:
    using VideoEffectOf<Settings>::VideoEffectOf;

    // Makes all samples of `to` from those of `from`, which has the same format and size, or is the same
    // frame. The metadata of `to` is that of `from` already. A status.
    virtual int change(const QvFrame& from, QvFrame& to) = 0;

    int fill(const QvFrame& frame) override {
        if (const int result = takeShape(this->output_, frame))
            return this->setError(result, "no memory for a frame of %dx%d", frame.width(), frame.height());
        this->output_.copyMeta(frame);
        return change(frame, this->output_);
    }
};
