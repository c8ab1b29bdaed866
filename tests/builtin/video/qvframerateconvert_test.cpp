#include "builtin/video/qvframerateconvert.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <deque>
#include <string>

#include "core/caption/qvcc.h"
#include "core/engine/qvexception.h"
#include "tests/support/log_capture.h"

namespace {

constexpr double film = 24000 / 1001.0, ntsc = 30000 / 1001.0;

// Frame `number` of a stream: all its samples are `letter`; "x" of the text is a caption x, "X" a packet X.
struct Input {
    Input(int number, char letter, double rate, const char* data = "", unsigned fourcc = QvFourcc::I420,
          int width = 8, int height = 6) {
        frame.init(fourcc, width, height);
        std::memset(frame.plane(), letter, static_cast<std::size_t>(frame.total_bytes()));
        frame.frameNr = number;
        frame.framerate = QvFramerate(rate);
        QvCcData captions;
        for (; *data; ++data) {
            const auto byte = static_cast<unsigned char>(*data);
            if (std::islower(byte))
                captions.append({0, byte, byte, true});
            else
                packets.append({&byte, 1});
        }
        AnyDict block;
        captions.store(block);
        if (captions.count() > 0) frame.setSubpic(block);
        if (!packets.empty()) frame.setUserData(&packets);
    }
    QvUserData packets;
    QvFrame frame;
};

// "7:AB": number 7, with A in all even rows and B in all odd ones; then captions and packets as for Input.
std::string described(const QvFrame& frame) {
    std::string text = std::to_string(frame.frameNr) + ":";
    for (int parity = 0; parity < 2; ++parity) {
        const auto letter = static_cast<char>(frame.plane()[parity * frame.stride()]);
        text += letter;
        for (int p = 0; p < frame.planes(); ++p)
            for (int row = parity; row < frame.height(p); row += 2)
                for (int x = 0; x < frame.width(p); ++x)
                    if (static_cast<char>(frame.plane(p)[row * frame.stride(p) + x]) != letter)
                        return "torn in row " + std::to_string(row) + " of plane " + std::to_string(p);
    }
    QvCcData captions;
    if (frame.subpic() && captions.restore(*frame.subpic()) != 0) return "no captions";
    for (const auto& pair : captions.pairs()) text += static_cast<char>(pair.byte1);
    for (int i = 0; frame.userData() && i < frame.userData()->count(); ++i)
        text += static_cast<char>(frame.userData()->packet(i)[0]);
    return text;
}

struct Converter : QvFramerateConvert {
    Converter(double in, double out, int interlace = 0, int pulldown = 0) {
        QvFramerateConvert::init();
        setParam("inFramerate", in);
        setParam("outFramerate", QvFramerate(out));
        setParam("interlace", interlace);
        setParam("pulldown", pulldown);
    }
    std::string give(QvFrame& frame) {
        std::string text;
        EXPECT_EQ(write(frame), 0);
        for (int left = ready(); left > 0; --left) {
            EXPECT_EQ(ready(), left);
            text += described(*this->frame()) + " ";
            scan = this->frame()->framerate.interlaced();
            rate = this->frame()->framerate.rate();
            next();
        }
        EXPECT_EQ(next(), 0);
        EXPECT_EQ(ready(), 0);
        return text;
    }
    // Frames A, B, C, ... from number `first` on; a "-" of the texts is a frame without data.
    std::string run(int first, int frames, const std::vector<const char*>& data = {}) {
        std::string text;
        const double fps = getParam("inFramerate").asDouble();
        for (int i = 0; i < frames; ++i) {
            const auto n = static_cast<std::size_t>(i);
            Input input(first + i, static_cast<char>('A' + i % 26), fps, n < data.size() ? data[n] : "");
            text += give(input.frame);
        }
        return text.empty() ? "" : text.substr(0, text.size() - 1);
    }
    int scan = -1;
    double rate = 0;
};

}  // namespace

