#include "builtin/video/geometry/qvcrop.h"

#include <array>
#include <climits>

#include "core/measure/rect.h"
#include "tests/builtin/video/effect_frames.h"

namespace {

using Opened = OpenedEffect<QvCrop>;

// Set before open, for an input of 1920x1080; what fails is left out of the result.
struct Cropper : QvCrop {
    explicit Cropper(const Params& params) {
        init();
        setParam("inputWidth", 1920);
        setParam("inputHeight", 1080);
        for (const auto& [name, value] : params) setParam(name, value);
    }
    int number(const char* name) const { return getParam(name).asInt32(-1); }
};

}  // namespace

TEST(QvCrop, BoxesFollowTheModes) {
    struct {
        Params params;
        QvRect box;
        int outWidth, outHeight;
    } const rows[] = {
        {{{"cropWidth", 642}}, {0, 0, 640, 360}, 640, 360},
        {{{"cropHeight", 363}}, {0, 0, 640, 360}, 640, 360},
        {{{"cropWidth", 640}, {"moveCropBox", QvPoint(31, 7)}}, {31, 7, 671, 367}, 640, 360},
        {{{"mode", 1}, {"cropWidth", 101}, {"cropHeight", 77}}, {0, 0, 100, 76}, 100, 76},
        {{{"mode", 1}, {"padTop", 10}, {"padRight", 6}}, {0, 0, 1920, 1080}, 1926, 1090},
        {{{"mode", 3}, {"cropAspect", 4.0 / 3}, {"cropWidth", 800}}, {0, 0, 800, 600}, 800, 600},
        // Pixels twice as wide as high.
        {{{"inputFrameAspect", 32.0 / 9}, {"mode", 3}, {"cropAspect", 2.0}}, {0, 0, 1080, 1080}, 1080, 1080},
        {{{"mode", 5}}, {0, 0, 1920, 1080}, 1920, 1440},
        {{{"padTop", 10}}, {0, 0, 1920, 1080}, 1920, 1080},
        {{{"mode", 1}, {"padTop", 10}, {"mode", 2}}, {0, 0, 1920, 1080}, 1920, 1080},
        {{{"mode", 1}, {"cropWidth", 640}, {"padTop", 4}, {"reset", 1}}, {0, 0, 1920, 1080}, 1920, 1080},
        {{{"mode", 4}, {"inputWidth", 1280}, {"inputHeight", 720}}, {160, 0, 1120, 720}, 960, 720},
        {{{"cropWidth", 640}, {"inputWidth", 320}}, {0, 0, 320, 360}, 320, 360},
        // A smaller input cuts the box; one that does not reach it is taken whole.
        {{{"mode", 1}, {"cropBox", QvRect(540, 60, 740, 260)}, {"inputWidth", 542}},
         {540, 60, 542, 260},
         2,
         200},
        {{{"mode", 1}, {"cropBox", QvRect(540, 60, 740, 260)}, {"inputWidth", 540}},
         {0, 0, 540, 1080},
         540,
         1080},
        {{{"mode", 1}, {"cropBox", QvRect(540, 60, 740, 260)}, {"inputWidth", 320}},
         {0, 0, 320, 1080},
         320,
         1080},
        {{{"mode", 1}, {"cropBox", QvRect(540, 60, 740, 260)}, {"inputHeight", 62}},
         {540, 60, 740, 62},
         200,
         2},
        {{{"mode", 1}, {"cropBox", QvRect(540, 60, 740, 260)}, {"inputHeight", 60}},
         {0, 0, 1920, 60},
         1920,
         60},
    };
    for (const auto& row : rows) {
        const Cropper crop(row.params);
        const QvRect box = crop.getParam("cropBox").asRect();
        EXPECT_EQ(box, row.box) << &row - rows << ": " << box.left() << " " << box.width() << " "
                                << box.height();
        EXPECT_EQ(crop.number("outputWidth"), row.outWidth) << &row - rows;
        EXPECT_EQ(crop.number("outputHeight"), row.outHeight) << &row - rows;
    }
}

TEST(QvCrop, LimitsAreToldAndHeld) {
    struct {
        Params params;
        std::array<int, 4> limits;  // width from and to, height from and to
    } const rows[] = {
        {{{"mode", 1}}, {32, 1920, 32, 1080}},
        {{{"cropWidth", 640}, {"moveCropBox", QvPoint(960, 100)}}, {32, 960, 16, 540}},
        {{{"inputWidth", 1080}, {"inputHeight", 1920}}, {16, 1080, 32, 1920}},
        {{{"inputWidth", 20}, {"inputHeight", 20}}, {20, 20, 20, 20}},
    };
    for (const auto& [params, limits] : rows) {
        Cropper crop(params);
        const char* const names[] = {"minWidth", "maxWidth", "minHeight", "maxHeight"};
        for (std::size_t i = 0; i < 4; ++i) {
            EXPECT_EQ(crop.number(names[i]), limits[i]) << names[i];
            const int beyond = limits[i] + (i % 2 ? 4 : -4);
            EXPECT_EQ(crop.setParam(i < 2 ? "cropWidth" : "cropHeight", beyond), QvStatus::failed) << beyond;
        }
    }
}

