// Which pixel formats stand for each other.
#include <algorithm>
#include <initializer_list>

#include "core/engine/qvutil.h"

namespace {

constexpr unsigned code(const char (&text)[5]) {
    unsigned value = 0;
    for (int i = 3; i >= 0; --i) value = value << 8 | static_cast<unsigned char>(text[i]);
    return value;
}
static_assert(code("BGRA") == 0x41524742);

constexpr unsigned rgb32[] = {code("BGRA"), code("ARGB"), code("BGR4"), code("R32C")};
constexpr unsigned packed422[] = {code("YUYV"), code("YUY2"), code("UYVY")};
constexpr unsigned planar420[] = {code("I420"), code("YV12")};

constexpr unsigned sameBgr[] = {code("BGRA"), code("BGR4")};
constexpr unsigned sameYuv[] = {code("YUY2"), code("YUYV")};

template <std::size_t n>
bool bothIn(const unsigned (&group)[n], unsigned a, unsigned b) {
    const auto holds = [&group](unsigned wanted) {
        return std::find(std::begin(group), std::end(group), wanted) != std::end(group);
    };
    return holds(a) && holds(b);
}

}  // namespace

bool QvUtil::equalFcc(unsigned a, unsigned b) {
    return a == b || bothIn(sameBgr, a, b) || bothIn(sameYuv, a, b);
}

bool QvUtil::exchengeableFOURCC(int a, int b) {
    const auto first = static_cast<unsigned>(a), second = static_cast<unsigned>(b);
    return bothIn(rgb32, first, second) || bothIn(packed422, first, second) ||
           bothIn(planar420, first, second);
}

int QvUtil::macroblocks(int width, int height) {
    if (width <= 0 || height <= 0) return 0;
    const long long count = ((width + 15LL) / 16) * ((height + 15LL) / 16);
    return static_cast<int>(std::min<long long>(count, 0x7FFFFFFF));
}
