#include "builtin/video/frames/qvframerateconvert.h"

#include <cstring>
#include <sstream>

#include "core/caption/cc/qvcc.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"

namespace {

constexpr double film = 24000 / 1001.0, ntsc = 30000 / 1001.0;

// "BxY": a frame whose samples are all B, with a caption x and a packet Y.
struct Input {
    Input(const std::string& word, int number, double rate, unsigned fourcc = QvFourcc::I420, int width = 8,
          int height = 6) {
        frame.init(fourcc, width, height);
        std::memset(frame.plane(), word[0], static_cast<std::size_t>(frame.total_bytes()));
        frame.frameNr = number;
        frame.framerate = QvFramerate(rate);
        frame.setTimestamp(number);
        QvCcData captions;
        for (const char c : word.substr(1)) {
            const auto byte = static_cast<unsigned char>(c);
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

// "7:AB": number 7, with A in all even rows and B in all odd ones, then captions and packets; "/" stands for
// interlaced with the top field first, "\" with the bottom field first.
std::string described(const QvFrame& frame) {
    std::string text = std::to_string(frame.frameNr) + ":/\\"[frame.framerate.interlaced()];
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
    Converter(double in, double out, int interlace = 0, int pulldown = 0) : fps(in) {
        QvFramerateConvert::init();
        setParam("inFramerate", in);
        setParam("outFramerate", QvFramerate(out));
        setParam("interlace", interlace);
        setParam("pulldown", pulldown);
    }
    int put(Input input) { return write(input.frame); }
    std::string give(Input input) {
        std::string text;
        EXPECT_EQ(write(input.frame), 0);
        for (int left = ready(); left > 0; --left, next()) {
            EXPECT_EQ(ready(), left);
            EXPECT_NEAR(this->frame()->framerate.rate(), getParam("outFramerate").asDouble(), 1e-6);
            text += described(*this->frame()) + " ";
        }
        EXPECT_EQ(next(), 0);
        EXPECT_EQ(ready(), 0);
        return text;
    }
    // What comes of the frames from number `first` on, each followed by a blank.
    std::string run(int first, const std::string& frames) {
        std::istringstream words(frames);
        std::string text;
        for (std::string word; words >> word; ++first) text += give(Input(word, first, fps));
        return text;
    }
    double fps;
};

TEST(QvFramerateConvert, FramesAreChosenWovenAndPulledDown) {
    const struct {
        double in, out;
        int interlace, pulldown, first;
        const char *frames, *outputs;
    } rows[] = {
        {25, 50, 0, 0, 100, "AaX Bb", "200:AAaX 201:AA 202:BBb 203:BB "},
        {50, 25, 0, 0, 0, "Aa BbcXY CdZ De", "0:AAa 1:CCbcdXYZ "},
        {50, 25, 0, 0, 101, "A BX C D", "51:BBX 52:DD "},
        {ntsc, 30, 0, 0, 998, "A B C D", "999:AA 1000:BB 1001:CC 1002:CC 1003:DD "},
        {30, ntsc, 0, 0, 999, "A B C D", "999:AA 1000:CC 1001:DD "},
        {24, 25, 0, 0, 22, "A B C", "23:AA 24:BB 25:CC 26:CC "},
        {24, 30, 0, 1, 0, "A B C D E F G H I", "0/AA 1/AB 2/BC 3/CC 4/DD 5/EE 6/EF 7/FG 8/GG 9/HH 10/II "},
        {film, ntsc, 0, 1, 100, "AaW BbX CcY DdZ", "125/AAaW 126/ABbX 127/BCcY 128/CC 129/DDdZ "},
        {50, 25, 1, 0, 10, "AaX BbY C DcZ", "5/ABabXY 6/CDcZ "},
        {50, 25, 2, 1, 11, "AaX Bb C D", "6\\BAabX 7\\DC "},
        // Rates that don't suit: whole frames.
        {50, 30, 1, 0, 0, "A B C D E", "0:AA 1:BB 2:DD "},
        {25, 30, 0, 1, 0, "A B C", "0:AA 1:AA 2:BB 3:CC "},
    };
    for (const auto& row : rows) {
        Converter converter(row.in, row.out, row.interlace, row.pulldown);
        for (int opened = 0; opened < 2; ++opened) {
            ASSERT_EQ(converter.open(), 0);
            EXPECT_EQ(converter.run(row.first, row.frames), row.outputs);
            EXPECT_EQ(converter.close(), 0);
        }
    }
}

TEST(QvFramerateConvert, WovenPicturesOfAnyShape) {
    for (const unsigned fourcc : {QvFourcc::I420, QvFourcc::UYVY, QvFourcc::v210, QvFourcc::BGR3})
        for (const int height : {1, 2, 6, 7, 10})
            for (int mode = 0; mode < 3; ++mode) {  // as "interlace", 0 for pulldown
                Converter converter(mode ? 50 : 24, mode ? 25 : 30, mode, !mode);
                converter.open();
                Input a("A", 0, converter.fps, fourcc, 10, height),
                    b("B", 1, converter.fps, fourcc, 10, height);
                converter.give(a);
                EXPECT_EQ(converter.write(b.frame), 0);
                const QvFrame& woven = *converter.frame();
                EXPECT_EQ(woven.four_cc(), fourcc);
                EXPECT_EQ(woven.getTimestamp(), mode == 2 ? 1 : 0) << "of the top field";
                ASSERT_EQ(woven.height(), height);
                for (int row = 0; row < height; ++row)
                    EXPECT_EQ(woven.plane()[row * woven.stride()], (row % 2 == 1) == (mode != 2) ? 'B' : 'A');
            }
    Converter changing(50, 25, 1);
    changing.open();
    changing.run(0, "A");
    EXPECT_EQ(changing.put(Input("B", 1, 50, QvFourcc::I420, 16, 6)), -1);
    EXPECT_EQ(changing.ready(), 0);
    EXPECT_EQ(changing.run(2, "C D"), "0/CD ") << "the pair after it is whole";
}

TEST(QvFramerateConvert, BrokenContractsAreAssertions) {
    for (const auto& [in, out] :
         {std::pair{0.0, 25.0}, {0.1, 25.0}, {25.0, 120.5}, {-25.0, 25.0}, {1e300, 25.0}})
        EXPECT_THROW(Converter(in, out).open(), QvAssertFailure) << in << " " << out;
    Converter converter(50, 25);
    const auto write = [&](int number, double rate = 50) { return converter.put(Input("A", number, rate)); };
    EXPECT_EQ(write(10), QvStatus::illegalState);
    converter.open();
    EXPECT_THROW(converter.open(), QvAssertFailure);
    EXPECT_THROW(write(11, 25), QvAssertFailure);
    EXPECT_EQ(write(10), 0);
    EXPECT_THROW(write(11), QvAssertFailure) << "the frame before is unread";
    converter.next();
    EXPECT_EQ(write(11), 0);
    EXPECT_THROW(write(13), QvAssertFailure);
    QvFrame empty;
    EXPECT_EQ(converter.write(empty), QvStatus::invalidArgument);
}

TEST(QvFramerateConvert, StateAndPlaceInAChain) {
    Converter converter(25, 12.5, 2, 1), other(24, 24);
    EXPECT_EQ(converter.setParam("interlace", 3), QvStatus::invalidParam);
    AnyDict stored;
    converter.store(stored);
    EXPECT_EQ(other.restore(stored), 0);
    for (const char* name : {"inFramerate", "outFramerate", "interlace", "pulldown"})
        EXPECT_EQ(other.getParam(name), converter.getParam(name)) << name;
    const struct {
        double in, out;
        int pulldown, safe;
    } rows[] = {{25, 25, 0, 1}, {25, 50, 0, 0}, {24, 30, 1, 1}, {24, 25, 1, 0}};
    for (const auto& row : rows) {
        Converter opened(row.in, row.out, 0, row.pulldown);
        opened.open();
        EXPECT_EQ(opened.getParam("_safeToApplyAfter"), Any(row.safe)) << row.in << " " << row.out;
    }
}

}  // namespace
