// Clipping and blending of pictures with a letter in each pixel.
#include <cmath>

#include "core/media/qvframe.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;

std::vector<unsigned> blendable() {
    auto formats = allFormats();
    std::erase_if(formats, [](unsigned fourcc) { return fourcc == I422 || fourcc == v210; });
    return formats;
}

bool hasQuarterChroma(unsigned fourcc) { return fourcc == I420 || fourcc == YV12 || fourcc == W016; }

// Calls each with plane, row, the pixel's first byte and its place in the plane.
template <class Each>
void forPixels(QvFrame& frame, Each each) {
    const int bytes = qvPixelFormat(frame.four_cc())->pixelBytes;
    for (int p = 0; p < frame.planes(); ++p)
        for (int y = 0; y < frame.height(p); ++y)
            for (int x = 0, width = frame.width() / (p ? 2 : 1); x < width; ++x)
                each(p, y, frame.plane(p) + y * frame.stride(p) + x * bytes, y * width + x);
}

// Every byte of a pixel holds `first`, or the letter as many further on as its place says.
QvFrame lettered(unsigned fourcc, int width, int height, int padding, char first, bool counted) {
    QvFrame frame = noiseFrame(fourcc, width, height, padding, 1);
    const int bytes = qvPixelFormat(fourcc)->pixelBytes;
    forPixels(frame, [&](int, int, unsigned char* pixel, int place) {
        std::fill_n(pixel, bytes, static_cast<unsigned char>(counted ? first + place : first));
    });
    return frame;
}

// The pixels' letters, a question mark where the bytes differ; rows apart by a slash, planes by a space.
std::string textOf(QvFrame& frame) {
    std::string text;
    int plane = 0, row = 0;
    const int bytes = qvPixelFormat(frame.four_cc())->pixelBytes;
    forPixels(frame, [&](int p, int y, const unsigned char* pixel, int) {
        if (p != plane || y != row) text += p != plane ? ' ' : '/';
        plane = p, row = y;
        const bool alike =
            std::all_of(pixel, pixel + bytes, [&](unsigned char byte) { return byte == *pixel; });
        text += alike ? static_cast<char>(*pixel) : '?';
    });
    return text;
}

std::string wantedText(unsigned fourcc, const std::string& whole, const std::string& quarter) {
    return hasQuarterChroma(fourcc) ? whole + ' ' + quarter + ' ' + quarter : whole;
}

TEST(QvFrameBlend, PlacesAreEvenAndCutAtTheEdges) {
    const std::string dots = "......../......../......../......../......../........", few = "..../..../....";
    const struct {
        int x, y;
        std::string whole, quarter;
    } cases[] = {
        {0, 0, "abcd..../efgh..../ijkl..../mnop..../......../........", "ab../cd../...."},
        {3, 1, "..abcd../..efgh../..ijkl../..mnop../......../........", ".ab./.cd./...."},
        {-1, -2, "ij....../mn....../......../......../......../........", "c.../..../...."},
        {5, 3, "......../......../....ab../....ef../......../........", "..../..a./...."},
        {8, 0, dots, few},
        {0, 6, dots, few},
        {-4, 0, dots, few},
        {0, -4, dots, few},
        {INT_MAX, INT_MAX, dots, few},
    };
    for (unsigned fourcc : blendable()) {
        const QvFrame source = lettered(fourcc, 4, 4, 3, 'a', true);
        QvFrame opaque = noiseFrame(GRAY, 4, 4, 1, 1);
        std::fill_n(opaque.plane(0), opaque.total_bytes(), static_cast<unsigned char>(255));
        for (const auto& c : cases) {
            SCOPED_TRACE(std::string(qvFourccText(fourcc).data()) + " at " + std::to_string(c.x));
            QvFrame plain = lettered(fourcc, 8, 6, 5, '.', false);
            EXPECT_EQ(plain.blend(c.x, c.y, source), 0);
            EXPECT_EQ(textOf(plain), wantedText(fourcc, c.whole, c.quarter));
            if (fourcc == b64a) continue;  // its alpha becomes zero
            QvFrame masked = lettered(fourcc, 8, 6, 0, '.', false);
            EXPECT_EQ(masked.blend(c.x, c.y, source, &opaque), 0);
            EXPECT_EQ(textOf(masked), textOf(plain));
        }
    }
}

TEST(QvFrameBlend, TallTargetsTakeNothingBelowTheirWidth) {
    QvFrame target = lettered(GRAY, 2, 6, 0, '.', false);
    target.blend(0, 2, lettered(GRAY, 2, 2, 0, 'a', true));
    EXPECT_EQ(textOf(target), "../../../../../..");
}