TEST(QvCrop, WhatItRefusesChangesNothing) {
    struct {
        int mode;
        const char* name;
        Any value;
        const char* text;
    } const rows[] = {
        {2, "inputWidth", INT_MAX, "Invalid state generic"},
        {2, "inputHeight", 0, "Invalid state generic"},
        {2, "inputFrameAspect", 10.01, "invalid aspect"},
        {2, "cropAspect", 0.0, "invalid aspect"},
        {2, "mode", "free", "Invalid crop mode"},
        {2, "mode", 6, "Invalid crop mode"},
        {4, "cropWidth", 640, "Can not change width in this mode"},
        {2, "moveCropBox", QvPoint(1, 0), "does not lie in the picture"},
        {1, "padTop", -1, "A pad is a number"},
        {1, "cropBox", QvRect(0, 0, 0, 5), "no rectangle"},
        {2, "cropHeight", INT_MIN, ""},
        {2, "state", AnyDict("mode", 9), "Invalid crop mode"},
    };
    for (const auto& row : rows) {
        Cropper crop({{"mode", row.mode}});
        AnyDict before, after;
        crop.store(before);
        EXPECT_EQ(crop.setParam(row.name, row.value), QvStatus::failed) << row.name;
        EXPECT_NE(std::string(crop.errorDesc()).find(row.text), std::string::npos) << crop.errorDesc();
        crop.store(after);
        EXPECT_EQ(Any(before), Any(after)) << row.name;
    }
}

TEST(QvCrop, StatesGoFromOneToAnother) {
    for (const int mode : {1, 2, 3, 4, 5}) {
        const Cropper crop({{"inputFrameAspect", 1.5},
                            {"cropAspect", 1.25},
                            {"mode", mode},
                            {"cropWidth", 640},
                            {"moveCropBox", QvPoint(16, 0)},
                            {"padLeft", 8}});
        Cropper other({}), small({{"inputWidth", 1280}, {"inputHeight", 720}});
        AnyDict stored;
        crop.store(stored);
        EXPECT_EQ(other.restore(stored), 0);
        for (const char* name : {"state", "outputWidth", "outputHeight", "inputFrameAspect"})
            EXPECT_EQ(other.getParam(name), crop.getParam(name)) << mode << name;
        if (mode < 4) continue;
        EXPECT_EQ(small.restore(stored), 0);
        EXPECT_EQ(small.number("outputHeight"), mode == 4 ? 720 : 960) << "derived from its own input";
    }
}

TEST(QvCrop, PicturesOfEveryFormatAreCutAndPadded) {
    for (const auto& format : qvPixelFormats()) {
        if (format.fourcc == QvFourcc::v210) continue;
        QvFrame in = makePicture(format.fourcc, 64, 48), wanted;
        in.framerate.setInterlaced(1);
        in.setTimestamp(9);
        wanted.init(format.fourcc, 40, 44);
        wanted.setBlack();
        for (int p = 0; p < in.planes(); ++p) {
            const int across = p ? 2 : 1, down = p && format.chroma == QvChroma::quarter ? 2 : 1;
            const int bytes = in.pixelBytes(p);
            for (int y = 0; y < 32 / down; ++y)
                std::memcpy(wanted.plane(p) + wanted.stride(p) * (y + 10 / down) + 4 / across * bytes,
                            rowOf(in, p, y + 4 / down) + 8 / across * bytes,
                            static_cast<size_t>(36 / across) * static_cast<size_t>(bytes));
        }
        Opened crop({{"inputWidth", 64}, {"inputHeight", 48}, {"mode", 1}, {"padTop", 10}, {"padBottom", 2}});
        crop.setParamDict(AnyDict("cropBox", QvRect(8, 4, 44, 36), "padLeft", 4));
        for (int time = 0; time < 2; ++time) {
            const QvFrame& out = crop.through(in);
            ASSERT_EQ(out.width(), 40);
            ASSERT_EQ(out.height(), 44);
            EXPECT_TRUE(samplesOf(out) == samplesOf(wanted)) << fourccName(format.fourcc);
            EXPECT_EQ(out.getTimestamp(), 9);
            EXPECT_EQ(out.framerate.interlaced(), 1);
        }
        EXPECT_EQ(crop.setParam("_on", 0), 0);
        EXPECT_EQ(samplesOf(crop.through(in)), samplesOf(in)) << "as it is when off";
    }
}

TEST(QvCrop, FramesOfOtherSizesAndFieldOrders) {
    QvFrame hundred = makePicture(QvFourcc::I420, 160, 100);
    EXPECT_EQ(Opened({{"mode", 1}, {"padTop", 10}, {"padBottom", 10}}).through(hundred).height(), 120);
    Opened wide({{"mode", 4}});
    EXPECT_EQ(wide.through(hundred).width(), 120);
    QvFrame large = makePicture(QvFourcc::BGR3, 640, 360);
    EXPECT_EQ(wide.through(large).width(), 480) << "derived from the frame";
    Opened odd({{"mode", 1}, {"cropBox", QvRect(0, 1, 32, 33)}});
    large.framerate.setInterlaced(1);
    EXPECT_EQ(odd.through(large).framerate.interlaced(), 2);
    // A box that the frames do not have, and what can't be cut.
    Opened box({{"mode", 1}, {"cropBox", QvRect(0, 0, 161, 50)}});
    EXPECT_EQ(box.through(large).width(), 161);
    EXPECT_EQ(box.write(hundred), QvStatus::failed);
    EXPECT_EQ(box.ready(), 0);
    EXPECT_NE(std::string(box.errorDesc()).find("(0, 0)-(161, 50) does not lie in the frame of 160x100"),
              std::string::npos);
    QvFrame tens = makePicture(QvFourcc::v210, 64, 48);
    EXPECT_NE(box.write(tens), 0);
    Opened huge(
        {{"mode", 1}, {"padLeft", 16384}, {"padRight", 16384}, {"padTop", 16384}, {"padBottom", 16384}});
    EXPECT_EQ(huge.write(large), QvStatus::outOfMemory);
}
