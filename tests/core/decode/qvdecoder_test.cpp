#include "core/decode/qvdecoder.h"

#include "core/engine/status.h"
#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"

namespace {

struct Contract : testing::Test {
    Contract() {
        decoder.init();
        decoder.setParam("filename", "a.mov");
        decoder.open();
        decoder.calls.clear();
    }
    FakeDecoder decoder;
};

TEST_F(Contract, StreamParametersAreReachedByName) {
    for (const char* name :
         {"video", "videos", "audio/x", "subpicture", "video0x", "video99999999999999/width"})
        EXPECT_FALSE(decoder.getParam(name).isValid()) << name;
    EXPECT_THROW(decoder.getParam("video1/width"), QvAssertFailure);
}

TEST_F(Contract, AStreamIsDescribedOrTheMistakeNamed) {
    QvElementaryStream is;
    decoder.elementaryStream(qvVideoStream, 0, &is);
    EXPECT_EQ(is.type, qvVideoStream);
    EXPECT_STREQ(is.filename.asString(""), "a.mov");
    EXPECT_TRUE(is.framerate == QvFramerate(25.0));
    const struct {
        int type, stream;
        QvElementaryStream* to;
        const char* why;
    } wrong[] = {{1, 0, nullptr, "Invalid stream pointer"},
                 {4, 0, &is, "Invalid stream type"},
                 {1, -1, &is, "Invalid stream number"},
                 {2, 2, &is, "Invalid stream number"},
                 {2, 1, &is, "Internal decoder error"}};
    for (const auto& c : wrong) {
        std::string why;
        try {
            decoder.elementaryStream(c.type, c.stream, c.to);
        } catch (const QvAssertFailure& failure) {
            why = failure.what();
        }
        EXPECT_NE(why.find(c.why), why.npos) << why << " of " << c.type << " " << c.stream;
    }
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

    decoder.calls.clear();
    EXPECT_EQ(decoder.seekAll(MediaTime(2.0)), 0);
    EXPECT_EQ(decoder.calls, (std::vector<std::string>{"frame 50 of 0", "sample 96000 of 0"}));
    decoder.seekResult = -4;
    EXPECT_EQ(decoder.seekAll(MediaTime(2.0)), QvStatus::failed);

    EXPECT_EQ(decoder.duration(1, 0).value(), 4 * MediaTime::defaultTimescale);
    EXPECT_EQ(decoder.duration(2, 0).value(), 4000 * (MediaTime::defaultTimescale / 48000));
}

TEST_F(Contract, OverridesRememberWhatWasThere) {
    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", 2.0), 0);
    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", 3.0), 0);
    EXPECT_EQ(decoder.override(1, 0, "frameAspect").toDouble(), 3.0);
    EXPECT_EQ(decoder.override(1, 0, "frameAspect_orig").toDouble(), 1.5);

    EXPECT_EQ(decoder.setOverride(1, 0, "frameAspect", Any()), 0);
    EXPECT_EQ(decoder.override(1, 0, "frameAspect").toDouble(), 1.5);

    LogCapture log;
    EXPECT_EQ(decoder.setOverride(1, 0, "width", 5), QvStatus::failed);
    EXPECT_TRUE(log.contains("[unnamed] Tried to override width -  not allowed", QvLogMask::warning));
}

TEST_F(Contract, ReportIsMadeOnceFromTheWholeStream) {
    decoder.values = {0, -16384};
    const QvAudioStreamReport* report = decoder.getAudioStreamReport(0);
    ASSERT_TRUE(report);
    EXPECT_TRUE(decoder.selectedWhenRead);
    EXPECT_FALSE(decoder.isSelected(qvAudioStream, 0)) << "left as it was";
    EXPECT_EQ(report->nrGroups(), 3);
    EXPECT_EQ(report->peak(2), 16384);
    EXPECT_NEAR(report->peakdB(0, 3999), -6.02, 0.01);
    decoder.calls.clear();
    EXPECT_EQ(decoder.getAudioStreamReport(0), report);
    EXPECT_TRUE(decoder.calls.empty());
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
    EXPECT_FALSE(decoder.isSelected(qvAudioStream, 0));
    decoder.failAtSample = -1;
    decoder.seekResult = -1;
    EXPECT_EQ(decoder.getAudioStreamReport(0), nullptr);
    decoder.seekResult = 0;
    EXPECT_NE(decoder.getAudioStreamReport(0), nullptr) << "a failure is not kept";
}

}  // namespace
