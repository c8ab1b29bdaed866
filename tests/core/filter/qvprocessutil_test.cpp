#include "core/filter/qvprocessutil.h"

#include <cstring>
#include <memory>

#include "builtin/modules.h"
#include "core/encode/qvmuxer.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"
#include "core/stream/qvbufstrm.h"
#include "tests/support/checks.h"
#include "tests/support/fake_streams.h"

namespace {

using U = QvProcessUtil;
using Rate = QvFramerate;

TEST(RescaleTimePoints, KeepsTheTypeOfTheFirstElement) {
    AnyVector out(Any("old"));
    U::rescaleTimePoints({}, Rate::f25p(), Rate::f50p(), &out);
    EXPECT_EQ(out, AnyVector(Any("old")));
    U::rescaleTimePoints(AnyVector(0, 3, 1001), Rate::f23p(), Rate::f59p(), &out);
    EXPECT_EQ(out, AnyVector(0, 7, 2502));
    U::rescaleTimePoints(AnyVector(Any(10LL), Any(4)), Rate::f50p(), Rate::f25p(), &out);
    EXPECT_EQ(out, AnyVector(Any(5LL), Any(2LL)));
    U::rescaleTimePoints(out, Rate::f25p(), Rate::f50p(), &out);
    EXPECT_EQ(out, AnyVector(Any(10LL), Any(4LL))) << "in place";
    EXPECT_THROW(U::rescaleTimePoints(out, Rate(), Rate(), nullptr), QvAssertFailure);
    EXPECT_THROW(U::rescaleTimePoints(AnyVector(Any(1.0)), Rate(), Rate(), &out), QvAssertFailure);
}

TEST(SmartRenderDelays, AreRelativeToTheEarliestStream) {
    const std::unique_ptr<QvCodec> codec(NullMuxModule().create());
    auto& muxer = dynamic_cast<QvMuxer&>(*codec);
    muxer.init();
    FakeAudioEncoder first, second;
    for (auto* encoder : {&first, &second}) {
        ASSERT_TRUE(muxer.addStream(qvAudioStream, {}));
        muxer.stream(qvAudioStream, encoder == &second)->setAtachee(encoder);
    }
    const auto delays = [&](QvMuxer* of) {
        AnyDict delays("old", 1);
        U::calculateSRAudioDelayCorrections(of, delays);
        return delays;
    };
    const auto both = [](long long video, long long a, long long b) {
        return AnyDict("video", AnyVector(Any(video)), "audio", AnyVector(Any(a), Any(b)));
    };
    EXPECT_TRUE(delays(nullptr).empty());
    first.params.set("smartRenderDelay", MediaTime(500));
    EXPECT_TRUE(delays(&muxer).empty()) << "without a video stream";
    ASSERT_TRUE(muxer.addStream(qvVideoStream, {}));
    EXPECT_EQ(delays(&muxer), both(500, 0, 500));
    second.params.set("smartRenderDelay", MediaTime(-40));
    EXPECT_EQ(delays(&muxer), both(500, 0, 540));
    first.params.set("smartRenderDelay", 7);
    second.params.clear();
    EXPECT_TRUE(delays(&muxer).empty());
}

TEST(YSwingCorrect, ChangesTheLumaOfY216Alone) {
    for (const auto& [in, out] : {std::pair{0, 16}, {1, 17}, {255, 235}})
        EXPECT_EQ(YSwingCorrect::table8()[in], out);
    EXPECT_EQ(YSwingCorrect::table16()[0], 4096);
    for (const unsigned fourcc : {QvFourcc::Y216, QvFourcc::b64a}) {
        QvFrame frame;
        ASSERT_EQ(frame.init(fourcc, 6, 3), 0);
        std::memset(frame.plane(0), 0xff, static_cast<std::size_t>(frame.plane_bytes(0)));
        EXPECT_EQ(YSwingCorrect::correct(frame), 0);
        const auto* words = reinterpret_cast<const unsigned short*>(frame.plane(0) + 2 * frame.stride(0));
        for (int x = 0; x < 12; ++x)
            EXPECT_EQ(words[x], fourcc == QvFourcc::Y216 && x % 2 == 0 ? 60160 : 65535);
    }
}

}  // namespace