TEST(QvFramerateConvert, FramesAreChosenWovenAndPulledDown) {
    const struct {
        double in, out;
        int interlace, pulldown, first, frames;
        const char* outputs;
        int scan;
    } rows[] = {
        {25, 50, 0, 0, 100, 2, "200:AA 201:AA 202:BB 203:BB", 0},
        {50, 25, 0, 0, 0, 4, "0:AA 1:CC", 0},
        {50, 25, 0, 0, 101, 4, "51:BB 52:DD", 0},
        {ntsc, 30, 0, 0, 998, 4, "999:AA 1000:BB 1001:CC 1002:CC 1003:DD", 0},
        {30, ntsc, 0, 0, 999, 4, "999:AA 1000:CC 1001:DD", 0},
        {24, 25, 0, 0, 22, 3, "23:AA 24:BB 25:CC 26:CC", 0},
        {12.5, 100, 0, 0, 1, 1, "8:AA 9:AA 10:AA 11:AA 12:AA 13:AA 14:AA 15:AA", 0},
        {24, 30, 0, 1, 0, 9, "0:AA 1:AB 2:BC 3:CC 4:DD 5:EE 6:EF 7:FG 8:GG 9:HH 10:II", 1},
        {film, ntsc, 0, 1, 100, 4, "125:AA 126:AB 127:BC 128:CC 129:DD", 1},
        {50, 25, 1, 0, 10, 4, "5:AB 6:CD", 1},
        {50, 25, 2, 1, 10, 4, "5:BA 6:DC", 2},
        // Rates that don't suit: whole frames.
        {50, 30, 1, 0, 0, 5, "0:AA 1:BB 2:DD", 0},
        {25, 30, 0, 1, 0, 3, "0:AA 1:AA 2:BB 3:CC", 0},
    };
    for (const auto& row : rows) {
        Converter converter(row.in, row.out, row.interlace, row.pulldown);
        ASSERT_EQ(converter.open(), 0);
        EXPECT_EQ(converter.run(row.first, row.frames), row.outputs) << row.in << " to " << row.out;
        EXPECT_EQ(converter.scan, row.scan) << row.outputs;
        EXPECT_NEAR(converter.rate, row.out, 1e-6);
        // Closed and opened again it starts anew.
        EXPECT_EQ(converter.close(), 0);
        ASSERT_EQ(converter.open(), 0);
        EXPECT_EQ(converter.run(row.first, row.frames), row.outputs);
    }
}

TEST(QvFramerateConvert, CaptionsAndUserDataLeaveOnceInTheirOrder) {
    const struct {
        double in, out;
        int interlace, pulldown;
        std::vector<const char*> data;
        const char* outputs;
    } rows[] = {
        {25, 50, 0, 0, {"aX", "b"}, "0:AAaX 1:AA 2:BBb 3:BB"},
        {50, 25, 0, 0, {"a", "bcXY", "dZ", "e"}, "0:AAa 1:CCbcdXYZ"},
        {50, 25, 0, 0, {"", "X", "", ""}, "0:AA 1:CCX"},
        {50, 25, 1, 0, {"aX", "bY", "", "cZ"}, "0:ABabXY 1:CDcZ"},
        {50, 25, 2, 0, {"aX", "b", "", ""}, "0:BAabX 1:DC"},
        {24, 30, 0, 1, {"aW", "bX", "cY", "dZ"}, "0:AAaW 1:ABbX 2:BCcY 3:CC 4:DDdZ"},
    };
    for (const auto& row : rows) {
        Converter converter(row.in, row.out, row.interlace, row.pulldown);
        converter.open();
        EXPECT_EQ(converter.run(0, static_cast<int>(row.data.size()), row.data), row.outputs);
    }
    Converter reopened(50, 25);
    reopened.open();
    EXPECT_EQ(reopened.run(0, 2, {"", "xX"}), "0:AA");
    reopened.close();
    reopened.open();
    EXPECT_EQ(reopened.run(0, 1), "0:AA") << "data of another run";
}

