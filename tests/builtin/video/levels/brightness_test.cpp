#include "builtin/video/levels/brightness.h"

#include <cmath>

#include "tests/builtin/video/effect_frames.h"

namespace {

using Opened = OpenedEffect<Brightness>;

// What becomes of one sample, by its own formula.
int expected(int sample, int black, int white, double brightness, double contrast, double gamma) {
    double level = static_cast<double>(sample - black) / (white - black);
    level = std::min(std::max((level - 0.5) * contrast + 0.5 + brightness, 0.0), 1.0);
    return static_cast<int>(std::lround(black + std::pow(level, 1 / gamma) * (white - black)));
}

// Which samples of a group of four change, and where black and white are.
struct Format {
    unsigned fourcc, changed;
    bool words;
    int black, white;
};

constexpr Format formats[] = {
    {QvFourcc::GRAY, 15, false, 16, 235},    {QvFourcc::I420, 15, false, 16, 235},
    {QvFourcc::YV12, 15, false, 16, 235},    {QvFourcc::YUYV, 5, false, 16, 235},
    {QvFourcc::YUY2, 5, false, 16, 235},     {QvFourcc::UYVY, 10, false, 16, 235},
    {QvFourcc::W016, 15, true, 4096, 60160}, {QvFourcc::Y216, 5, true, 4096, 60160},
    {QvFourcc::BGR3, 15, false, 0, 255},     {QvFourcc::BGR4, 7, false, 0, 255},
    {QvFourcc::BGRA, 7, false, 0, 255},      {QvFourcc::ARGB, 14, false, 0, 255},
    {QvFourcc::b64a, 7, true, 0, 65535},
};

int sampleOf(const Format& format, const unsigned char* row, int i) {
    return format.words ? row[2 * i] | row[2 * i + 1] << 8 : row[i];
}

}  // namespace

TEST(Brightness, SamplesFollowTheFormula) {
    struct {
        double brightness, contrast, gamma;
    } const rows[] = {{-0.3, 1, 1}, {0, 1.7, 1}, {0, 0, 1}, {0, 1, 0.5}, {0.05, 1.2, 1.3}};
    for (const auto& format : formats)
        for (const auto& row : rows) {
            QvFrame in = makePicture(format.fourcc, 37, 6);
            Opened filter({{"brightness", row.brightness}, {"contrast", row.contrast}, {"gamma", row.gamma}});
            const QvFrame& out = filter.through(in);
            const int samples = 37 * in.pixelBytes() / (format.words ? 2 : 1);
            for (int y = 0; y < 6; ++y)
                for (int i = 0; i < samples; ++i) {
                    const int was = sampleOf(format, rowOf(in, 0, y), i);
                    const int wanted = format.changed >> i % 4 & 1
                                           ? expected(was, format.black, format.white, row.brightness,
                                                      row.contrast, row.gamma)
                                           : was;
                    ASSERT_EQ(sampleOf(format, rowOf(out, 0, y), i), wanted)
                        << fourccName(format.fourcc) << " " << i;
                }
            for (int p = 1; p < in.planes(); ++p)
                EXPECT_EQ(std::memcmp(out.plane(p), in.plane(p), static_cast<size_t>(in.plane_bytes(p))), 0);
            sameInPlace(Opened({{"gamma", row.gamma + 1}}), Opened({{"gamma", row.gamma + 1}}), in);
        }
}

TEST(Brightness, NeutralTouchesNothingAndChangesTakeEffectAtOnce) {
    QvFrame in = makePicture(QvFourcc::I420, 16, 16), deep = makePicture(QvFourcc::W016, 16, 16);
    Opened filter;
    EXPECT_EQ(samplesOf(filter.through(in)), samplesOf(in)) << "not even what lies beyond white";
    EXPECT_EQ(filter.setParam("brightness", 1.0), 0);
    EXPECT_EQ(filter.through(in).plane()[0], 235);
    EXPECT_EQ(filter.through(deep).plane()[1], 235);
    EXPECT_EQ(filter.setParam("brightness", -1), 0);
    EXPECT_EQ(filter.through(deep).plane()[1], 16);
    EXPECT_EQ(filter.through(in).plane()[0], 16);
}
