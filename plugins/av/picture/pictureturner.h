// Pictures turned by quarters and mirrored, as a film says that they are to be shown.
#pragma once

#include "plugins/av/picture/picturewords.h"
#include "plugins/av/source/avheaders.h"

namespace av {

class PictureTurner {
  public:
    explicit PictureTurner(const Turn& turn);

    // Whether pictures of that layout can be turned. Those whose pixels share bytes with their neighbours,
    // such as packed 4:2:2, can't.
    bool takes(AVPixelFormat layout) const { return layoutFor(layout) != AV_PIX_FMT_NONE; }
    // The picture as it is to be shown: its samples, layout, range, matrix and fields. Of 4:2:2 a quarter
    // turn makes 4:4:0. Valid until the next call. Null for a layout that it does not take, and without
    // memory.
    const AVFrame* turn(const AVFrame& picture);
    bool swapsSides() const { return swap_; }

  private:
    // Where the sample of the result at (x, y) is from: of the row or column counted from the other end, and
    // then, for a quarter turn, at (y, x).
    bool swap_, flipX_, flipY_;
    FramePtr turned_;

    AVPixelFormat layoutFor(AVPixelFormat layout) const;
    bool prepare(const AVFrame& picture, AVPixelFormat layout);
    void turnFields(const AVFrame& picture);
};

}  // namespace av
