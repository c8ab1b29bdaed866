#include "core/engine/qvutil.h"
#include "tests/support/checks.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"

namespace {

TEST(MatchParams, TakesWhatBothSidesKnow) {
    FakeDecoder decoder(10, QvFramerate(25.0), 640, 360);
    decoder.audio(1000, 44100, 6);
    FakeEncodePipe pipe(QvFramerate(30.0), 16, 8);
    pipe.audio(48000, 2);
    pipe.video.refused.set("height", 1);
    LogCapture log;
    QvUtil::matchParams(&decoder, 1, &pipe, AnyVector("width", "nothing", "height", u"frames", 7));
    EXPECT_EQ(pipe.video.params.get("width"), Any(640));
    EXPECT_EQ(pipe.video.params.get("height"), Any(8)) << "an unknown name stops nothing";
    EXPECT_EQ(pipe.video.params.get("frames"), Any(10));
    EXPECT_TRUE(log.contains("Can not match param:nothing", QvLogMask::warning));
    EXPECT_EQ(log.count("Can not match param:"), 2);
    QvUtil::matchParams(&decoder, 2, &pipe, AnyVector("samplerate", "channels"));
    EXPECT_EQ(pipe.audios[0]->params.get("samplerate"), Any(44100));
    EXPECT_EQ(pipe.audios[0]->params.get("channels"), Any(6));
}

TEST(MatchParams, RatesAreThoseThatTheEncoderAllows) {
    const QvFramerate p25(25.0), i25(25.0, 1), p29(29.97), i29(29.97, 1), p50(50.0);
    const struct {
        QvFramerate source;
        Any range;
        QvFramerate result;
    } cases[] = {
        {p25, Any(), p25},
        {p25, AnyVector("none", 5), p25},
        {i25, AnyVector(p25, i25, p50), i25},
        {p25, AnyVector(i25, p25, p50), p25},
        {QvFramerate(26.0), AnyVector(p50, i25, p25), p25},
        {QvFramerate(28.0, 2), AnyVector(p25, p29, i29), i29},
        {QvFramerate(24.0), AnyVector(p50, p29), p29},
    };
    for (const auto& c : cases) {
        FakeDecoder decoder(10, c.source);
        FakeEncodePipe pipe(QvFramerate(60.0));
        if (c.range.isValid()) pipe.video.params.set("framerateRange", c.range);
        QvUtil::matchParams(&decoder, 1, &pipe, AnyVector(Any("framerate")));
        EXPECT_EQ(pipe.video.params.get("framerate").asFramerate(), c.result)
            << c.source.desc(true, true).asString("");
    }
}

TEST(MatchParams, WithoutAStreamOnEitherSideNothingIsSet) {
    FakeDecoder silent(10, QvFramerate(25.0)), sounding(10, QvFramerate(25.0));
    sounding.audio(1000, 44100);
    FakeEncodePipe pipe(QvFramerate(30.0));
    const AnyVector names(Any("width"));
    LogCapture log;
    QvUtil::matchParams(nullptr, 1, &pipe, names);
    QvUtil::matchParams(&silent, 1, nullptr, names);
    QvUtil::matchParams(&silent, 2, &pipe, names);
    QvUtil::matchParams(&sounding, 2, &pipe, names);
    EXPECT_EQ(log.texts(),
              (Texts{"QvUtil::matchParams Invalid audio stream nr", "QvUtil::matchParams - No encoder"}));
    EXPECT_THROW(QvUtil::matchParams(&silent, 4, &pipe, names), QvAssertFailure);
}

}  // namespace
