#include "core/decode/qvdecoder.h"

#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"
#include "tests/support/log_capture.h"

namespace {

class Contract : public testing::Test {
  protected:
    Contract() {
        decoder.init();
        decoder.setParam("filename", "a.mov");
        decoder.open();
        decoder.calls.clear();
    }
    FakeDecoder decoder;
};

// Answers its streams from getParam alone, as a plug-in may.
class ByParam : public FakeDecoder {
  public:
    using FakeDecoder::getParam;
    void getParam(const char* name, Any& value) const override {
        if (std::strcmp(name, "video0") == 0)
            value = AnyDict("width", 720);
        else
            QvDecodePipe::getParam(name, value);
    }
    void getStreamParams(int type, int stream, AnyDict& params) const override {
        QvDecodePipe::getStreamParams(type, stream, params);
    }
    void getStreamParam(int type, int stream, const char* name, Any& value) const override {
        QvDecodePipe::getStreamParam(type, stream, name, value);
    }
};

TEST_F(Contract, StreamParametersAreReachedByName) {
    EXPECT_EQ(decoder.getParam("video0/frames").toInt32(), 100);
    EXPECT_EQ(decoder.getParam("audio0/channels").toInt32(), 1);
    EXPECT_EQ(decoder.getParam("audio0").asDict().getInt32("aBitrate"), 192);
    EXPECT_FALSE(decoder.getParam("video0/none").isValid());
    for (const char* name :
         {"video", "videos", "audio/x", "subpicture", "video0x", "video99999999999999/width"})
        EXPECT_FALSE(decoder.getParam(name).isValid()) << name;
    EXPECT_THROW(decoder.getParam("video1/width"), QvAssertFailure);
    EXPECT_THROW(decoder.getParam("video-1/width"), QvAssertFailure);
    EXPECT_THROW(decoder.setStreamParam(1, 0, "x", 1), QvParamException);
}

TEST(DecoderByParam, DefaultsOfBothSidesMeet) {
    ByParam decoder;
    decoder.init();
    EXPECT_EQ(decoder.getVideoParam(0, "width").toInt32(), 720);
    EXPECT_EQ(decoder.getParam("video0/width").toInt32(), 720);
    AnyDict params("stale", 1);
    decoder.getStreamParams(qvVideoStream, 1, params);
    EXPECT_TRUE(params.empty()) << "no answer clears the target, and asking ends";
    EXPECT_FALSE(decoder.getParam("audio3/samplerate").isValid());
}

TEST_F(Contract, SeeksGoToTheFrameAndSampleOfATime) {
    const auto seek = [this](long long ticks, int type, int stream) {
        decoder.calls.clear();
        EXPECT_EQ(decoder.seek(MediaTime(ticks), type, stream), 0);
        return decoder.calls.back();
    };
    const long long frame = MediaTime::defaultTimescale / 25;
    EXPECT_EQ(seek(7 * frame, 1, 0), "frame 7 of 0");
    EXPECT_EQ(seek(7 * frame - 1, 1, 0), "frame 6 of 0");
    EXPECT_EQ(seek(MediaTime::defaultTimescale, 2, 0), "sample 48000 of 0");
    EXPECT_EQ(seek(3 * frame, 4, 0), "frame 3 of 0") << "a subpicture stream follows its video";
    EXPECT_THROW(decoder.seek(MediaTime(), 4, 1), QvAssertFailure) << "no video and no rate of its own";
    EXPECT_THROW(decoder.seek(MediaTime(), 3, 0), QvAssertFailure);

    decoder.calls.clear();
    EXPECT_EQ(decoder.seekAll(MediaTime(2.0)), 0);
    EXPECT_EQ(decoder.calls, (std::vector<std::string>{"frame 50 of 0", "sample 96000 of 0"}));
    decoder.seekResult = -4;
    EXPECT_EQ(decoder.seekAll(MediaTime(2.0)), -1);

    EXPECT_EQ(decoder.duration(1, 0).value(), 4 * MediaTime::defaultTimescale);
    EXPECT_EQ(decoder.duration(2, 0).value(), 4000 * (MediaTime::defaultTimescale / 48000));
    EXPECT_THROW(decoder.duration(4, 0), QvAssertFailure);
}

TEST_F(Contract, ElementaryStreamsAreDescribed) {
    QvElementaryStream stream;
    decoder.elementaryStream(1, 0, &stream);
    EXPECT_TRUE(stream.filename == "a.mov" && stream.framerate == QvFramerate(25.0));
    EXPECT_TRUE(stream.type == 1 && stream.videoCodec == "N/A" && stream.pid == 33);
    EXPECT_EQ(stream.rate, 1234567);
    decoder.elementaryStream(2, 0, &stream);
    EXPECT_TRUE(stream.rate == 192000 && stream.pid == -1);

    const auto refusal = [this](int type, int nr, QvElementaryStream* out) {
        return failureOf([&] { decoder.elementaryStream(type, nr, out); });
    };
    EXPECT_EQ(refusal(1, 0, nullptr), "Invalid stream pointer");
    EXPECT_EQ(refusal(4, 0, &stream), "Invalid stream type");
    EXPECT_EQ(refusal(1, -1, &stream), "Invalid stream number");
    EXPECT_EQ(refusal(1, 2, &stream), "Invalid stream number");
    EXPECT_EQ(refusal(1, 1, &stream), "Internal decoder error");
}

TEST_F(Contract, OverridesRememberWhatWasThere) {
    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", Any()), 0) << "nothing to go back to";
    EXPECT_FALSE(decoder.override(1, 0, "frameAspect").isValid());
    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", 2.0), 0);
    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", 3.0), 0);
    EXPECT_EQ(decoder.override(1, 0, "frameAspect").toDouble(), 3.0);
    EXPECT_EQ(decoder.override(1, 0, "frameAspect_orig").toDouble(), 1.5);
    EXPECT_EQ(decoder.overrides(1).size(), 1);

    AnyDict state;
    decoder.store(state);
    EXPECT_TRUE(state["name"] == "unnamed");
    EXPECT_EQ(state.descendant("vidsOverride.0.frameAspect")->toDouble(), 3.0);
    EXPECT_FALSE(state.isSet("audsOverride"));
    EXPECT_FALSE(state.isSet("subsOverride"));

    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", Any()), 0);
    EXPECT_EQ(decoder.override(1, 0, "frameAspect").toDouble(), 1.5);

    LogCapture log;
    EXPECT_EQ(decoder.setOverride(1, 0, "width", 5), -1);
    EXPECT_TRUE(log.contains("[unnamed] Tried to override width -  not allowed", QvLogMask::warning));
    EXPECT_FALSE(decoder.override(1, 0, "width").isValid());
    EXPECT_FALSE(decoder.override(3, 9, "width").isValid());
    EXPECT_TRUE(decoder.overrides(3).empty());
    for (const int stream : {-1, 1}) {
        EXPECT_THROW(decoder.setOverride(1, stream, "frameAspect", 2.0), QvAssertFailure);
        EXPECT_THROW(decoder.override(1, stream, "frameAspect"), QvAssertFailure);
    }
    decoder.close();
    EXPECT_TRUE(decoder.overrides(1).empty());
    decoder.store(state);
    EXPECT_FALSE(state.isSet("vidsOverride"));
}

TEST_F(Contract, OpeningTwiceWithoutCloseAsserts) {
    EXPECT_THROW(decoder.QvDecodePipe::open(), QvAssertFailure);
    EXPECT_EQ(decoder.getInterface(2), static_cast<QvDecodePipe*>(&decoder));
    EXPECT_EQ(decoder.getInterface(3), nullptr);
    EXPECT_EQ(decoder.setReadUserData(1, 0, true), -1);
    EXPECT_FALSE(decoder.readUserData(1, 0));
    AnyDict meta;
    EXPECT_THROW(decoder.readMeta(0, 0, meta), QvAssertFailure);
    EXPECT_THROW(decoder.encodedFrameSize(0), QvAssertFailure);
}

TEST_F(Contract, ReportIsMadeOnceFromTheWholeStream) {
    decoder.values = {0, -16384};
    const QvAudioStreamReport* report = decoder.getAudioStreamReport(0);
    ASSERT_TRUE(report);
    EXPECT_TRUE(decoder.selectedWhenRead);
    EXPECT_FALSE(decoder.isSelected(2, 0)) << "left as it was";
    EXPECT_EQ(report->nrGroups(), 3);
    EXPECT_EQ(report->samplesProcessed(), 4000);
    EXPECT_EQ(report->peak(2), 16384);
    EXPECT_NEAR(report->peakdB(0, 3999), -6.02, 0.01);
    EXPECT_EQ(decoder.calls.back(), "sample 0 of 0");
    decoder.calls.clear();
    EXPECT_EQ(decoder.getAudioStreamReport(0), report);
    EXPECT_TRUE(decoder.calls.empty());
    EXPECT_EQ(decoder.getAudioStreamReport(1), nullptr);
    EXPECT_EQ(decoder.getAudioStreamReport(-1), nullptr);
    decoder.values = {100};
    for (const long long samples : {0LL, 1600LL, 1601LL}) {
        decoder.close();
        decoder.samples = samples;
        decoder.open();
        report = decoder.getAudioStreamReport(0);
        ASSERT_TRUE(report) << samples;
        EXPECT_EQ(report->nrGroups(), samples / 1600 + 1);
        EXPECT_EQ(report->peak(report->nrGroups() - 1), samples == 1601 ? 100 : 0);
    }
}

TEST_F(Contract, NoReportOfAStreamThatFails) {
    decoder.failAtSample = 3000;
    EXPECT_EQ(decoder.getAudioStreamReport(0), nullptr);
    EXPECT_FALSE(decoder.isSelected(2, 0));
    decoder.failAtSample = -1;
    decoder.seekResult = -1;
    EXPECT_EQ(decoder.getAudioStreamReport(0), nullptr);
    decoder.seekResult = 0;
    EXPECT_NE(decoder.getAudioStreamReport(0), nullptr) << "a failure is not kept";
}

}  // namespace
