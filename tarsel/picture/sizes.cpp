#include "tarsel/picture/sizes.h"

#include <algorithm>
#include <cmath>

#include "tarsel/words/messages.h"

namespace {

constexpr int kMostSide = 65535, kMostBar = 16384;

// The nearest multiple of `step`, at least one.
int onGrid(double length, int step) {
    return std::clamp(static_cast<int>(std::lround(length / step)), 1, kMostSide / step) * step;
}

}  // namespace

Grid gridOf(const PictureFormat& picture) {
    const QvPixelFormat* format = qvPixelFormat(picture.fourcc);
    if (!format) return {1, 1};
    const bool quarter = format->chroma == QvChroma::quarter;
    const bool pairs = quarter || format->chroma == QvChroma::half || format->group == 'y' ||
                       format->fourcc == QvFourcc::Y216 || format->fourcc == QvFourcc::v210;
    const int fields = picture.rate.interlaced() ? 2 : 1;
    return {pairs ? 2 : 1, (quarter ? 2 : 1) * fields};
}

QvRect partOfShape(double aspect, const PictureFormat& picture) {
    int width = picture.width, height = picture.height;
    if (aspect < picture.aspect)
        width = static_cast<int>(std::lround(width * aspect / picture.aspect));
    else
        height = static_cast<int>(std::lround(height * picture.aspect / aspect));
    const Grid grid = gridOf(picture);
    width = width / grid.columns * grid.columns;
    height = height / grid.rows * grid.rows;
    const int x = (picture.width - width) / 2 / grid.columns * grid.columns;
    const int y = (picture.height - height) / 2 / grid.rows * grid.rows;
    return QvRect(x, y, x + width, y + height);
}

Size scaledSize(const std::string& text, const PictureFormat& picture) {
    Size size = parseSizeOrShape(text, "--size");
    const Grid grid = gridOf(picture);
    if (size.width < 0) size.width = onGrid(size.height * picture.aspect, grid.columns);
    if (size.height < 0) size.height = onGrid(size.width / picture.aspect, grid.rows);
    return size;
}

Fit parseFit(const std::string& text) {
    const size_t comma = std::min(text.find(','), text.size());
    const std::string how = text.substr(comma);
    if (!how.empty() && how != ",bars" && how != ",crop") throw failure(Msg::fitWrong, {"--fit", text});
    const Size box = parseSize(text.substr(0, comma), "--fit", kMostSide, Msg::fitWrong);
    return {box, how.empty() ? Fit::How::within : how == ",bars" ? Fit::How::bars : Fit::How::crop};
}

Size sizeWithin(const Size& box, const PictureFormat& picture) {
    const Grid grid = gridOf(picture);
    const auto below = [](double length, int most, int step) {
        const int whole = onGrid(length, step);
        return whole > most ? std::max(whole - step, step) : whole;
    };
    if (static_cast<double>(box.width) / box.height > picture.aspect)
        return {below(box.height * picture.aspect, box.width, grid.columns),
                below(box.height, box.height, grid.rows)};
    return {below(box.width, box.width, grid.columns),
            below(box.width / picture.aspect, box.height, grid.rows)};
}

Bars barsAround(const QvRect& part, const PictureFormat& picture, const Fit& fit, const std::string& text) {
    const Grid grid = gridOf(picture);
    const double wider = fit.aspect() / picture.aspect;
    const auto half = [](double more, int step) {
        return static_cast<int>(std::min(std::round(more / 2 / step), kMostBar + 1.0)) * step;
    };
    Bars bars;
    if (wider > 1)
        bars.columns = half(part.width() * (wider - 1), grid.columns);
    else
        bars.rows = half(part.height() * (1 / wider - 1), grid.rows);
    if (std::max(bars.columns, bars.rows) > kMostBar) throw failure(Msg::fitFar, {text});
    return bars;
}
