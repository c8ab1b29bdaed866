// The bobber (module "bobber"): makes two progressive frames of full height from each interlaced one, at
// twice the rate. Motion is as smooth as it was shot, and no comb is left.
//
// The first frame shows the field that comes first (the bottom field for interlaced 2, else the top field),
// the second the other one. Rows of the shown field are unchanged. Each missing row lies between two of
// them, and is made of two guesses:
//
//     mean   of the rows above and below: steady where the picture moves, soft where it does not
//     woven  the row of the other field. Where the picture changed since the frame before it is held between
//            the rows above and below (the median of the three), so that no comb is left; where it stands
//            still it is taken as it is, and text and fine lines keep their detail and do not bounce
//
// Parameter "alpha" (0 to 255, default 255) is the share of the woven row: 0 gives plain line interpolation,
// and what lies between mixes the two. The first and the last row have one neighbour, which counts twice.
// Frames marked progressive are treated as top field first.
//
// The numbers of output frames begin at twice the number of the first input frame and rise by one. The second
// frame of a pair has no user data and no captions, so that these leave once.
#pragma once

#include "builtin/video/frames/fields.h"
#include "builtin/video/videoeffect.h"

struct BobberSettings {
    int alpha = 255;
};

class QvBobber : public VideoEffectOf<BobberSettings> {
  public:
    QvBobber();

    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    int write(QvFrame& frame) override;
    int ready() const override { return left_; }
    QvFrame* frame() override { return left_ == 1 ? &second_ : &output_; }
    int next() override;

    using VideoEffectOf::getParam;

  protected:
    int fill(const QvFrame& frame) override;

  private:
    int show(QvFrame& to, const QvFrame& frame, Field field) const;

    QvFrame second_;
    QvFrame before_;  // the input frame before, pixels only; empty if alpha is 0
    long long nextNumber_ = 0;
    bool started_ = false;
    int left_ = 0;  // frames to fetch
};
