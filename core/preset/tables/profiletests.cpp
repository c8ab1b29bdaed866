// Questions about profile numbers, and words for quality steps. In numbers of the current scheme the upper
// half names the family and the lower half its member.
#include <algorithm>
#include <iterator>

#include "core/engine/qvutil.h"

namespace {

constexpr int secondScheme = 0x1000000;
constexpr int currentScheme = 0x2000000;
constexpr int secondXdcamEx = secondScheme + 22;
constexpr int familyXdcamEx = 0x020E;

// Both ends belong to the range.
struct Range {
    int first, last;
};

constexpr Range mpeg2[] = {
    {secondScheme + 10, secondScheme + 10},  // MPEG-2
    {secondScheme + 12, secondScheme + 22},  // DVD and SVCD to XDCAM EX
    {secondScheme + 29, secondScheme + 29},  // the largest MPEG-2
    {0x2030003, 0x2030004},                  // Blu-ray with MPEG-2
    {0x2040001, 0x2040002},                  // DVD, SVCD
    {0x20D0002, 0x20D0004},                  // XDCAM IMX
    {0x20E0001, 0x20E0003},                  // XDCAM EX
    {0x20F0001, 0x20F0009},                  // XDCAM HD
    {0x2140001, 0x2140004},                  // digital television
    {0x2150001, 0x2150002},                  // HDV
    {0x216000A, 0x216000E},                  // plain MPEG-2, simple to 4:2:2
};

constexpr const char* threeSteps[] = {"Best", "Better", "Good"};
constexpr const char* fourSteps[] = {"Highest", "High", "Medium", "Lowest"};

template <std::size_t n>
const char* step(const char* const (&words)[n], int index) {
    return words[std::clamp(index, 0, static_cast<int>(n) - 1)];
}

}  // namespace

bool QvUtil::isProfile1(int profile) { return profile >= secondScheme && profile < currentScheme; }

bool QvUtil::isProfile2(int profile) { return profile >= currentScheme; }

bool QvUtil::isExProfile(int profile) {
    return profile == secondXdcamEx || (profile > 0 && profile >> 16 == familyXdcamEx);
}

bool QvUtil::isMpeg2Profile(int profile) {
    return std::any_of(std::begin(mpeg2), std::end(mpeg2),
                       [profile](Range range) { return profile >= range.first && profile <= range.last; });
}

const char* QvUtil::cqtQualityStr(int quality, int steps) {
    return steps == 3 ? step(threeSteps, quality) : step(fourSteps, quality);
}
