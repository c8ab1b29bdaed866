// What filters share that draw text onto the frames they are given.
#pragma once

#include "builtin/video/videoeffect.h"

class QvTextRenderingOptions;

namespace overlay {

// Text can't be drawn onto v210 and I422.
bool canDrawOn(const QvFrame& frame);

// Warns of fonts whose files don't exist, and which draw nothing; each file once.
void warnOfFonts(const QvTextRenderingOptions& options);

// A byte of a colour as a row.
template <class Settings>
constexpr QvParamRow<Settings> byteRow(const char* name, int Settings::*member) {
    return {name, member, qvParamStored, 0, 255};
}

}  // namespace overlay

// An effect that draws in place; write draws onto a copy. An application's frame keeps its format, size, rate
// and metadata.
template <class Settings>
class OverlayOf : public VideoEffectOf<Settings> {
  public:
    bool applySupported() const override { return true; }

    // -18 before open, -12 for an empty frame, -10 for a format that can't be drawn on; the frame is
    // unchanged then.
    int apply(QvFrame& frame) override {
        if (!this->opened()) return this->setError(QvStatus::illegalState, "Not opened");
        if (!frame.inited()) return this->setError(QvStatus::invalidArgument, "an empty frame");
        if (overlay::canDrawOn(frame)) return draw(frame);
        return this->setError(QvStatus::notSupported, "Can't draw text on %s frames", frame.str_four_cc());
    }

  protected:
    using VideoEffectOf<Settings>::VideoEffectOf;

    virtual int draw(QvFrame& frame) = 0;

    int fill(const QvFrame& frame) override {
        this->output_ = frame;
        return apply(this->output_);
    }
};
