// Copies of whole pictures, row by row, and of their fields: the operations of QvFrame of these names, which
// say what they do. `dst` is the frame that is written; the source may be the same one.
#pragma once

#include "core/media/qvframe.h"

namespace qvframes {

int copy(QvFrame& dst, const QvFrame& src, bool flip);
int copyFramett(QvFrame& dst, const frame_tt& tt, bool keepStrides);
int copyShifted(QvFrame& dst, const QvFrame& src);
int changeDominance(QvFrame& dst, bool up);
int copySwitched(QvFrame& dst, const QvFrame& src);
int interlace(QvFrame& dst, const QvFrame& first, const QvFrame& second);
int combineFields(QvFrame& dst, const QvFrame& first, const QvFrame& second);
int copyDeinterlaced(QvFrame& dst, const QvFrame& src, bool firstField);
int copyBob(QvFrame& dst, const QvFrame& src);

}  // namespace qvframes
