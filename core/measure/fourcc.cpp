#include "core/measure/fourcc.h"

namespace {

using enum QvChroma;
namespace F = QvFourcc;

// clang-format off
constexpr QvPixelFormat formats[] = {
    // fourcc   chroma   rgb    sample pixel bits depth group
    {F::GRAY, none,    false, 1,  1,  8,  8, 0},
    {F::I420, quarter, false, 1,  1, 12,  8, 'p'},
    {F::YV12, quarter, false, 1,  1, 12,  8, 'p'},
    {F::I422, half,    false, 1,  1, 16,  8, 0},
    {F::W016, quarter, false, 2,  2, 24, 16, 0},
    {F::YUY2, none,    false, 1,  2, 16,  8, 'y'},
    {F::YUYV, none,    false, 1,  2, 16,  8, 'y'},
    {F::UYVY, none,    false, 1,  2, 16,  8, 'y'},
    {F::Y216, none,    false, 2,  4, 32, 16, 0},
    {F::v210, none,    false, 1, -1, 32, 10, 0},
    {F::BGR3, none,    true,  1,  3, 24,  8, 0},
    {F::BGR4, none,    true,  1,  4, 32,  8, 'r'},
    {F::BGRA, none,    true,  1,  4, 32,  8, 'r'},
    {F::ARGB, none,    true,  1,  4, 32,  8, 'r'},
    {F::R32C, none,    false, 1,  4, 32,  8, 'r'},
    {F::b64a, none,    false, 2,  8, 64, 16, 0},
    {F::R555, none,    false, 1,  2, -1,  8, 0},
    {F::R565, none,    false, 1,  2, -1,  8, 0},
};
// clang-format on

bool isPair(unsigned a, unsigned b, unsigned first, unsigned second) {
    return (a == first && b == second) || (a == second && b == first);
}

}  // namespace

std::span<const QvPixelFormat> qvPixelFormats() { return formats; }

const QvPixelFormat* qvPixelFormat(unsigned fourcc) {
    for (const auto& format : formats)
        if (format.fourcc == fourcc) return &format;
    return nullptr;
}

long long qvDefaultStride(const QvPixelFormat& format, int width) {
    const long long w = width;
    if (format.fourcc == F::v210) return 128 * ((w + 47) / 48);
    const long long packed = format.pixelBytes * w;
    return format.fourcc == F::GRAY || format.fourcc == F::BGR3 ? (packed + 3) & ~3LL : packed;
}

bool qvEqualFourcc(unsigned a, unsigned b) {
    return a == b || isPair(a, b, F::BGRA, F::BGR4) || isPair(a, b, F::YUY2, F::YUYV);
}

bool qvExchangeableFourcc(unsigned a, unsigned b) {
    const auto* first = qvPixelFormat(a);
    const auto* second = qvPixelFormat(b);
    return first && second && first->group != 0 && first->group == second->group;
}
