// Clipping and blending, held against references over plain bytes.
#include <algorithm>
#include <climits>
#include <cmath>
#include <optional>

#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

int pixelBytesOf(unsigned fourcc) { return qvPixelFormat(fourcc)->pixelBytes; }

struct Weights {
    FrameModel* mask = nullptr;
    FrameModel* chroma = nullptr;
    std::optional<double> alpha;
};

int mixed(int target, int source, const Weights& weights, int maskValue) {
    if (weights.alpha) {
        const int a = static_cast<int>(*weights.alpha * 255 + 0.5);
        return (target * (256 - a) + source * a) >> 8;
    }
    if (!weights.mask) return source;
    const int w = (maskValue + 1) >> 1;
    return (target * (128 - w) + source * w) >> 7;
}

FrameModel blended(FrameModel dst, FrameModel src, int x, int y, const Weights& weights) {
    const auto even = [](int value) { return value / 2 * 2; };
    int sx = std::max(-x, 0), sy = std::max(-y, 0), dx = std::max(x, 0), dy = std::max(y, 0);
    if (dx >= dst.width || sx >= src.width || sy >= src.height || dy >= dst.width || dy >= dst.height)
        return dst;
    const int width = even(std::min(src.width - sx, dst.width - dx));
    const int height = even(std::min(src.height - sy, dst.height - dy));
    sx = even(sx), sy = even(sy), dx = even(dx), dy = even(dy);
    const int bytes = pixelBytesOf(dst.fourcc);
    const int unit = QvFrame::bitDepth(dst.fourcc) == 16 ? 2 : 1;
    for (int p = 0; p < static_cast<int>(dst.planes.size()); ++p) {
        const int half = p ? 2 : 1;
        for (int row = 0; row < height / half; ++row)
            for (int column = 0; column < width / half; ++column) {
                const bool own = p && weights.chroma;
                FrameModel* const mask = own ? weights.chroma : weights.mask;
                const int maskValue = !mask ? 0
                                      : own ? mask->at(0, sy / 2 + row, sx / 2 + column)
                                            : mask->at(0, sy + half * row, sx + half * column);
                for (int i = 0; i < bytes; i += unit) {
                    const int to = (dx / half + column) * bytes + i, from = (sx / half + column) * bytes + i;
                    const int toRow = dy / half + row, fromRow = sy / half + row;
                    int value = mixed(dst.sample(p, toRow, to, unit), src.sample(p, fromRow, from, unit),
                                      weights, maskValue);
                    if (dst.fourcc == b64a && i == 6 && (weights.mask || weights.alpha)) value = 0;
                    dst.setSample(p, toRow, to, unit, value);
                }
            }
    }
    return dst;
}

constexpr struct {
    int x, y;
} positions[] = {{0, 0},   {3, 2},  {-3, -2}, {-5, 1}, {8, -3},           {2, 9}, {37, 0}, {-60, 0},
                 {0, -40}, {0, 36}, {36, 35}, {0, 38}, {INT_MAX, INT_MAX}};

TEST(QvFrameBlend, EveryFormatAndPosition) {
    unsigned seed = 1;
    for (unsigned fourcc : allFormats()) {
        if (fourcc == I422 || fourcc == v210) continue;
        for (const auto& [targetSize, sourceSize] :
             {std::pair<Size, Size>{{37, 39}, {61, 33}}, {{19, 41}, {5, 3}}, {{1, 1}, {70, 2}}})
            for (const auto& at : positions) {
                SCOPED_TRACE(std::string(qvFourccText(fourcc).data()) + " at " + std::to_string(at.x) + "," +
                             std::to_string(at.y) + " into " + std::to_string(targetSize.width));
                const auto& [width, height] = sourceSize;
                const QvFrame target = noiseFrame(fourcc, targetSize.width, targetSize.height, 5, ++seed);
                const QvFrame source = noiseFrame(fourcc, width, height, 3, ++seed);
                QvFrame mask = noiseFrame(GRAY, width, height, 1, ++seed);
                const QvFrame chroma = noiseFrame(GRAY, width / 2, height / 2, 1, ++seed);
                for (int i = 0; i < mask.total_bytes(); i += 3) mask.plane()[i] = i % 2 ? 0 : 255;
                auto maskModel = modelOf(mask), chromaModel = modelOf(chroma);
                const auto check = [&](const Weights& weights, auto blend) {
                    QvFrame drawn;
                    drawn.copyFramett(*target.getFrame_tt(), true);
                    for (int p = 0; p < target.planes(); ++p)
                        std::copy_n(target.plane(p), target.plane_bytes(p), drawn.plane(p));
                    const auto wanted = blended(modelOf(drawn), modelOf(source), at.x, at.y, weights);
                    EXPECT_EQ(blend(drawn), 0);
                    EXPECT_EQ(modelOf(drawn), wanted);
                };
                check({}, [&](QvFrame& f) { return f.blend(at.x, at.y, source); });
                check({&maskModel, nullptr, {}},
                      [&](QvFrame& f) { return f.blend(at.x, at.y, source, &mask); });
                check({&maskModel, &chromaModel, {}},
                      [&](QvFrame& f) { return f.blend(at.x, at.y, source, &mask, &chroma); });
                for (double alpha : {0.0, 0.3, 1.0})
                    check({nullptr, nullptr, alpha},
                          [&](QvFrame& f) { return f.blend(at.x, at.y, source, alpha); });
                ASSERT_FALSE(HasFailure());
            }
    }
}

