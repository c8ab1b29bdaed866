// Logos, still and moving, against the same picture mixed in RGB.
#include <png.h>

#include <cmath>

#include "builtin/video/overlay/animatedlogo.h"
#include "builtin/video/overlay/qvlogo.h"
#include "core/filter/qvcolorconvert.h"
#include "tests/builtin/video/effect_frames.h"

namespace {

using Logo = OpenedEffect<QvLogo>;
using Animated = OpenedEffect<AnimatedLogo>;

constexpr unsigned char background[] = {200, 90, 40};  // B, G, R

// A soft disc, blue to red, on transparent green.
QvFrame disc(int width, int height) {
    QvFrame frame;
    frame.init(QvFourcc::BGRA, width, height);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            unsigned char* pixel = frame.pixelPtr(x, y);
            const double distance = std::hypot(x - width / 2.0 + 0.5, y - height / 2.0 + 0.5);
            const double cover = std::clamp((width / 2.0 - distance) / 4, 0.0, 1.0);
            const int red = 255 * x / width;
            const unsigned char colour[] = {static_cast<unsigned char>(255 - red), 30,
                                            static_cast<unsigned char>(red),
                                            static_cast<unsigned char>(cover * 255)};
            const unsigned char nothing[] = {0, 255, 0, 0};
            std::copy_n(cover > 0 ? colour : nothing, 4, pixel);
        }
    return frame;
}

void writePng(const QvFrame& frame, const std::string& name, unsigned format = PNG_FORMAT_BGRA) {
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    image.format = format;
    image.width = static_cast<unsigned>(frame.width());
    image.height = static_cast<unsigned>(frame.height());
    ASSERT_TRUE(png_image_write_to_file(&image, name.c_str(), 0, frame.plane(), frame.stride(), nullptr));
}

// A frame of the background with the logo mixed in at a corner, as RGB.
QvFrame mixed(const QvFrame* logo, int left, int top, double opacity, int width, int height) {
    QvFrame frame;
    frame.init(QvFourcc::BGR4, width, height);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            unsigned char* pixel = frame.pixelPtr(x, y);
            const int lx = x - left, ly = y - top;
            const bool inside = logo && lx >= 0 && ly >= 0 && lx < logo->width() && ly < logo->height();
            const unsigned char* over = inside ? logo->pixelPtr(lx, ly) : nullptr;
            const double cover = over ? opacity * over[3] / 255 : 0;
            for (int k = 0; k < 3; ++k)
                pixel[k] = static_cast<unsigned char>(
                    std::lround(background[k] * (1 - cover) + (over ? over[k] : 0) * cover));
            pixel[3] = 99;
        }
    return frame;
}

QvFrame converted(QvFrame picture, unsigned fourcc) {
    QvFrame out;
    EXPECT_EQ(QvColorConverter(fourcc, false, false).convert(picture, out), 0);
    return out;
}

// The largest difference of samples, in steps of 8 bits, or of the format's own below that.
double difference(const QvFrame& a, const QvFrame& b) {
    const SampleLayout& layout = sampleLayout(a.four_cc());
    double most = 0;
    for (int p = 0; p < a.planes(); ++p) {
        const size_t samples = layout.rowSamples(a, p);
        std::vector<uint16_t> left(samples), right(samples);
        for (int y = 0; y < sampleRows(a, p); ++y) {
            layout.read(rowOf(a, p, y), left.data(), samples);
            layout.read(rowOf(b, p, y), right.data(), samples);
            for (size_t i = 0; i < layout.samples(p, a.width(p)); ++i)
                most = std::max(most, std::abs(left[i] - right[i]) / std::exp2(std::max(layout.bits - 8, 0)));
        }
    }
    return most;
}

class Logos : public testing::Test {
  protected:
    EngineScope engine_;
    TempFolder folder_;
    QvFrame disc_ = disc(21, 21);
    std::string png_ = folder_.file("disc.png");

    void SetUp() override { writePng(disc_, png_); }
};

}  // namespace

TEST_F(Logos, EveryFormatLooksAsMixedInRgb) {
    struct {
        int x, y, left, top;
        double opacity;
    } const places[] = {
        {11, 7, 11, 7, 0.6},   {-1, -2, 52 - 21 - 1, 40 - 21 - 2, 1},
        {45, 30, 45, 30, 0.3}, {-41, -31, -10, -12, 1},
        {60, 10, 60, 10, 1},
    };
    for (const auto& format : qvPixelFormats())
        for (const auto& place : places) {
            QvFrame in = converted(mixed(nullptr, 0, 0, 0, 52, 40), format.fourcc);
            const QvFrame wanted =
                converted(mixed(&disc_, place.left, place.top, place.opacity, 52, 40), format.fourcc);
            Logo logo(
                {{"filename", png_.c_str()}, {"xpos", place.x}, {"ypos", place.y}, {"alpha", place.opacity}});
            EXPECT_LE(difference(logo.through(in), wanted), 3.0)
                << fourccName(format.fourcc) << " " << place.x << " " << place.y;
            sameInPlace(Logo({{"filename", png_.c_str()}}), Logo({{"filename", png_.c_str()}}), in);
        }
}

