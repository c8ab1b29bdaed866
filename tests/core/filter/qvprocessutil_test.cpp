#include "core/filter/qvprocessutil.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>

#include "builtin/modules.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/qvexception.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvgeometry.h"
#include "core/stream/qvbufstrm.h"
#include "tests/support/fake_streams.h"

namespace {

TEST(RescaleTimePoints, KeepsTheTypeOfTheFirstElement) {
    AnyVector out(Any("old"));
    QvProcessUtil::rescaleTimePoints({}, QvFramerate::f25p(), QvFramerate::f50p(), &out);
    EXPECT_EQ(out, AnyVector(Any("old")));
    QvProcessUtil::rescaleTimePoints(AnyVector(0, 3, 1001), QvFramerate::f23p(), QvFramerate::f59p(), &out);
    EXPECT_EQ(out, AnyVector(0, 7, 2502));
    QvProcessUtil::rescaleTimePoints(AnyVector(Any(10LL), Any(4)), QvFramerate::f50p(), QvFramerate::f25p(),
                                     &out);
    EXPECT_EQ(out, AnyVector(Any(5LL), Any(2LL)));
    QvProcessUtil::rescaleTimePoints(out, QvFramerate::f25p(), QvFramerate::f50p(), &out);
    EXPECT_EQ(out, AnyVector(Any(10LL), Any(4LL)));
    EXPECT_THROW(QvProcessUtil::rescaleTimePoints(out, QvFramerate(), QvFramerate(), nullptr),
                 QvAssertFailure);
    EXPECT_THROW(QvProcessUtil::rescaleTimePoints(AnyVector(Any(1.0)), QvFramerate(), QvFramerate(), &out),
                 QvAssertFailure);
}

TEST(SmartRenderDelays, AreRelativeToTheEarliestStream) {
    NullMuxModule module;
    std::unique_ptr<QvCodec> codec(module.create());
    ASSERT_TRUE(codec);
    codec->init();
    auto& muxer = dynamic_cast<QvMuxer&>(*codec);
    AnyDict delays("old", 1);
    QvProcessUtil::calculateSRAudioDelayCorrections(nullptr, delays);
    EXPECT_TRUE(delays.empty());
    ASSERT_TRUE(muxer.addStream(qvAudioStream, {}));
    ASSERT_TRUE(muxer.addStream(qvAudioStream, {}));
    FakeAudioEncoder first, second;
    muxer.stream(qvAudioStream, 0)->setAtachee(&first);
    muxer.stream(qvAudioStream, 1)->setAtachee(&second);
    first.params.set("smartRenderDelay", MediaTime(500));
    QvProcessUtil::calculateSRAudioDelayCorrections(&muxer, delays);
    EXPECT_TRUE(delays.empty()) << "without a video stream";
    ASSERT_TRUE(muxer.addStream(qvVideoStream, {}));
    QvProcessUtil::calculateSRAudioDelayCorrections(&muxer, delays);
    EXPECT_EQ(delays.get("video").asVector(), AnyVector(Any(500LL)));
    EXPECT_EQ(delays.get("audio").asVector(), AnyVector(Any(0LL), Any(500LL)));
    second.params.set("smartRenderDelay", MediaTime(-40));
    QvProcessUtil::calculateSRAudioDelayCorrections(&muxer, delays);
    EXPECT_EQ(delays.get("audio").asVector(), AnyVector(Any(0LL), Any(540LL)));
    first.params.set("smartRenderDelay", 7);
    second.params.clear();
    QvProcessUtil::calculateSRAudioDelayCorrections(&muxer, delays);
    EXPECT_TRUE(delays.empty());
}

TEST(YSwingCorrect, ChangesTheLumaOfY216Alone) {
    EXPECT_EQ(YSwingCorrect::table8()[0], 16);
    EXPECT_EQ(YSwingCorrect::table8()[255], 235);
    EXPECT_EQ(YSwingCorrect::table8()[1], 17);
    EXPECT_EQ(YSwingCorrect::table16()[0], 4096);
    EXPECT_EQ(YSwingCorrect::table16()[65535], 60160);
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
