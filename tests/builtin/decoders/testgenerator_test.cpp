#include "builtin/decoders/testgenerator.h"

#include <memory>

#include "core/engine/status.h"
#include "core/media/qvsoundbytes.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"

namespace {

AnyDict videoDict(int width, int height, double rate, double seconds) {
    return AnyDict("width", width, "height", height, "framerate", rate, "duration", seconds);
}

class Testgen : public testing::Test {
  protected:
    Testgen() { decoder.init(); }
    ~Testgen() override { decoder.close(); }

    int open(const AnyVector& vids, const AnyVector& auds) {
        decoder.setParam("streams", AnyDict("vids", vids, "auds", auds));
        return decoder.open();
    }
    int openVideo(const AnyDict& dict) { return open(AnyVector(Any(dict)), AnyVector()); }
    int openAudio(double seconds) { return open(AnyVector(), AnyVector(Any(AnyDict("duration", seconds)))); }

    std::string pixels() { return pictureBytes(*decoder.getFramePtr(0)); }

    EngineScope engine;
    GeneratorPipe decoder;
};

TEST_F(Testgen, FramesCountUpFromWhereTheSeekWent) {
    ASSERT_EQ(openVideo(videoDict(160, 120, 25, 0.2)), 0);
    EXPECT_EQ(decoder.nrFrames(0), 5);
    Texts pictures;
    for (int i = 0; i < 7; ++i) {
        ASSERT_EQ(decoder.readFrame(0), 0);
        EXPECT_EQ(decoder.getFramePtr(0)->frameNr, i) << "also after the end";
        pictures.push_back(pixels());
    }
    EXPECT_FALSE(pictures[0] == pictures[1]) << "the cursor moves";
    for (const int i : {3, 0, 6, 0}) {
        decoder.getFramePtr(0)->setBlack();  // a reader may spoil its frame
        ASSERT_EQ(decoder.seekToFrame(i, 0), 0);
        ASSERT_EQ(decoder.readFrame(0), 0);
        EXPECT_EQ(decoder.getFramePtr(0)->frameNr, i);
        EXPECT_TRUE(pixels() == pictures[static_cast<std::size_t>(i)]);
    }
}

// The circle of the card is white at its four ends: 12 units of a 16th from the left, 8 from the top.
TEST_F(Testgen, TheCardHasARoundCircle) {
    ASSERT_EQ(openVideo(videoDict(320, 256, 25, 1)), 0);
    ASSERT_EQ(decoder.readFrame(0), 0);
    const QvFrame& frame = *decoder.getFramePtr(0);
    const int x = 12 * 320 / 16, y = 8 * 256 / 16, radius = 3 * 256 / 16;
    for (const auto& [dx, dy] : {std::pair{radius, 0}, {-radius, 0}, {0, radius}, {0, -radius}})
        EXPECT_EQ(*frame.pixelPtr(x + dx, y + dy), 255) << dx << " " << dy;

    // The digits of the timecode fill about half of its box, 7 by 2 units at the lower left.
    const int left = 256 / 32, top = 256 - 4 - 3 * 16, background = *frame.pixelPtr(left, top);
    int rows = 0;
    for (int row = top; row < top + 32; ++row) {
        const unsigned char* line = frame.pixelPtr(left, row);
        bool digits = false;
        for (int i = 0; i < 112; ++i) digits |= line[i * frame.pixelBytes()] != background;
        rows += digits;
    }
    EXPECT_NEAR(rows, 16, 8);
}

TEST_F(Testgen, GrayBarsStandStill) {
    const int levels[] = {0, 26, 51, 77, 102, 128, 153, 179, 204, 230, 255};
    for (const int width : {221, 220}) {
        decoder.close();
        decoder.setParam("mode", "graybar");
        ASSERT_EQ(openVideo(videoDict(width, 64, 25, 1)), 0);
        ASSERT_EQ(decoder.readFrame(0), 0);
        const QvFrame& frame = *decoder.getFramePtr(0);
        const std::string first = pixels();
        const int bar = (width - 1) / 11;  // the last column never belongs to one
        for (int i = 0; i < 11; ++i) EXPECT_EQ(*frame.pixelPtr(i * bar + bar / 2, 30), levels[i]);
        for (int x = 11 * bar; x < width; ++x) EXPECT_EQ(*frame.pixelPtr(x, 30), 128) << x;
        ASSERT_EQ(decoder.readFrame(0), 0);
        EXPECT_TRUE(pixels() == first);
    }
}

TEST_F(Testgen, OverridesRedrawAndRestore) {
    ASSERT_EQ(open(AnyVector(Any(videoDict(320, 240, 25, 2))), AnyVector(Any(AnyDict("duration", 2.0)))), 0);
    const std::string before = pixels();

    ASSERT_EQ(decoder.setOverride(1, 0, "frameAspect", 16.0 / 9), 0);
    EXPECT_DOUBLE_EQ(decoder.getVideoParam(0, "pixelAspect").toDouble(), 16.0 / 9 * 240 / 320);
    EXPECT_FALSE(pixels() == before);
    ASSERT_EQ(decoder.setOverride(1, 0, "frameAspect", Any()), 0);
    EXPECT_TRUE(pixels() == before);

    ASSERT_EQ(decoder.setOverride(1, 0, "framerate", QvFramerate(50.0)), 0);
    EXPECT_EQ(decoder.nrFrames(0), 100);
    EXPECT_TRUE(decoder.getFramePtr(0)->framerate == QvFramerate(50.0));
    ASSERT_EQ(decoder.setOverride(1, 0, "framerate", Any()), 0);
    ASSERT_EQ(decoder.readFrame(0), 0);
    const std::string shown = pixels();
    ASSERT_EQ(decoder.setOverride(1, 0, "framerate", QvFramerate(50.0)), 0);
    ASSERT_EQ(decoder.setOverride(1, 0, "framerate", Any()), 0);
    EXPECT_TRUE(pixels() == shown) << "with the parts that move";
    ASSERT_EQ(decoder.setOverride(1, 0, "framerate", QvFramerate(50.0)), 0);
    ASSERT_EQ(decoder.setOverride(1, 0, "duration", 0.5), 0);
    EXPECT_EQ(decoder.nrFrames(0), 25);
    EXPECT_EQ(decoder.nrSamples(0), 22050);
    EXPECT_EQ(decoder.readSamples(30000, 0), 22050);

    decoder.close();
    ASSERT_EQ(decoder.open(), 0);
    EXPECT_EQ(decoder.nrFrames(0), 50) << "nothing of an override is left";
}

TEST_F(Testgen, ALoopIsTheSoundAndThenSilence) {
    for (const int count : {1, 2, 5}) {
        QvPcm sound;
        fillSound(sound, count, 1, 2, 48000);
        SoundLoop loop;
        ASSERT_EQ(loop.init(sound, 3, 100), 0);
        short got[7] = {};
        loop.copy(reinterpret_cast<unsigned char*>(got), 7);
        const auto* from = reinterpret_cast<const short*>(sound.ptr(0));
        for (int i = 0; i < 7; ++i) EXPECT_EQ(got[i], i % 3 < count ? from[i % 3] : 0) << count << " " << i;
    }
}

TEST_F(Testgen, BeepsOnceASecondAndEnds) {
    ASSERT_EQ(openAudio(2.5), 0);
    const std::unique_ptr<QvPcm> beep(QvSoundBytes::create(0));
    std::string heard;
    int result = 0;
    while ((result = decoder.readSamples(10007, 0)) > 0) {
        heard += soundBytes(*decoder.getAudioPtr(0));
        EXPECT_EQ(decoder.getAudioPtr(0)->position() * 4, static_cast<long long>(heard.size()));
    }
    EXPECT_EQ(result, QvStatus::endOfStream);
    const auto second = soundBytes(*beep).substr(0, 32448 * 4) + std::string((44100 - 32448) * 4, 0);
    EXPECT_TRUE(heard == repeated(second, 3).substr(0, 110250 * 4));

    ASSERT_EQ(decoder.seekToSample(50000, 0), 0);
    ASSERT_EQ(decoder.readSamples(100000, 0), 60250) << "more than the buffer held";
    EXPECT_TRUE(soundBytes(*decoder.getAudioPtr(0)) == heard.substr(50000 * 4));
    EXPECT_EQ(decoder.seekToSample(110249, 0), 0);
    for (const long long bad : {110250LL, -1LL}) EXPECT_THROW(decoder.seekToSample(bad, 0), QvAssertFailure);
}

TEST_F(Testgen, BlackAndSilenceAreOfAnyFormat) {
    AnyDict video("content", "black", "width", 6, "height", 4, "frames", 3), sound("content", "silence");
    video.set("framerate", Any(QvFramerate(QvRatio(25, 1))));
    sound.set("samples", 100);
    sound.set("samplerate", 8000);
    sound.set("channels", 5);
    sound.set("bitsPerSample", 24);
    AnyVector vids, auds;
    vids.append(video);
    auds.append(sound);
    decoder.setParam("streams", AnyDict("vids", Any(vids), "auds", Any(auds)));
    ASSERT_EQ(decoder.open(), 0);
    for (int i = 0; i < 3; ++i) {
        ASSERT_EQ(decoder.readFrame(0), 0);
        const QvFrame& frame = *decoder.getFramePtr(0);
        EXPECT_EQ(frame.frameNr, i);
        for (int byte = 0; byte < 6 * 4 * 4; ++byte)
            EXPECT_TRUE(byte % 4 == 3 || frame.plane(0)[byte] == 0) << byte;
    }
    EXPECT_EQ(decoder.nrSamples(0), 100);
    EXPECT_EQ(decoder.readSamples(1000, 0), 100);
    const QvPcm& pcm = *decoder.getAudioPtr(0);
    EXPECT_EQ(pcm.channels(), 5);
    EXPECT_EQ(pcm.bytesPerSample(), 3);
    for (int byte = 0; byte < 100 * 15; ++byte) EXPECT_EQ(pcm.ptr(0)[byte], 0) << byte;

    for (const auto& [key, value] : {std::pair{"samplerate", 0}, {"channels", 65}, {"bitsPerSample", 8}}) {
        decoder.close();
        AnyDict wrong = sound;
        wrong.set(key, value);
        AnyVector wrongs;
        wrongs.append(wrong);
        decoder.setParam("streams", AnyDict("auds", Any(wrongs)));
        decoder.open();
        EXPECT_EQ(decoder.nrStreams(qvAudioStream), 0) << key;
    }
}

TEST_F(Testgen, MissingParametersAssertAndLeaveItClosed) {
    EXPECT_EQ(open(AnyVector(), AnyVector()), QvStatus::invalidStructure);
    EXPECT_EQ(decoder.getState(), QvCodec::stateInitialised);
    const std::pair<const char*, Any> rows[] = {
        {"framerate", Any()}, {"width", 31}, {"picture", "/no/such/picture.png"}};
    for (const auto& [key, value] : rows) {
        AnyDict dict = videoDict(64, 31, 25, 1);
        dict.set(key, value);
        EXPECT_THROW(openVideo(dict), QvAssertFailure);
        EXPECT_EQ(decoder.getState(), 2);
        EXPECT_EQ(decoder.nrStreams(1), 0);
    }
}

TEST_F(Testgen, AnySizeAndRateDrawsInsideItsFrame) {
    for (const auto& [width, height] : {std::pair{1, 200}, {200, 1}, {2000, 40}, {127, 61}})
        for (const double rate : {1.0, 29.97, 60.0, 1000.0}) {
            ASSERT_EQ(openVideo(videoDict(width, height, rate, 1)), 0);
            for (int i = 0; i < 3; ++i) EXPECT_EQ(decoder.readFrame(0), 0) << width << "x" << height;
        }
    ASSERT_EQ(open(AnyVector(Any(videoDict(0, 64, 25, 1)), Any(videoDict(64, 64, 25, 1))), AnyVector()), 0);
    EXPECT_EQ(decoder.nrStreams(1), 1) << "a stream that can not be is left out";
}

TEST_F(Testgen, APictureGivesTheSizeAndViewsAreChained) {
    QvFrame picture;
    picture.init(QvFourcc::BGR4, 96, 48);
    AnyDict dict = videoDict(640, 480, 25, 1);
    dict.set("picture", Any(static_cast<const void*>(&picture)));
    ASSERT_EQ(openVideo(dict), 0);
    EXPECT_EQ(decoder.getVideoParam(0, "width").toInt32(), 96);

    dict = videoDict(64, 64, 25, 1);
    dict.set("nrViews", Any(3));
    ASSERT_EQ(openVideo(dict), 0);
    ASSERT_EQ(decoder.seekToFrame(7, 0), 0);
    const QvFrame* head = decoder.getFramePtr(0);
    ASSERT_EQ(QvFrame_nrViews(head), 3);
    for (const QvFrame* view = head; view; view = view->nextView()) EXPECT_EQ(view->frameNr, 7);
}

}  // namespace
