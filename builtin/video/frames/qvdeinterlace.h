// The field deinterlacer (module "deinterlace"): makes progressive frames, or exchanges the fields.
//
// Parameter "deinterlace", given as text or number; getParam answers with the text:
//
//     0  ""         the frame as it is; any other text or number counts as this
//     1  "top"      the first field: rows 0, 2, 4, ..., half the height
//     2  "bottom"   the second field: rows 1, 3, 5, ..., half the height
//     3  "reverse"  the rows of each pair change places and so does the field order; full height
//     4  "bob"      the averages of the rows of each pair, half the height
//
// Half a height is rounded down, to even lines for 4:2:0. The frame is one frame for each frame written, of
// the same number and rate; those of half height are marked progressive.
#pragma once

#include "builtin/video/videoeffect.h"

struct DeinterlaceSettings {
    int method = 0;  // 0 to 4, as above
};

class QvDeinterlace : public VideoEffectOf<DeinterlaceSettings> {
  public:
    QvDeinterlace();

  protected:
    int fill(const QvFrame& frame) override;
};
