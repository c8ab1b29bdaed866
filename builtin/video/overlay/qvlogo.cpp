#include "builtin/video/overlay/qvlogo.h"

#include <algorithm>
#include <memory>

#include "builtin/creators.h"
#include "core/arch/platform.h"
#include "core/image/wholepicture_p.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = LogoSettings;

constexpr int mostOffset = 1 << 20;

constexpr QvParamRow<Settings> rows[] = {
    {.name = "filename",
     .member = &Settings::filename,
     .flags = qvParamStored,
     .description = "Logo picture (PNG)"},
    {"xpos", &Settings::x, qvParamStored, -mostOffset, mostOffset, "x offset (negative for right alignment)",
     "pixels"},
    {"ypos", &Settings::y, qvParamStored, -mostOffset, mostOffset, "y offset (negative for bottom alignment)",
     "pixels"},
    {"alpha", &Settings::alpha, qvParamStored, 0, 1, "Logo opacity"},
};
static_assert(qvParamTableOk<Settings>(rows));

struct Size {
    int width, height;
};

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};
using File = std::unique_ptr<std::FILE, CloseFile>;

File fileOf(const char* name) { return File(qv_platform().openFile(name, "rb")); }

// The size in the head of a PNG: what is read of one is rounded up to even.
Size sizeInFile(const char* name, const QvFrame& picture) {
    constexpr size_t headBytes = 24, sizesAt = 16;
    unsigned char head[headBytes] = {};
    const File file = fileOf(name);
    if (!file || std::fread(head, 1, headBytes, file.get()) != headBytes)
        return {picture.width(), picture.height()};
    const auto at = [&](size_t i) {
        return head[i] << 24 | head[i + 1] << 16 | head[i + 2] << 8 | head[i + 3];
    };
    return {std::clamp(at(sizesAt), 1, picture.width()), std::clamp(at(sizesAt + 4), 1, picture.height())};
}

// The smallest rectangle with all that is not transparent; empty if there is nothing.
QvRect visiblePart(const QvFrame& alpha, const Size& size) {
    if (!alpha.inited()) return {0, 0, size.width, size.height};
    QvRect part(size.width, size.height, 0, 0);
    for (int y = 0; y < size.height; ++y) {
        const unsigned char* row = alpha.pixelPtr(0, y);
        const unsigned char* end = row + size.width;
        const auto seen = [](unsigned char a) { return a != 0; };
        const unsigned char* first = std::find_if(row, end, seen);
        if (first == end) continue;
        const unsigned char* last = end;
        while (last[-1] == 0) --last;
        part = QvRect(std::min(part.left(), static_cast<int>(first - row)), std::min(part.top(), y),
                      std::max(part.right(), static_cast<int>(last - row)), y + 1);
    }
    return part.right() > 0 ? part : QvRect();
}

int joinAlpha(QvFrame& to, const QvFrame& colour, const QvFrame& alpha, const QvRect& part) {
    if (const int result = to.init(QvFourcc::BGRA, part.width(), part.height())) return result;
    for (int y = 0; y < part.height(); ++y) {
        const unsigned char* from = colour.pixelPtr(part.left(), part.top() + y);
        const unsigned char* a = alpha.inited() ? alpha.pixelPtr(part.left(), part.top() + y) : nullptr;
        unsigned char* pixel = to.pixelPtr(0, y);
        for (int x = 0; x < part.width(); ++x, from += 4, pixel += 4) {
            std::copy_n(from, 3, pixel);
            pixel[3] = a ? a[x] : 255;
        }
    }
    return QvStatus::ok;
}

}  // namespace

QvCodec* newLogo() { return new QvLogo; }

QvLogo::QvLogo() : InPlaceEffectOf("logo", rows) {}

int QvLogo::open() {
    const char* name = settings_.filename.c_str();
    prepared_ = false;
    if (settings_.filename.empty()) return setError(QvStatus::failed, "'filename' names no logo picture");
    if (!fileOf(name)) return setError(QvStatus::failed, "The logo picture %s can't be opened", name);
    QvFrame colour, alpha;
    const int loaded = qvLoadWhole(colour, Any(name), &alpha);
    if (loaded == QvStatus::cannotParse)
        return setError(QvStatus::failed, "The logo picture %s is damaged", name);
    if (loaded != QvStatus::ok)
        return setError(QvStatus::failed, "The logo picture %s can't be read as a PNG", name);
    const Size size = sizeInFile(name, colour);
    const QvRect part = visiblePart(alpha, size);
    picture_.destroy();
    if (part.width() > 0 && joinAlpha(picture_, colour, alpha, part) != QvStatus::ok)
        return setError(QvStatus::outOfMemory, "no memory for the logo picture %s", name);
    inside_ = part.topLeft();
    width_ = size.width;
    height_ = size.height;
    return InPlaceEffectOf::open();
}

int QvLogo::close() {
    picture_.destroy();
    overlay_.clear();
    return InPlaceEffectOf::close();
}

int QvLogo::change(const QvFrame& from, QvFrame& to) {
    copySamples(to, from);
    if (!picture_.inited()) return QvStatus::ok;
    if (!prepared_ || !overlay_.suits(to)) {
        QvPoint corner = qvOverlayCorner(settings_.x, settings_.y, width_, height_, to);
        corner = {corner.x() + inside_.x(), corner.y() + inside_.y()};
        prepared_ = false;
        if (const int result =
                overlay_.prepare(picture_, PictureOverlay::Alpha::straight, corner, settings_.alpha, to))
            return setError(result, "%s", overlay_.error());
        prepared_ = true;
    }
    overlay_.draw(to);
    return QvStatus::ok;
}