TEST(QvFramerateConvert, WovenPicturesKeepFormatSizeAndScanOfAnyShape) {
    for (const unsigned fourcc : {QvFourcc::I420, QvFourcc::UYVY, QvFourcc::v210, QvFourcc::BGR3})
        for (const int height : {1, 2, 6, 7, 10}) {
            Converter pulldown(24, 30, 0, 1), interlacing(50, 25, 1);
            for (Converter* converter : {&pulldown, &interlacing}) {
                converter->open();
                const double fps = converter->getParam("inFramerate").asDouble();
                Input a(0, 'A', fps, "", fourcc, 10, height), b(1, 'B', fps, "", fourcc, 10, height);
                converter->give(a.frame);
                EXPECT_EQ(converter->write(b.frame), 0);
                const QvFrame& woven = *converter->frame();
                EXPECT_EQ(woven.four_cc(), fourcc);
                ASSERT_EQ(woven.height(), height);
                for (int row = 0; row < height; ++row)
                    EXPECT_EQ(woven.plane()[row * woven.stride()], row % 2 ? 'B' : 'A');
            }
        }
    Converter changing(50, 25, 1);
    changing.open();
    Input a(0, 'A', 50), wider(1, 'B', 50, "", QvFourcc::I420, 16, 6), c(2, 'C', 50), d(3, 'D', 50);
    changing.give(a.frame);
    EXPECT_EQ(changing.write(wider.frame), -1);
    EXPECT_EQ(changing.ready(), 0);
    EXPECT_EQ(changing.give(c.frame), "");
    EXPECT_EQ(changing.give(d.frame), "0:CD ") << "the pair after it is whole";
}

TEST(QvFramerateConvert, BrokenContractsAreAssertions) {
    QvFramerateConvert fresh;
    EXPECT_THROW(fresh.getParam("interlace"), QvAssertFailure);
    EXPECT_THROW(fresh.setParam("interlace", 1), QvAssertFailure);
    for (const auto& [in, out] :
         {std::pair{0.0, 25.0}, {0.1, 25.0}, {25.0, 120.5}, {-25.0, 25.0}, {1e300, 25.0}})
        EXPECT_THROW(Converter(in, out).open(), QvAssertFailure) << in << " " << out;
    Converter converter(50, 25);
    Input a(10, 'A', 50), again(8, 'B', 50), other(11, 'C', 25);
    EXPECT_EQ(converter.write(a.frame), -18);
    converter.open();
    EXPECT_THROW(converter.open(), QvAssertFailure);
    LogCapture log;
    EXPECT_THROW(converter.write(other.frame), QvAssertFailure);
    EXPECT_TRUE(log.contains("invalid framerate in input frame 25p, should be 50p"));
    EXPECT_EQ(converter.write(a.frame), 0);
    Input next(11, 'D', 50);
    EXPECT_THROW(converter.write(next.frame), QvAssertFailure) << "the frame before is unread";
    converter.next();
    EXPECT_EQ(converter.write(next.frame), 0);
    Input late(13, 'E', 50);
    EXPECT_THROW(converter.write(late.frame), QvAssertFailure);
    EXPECT_TRUE(log.contains("Framerate convert: need frame nr=12, frame_nr=13"));
    QvFrame empty;
    EXPECT_EQ(converter.write(empty), -12);
}

TEST(QvFramerateConvert, ParametersAndState) {
    Converter converter(25, 25.0 / 2, 2, 1);
    EXPECT_EQ(converter.getParam("outFramerate"), Any(12.5));
    EXPECT_EQ(converter.setParam("inFramerate", 30), 0);
    EXPECT_EQ(converter.setParam("inFramerate", "30"), -5);
    EXPECT_EQ(converter.setParam("interlace", 3), -5);
    EXPECT_EQ(converter.getParam("_isFramerateConverter"), Any(1));
    AnyDict stored;
    converter.store(stored);
    Converter other(24, 24);
    EXPECT_EQ(other.restore(stored), 0);
    for (const char* name : {"inFramerate", "outFramerate", "interlace", "pulldown"})
        EXPECT_EQ(other.getParam(name), converter.getParam(name)) << name;
    const struct {
        double in, out;
        int pulldown, safe;
    } rows[] = {{50, 25, 0, 1}, {25, 25, 0, 1}, {25, 50, 0, 0}, {24, 30, 1, 1}, {24, 25, 1, 0}};
    for (const auto& row : rows) {
        Converter opened(row.in, row.out, 0, row.pulldown);
        opened.open();
        EXPECT_EQ(opened.getParam("_safeToApplyAfter"), Any(row.safe)) << row.in << " " << row.out;
        EXPECT_FALSE(opened.applySupported());
    }
}