TEST(QvFrameBlend, RefusesWhatDoesNotFit) {
    QvFrame target = noiseFrame(YUYV, 8, 8, 0, 1);
    const QvFrame source = noiseFrame(YUY2, 8, 4, 0, 2), mask = noiseFrame(GRAY, 8, 4, 0, 3);
    EXPECT_EQ(target.blend(0, 0, source, &mask), 0);  // these two labels mean one format
    LogCapture log;
    for (const QvFrame& bad : {noiseFrame(GRAY, 8, 3, 0, 3), noiseFrame(BGRA, 8, 4, 0, 3)})
        EXPECT_EQ(target.blend(0, 0, source, &bad), -1);
    EXPECT_EQ(log.count("invalid blend mask, wrong dimensions or FCC"), 2);
    const QvFrame other = noiseFrame(UYVY, 8, 4, 0, 2), small = noiseFrame(GRAY, 3, 4, 0, 3);
    EXPECT_TRUE(target.blend(0, 0, other) == -1 && target.blend(0, 0, other, 0.5) == -1);
    EXPECT_EQ(log.count("Can not blend - FOURCC must match"), 2);

    QvFrame planar = noiseFrame(I420, 8, 8, 0, 1), whole = noiseFrame(GRAY, 8, 8, 0, 3);
    EXPECT_EQ(planar.blend(0, 0, QvFrame(planar), &whole, &small), -1);
    for (unsigned fourcc : {I422, v210}) {
        makeNoise(planar, fourcc, 8, 8, 0, 1);
        EXPECT_THROW(planar.blend(0, 0, QvFrame(planar)), QvAssertFailure);
        EXPECT_THROW(planar.blend(0, 0, QvFrame(planar), 0.5), QvAssertFailure);
    }
}

TEST(QvFrameBlend, ItselfAndWildWeights) {
    QvFrame frame, apart;
    makeNoise(frame, GRAY, 9, 8, 0, 1);
    for (double alpha : {1e9, -1e9, std::nan("")}) frame.blend(1, 1, QvFrame(frame), alpha);
    apart = frame;
    const QvFrame original(frame);
    frame.blend(2, 2, frame, &frame);
    apart.blend(2, 2, original, &original);
    EXPECT_EQ(modelOf(frame), modelOf(apart));
}

struct Clip {
    int srcX, srcY, dstX, dstY, width, height;
};

TEST(QvFrameClip, CopiesEvenAreas) {
    const Clip clips[] = {
        {2, 2, 4, 3, 9, 7}, {3, 2, 1, 5, 5, 3}, {1, 1, 3, 3, 7, 5}, {2, 3, 4, 1, 0, 0}, {5, 4, 2, 2, 1, 1}};
    unsigned seed = 1;
    for (unsigned fourcc : allFormats()) {
        if (fourcc == v210) continue;
        const bool quarter = fourcc == I420 || fourcc == YV12 || fourcc == W016;
        const bool pairs =
            quarter || fourcc == I422 || fourcc == YUY2 || fourcc == YUYV || fourcc == UYVY || fourcc == Y216;
        for (const auto& c : clips) {
            SCOPED_TRACE(std::string(qvFourccText(fourcc).data()) + " " + std::to_string(c.srcX));
            const QvFrame source = noiseFrame(fourcc, 11, 9, 3, ++seed);
            QvFrame target = noiseFrame(fourcc, 13, 10, 1, ++seed);
            const auto x = [&](int value) { return pairs ? value / 2 * 2 : value; };
            const auto y = [&](int value) { return quarter ? value / 2 * 2 : value; };
            auto wanted = modelOf(target), from = modelOf(source);
            const int bytes = pixelBytesOf(fourcc);
            for (int p = 0; p < (fourcc == I422 ? 1 : target.planes()); ++p) {
                const int half = p ? 2 : 1;
                for (int row = 0; row < y(c.height) / half; ++row)
                    for (int i = 0; i < x(c.width) / half * bytes; ++i)
                        wanted.at(p, y(c.dstY) / half + row, x(c.dstX) / half * bytes + i) =
                            from.at(p, y(c.srcY) / half + row, x(c.srcX) / half * bytes + i);
            }
            target.clip(source, c.srcX, c.srcY, c.dstX, c.dstY, c.width, c.height);
            EXPECT_EQ(modelOf(target), wanted);
            const bool reversed = (y(c.srcY) + y(c.dstY)) % 2 != 0;
            EXPECT_EQ(target.framerate, QvFramerate(25.0, reversed ? 2 : 1));
        }
    }
}

TEST(QvFrameClip, RefusesWhatSticksOut) {
    const QvFrame source = noiseFrame(BGR3, 8, 6, 0, 1);
    QvFrame target = noiseFrame(BGR3, 6, 8, 0, 2), other = noiseFrame(BGR4, 8, 6, 0, 1);
    const auto before = modelOf(target);
    // One place, size or sum of them out of range each.
    const int good[] = {0, 0, 0, 0, 2, 2}, high[] = {7, 5, 5, 7, INT_MAX, INT_MAX};
    for (int i = 0; i < 6; ++i)
        for (int bad : {-1, high[i]}) {
            int c[6];
            std::copy_n(good, 6, c);
            c[i] = bad;
            EXPECT_THROW(target.clip(source, c[0], c[1], c[2], c[3], c[4], c[5]), QvAssertFailure) << i;
        }
    EXPECT_THROW(target.clip(source, INT_MAX, 0, 0, 0, INT_MAX, 1), QvAssertFailure);
    EXPECT_EQ(modelOf(target), before);
    EXPECT_THROW(target.clip(other, 0, 0, 0, 0, 1, 1), QvAssertFailure);
    makeNoise(other, v210, 8, 6, 0, 1);
    EXPECT_THROW(other.clip(QvFrame(other), 0, 0, 0, 0, 1, 1), QvAssertFailure);
}

}  // namespace
