#include "builtin/decoders/rawdec.h"

#include "core/engine/qvregistry.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"
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
    std::string told(int status) { return std::to_string(status) + " " + decoder.errorDesc(); }
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
    EXPECT_EQ(decoder.readFrame(0), -4);
    for (const int i : {3, 0, 4}) {
        ASSERT_EQ(decoder.seekToFrame(i, 0), 0);
        EXPECT_EQ(next(i), frame(i));
    }
    for (const long long bad : {-1LL, 5LL, 1LL << 60})
        EXPECT_EQ(told(decoder.seekToFrame(bad, 0)), "-1 Invalid seek pos");
    EXPECT_EQ(told(decoder.readFrame(1)), "-1 Invalid stream nr");
    decoder.close();
    EXPECT_EQ(told(decoder.readFrame(0)), "-1 stream not opened");
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
        EXPECT_EQ(decoder.readFrame(0), -4);
        EXPECT_EQ(decoder.getParam("framesFloat").toDouble() * 16,
                  static_cast<double>(std::max(0LL, static_cast<long long>(c.bytes) - c.offset)));
    }
}

TEST_F(Raw, DescribesItsStream) {
    set("I420", 720, 576);
    decoder.setParam("framerate", QvFramerate(25.0, 1));
    decoder.setParam("frameAspect", 16.0 / 9);
    const std::string bytes = patternBytes(3 * 720 * 576 * 3 / 2);
    ASSERT_EQ(open(bytes), 0);
    AnyDict wanted("FOURCC", static_cast<int>(QvFourcc::I420), "width", 720, "height", 576, "framerate",
                   QvFramerate(25.0, 1), "frameAspect", 16.0 / 9, "pixelAspect", 16.0 / 9 * 576 / 720,
                   "frames", 3, "duration", 3 / 25.0);
    wanted.update(AnyDict("codec", "I420", "videoCodec", "I420", "vBitrate", 622080 * 8 * 25.0, "nrViews", 1,
                          "pal", 1));
    EXPECT_TRUE(decoder.getParam("video0").asDict() == wanted);
    EXPECT_TRUE(decoder.getParam("filesize") == static_cast<long long>(bytes.size()));
    EXPECT_TRUE(decoder.getParam("topFirst") == 1 && decoder.getParam("notSeekable") == 0 &&
                decoder.getParam("extendedFOURCC") == "I420");
    ASSERT_EQ(decoder.readFrame(0), 0);
    EXPECT_EQ(decoder.getFramePtr(0)->framerate.interlaced(), 1);
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
    EXPECT_EQ(decoder.open(), -1) << "an odd height has no two equal fields";
}

TEST_F(Raw, SizesAndFormatsThatCanNotBeAreRefused) {
    EXPECT_EQ(told(decoder.open()), "-1 media dec: filename not set");
    for (const auto& [width, height] :
         {Pair(0, 240), {-1, 240}, {320, 0}, {320, -1}, {100000, 100000}, {2147483647, 1}}) {
        decoder.setParam("width", width);
        decoder.setParam("height", height);
        EXPECT_EQ(open("0123456789"), -1) << width << "x" << height;
        EXPECT_EQ(decoder.getState(), 2);
    }
    const std::pair<const char*, Any> rows[] = {
        {"FOURCC", "NONE"},    {"FOURCC", "RG"},     {"FOURCC", 7},
        {"FOURCC", 1.5},       {"framerate", 0},     {"framerate", -25},
        {"framerate", "25"},   {"framerate", 1e300}, {"framerate", QvFramerate(0.0)},
        {"interlacedFlag", 3}, {"offset", -1}};
    for (const auto& [name, value] : rows) EXPECT_EQ(decoder.setParam(name, value), -5) << name;
    EXPECT_THROW(decoder.setParam("colour", 1), QvParamException);
    set("GRAY", 4, 1);
    decoder.setParam("filename", folder.path().c_str());
    EXPECT_EQ(told(decoder.open()), "-1 Can not open file");
}

TEST_F(Raw, ChangesWhileOpenStartOver) {
    set("GRAY", 4, 1);
    ASSERT_EQ(open("aaaabbbbccccdddd"), 0);
    ASSERT_EQ(decoder.readFrame(0), 0);
    ASSERT_EQ(decoder.seekToFrame(2, 0), 0);
    EXPECT_EQ(decoder.setParam("height", 2), 0);
    EXPECT_EQ(decoder.nrFrames(0), 2);
    EXPECT_EQ(next(0), "aaaabbbb");
    EXPECT_EQ(decoder.setParam("offset", 4), 0);
    EXPECT_EQ(next(0), "bbbbcccc");
    EXPECT_EQ(decoder.setParam("filename", decoder.getParam("filename")), 0);
    EXPECT_EQ(decoder.getState(), 3) << "the same name changes nothing";
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
    const std::unique_ptr<QvCodec> converter(qv_registry()->newCodec("colorconv"));
    if (!converter) {
        EXPECT_EQ(told(open(bytes)), "-1 media dec: no converter for v210");
        return;
    }
    decoder.setParam("height", 3);
    EXPECT_EQ(open(bytes), -1) << "lower than the converter can";
    decoder.setParam("height", 4);
    ASSERT_EQ(open(bytes), 0);
    EXPECT_EQ(decoder.nrFrames(0), 2);
    EXPECT_EQ(static_cast<unsigned>(decoder.getVideoParam(0, "FOURCC").toInt32()), QvFourcc::Y216);
    for (const int luma : {512, 128}) {
        ASSERT_EQ(decoder.readFrame(0), 0);
        const QvFrame& frame = *decoder.getFramePtr(0);
        ASSERT_EQ(frame.four_cc(), QvFourcc::Y216);
        const unsigned char* first = frame.plane();
        EXPECT_NEAR(first[0] | first[1] << 8, luma << 6, 64);
        EXPECT_NEAR(first[2] | first[3] << 8, 512 << 6, 64);
        EXPECT_EQ(frame.frameNr, luma == 512 ? 0 : 1);
    }
}

TEST_F(Raw, SettingsComeBackFromAStoredState) {
    std::unique_ptr<QvCodec> first(qv_registry()->newCodec("rawdec"));
    const std::pair<const char*, Any> rows[] = {{"FOURCC", "YUY2"}, {"width", 8},
                                                {"height", 2},      {"offset", 3},
                                                {"invert", 1},      {"framerate", QvFramerate(29.97, 2)}};
    for (const auto& [name, value] : rows) ASSERT_EQ(first->setParam(name, value), 0);
    AnyDict state, again;
    first->store(state);
    std::unique_ptr<QvCodec> second(qv_registry()->newCodec("rawdec"));
    ASSERT_EQ(second->restore(state), 0);
    second->store(again);
    EXPECT_EQ(state, again);
    EXPECT_EQ(second->getParam("video0/width").toInt32(), 8);
    EXPECT_EQ(second->getParam("interlacedFlag").toInt32(), 2);
}

}  // namespace
