#include "builtin/decoders/rawdec.h"

#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"
#include "tests/support/wav_bytes.h"

namespace {

class Raw : public testing::Test {
  protected:
    Raw() { decoder.init(); }
    ~Raw() override { decoder.close(); }

    void set(const char* fourcc, int width, int height) {
        EXPECT_EQ(decoder.setParam("width", width), 0);
        EXPECT_EQ(decoder.setParam("height", height), 0);
        EXPECT_EQ(decoder.setParam("FOURCC", fourcc), 0);
    }
    int open(const std::string& bytes) {
        decoder.setParam("filename", folder.write("a.raw", bytes).c_str());
        return decoder.open();
    }
    // A status with the text that goes with it.
    std::string outcome(int status) { return std::to_string(status) + " " + decoder.errorDesc(); }
    std::string plane(int nr = 0) {
        const QvFrame& frame = *decoder.getFramePtr(0);
        return {reinterpret_cast<const char*>(frame.plane(nr)),
                static_cast<std::size_t>(frame.plane_bytes(nr))};
    }
    // The next frame: its planes, or "none" if it can not be read or is not of that number.
    std::string next(int frameNr) {
        if (decoder.readFrame(0) != 0 || decoder.getFramePtr(0)->frameNr != frameNr) return "none";
        return pictureBytes(*decoder.getFramePtr(0));
    }

