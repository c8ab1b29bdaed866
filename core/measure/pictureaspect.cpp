#include "core/measure/pictureaspect_p.h"

#include "core/measure/qvnum.h"

namespace {

constexpr double standard = 4.0 / 3.0;
constexpr double wide = 16.0 / 9.0;
constexpr double aspectTolerance = 1e-4;

struct Broadcast {
    int width, height;
    double frameAspect;
    int x, y;
};

// Television's own pixel aspects, which its cropped lines keep from being height * aspect / width.
constexpr Broadcast broadcasts[] = {
    {720, 480, standard, 10, 11}, {720, 480, wide, 40, 33}, {720, 576, standard, 12, 11},
    {720, 576, wide, 16, 11},     {480, 270, wide, 1, 1},   {480, 272, wide, 1, 1},
};

bool isSquare(double pixelAspect) { return pixelAspect > 0.996 && pixelAspect < 1.005; }

}  // namespace

int qvPixelAspect(int& x, int& y, double frameAspect, int width, int height, bool broadcast) {
    x = y = 1;
    if (width == 0 || height == 0 || frameAspect == 0) return 0;
    for (const Broadcast& row : broadcasts) {
        if (!broadcast || row.width != width || row.height != height) continue;
        if (!QvNum::equ(row.frameAspect, frameAspect, aspectTolerance)) continue;
        x = row.x;
        y = row.y;
        return 0;
    }
    const double aspect = height * frameAspect / width;
    if (QvNum::ratio(isSquare(aspect) ? 1.0 : aspect, x, y, 10000, 0.001) == 0) return 0;
    x = y = 1;
    return -1;
}

double qvFrameAspect(int x, int y, int width, int height, bool broadcast) {
    if (x <= 0 || y <= 0 || width <= 0 || height <= 0) return 0;
    for (const Broadcast& row : broadcasts) {
        if (!broadcast || row.width != width || row.height != height) continue;
        if (1LL * row.x * y == 1LL * row.y * x) return row.frameAspect;
    }
    return static_cast<double>(width) * x / (static_cast<double>(height) * y);
}
