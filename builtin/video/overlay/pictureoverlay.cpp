#include "builtin/video/overlay/pictureoverlay.h"

#include <algorithm>
#include <cmath>

#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"

namespace {

constexpr uint32_t whole = 65536;
constexpr int videoFilterInterface = 12;
constexpr int hdLines = 720;    // from here on a frame of unknown matrix counts as BT.709
constexpr int chromaReach = 2;  // so many pixels next to the picture share chroma with it
constexpr int leastCanvas = 4;  // what the scaler takes
constexpr int pixelGroup = 6;   // of v210

int roundedDown(int value, int step) { return value / step * step; }
int roundedUp(int value, int step) { return (value + step - 1) / step * step; }

QvVideoFilter* filterOf(QvCodec* codec) {
    return codec ? static_cast<QvVideoFilter*>(codec->getInterface(videoFilterInterface)) : nullptr;
}

QvChroma chromaOf(unsigned fourcc) { return qvPixelFormat(fourcc)->chroma; }

// Whether pixels of a row share chroma.
bool sharesAcross(const SampleLayout& layout) {
    return chromaOf(layout.fourcc) != QvChroma::none || layout.chosen(SampleRole::chroma) != 0;
}

}  // namespace

QvPoint qvOverlayCorner(int x, int y, int pictureWidth, int pictureHeight, const QvFrame& frame) {
    return {x < 0 ? frame.width() - pictureWidth + x : x, y < 0 ? frame.height() - pictureHeight + y : y};
}

PictureOverlay::Shape PictureOverlay::shapeOf(const QvFrame& frame) {
    const int known = frame.YUVMatrix();
    const int matrix = known ? known : frame.height() < hdLines ? qvMatrixBT601 : qvMatrixBT709;
    return {frame.four_cc(), frame.width(), frame.height(), matrix};
}

bool PictureOverlay::suits(const QvFrame& frame) const { return shape_ == shapeOf(frame); }

void PictureOverlay::clear() {
    shape_ = {};
    scaler_.reset();
    composed_.destroy();
    opacities_ = {};
    for (auto& weights : weights_) weights = {};
}

int PictureOverlay::fail(int status, const char* text) {
    shape_ = {};
    error_ = text;
    return status;
}

// On the grid of the format; it may reach beyond the frame.
void PictureOverlay::placeCanvas() {
    const SampleLayout& layout = sampleLayout(shape_.fourcc);
    const int reach = sharesAcross(layout) ? chromaReach : 0;
    const int across = layout.store == SampleLayout::v210 ? pixelGroup : 2;
    const int left = roundedDown(std::max(seen_.left() - reach, 0), across),
              top = roundedDown(seen_.top(), 2);
    const int right = roundedUp(std::min(seen_.right() + reach, shape_.width), across);
    const int bottom = roundedUp(seen_.bottom(), 2);
    canvas_ = QvRect(left, top, std::max(right, left + leastCanvas), std::max(bottom, top + leastCanvas));
    if (layout.store == SampleLayout::v210) canvas_.setRight(left + roundedUp(canvas_.width(), pixelGroup));
}

int PictureOverlay::prepare(const QvFrame& picture, Alpha alpha, const QvPoint& corner, double opacity,
                            const QvFrame& frame) {
    shape_ = shapeOf(frame);
    seen_ = QvRect(std::max(corner.x(), 0), std::max(corner.y(), 0),
                   std::min(corner.x() + picture.width(), frame.width()),
                   std::min(corner.y() + picture.height(), frame.height()));
    if (seen_.right() <= seen_.left() || seen_.bottom() <= seen_.top()) {
        seen_ = {};
        return QvStatus::ok;
    }
    placeCanvas();
    if (const int result = compose(picture, alpha, corner, opacity)) return result;
    if (const int result = convert()) return result;
    for (int p = 0; p < std::min(frame.planes(), 3); ++p) weigh(p);
    return QvStatus::ok;
}

int PictureOverlay::compose(const QvFrame& picture, Alpha alpha, const QvPoint& corner, double opacity) {
    const int width = canvas_.width(), height = canvas_.height();
    if (!composed_.inited() || composed_.width() != width || composed_.height() != height)
        if (const int result = composed_.init(QvFourcc::BGR4, width, height))
            return fail(result, "no memory for the picture laid over");
    composed_.setBlack();
    opacities_.assign(static_cast<size_t>(width) * static_cast<size_t>(height), 0);
    const auto share = static_cast<uint32_t>(std::lround(std::clamp(opacity, 0.0, 1.0) * whole));
    uint32_t shares[256];
    for (uint32_t a = 0; a < 256; ++a) shares[a] = (a * share + 127) / 255;
    for (int y = seen_.top(); y < seen_.bottom(); ++y) {
        const unsigned char* from = picture.pixelPtr(seen_.left() - corner.x(), y - corner.y());
        const int left = seen_.left() - canvas_.left(), row = y - canvas_.top();
        unsigned char* to = composed_.pixelPtr(left, row);
        uint32_t* weight = opacities_.data() + static_cast<size_t>(row) * static_cast<size_t>(width) + left;
        for (int n = seen_.width(); n > 0; --n, from += 4, to += 4) {
            const uint32_t w = shares[from[3]], colour = alpha == Alpha::straight ? w : share;
            for (int k = 0; k < 3; ++k)
                to[k] = static_cast<unsigned char>((from[k] * colour + whole / 2) / whole);
            *weight++ = w;
        }
    }
    return QvStatus::ok;
}