TEST(QvFrameBlend, MasksSelectPixelsFromTheirOwnPlace) {
    for (unsigned fourcc : {BGRA, I420, W016}) {
        const QvFrame source = lettered(fourcc, 4, 4, 0, 'a', true);
        QvFrame mask = lettered(GRAY, 4, 4, 1, 0, false), chroma = lettered(GRAY, 2, 2, 1, 0, false);
        *mask.pixelPtr(2, 2) = *mask.pixelPtr(3, 2) = *chroma.pixelPtr(1, 0) = 255;
        QvFrame target = lettered(fourcc, 4, 4, 0, '.', false), own = target;
        target.blend(0, 0, source, &mask);
        EXPECT_EQ(textOf(target), wantedText(fourcc, "..../..../..kl/....", "../.d"));
        own.blend(0, 0, source, &mask, &chroma);
        EXPECT_EQ(textOf(own), wantedText(fourcc, "..../..../..kl/....", ".b/.."));
        QvFrame cut = lettered(fourcc, 4, 4, 0, '.', false);
        cut.blend(-2, -2, source, &mask);
        EXPECT_EQ(textOf(cut), wantedText(fourcc, "kl../..../..../....", "d./.."));
    }
}

TEST(QvFrameBlend, WeightsAreExact) {
    const std::pair<int, int> masks[] = {{0, 0}, {1, 1}, {127, 64}, {128, 64}, {254, 127}, {255, 128}};
    const std::pair<double, int> alphas[] = {{0.0, 0}, {0.25, 64}, {0.5, 128}, {1.0, 255}};
    for (unsigned fourcc : blendable()) {
        const int sample = QvFrame::bitDepth(fourcc) == 16 ? 257 : 1;  // of two equal bytes
        const QvFrame source = lettered(fourcc, 4, 2, 0, 100, false);
        const auto check = [&](QvFrame& target, int weight, int unity) {
            forPixels(target, [&](int, int, const unsigned char* pixel, int) {
                EXPECT_EQ(sample == 1 ? pixel[0] : pixel[0] + 256 * pixel[1],
                          sample * (200 * (unity - weight) + 100 * weight) / unity)
                    << target.str_four_cc();
                EXPECT_TRUE(fourcc != b64a || pixel[6] + pixel[7] == 0);
            });
        };
        for (const auto& [value, weight] : masks) {
            QvFrame target = lettered(fourcc, 4, 2, 0, static_cast<char>(200), false);
            const QvFrame mask = lettered(GRAY, 4, 2, 0, static_cast<char>(value), false);
            target.blend(0, 0, source, &mask);
            check(target, weight, 128);
        }
        for (const auto& [alpha, weight] : alphas) {
            QvFrame target = lettered(fourcc, 4, 2, 0, static_cast<char>(200), false);
            target.blend(0, 0, source, alpha);
            check(target, weight, 256);
        }
    }
}

TEST(QvFrameBlend, RefusesWhatDoesNotFit) {
    QvFrame target = noiseFrame(YUYV, 8, 8, 0, 1);
    const QvFrame source = noiseFrame(YUY2, 8, 4, 0, 2), mask = noiseFrame(GRAY, 8, 4, 0, 3);
    EXPECT_EQ(target.blend(0, 0, source, &mask), 0);  // these two labels mean one format
    for (const QvFrame& bad : {noiseFrame(GRAY, 8, 3, 0, 3), noiseFrame(BGRA, 8, 4, 0, 3)})
        EXPECT_EQ(target.blend(0, 0, source, &bad), -1);
    const QvFrame other = noiseFrame(UYVY, 8, 4, 0, 2), small = noiseFrame(GRAY, 3, 4, 0, 3);
    EXPECT_TRUE(target.blend(0, 0, other) == -1 && target.blend(0, 0, other, 0.5) == -1);
    QvFrame planar = noiseFrame(I420, 8, 8, 0, 1), whole = noiseFrame(GRAY, 8, 8, 0, 3);
    EXPECT_EQ(planar.blend(0, 0, QvFrame(planar), &whole, &small), -1);
}

TEST(QvFrameBlend, ItselfAndWildWeights) {
    QvFrame frame = noiseFrame(GRAY, 9, 8, 0, 1);
    for (double alpha : {1e9, -1e9, std::nan("")}) frame.blend(1, 1, QvFrame(frame), alpha);
    QvFrame apart = frame;
    const QvFrame original(frame);
    frame.blend(2, 2, frame, &frame);
    apart.blend(2, 2, original, &original);
    EXPECT_EQ(modelOf(frame), modelOf(apart));
}

TEST(QvFrameClip, RefusesWhatSticksOut) {
    const QvFrame source = noiseFrame(BGR3, 8, 6, 0, 1);
    QvFrame target = noiseFrame(BGR3, 6, 8, 0, 2);
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
}

TEST(QvFrameClip, CopiesAreasEvenWhereChromaIsShared) {
    for (unsigned fourcc : blendable()) {
        const QvFrame source = lettered(fourcc, 4, 4, 3, 'a', true);
        QvFrame target = lettered(fourcc, 8, 4, 1, '.', false);
        target.clip(source, 1, 1, 3, 2, 3, 2);
        const bool pairs = fourcc == YUY2 || fourcc == YUYV || fourcc == UYVY || fourcc == Y216;
        EXPECT_EQ(textOf(target), hasQuarterChroma(fourcc)
                                      ? "......../......../..ab..../..ef.... ..../.a.. ..../.a.."
                                  : pairs ? "......../......../..ef..../..ij...."
                                          : "......../......../...fgh../...jkl..")
            << target.str_four_cc();
        EXPECT_EQ(target.framerate.interlaced(), hasQuarterChroma(fourcc) ? 1 : 2);
    }
}

}  // namespace
