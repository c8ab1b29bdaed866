// The scaler as a filter, and the converter that applications use.
#include "builtin/video/geometry/qvscalercc.h"

#include <algorithm>
#include <cstring>
#include <vector>

#include "core/engine/status.h"
#include "core/filter/qvcolorconvert.h"
#include "core/measure/qvframerate.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"

namespace {

struct Opened : QvScalerCC {
    Opened(const char* fourcc, int width, int height,
           std::initializer_list<std::pair<const char*, int>> more = {}) {
        QvCodec::init();
        setParam("FOURCC", fourcc);
        setParam("outWidth", width);
        setParam("outHeight", height);
        for (const auto& [name, value] : more) setParam(name, value);
        EXPECT_EQ(open(), 0);
    }
    QvFrame& convert(QvFrame& in) {
        EXPECT_EQ(write(in), 0);
        EXPECT_EQ(ready(), 1);
        return *frame();
    }
};

QvFrame plain(unsigned fourcc, int width, int height, int value) {
    QvFrame frame;
    frame.init(fourcc, width, height);
    std::memset(frame.plane(), value, static_cast<size_t>(frame.total_bytes()));
    return frame;
}

}  // namespace

TEST(QvScalerCC, ParametersAreKeptStoredAndRestored) {
    QvScalerCC scaler, other;
    scaler.init();
    other.init();
    const auto names = {"outWidth", "outHeight", "quality", "topBlankingLines", "inITU", "outITU"};
    int value = 2;
    for (const char* name : names) EXPECT_EQ(scaler.setParam(name, value++), 0) << name;
    EXPECT_EQ(scaler.setParam("FOURCC", static_cast<int>(QvFourcc::BGR3)), 0);
    EXPECT_NE(scaler.setParam("FOURCC", "YV123"), 0);
    AnyDict stored;
    scaler.store(stored);
    EXPECT_EQ(other.restore(stored), 0);
    EXPECT_EQ(other.getParam("FOURCC"), Any("BGR3"));
    for (value = 2; const char* name : names) EXPECT_EQ(other.getParam(name), Any(value++)) << name;
    stored.set("name", "flipper");
    EXPECT_EQ(other.restore(stored), QvStatus::failed);
}

TEST(QvScalerCC, AnyFourccIsRestoredAlsoNone) {
    for (const int fourcc : {0, 5, 'A' << 16, static_cast<int>(QvFourcc::v210)}) {
        QvScalerCC scaler, other;
        scaler.init();
        other.init();
        EXPECT_EQ(other.setParam("FOURCC", "I420"), 0);
        EXPECT_EQ(scaler.setParam("FOURCC", fourcc), 0);
        AnyDict stored;
        scaler.store(stored);
        EXPECT_EQ(other.restore(stored), 0) << fourcc;
        EXPECT_EQ(other.getParam("FOURCCint"), Any(fourcc));
    }
}

TEST(QvScalerCC, OutputsThatCanNotBeMadeFailToOpen) {
    for (const auto& [fourcc, w, h] :
         {std::tuple{"XYZW", 8, 8}, {"I420", 0, 8}, {"I420", 8, -1}, {"BGR4", 1 << 20, 1 << 20}}) {
        QvScalerCC scaler;
        scaler.init();
        scaler.setParam("FOURCC", fourcc);
        scaler.setParam("outWidth", w);
        scaler.setParam("outHeight", h);
        EXPECT_EQ(scaler.open(), QvStatus::failed) << fourcc;
        EXPECT_STREQ(scaler.errorDesc(), "QvScalerCC::Can not init output frame!");
        QvFrame frame = plain(QvFourcc::I420, 8, 8, 1);
        EXPECT_NE(scaler.write(frame), 0);
    }
}

TEST(QvScalerCC, TinyOutputsAreBlack) {
    for (const auto& [w, h] : {std::pair{3, 8}, {8, 3}, {1, 1}}) {
        Opened scaler("I420", w, h);
        QvFrame in = plain(QvFourcc::I420, 16, 16, 200);
        const LogCapture log;
        EXPECT_EQ(scaler.convert(in).plane(0)[0], 0);
        EXPECT_EQ(log.count("Scaler does not support size smaller that 4 pixels", QvLogMask::error), 1);
    }
}

TEST(QvScalerCC, MatricesFollowFrameParameterAndHeight) {
    struct {
        int frame, inItu, outItu, inLines, outLines;
        bool changes;
        int marked;
    } const rows[] = {
        {0, 0, 0, 576, 1080, true, 2}, {0, 0, 0, 480, 576, false, 1}, {2, 1, 2, 576, 576, false, 2},
        {0, 2, 1, 576, 576, true, 1},  {0, 1, 0, 1080, 720, true, 2}, {7, 1, 2, 576, 576, false, 2},
    };
    for (const auto& row : rows) {
        Opened scaler("I420", 16, row.outLines, {{"inITU", row.inItu}, {"outITU", row.outItu}});
        QvFrame in = plain(QvFourcc::I420, 16, row.inLines, 60);
        if (row.frame) in.setYUVMatrix(static_cast<QvYUVMatrix>(row.frame));
        const QvFrame& out = scaler.convert(in);
        EXPECT_EQ(out.plane(0)[0] != 60, row.changes) << &row - rows;
        EXPECT_EQ(out.YUVMatrix(), row.marked) << &row - rows;
    }
    Opened rgb("BGR3", 16, 16);
    QvFrame in = plain(QvFourcc::I420, 16, 16, 60);
    EXPECT_EQ(rgb.convert(in).YUVMatrix(), qvMatrixNotSet);
}

