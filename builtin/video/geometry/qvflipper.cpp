#include "builtin/video/geometry/qvflipper.h"

#include <algorithm>

#include "builtin/creators.h"
#include "core/measure/qvgeometry.h"
#include "core/media/rows_p.h"

namespace {

constexpr QvParamRow<FlipperSettings> rows[] = {
    {.name = "flip",
     .member = &FlipperSettings::flip,
     .flags = qvParamStored,
     .description = "Flip vertically",
     .help = "turns frames upside down, and reverses the field order"},
};
static_assert(qvParamTableOk<FlipperSettings>(rows));

// Frames of one format may differ in their strides. With an odd height a plane of 4:2:0 is longer than the
// rows that are copied.
void copyFlipped(QvFrame& to, const QvFrame& from, int plane) {
    const std::ptrdiff_t stride = from.stride(plane);
    const int rows = sampleRows(from, plane);
    if (rows == 0) return;
    qvrows::copy(to.plane(plane), to.stride(plane), from.plane(plane) + stride * (rows - 1), -stride,
                 std::min<std::ptrdiff_t>(stride, to.stride(plane)), rows);
}

void swapRows(QvFrame& frame, int plane) {
    const std::ptrdiff_t stride = frame.stride(plane);
    const int rows = sampleRows(frame, plane);
    for (int y = 0; y < rows / 2; ++y) {
        unsigned char* upper = frame.plane(plane) + stride * y;
        std::swap_ranges(upper, upper + stride, frame.plane(plane) + stride * (rows - 1 - y));
    }
}

}  // namespace

QvCodec* newFlipper() { return new QvFlipper; }

QvFlipper::QvFlipper() : InPlaceEffectOf("flipper", rows) {}

int QvFlipper::change(const QvFrame& from, QvFrame& to) {
    if (!settings_.flip) {
        copySamples(to, from);
        return QvStatus::ok;
    }
    for (int p = 0; p < from.planes(); ++p)
        if (&from == &to)
            swapRows(to, p);
        else
            copyFlipped(to, from, p);
    to.framerate.reverseDominance();
    return QvStatus::ok;
}
