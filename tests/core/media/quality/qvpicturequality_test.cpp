#include "core/media/quality/qvpicturequality.h"

#include <cmath>

#include "core/engine/status.h"
#include "core/media/qvframe.h"
#include "tests/support/checks.h"

namespace {

// A pattern with noise of up to `amplitude`, the same on every machine. A linear congruence gives the noise.
class Pattern {
  public:
    Pattern(unsigned seed, int amplitude) : state_(seed), amplitude_(amplitude) {}
    int at(int plane, int x, int y) {
        state_ = (state_ * 1103515245u + 12345u) & 0x7fffffffu;
        const int noise = static_cast<int>(state_ >> 16) % (2 * amplitude_ + 1) - amplitude_;
        return std::clamp((x * 7 + y * 3 + plane * 40) % 200 + 25 + noise, 0, 255);
    }

  private:
    unsigned state_;
    int amplitude_;
};

QvFrame planar(unsigned fourcc, int width, int height, unsigned seed, int amplitude) {
    QvFrame frame;
    frame.init(fourcc, width, height);
    Pattern pattern(seed, amplitude);
    const bool words = fourcc == QvFourcc::W016;
    for (int p = 0; p < 3; ++p) {
        const int rows = p && fourcc != QvFourcc::I422 ? height / 2 : height;
        for (int y = 0; y < rows; ++y)
            for (int x = 0; x < frame.width(p); ++x) {
                const int value = pattern.at(p, x, y);
                unsigned char* row = frame.plane(p) + y * frame.stride(p);
                if (words) {
                    const auto word = static_cast<unsigned short>(value * 257);
                    std::memcpy(row + 2 * x, &word, 2);
                } else {
                    row[x] = static_cast<unsigned char>(value);
                }
            }
    }
    return frame;
}

QvFrame packed(const QvFrame& from, unsigned fourcc) {
    QvFrame frame;
    frame.init(fourcc, from.width(), from.height());
    const bool chromaFirst = fourcc == QvFourcc::UYVY;
    for (int y = 0; y < from.height(); ++y)
        for (int x = 0; x < from.width(); ++x) {
            unsigned char* to = frame.plane() + y * frame.stride() + 2 * x;
            to[chromaFirst ? 1 : 0] = from.plane(0)[y * from.stride(0) + x];
            const int p = x % 2 == 0 ? 1 : 2;
            to[chromaFirst ? 0 : 1] = from.plane(p)[y * from.stride(p) + x / 2];
        }
    return frame;
}

// What FFmpeg's filters `psnr` and `ssim` say of the same pictures.
TEST(PictureQuality, IsWhatThePeerMeasures) {
    const struct {
        unsigned fourcc;
        int width, height, amplitudes[2];
        unsigned seeds[2];
        double mse[3], psnr[4], ssim[4];
    } rows[] = {
        {QvFourcc::I420,
         70,
         46,
         {0, 9},
         {1, 2},
         {30.91, 28.75, 30.88},
         {33.23, 33.54, 33.23, 33.28},
         {0.967857, 0.969638, 0.969415, 0.968414}},
        {QvFourcc::I422,
         64,
         34,
         {2, 30},
         {1, 5},
         {318.59, 296.72, 316.06},
         {23.10, 23.41, 23.13, 23.18},
         {0.767831, 0.785911, 0.770794, 0.773092}},
        {QvFourcc::W016,
         64,
         32,
         {3, 12},
         {1, 7},
         {3810943.45, 3759116.91, 3750086.78},
         {30.52, 30.58, 30.59, 30.54},
         {0.944331, 0.944440, 0.949453, 0.945203}},
    };
    QvQualityMeter meter;
    for (const auto& row : rows) {
        SCOPED_TRACE(qvFourccText(row.fourcc).data());
        const QvFrame a = planar(row.fourcc, row.width, row.height, row.seeds[0], row.amplitudes[0]);
        const QvFrame b = planar(row.fourcc, row.width, row.height, row.seeds[1], row.amplitudes[1]);
        QvPictureQuality quality;
        ASSERT_EQ(meter.measure(a, b, quality), 0);
        ASSERT_EQ(quality.planes, 3);
        for (size_t p = 0; p < 3; ++p) {
            EXPECT_EQ(quality.plane[p].name, "YUV"[p]);
            EXPECT_NEAR(quality.plane[p].mse, row.mse[p], 0.0051);
            EXPECT_NEAR(quality.plane[p].psnr(), row.psnr[p], 0.0051);
            EXPECT_NEAR(quality.plane[p].ssim, row.ssim[p], 2e-6);
        }
        EXPECT_NEAR(quality.psnr(), row.psnr[3], 0.0051);
        EXPECT_NEAR(quality.ssim(), row.ssim[3], 2e-6);
    }
}

// The place of a sample in memory is no matter.
TEST(PictureQuality, PackedPicturesAreMeasuredAsPlanarOnes) {
    const QvFrame a = planar(QvFourcc::I422, 38, 20, 3, 4), b = planar(QvFourcc::I422, 38, 20, 4, 20);
    QvQualityMeter meter;
    QvPictureQuality flat, quality;
    ASSERT_EQ(meter.measure(a, b, flat), 0);
    for (const unsigned fourcc : {QvFourcc::YUY2, QvFourcc::YUYV, QvFourcc::UYVY}) {
        ASSERT_EQ(meter.measure(packed(a, fourcc), packed(b, fourcc), quality), 0);
        for (size_t p = 0; p < 3; ++p) {
            EXPECT_DOUBLE_EQ(quality.plane[p].mse, flat.plane[p].mse);
            EXPECT_DOUBLE_EQ(quality.plane[p].ssim, flat.plane[p].ssim);
        }
    }
    const struct {
        unsigned fourcc;
        int bytes, r, g, b;
    } rgb[] = {{QvFourcc::BGR3, 3, 2, 1, 0},
               {QvFourcc::BGR4, 4, 2, 1, 0},
               {QvFourcc::BGRA, 4, 2, 1, 0},
               {QvFourcc::ARGB, 4, 1, 2, 3}};
    for (const auto& format : rgb) {
        QvFrame x, y;
        x.init(format.fourcc, 16, 12);
        std::memset(x.plane(), 100, static_cast<size_t>(x.total_bytes()));
        y = x;
        y.pixelPtr(3, 3)[format.r] = 110;  // 100 / 192
        y.pixelPtr(3, 3)[format.b] = 120;  // 400 / 192
        if (format.bytes == 4) y.pixelPtr(3, 3)[6 - format.r - format.g - format.b] = 0;
        ASSERT_EQ(meter.measure(x, y, quality), 0);
        EXPECT_DOUBLE_EQ(quality.plane[0].mse, 100.0 / 192);
        EXPECT_DOUBLE_EQ(quality.plane[1].mse, 0.0);
        EXPECT_DOUBLE_EQ(quality.plane[2].mse, 400.0 / 192);
        EXPECT_EQ(quality.plane[2].name, 'B');
    }
}

TEST(PictureQuality, EqualSmallAndUnlikePictures) {
    QvQualityMeter meter;
    QvPictureQuality quality;
    for (const auto& [width, height] : {Pair(64, 32), Pair(7, 5), Pair(8, 3), Pair(2, 2), Pair(1, 1)}) {
        const QvFrame a = planar(QvFourcc::I420, width, height, 1, 5);
        ASSERT_EQ(meter.measure(a, a, quality), 0) << width;
        EXPECT_TRUE(std::isinf(quality.psnr()));
        EXPECT_DOUBLE_EQ(quality.ssim(), 1.0) << width;
        QvFrame b = a;
        b.plane()[0] ^= 64;
        ASSERT_EQ(meter.measure(a, b, quality), 0);
        EXPECT_LT(quality.plane[0].ssim, 1.0);
        EXPECT_TRUE(std::isfinite(quality.plane[0].psnr()));
    }
    const QvFrame a = planar(QvFourcc::I420, 16, 16, 1, 5), empty;
    EXPECT_EQ(meter.measure(a, planar(QvFourcc::I420, 16, 14, 1, 5), quality), QvStatus::invalidArgument);
    EXPECT_EQ(meter.measure(a, planar(QvFourcc::I422, 16, 16, 1, 5), quality), QvStatus::invalidArgument);
    EXPECT_EQ(meter.measure(a, empty, quality), QvStatus::invalidArgument);
    QvFrame v210;
    v210.init(QvFourcc::v210, 48, 4);
    EXPECT_EQ(meter.measure(v210, v210, quality), QvStatus::notSupported);
    EXPECT_EQ(quality.planes, 0);
}

TEST(PictureQuality, TheMeanOfPsnrIsThatOfTheErrors) {
    QvQualityMean mean;
    EXPECT_EQ(mean.mean().planes, 0);
    QvPictureQuality quality;
    quality.planes = 1;
    quality.plane[0] = {.name = 'Y', .peak = 255, .samples = 10, .mse = 0.0, .ssim = 1.0};
    mean.add(quality);
    quality.plane[0].mse = 65025.0 * 2;
    quality.plane[0].ssim = 0.5;
    mean.add(quality);
    EXPECT_DOUBLE_EQ(mean.mean().psnr(), 0.0);
    EXPECT_DOUBLE_EQ(mean.mean().ssim(), 0.75);
    EXPECT_EQ(mean.count(), 2);
}

}  // namespace
