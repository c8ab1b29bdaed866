#include "builtin/pipes/output/outputpreparation.h"

#include "core/measure/qvgeometry.h"
#include "core/stream/qvbufstrm.h"
#include "tests/builtin/pipes/output/output_parts.h"
#include "tests/support/test_stream.h"

namespace {

struct Preparation : OutputParts {
    void run() { OutputPreparation(streams_, end_).run(); }
    FakeMuxer& muxer(const char* name) {
        end_.put(std::make_unique<FakeMuxer>(name));
        return static_cast<FakeMuxer&>(*end_.muxer());
    }
};

TEST_F(Preparation, VideoGivesWayToTheTotalBitrateOfAvchd) {
    muxer("anymux");
    auto& video = append<FakeVideoEncoder>(qvVideoStream, {});
    append<FakeAudioEncoder>(qvAudioStream, AnyDict("aBitrate", 384));
    struct Case {
        int avchd;
        double maximum, average, maximumAfter, averageAfter;
    };
    constexpr double left = 22536000 - 384000;
    const Case cases[] = {
        {1, left, left, left, left}, {1, left + 1, left, left, left}, {1, left + 1, left + 1, left, left},
        {1, 4e7, 1000, left, 1000},  {0, 4e7, 3e7, 4e7, 3e7},
    };
    for (const auto& [avchd, maximum, average, maximumAfter, averageAfter] : cases) {
        LogCapture log;
        video.params = AnyDict("_isAVCHD", avchd, "maxVBitrate", maximum, "vBitrate", average);
        run();
        EXPECT_EQ(video.params.get("maxVBitrate"), Any(maximumAfter));
        EXPECT_EQ(video.params.get("vBitrate"), Any(averageAfter));
        EXPECT_EQ(log.contains("larger than maximal allowed for AVCHD"), maximumAfter != maximum);
    }
}

TEST_F(Preparation, TheFirstVideoEncodersRateGoesToAllOthers) {
    auto& target = muxer("anymux");
    auto& audio = append<FakeAudioEncoder>(qvAudioStream, {});
    const QvFramerate rate(50.0);
    append<FakeVideoEncoder>(qvVideoStream, AnyDict("framerate", rate));
    auto& second = append<FakeVideoEncoder>(qvVideoStream, AnyDict("framerate", QvFramerate(24.0)));
    audio.refused = AnyDict("framerate", 1);
    streams_.append(std::make_unique<OutputStream>(qvAudioStream));  // whose encoder is missing
    run();
    EXPECT_EQ(second.params.get("framerate").asFramerate(), rate);
    EXPECT_EQ(target.params.get("framerate").asFramerate(), rate);
    EXPECT_FALSE(audio.params.isSet("framerate"));
}

TEST_F(Preparation, AacIsAdjustedForAMultiplexerOfManyPrograms) {
    struct Aac : FakeAudioEncoder {
        const char* name() const override { return "aacaenc"; }
    };
    auto& aac = append<Aac>(qvAudioStream, {});
    auto& other = append<FakeAudioEncoder>(qvAudioStream, {});
    for (const auto& [name, adjusted] :
         {std::pair("mpegtsmux", false), {"rawmux", false}, {"mptsmux", true}}) {
        muxer(name);
        run();
        EXPECT_EQ(aac.params.get("aacTsAdjust") == Any(1), adjusted) << name;
    }
    EXPECT_FALSE(other.params.isSet("aacTsAdjust"));
}

TEST_F(Preparation, BuffersAreAsLargeAsThePicturesAskFor) {
    append<FakeVideoEncoder>(qvVideoStream, AnyDict("dstBuffSize", 12345));
    end_.setSink("filesink");
    run();
    EXPECT_EQ(static_cast<const QvCodec&>(*end_.sink()).getParam("bufsize"), 12345) << "no multiplexer";
    EXPECT_EQ(end_.sink()->stream()->atachee(), streams_.videoEncoder(0));
    TestStream stream;
    streams_[0].bitstream = &stream;
    muxer("rawmux");
    run();
    EXPECT_EQ(stream.getParam("size"), 12345);
}

}  // namespace