    EngineScope engine;
    TempFolder folder;
    RawDecoder decoder;
};

TEST_F(Raw, FramesComeInOrderAndAfterSeeks) {
    set("I420", 6, 4);
    constexpr std::size_t frameBytes = 36;
    const std::string bytes = patternBytes(5 * frameBytes);
    ASSERT_EQ(open(bytes), 0);
    EXPECT_EQ(decoder.nrFrames(0), 5);
    const auto frame = [&](int i) {
        return bytes.substr(static_cast<std::size_t>(i) * frameBytes, frameBytes);
    };
    for (int i = 0; i < 5; ++i) EXPECT_EQ(next(i), frame(i));
    EXPECT_EQ(decoder.readFrame(0), QvStatus::endOfStream);
    for (const int i : {3, 0, 4}) {
        ASSERT_EQ(decoder.seekToFrame(i, 0), 0);
        EXPECT_EQ(next(i), frame(i));
    }
    for (const long long bad : {-1LL, 5LL, 1LL << 60})
        EXPECT_EQ(outcome(decoder.seekToFrame(bad, 0)), "-1 Invalid seek pos");
    decoder.close();
    EXPECT_EQ(outcome(decoder.readFrame(0)), "-1 stream not opened");
}

TEST_F(Raw, PartsOfFramesAreToldAndNeverRead) {
    set("GRAY", 8, 2);
    const struct {
        std::size_t bytes;
        long long offset;
        int frames;
        bool truncated;
    } cases[] = {{0, 0, 0, false},  {15, 0, 0, true}, {16, 0, 1, false},  {40, 0, 2, true},
                 {40, 8, 2, false}, {40, 9, 1, true}, {40, 40, 0, false}, {40, 100, 0, false}};
    for (const auto& c : cases) {
        decoder.setParam("offset", c.offset);
        ASSERT_EQ(open(patternBytes(c.bytes)), 0);
        EXPECT_EQ(decoder.nrFrames(0), c.frames) << c.bytes;
        EXPECT_EQ(decoder.getVideoParam(0, "truncated") == Any(1), c.truncated) << c.bytes << " " << c.offset;
        EXPECT_TRUE(decoder.getVideoParam(0, "framesExpected") ==
                    (c.truncated ? Any(c.frames + 1LL) : Any()));
        for (int i = 0; i < c.frames; ++i) EXPECT_EQ(decoder.readFrame(0), 0);
        EXPECT_EQ(decoder.readFrame(0), QvStatus::endOfStream);
    }
}

TEST_F(Raw, InvertedFilesBeginAtTheBottom) {
    set("I420", 2, 4);
    decoder.setParam("invert", 1);
    ASSERT_EQ(open("aabbccddUVuv"), 0);
    EXPECT_EQ(next(0), "ddccbbaaVUvu");
}

TEST_F(Raw, PackedFormatsBecomeBgr3) {
    set("BGRU", 2, 2);  // rows of 6 bytes in the file, of 8 in the frame
    ASSERT_EQ(open("abcdefghijkl"), 0);
    EXPECT_EQ(decoder.nrFrames(0), 1);
    ASSERT_EQ(decoder.readFrame(0), 0);
    EXPECT_EQ(plane().substr(0, 6) + plane().substr(8, 6), "abcdefghijkl");
    EXPECT_EQ(decoder.getFramePtr(0)->four_cc(), QvFourcc::BGR3);

    set("BGR6", 4, 1);  // the high byte is the second one
    ASSERT_EQ(open("-a-b-c-d-e-f-g-h-i-j-k-l"), 0);
    EXPECT_EQ(next(0), "abcdefghijkl");
}

TEST_F(Raw, FieldsOneAfterTheOtherAreWoven) {
    set("GRAY", 4, 4);
    decoder.setParam("fieldOrderFile", 1);
    for (const auto& [flag, picture] :
         {std::pair(0, "aaaabbbbccccdddd"), {1, "aaaaccccbbbbdddd"}, {2, "ccccaaaaddddbbbb"}}) {
        ASSERT_EQ(decoder.setParam("interlacedFlag", flag), 0);
        ASSERT_EQ(open("aaaabbbbccccddddaaaabbbbccccdddd"), 0);
        for (int i = 0; i < 2; ++i) EXPECT_EQ(next(i), picture) << flag;
        EXPECT_EQ(decoder.getFramePtr(0)->framerate.interlaced(), flag);
    }
    ASSERT_EQ(decoder.setParam("height", 3), 0);
    EXPECT_EQ(decoder.open(), QvStatus::failed) << "an odd height has no two equal fields";
}

TEST_F(Raw, SizesAndFormatsThatCanNotBeAreRefused) {
    EXPECT_EQ(outcome(decoder.open()), "-1 media dec: filename not set");
    for (const auto& [width, height] : {Pair(0, 240), {320, -1}, {100000, 100000}, {2147483647, 1}}) {
        decoder.setParam("width", width);
        decoder.setParam("height", height);
        EXPECT_EQ(open("0123456789"), QvStatus::failed) << width << "x" << height;
        EXPECT_EQ(decoder.getState(), 2);
    }
    const std::pair<const char*, Any> rows[] = {{"FOURCC", "NONE"},   {"FOURCC", 7},         {"framerate", 0},
                                                {"framerate", 1e300}, {"interlacedFlag", 3}, {"offset", -1}};
    for (const auto& [name, value] : rows)
        EXPECT_EQ(decoder.setParam(name, value), QvStatus::invalidParam) << name;
    set("GRAY", 4, 1);
    decoder.setParam("filename", folder.path().c_str());
    EXPECT_EQ(outcome(decoder.open()), "-1 Can not open file");
}

TEST_F(Raw, OneStreamOfPicturesIsDescribed) {
    decoder.setParam("FOURCC", "I420"), decoder.setParam("width", 48), decoder.setParam("height", 20);
    AnyDict params;
    decoder.getStreamParams(qvVideoStream, 0, params);
    EXPECT_EQ(params.getInt32("width", 0), 48);
    for (const auto& [type, stream] : {std::pair(qvVideoStream, 1), std::pair(qvAudioStream, 0)}) {
        decoder.getStreamParams(type, stream, params);
        EXPECT_TRUE(params.empty()) << type;
    }
}

TEST_F(Raw, SettingsAreStored) {
    const std::pair<const char*, Any> rows[] = {
        {"FOURCC", "UYVY"},    {"width", 48}, {"height", 20},        {"framerate", QvFramerate(50.0)},
        {"frameAspect", 1.25}, {"invert", 1}, {"fieldOrderFile", 1}, {"offset", 77}};
    for (const auto& [name, value] : rows) ASSERT_EQ(decoder.setParam(name, value), 0) << name;
    AnyDict stored = static_cast<const QvCodec&>(decoder).getParam("store").asDict();
    EXPECT_EQ(stored.size(), 8);
    stored.set("name", decoder.name());
    RawDecoder other;
    other.init();
    ASSERT_EQ(other.restore(stored), 0);
    for (const auto& [name, value] : rows)
        EXPECT_EQ(static_cast<const QvCodec&>(other).getParam(name),
                  static_cast<const QvCodec&>(decoder).getParam(name))
            << name;
}

TEST_F(Raw, ChangesWhileOpenStartOver) {
    set("GRAY", 4, 1);
    ASSERT_EQ(open("aaaabbbbccccdddd"), 0);
    ASSERT_EQ(decoder.readFrame(0), 0);
    ASSERT_EQ(decoder.seekToFrame(2, 0), 0);
    EXPECT_EQ(decoder.setParam("height", 2), 0);
    EXPECT_EQ(decoder.nrFrames(0), 2);
    EXPECT_EQ(next(0), "aaaabbbb");
    EXPECT_EQ(decoder.setParam("filename", "other"), 0);
    EXPECT_EQ(decoder.getState(), 2);
}

// Cb, Y, Cr of 10 bits each in a word, all 512 but the luma of the second frame.
TEST_F(Raw, V210IsDeliveredAsY216OrRefused) {
    const auto frameOf = [](unsigned luma) {
        std::string bytes;
        for (int group = 0; group < 8 * 4; ++group)
            bytes += leBytes(512 | luma << 10 | 512 << 20, 4) + leBytes(luma | 512 << 10 | luma << 20, 4) +
                     leBytes(512 | luma << 10 | 512 << 20, 4) + leBytes(luma | 512 << 10 | luma << 20, 4);
        return bytes;
    };
    set("v210", 48, 4);
    const std::string bytes = frameOf(512) + frameOf(128) + "rest";
    ASSERT_EQ(open(bytes), 0);
    EXPECT_EQ(decoder.nrFrames(0), 2);
    for (const int luma : {512, 128}) {
        ASSERT_EQ(decoder.readFrame(0), 0);
        const QvFrame& frame = *decoder.getFramePtr(0);
        ASSERT_EQ(frame.four_cc(), QvFourcc::Y216);
        const unsigned char* first = frame.plane();
        EXPECT_NEAR(first[0] | first[1] << 8, luma << 6, 64);
    }
}

}  // namespace
