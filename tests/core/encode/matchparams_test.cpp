#include "core/engine/qvutil.h"
#include "tests/support/checks.h"
#include "tests/support/fake_streams.h"

namespace {

TEST(MatchParams, RatesAreThoseThatTheEncoderAllows) {
    const QvFramerate p25(25.0), i25(25.0, 1), p29(29.97), i29(29.97, 1), p50(50.0);
    const struct {
        QvFramerate source;
        Any range;
        QvFramerate result;
    } cases[] = {
        {p25, Any(), p25},
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

}  // namespace