TEST_F(Logos, FramesThatChangeAndPicturesThatDoNotFit) {
    Logo logo({{"filename", png_.c_str()}, {"xpos", -1}, {"ypos", -1}});
    struct {
        unsigned fourcc;
        int width, height, matrix;
    } const frames[] = {
        {QvFourcc::I420, 64, 48, 1}, {QvFourcc::I420, 64, 48, 2}, {QvFourcc::YUYV, 7, 5, 1},
        {QvFourcc::I420, 7, 5, 1},   {QvFourcc::I420, 24, 96, 1}, {QvFourcc::v210, 7, 5, 1},
    };
    for (const auto& frame : frames) {
        QvFrame in = makePicture(frame.fourcc, frame.width, frame.height);
        in.setYUVMatrix(static_cast<QvYUVMatrix>(frame.matrix));
        Logo fresh({{"filename", png_.c_str()}, {"xpos", -1}, {"ypos", -1}});
        const QvFrame& out = logo.through(in);
        EXPECT_TRUE(samplesOf(out) == samplesOf(fresh.through(in)));
        EXPECT_FALSE(samplesOf(out) == samplesOf(in)) << fourccName(frame.fourcc) << frame.width;
    }
    // Without alpha an odd size has no edge of its own, and an empty picture shows nothing.
    QvFrame opaque = makePicture(QvFourcc::BGR3, 5, 3), in = makePicture(QvFourcc::BGR3, 16, 8);
    writePng(opaque, png_, PNG_FORMAT_BGR);
    Logo odd({{"filename", png_.c_str()}});
    const QvFrame& out = odd.through(in);
    for (int y = 0; y < 8; ++y)
        for (int i = 0; i < 48; ++i)
            EXPECT_EQ(rowOf(out, 0, y)[i], rowOf(y < 3 && i < 15 ? opaque : in, 0, y)[i]) << y << " " << i;
    QvFrame nothing = disc(4, 4);
    std::memset(nothing.plane(), 0, 64);
    writePng(nothing, png_);
    Logo empty({{"filename", png_.c_str()}});
    EXPECT_EQ(samplesOf(empty.through(in)), samplesOf(in));
}

TEST_F(Logos, FilesThatAreNoLogo) {
    const std::string bytes = TempFolder::read(png_);
    for (const std::string& name :
         {std::string(), folder_.file("none.png"), folder_.write("a.png", "PNG?"),
          folder_.write("b.png", bytes.substr(0, 20)),
          folder_.write("half.png", bytes.substr(0, bytes.size() - 20)), folder_.path().string(),
          folder_.write("x.srt", "1\n00:00:00,000 --> 00:00:01,000\nHi\n")}) {
        QvLogo logo;
        logo.init();
        logo.setParam("filename", name.c_str());
        EXPECT_EQ(logo.open(), QvStatus::failed) << name;
        EXPECT_NE(std::string(logo.errorDesc()).find("logo picture"), std::string::npos) << logo.errorDesc();
        AnimatedLogo animated;
        animated.init();
        animated.setParam("filename", name.c_str());
        EXPECT_EQ(animated.open(), QvStatus::failed) << name;
        EXPECT_NE(std::string(animated.errorDesc()).find("movie"), std::string::npos) << animated.errorDesc();
    }
}

TEST_F(Logos, MoviesRunFrameByFrame) {
    std::string bytes;  // three frames, each with the disc one pixel further to the right
    for (int i = 0; i < 3; ++i) {
        QvFrame frame;
        frame.init(QvFourcc::BGRA, 24, 21);
        frame.setBlack();
        frame.clip(disc_, 0, 0, i, 0, 21, 21);
        bytes += pictureBytes(frame);
    }
    const std::string name = folder_.write("disc.bgra", bytes);
    const auto playing = [&](const Any& format, Params params) {
        for (const auto& [key, value] : Params{{"filename", name.c_str()}, {"decoder", "rawdec"}})
            params.emplace_back(key, value);
        params.emplace_back("decoderParams", format);
        return params;
    };
    const char* format = "FOURCC=BGRA;width=24;height=21";
    for (const int loop : {0, 1}) {
        Animated logo(playing(format, {{"xpos", 4}, {"ypos", 2}, {"alpha", 0.8}, {"loop", loop}}));
        for (int i = 0; i < 7; ++i) {
            const int step = loop ? i % 3 : std::min(i, 2);
            QvFrame in = converted(mixed(nullptr, 0, 0, 0, 52, 40), QvFourcc::I420);
            const QvFrame wanted = converted(mixed(&disc_, 4 + step, 2, 0.8, 52, 40), QvFourcc::I420);
            EXPECT_LE(difference(logo.through(in), wanted), 3.0) << loop << i;
        }
    }
    // Twice as large a disc has nothing of the green of transparent pixels; without alpha a picture covers.
    Animated twice(playing(format, {{"scale", 200}, {"xpos", -10}, {"ypos", -4}}));
    QvFrame in = mixed(nullptr, 0, 0, 0, 100, 80);
    const QvFrame& out = twice.through(in);
    EXPECT_NEAR(out.pixelPtr(42 + 21, 34 + 21)[2], 255 * 10 / 21.0, 14);
    EXPECT_EQ(out.pixelPtr(42 + 21, 34 + 21)[1], 30);
    for (int i = 0; i < 100 * 80; ++i) EXPECT_LE(out.pixelPtr(i % 100, i / 100)[1], 92) << i;
    Animated covering(playing(AnyDict("FOURCC", "BGR4", "width", 24, "height", 21), {}));
    const QvFrame& covered = covering.through(in);
    EXPECT_EQ(covered.pixelPtr(23, 0)[0], 0);
    EXPECT_EQ(covered.pixelPtr(24, 0)[0], background[0]);
}