int PictureOverlay::openScaler() {
    const Shape wanted{shape_.fourcc, canvas_.width(), canvas_.height(), shape_.matrix};
    if (scaler_ && wanted == scalerShape_) return QvStatus::ok;
    scalerShape_ = {};
    if (scaler_)
        scaler_->close();
    else
        scaler_.reset(qv_registry()->newCodec("scaler"));
    if (!filterOf(scaler_.get())) return fail(QvStatus::failed, "there is no scaler");
    scaler_->setParam("FOURCC", static_cast<int>(shape_.fourcc));
    scaler_->setParam("outWidth", wanted.width);
    scaler_->setParam("outHeight", wanted.height);
    scaler_->setParam("outITU", shape_.matrix);
    scaler_->setParam("disableLog", 1);
    if (scaler_->open() != QvStatus::ok) return fail(QvStatus::failed, scaler_->errorDesc());
    scalerShape_ = wanted;
    return QvStatus::ok;
}

int PictureOverlay::convert() {
    converted_ = &composed_;
    if (qvEqualFourcc(shape_.fourcc, QvFourcc::BGR4)) return QvStatus::ok;
    if (const int result = openScaler()) return result;
    QvVideoFilter& scaler = *filterOf(scaler_.get());
    if (scaler.write(composed_) != QvStatus::ok || scaler.ready() == 0)
        return fail(QvStatus::failed, "the picture laid over can't be converted");
    converted_ = scaler.frame();
    return QvStatus::ok;
}

// Chroma lies on every second pixel of a row, from a quarter of each neighbour, and between two rows of
// 4:2:0.
uint32_t PictureOverlay::opacityAt(int plane, int x, int y) const {
    const int width = canvas_.width(), height = canvas_.height();
    const auto at = [&](int px, int py) {
        return opacities_[static_cast<size_t>(py) * static_cast<size_t>(width) + static_cast<size_t>(px)];
    };
    if (plane == 0) return at(x, y);
    const bool quarter = chromaOf(shape_.fourcc) == QvChroma::quarter;
    const int first = quarter ? 2 * y : y, second = quarter ? std::min(2 * y + 1, height - 1) : y;
    const auto across = [&](int py) {
        return at(std::max(2 * x - 1, 0), py) + 2 * at(2 * x, py) + at(std::min(2 * x + 1, width - 1), py);
    };
    return (across(first) + across(second) + 4) / 8;
}

void PictureOverlay::weigh(int plane) {
    const SampleLayout& layout = sampleLayout(shape_.fourcc);
    const bool half = plane > 0, quarter = half && chromaOf(shape_.fourcc) == QvChroma::quarter;
    const int width = canvas_.width() / (half ? 2 : 1), rows = canvas_.height() / (quarter ? 2 : 1);
    const size_t samples = layout.samples(plane, width);
    const bool packed = layout.store == SampleLayout::v210 || layout.perPixel == 2;
    SampleWeights& weights = weights_[plane];
    weights.resize(layout, samples * static_cast<size_t>(rows));
    apart_.resize(samples);
    for (int y = 0; y < rows; ++y) {
        layout.read(converted_->plane(plane) + static_cast<std::ptrdiff_t>(converted_->stride(plane)) * y,
                    apart_.data(), samples);
        for (size_t i = 0; i < samples; ++i) {
            const SampleRole role = layout.role(plane, i);
            const int x = static_cast<int>(i / (half ? 1u : layout.perPixel));
            // Both chroma samples of a pair of packed pixels lie on its first.
            const uint32_t weight = role == SampleRole::keep               ? 0
                                    : packed && role == SampleRole::chroma ? opacityAt(1, x / 2, y)
                                                                           : opacityAt(half ? 1 : 0, x, y);
            const uint32_t black = layout.black(role);
            weights.cover(samples * static_cast<size_t>(y) + i, role == SampleRole::keep ? black : apart_[i],
                          black, weight);
        }
    }
}

void PictureOverlay::draw(QvFrame& frame) {
    if (seen_.width() == 0) return;
    const SampleLayout& layout = sampleLayout(shape_.fourcc);
    for (int p = 0; p < std::min(frame.planes(), 3); ++p) {
        const bool half = p > 0, quarter = half && chromaOf(shape_.fourcc) == QvChroma::quarter;
        const int left = canvas_.left() / (half ? 2 : 1), top = canvas_.top() / (quarter ? 2 : 1);
        const int width = canvas_.width() / (half ? 2 : 1), rows = canvas_.height() / (quarter ? 2 : 1);
        // v210 has whole groups of pixels to the end of its rows.
        const int inside =
            layout.store == SampleLayout::v210 ? width : std::min(width, frame.width(p) - left);
        if (inside <= 0) continue;
        const size_t stride = layout.samples(p, width);
        for (int y = 0; y < std::min(rows, sampleRows(frame, p) - top); ++y) {
            unsigned char* row = frame.plane(p) + static_cast<std::ptrdiff_t>(frame.stride(p)) * (top + y) +
                                 layout.byteOffset(p, left);
            weights_[p].apply(row, row, stride * static_cast<size_t>(y), layout.samples(p, inside));
        }
    }
}
