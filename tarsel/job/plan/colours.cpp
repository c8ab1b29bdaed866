#include "tarsel/job/plan/colours.h"

#include "tarsel/words/rawnames.h"

namespace {

// Code points of ITU-T H.273.
constexpr int kBt709 = 1, kBt470Bg = 5, kSmpte170m = 6;
constexpr int kPq = 16, kHlg = 18;
constexpr int kFirstWide = 9;  // BT.2020, of primaries and matrices; those above are wider still
constexpr int kHdLines = 720;

bool isBt601(const Colours& colours, int lines) {
    if (colours.space == kBt709) return false;
    return colours.space == kBt470Bg || colours.space == kSmpte170m || lines < kHdLines;
}

}  // namespace

bool isWide(const Colours& colours) {
    return colours.primaries >= kFirstWide || colours.space >= kFirstWide || colours.transfer == kPq ||
           colours.transfer == kHlg;
}

Colours coloursOf(const PictureFormat& in, const PictureFormat& out, bool converted) {
    if (!isYuv(in.fourcc) || !isYuv(out.fourcc)) return {};
    const bool same = isBt601(in.colours, in.height) == (out.height < kHdLines);
    return converted && !same ? Colours{} : in.colours;
}