TEST(QvScalerCC, AlphaFirstGoesBothWays) {
    QvFrame argb = makePicture(QvFourcc::ARGB, 12, 8, 3);
    Opened same("ARGB", 12, 8), toBgr4("BGR4", 12, 8), back("ARGB", 12, 8);
    EXPECT_EQ(pictureBytes(same.convert(argb)), pictureBytes(argb));
    QvFrame& bgr4 = toBgr4.convert(argb);
    for (int i = 0; i < 4; ++i) EXPECT_EQ(bgr4.plane()[i], argb.plane()[3 - i]);
    EXPECT_EQ(pictureBytes(back.convert(bgr4)), pictureBytes(argb));
}

TEST(QvScalerCC, TheLastChromaLineOfTheBottomFieldIsRepeated) {
    for (const int lines : {1078, 1080}) {
        Opened scaler("I420", 16, lines);
        QvFrame in = makePicture(QvFourcc::I422, 16, lines, 5);
        in.framerate.setInterlaced(1);
        const QvFrame& out = scaler.convert(in);
        const int last = out.height(1) - 1;
        for (int p = 1; p < 3; ++p) {
            const unsigned char* line = out.plane(p) + out.stride(p) * last;
            EXPECT_EQ(std::memcmp(line, line - out.stride(p), 8) == 0, lines == 1078);
        }
    }
}

TEST(QvScalerCC, BlankLinesStayBlackAndTheRestIsThePicture) {
    Opened scaler("I420", 16, 32, {{"topBlankingLines", 8}});
    QvFrame in = plain(QvFourcc::I420, 16, 16, 130);
    for (int i = 0; i < 2; ++i) {
        const QvFrame& out = scaler.convert(in);
        for (int y = 0; y < 32; ++y) EXPECT_EQ(out.plane()[out.stride() * y], y < 8 ? 0 : 130) << y;
        for (int y = 0; y < 16; ++y) EXPECT_EQ(out.plane(1)[out.stride(1) * y], y < 4 ? 128 : 130) << y;
    }
}

TEST(QvColorConverter, ConvertsAtAnySizeAndReopens) {
    const EngineScope engine;
    QvColorConverter converter(QvFourcc::I420, false, false);
    QvFrame out;
    for (const int width : {320, 64, 64, 102}) {
        QvFrame in = plain(QvFourcc::BGR3, width, 48, 255);
        in.frameNr = width;
        EXPECT_EQ(converter.convert(in, out), 0);
        EXPECT_EQ(out.width(), width);
        EXPECT_EQ(out.frameNr, width);
        EXPECT_EQ(out.plane()[0], 235);
    }
    QvColorConverter to601(QvFourcc::YUYV, true, true);
    QvFrame in = plain(QvFourcc::YUYV, 32, 32, 60);
    EXPECT_EQ(to601.convert(in, out), 0);
    EXPECT_EQ(out.YUVMatrix(), qvMatrixBT601);
    EXPECT_NE(out.plane()[0], 60);
    EXPECT_THROW(QvColorConverter(1234, false, false), QvAssertFailure);
    EXPECT_THROW(converter.convert(QvFrame(), out), QvAssertFailure);
}

TEST(QvColorConverter, PacksV210Lines) {
    for (const auto& [width, lineBytes] : {std::pair{720, 1920}, {726, 2048}, {14, 128}}) {
        QvFrame in = makePicture(QvFourcc::YUYV, width, 3, 9), scratch;
        std::vector<unsigned char> dest(static_cast<size_t>(lineBytes * 3 + 1), 0xEE);
        qvColorYUYVToV210(in, dest.data(), scratch);
        const unsigned char* pixel = in.plane() + in.stride() * 2;
        unsigned word;
        std::memcpy(&word, dest.data() + lineBytes * 2, 4);
        EXPECT_EQ(word, pixel[1] * 4u | pixel[0] * 4u << 10 | pixel[3] * 4u << 20);
        EXPECT_EQ(dest.back(), 0xEE);
        // After the last whole group as many zero bytes as pixels are left; the rest of the line stays.
        const int rest = width % 6;
        const unsigned char* end = dest.data() + lineBytes + width / 6 * 16;
        EXPECT_EQ(std::count(end, end + rest, 0), rest);
        if (width / 6 * 16 + rest < lineBytes) {
            EXPECT_EQ(end[rest], 0xEE);
        }
    }
}
