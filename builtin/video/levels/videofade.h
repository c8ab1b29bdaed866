// The fade (module "videofade"): brings a segment up from black and back to black.
//
// Parameters, all numbers of frames from 0:
//
//     "fade_in"       0  at the start: the first frame is black, frame "fade_in" is the first one untouched
//     "fade_out"      0  at the end: the last frame is black, the one "fade_out" before it the last untouched
//     "frames_count"  0  in the segment; with 0 the number that the job announces as "_totalFrames"
//     "first_frame"   0  of the segment, the one that comes first after open: a part of a segment goes on
//                        where the part in front of it ended. Stored only where it is not 0
//
// Frames are counted from open. The curve is linear in the signal: a sample keeps frame / "fade_in" of its
// distance from black, which is 16 for luma and 128 for chroma, at the depth of the format, and 0 for RGB;
// alpha stays. Where both fades meet their shares are multiplied. Frames past the count stay black when there
// is a fade out, which without a known count is left out, with a warning. Works in place, on all formats.
#pragma once

#include "builtin/video/inplaceeffect.h"

struct VideoFadeSettings {
    int in = 0, out = 0, count = 0, first = 0;
};

class CVideoFade : public InPlaceEffectOf<VideoFadeSettings> {
  public:
    CVideoFade();
    int setParam(const char* name, const Any& value) override;
    void store(AnyDict& dict) const override;
    int open() override;

  protected:
    int change(const QvFrame& from, QvFrame& to) override;

  private:
    int length() const;
    uint32_t share(int frame) const;  // of 65536

    int announced_ = 0;
    int position_ = 0;
    SampleWeights weights_;
};
