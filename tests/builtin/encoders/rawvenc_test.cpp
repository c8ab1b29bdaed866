#include "builtin/encoders/rawvenc.h"

#include <future>

#include "builtin/modules.h"
#include "builtin/shared/rawoutput.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/auxinfoid.h"
#include "tests/support/checks.h"
#include "tests/support/pictures.h"
#include "tests/support/test_stream.h"

namespace {

struct RawVideo : testing::Test {
    RawVideo() { enc().init(); }
    RawVideoEnc& enc() { return *enc_; }
    Any get(const char* name) { return static_cast<QvCodec&>(enc()).getParam(name); }
    void format(unsigned type, int width, int height, bool accelerated = false) {
        const AnyDict params("type", static_cast<int>(type), "width", width, "height", height,
                             "accelerationOn", int{accelerated});
        ASSERT_EQ(enc().setParamDict(params), 0);
    }
    void start() {
        ASSERT_EQ(enc().attachOutStream(&out_), 0);
        ASSERT_EQ(enc().open(), 0);
    }
    // Three frames wait in the worker, which stands before the shut gate with the first.
    void stall() {
        format(QvFourcc::GRAY, 32, 32, true);
        start();
        out_.shut();
        for (int i = 0; i < 3; ++i) ASSERT_EQ(enc().writeFrame(&gray_), 0);
        out_.waitForWriter();
    }

    RawVideoEncoderModule module_;
    TestStream out_;
    QvFrame gray_ = makePicture(QvFourcc::GRAY, 32, 32);
    std::unique_ptr<RawVideoEnc> enc_{static_cast<RawVideoEnc*>(module_.create())};
};

// Sizes that give odd strides and padding, so that a lost or doubled byte shows.
TEST_F(RawVideo, PutsOutThePlanesAndAnnouncesThem) {
    const struct {
        unsigned type;
        int width, height, bytes;
    } layouts[] = {
        {QvFourcc::BGR3, 33, 5, 100 * 5}, {QvFourcc::BGR4, 33, 5, 660},  {QvFourcc::I420, 34, 6, 306},
        {QvFourcc::YV12, 34, 6, 306},     {QvFourcc::I422, 34, 6, 408},  {QvFourcc::W016, 34, 6, 612},
        {QvFourcc::YUYV, 34, 5, 340},     {QvFourcc::YUY2, 34, 5, 340},  {QvFourcc::UYVY, 34, 5, 340},
        {QvFourcc::Y216, 34, 5, 680},     {QvFourcc::b64a, 33, 5, 1320}, {QvFourcc::GRAY, 33, 5, 180}};
    for (const auto& layout : layouts)
        for (const bool accelerated : {false, true}) {
            SCOPED_TRACE(qvFourccText(layout.type).data() + std::string(accelerated ? " by the worker" : ""));
            format(layout.type, layout.width, layout.height, accelerated);
            EXPECT_EQ(get("_outFrameSize"), layout.bytes);
            out_.data.clear();
            out_.units.clear();
            start();
            std::string expected;
            for (unsigned seed = 1; seed <= 7; ++seed) {
                QvFrame frame = makePicture(layout.type, layout.width, layout.height, seed);
                expected += pictureBytes(frame);
                ASSERT_EQ(enc().writeFrame(&frame), 0);
                fillPicture(frame, 99);  // the buffer is the caller's again
            }
            ASSERT_EQ(enc().close(), 0);
            EXPECT_TRUE(out_.data == expected);
            const TestStream::Unit unit{QvAuxId::VIDEO_AU_CODE, static_cast<unsigned>(layout.bytes), 32};
            EXPECT_EQ(out_.units, std::vector(7, unit));
        }
}

TEST_F(RawVideo, PacksPaddedRows) {
    format(QvFourcc::I420, 16, 4);
    out_.setParam(rawWriteThrough, 1);
    start();
    const AnyVector strides(48, 24, 24);
    QvFrame padded;
    ASSERT_EQ(padded.init(QvFourcc::I420, 16, 4, nullptr, &strides), 0);
    QvFrame packed = makePicture(QvFourcc::I420, 16, 4);
    fillPicture(padded, 5);
    packed = padded;
    ASSERT_EQ(enc().writeFrame(&padded), 0);
    EXPECT_TRUE(out_.data == pictureBytes(packed));
}

TEST_F(RawVideo, StalledOutputHoldsTheFourthFrame) {
    stall();
    auto fourth = std::async(std::launch::async, [&] { return enc().writeFrame(&gray_); });
    EXPECT_EQ(fourth.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
    out_.open();
    EXPECT_EQ(fourth.get(), 0);
    EXPECT_EQ(enc().close(), 0);
    EXPECT_EQ(out_.units.size(), 4u);
}

TEST_F(RawVideo, AbortDropsWhatIsQueued) {
    stall();
    auto aborted = std::async(std::launch::async, [&] { return enc().abort(); });
    EXPECT_EQ(aborted.wait_for(std::chrono::milliseconds(200)), std::future_status::timeout)
        << "the frame that is being written is finished";
    out_.open();
    EXPECT_EQ(aborted.get(), 0);
    EXPECT_EQ(out_.units.size(), 1u);
    EXPECT_EQ(out_.data.size(), 1024u);
    EXPECT_EQ(enc().getState(), QvCodec::stateInitialised);
    EXPECT_EQ(enc().open(), 0) << "it can be used again";
}

TEST_F(RawVideo, RefusedBlockIsABrokenContract) {
    format(QvFourcc::GRAY, 32, 32);
    out_.failAfter = 1500;
    start();
    ASSERT_EQ(enc().writeFrame(&gray_), 0);
    LogCapture log;
    EXPECT_THROW(enc().writeFrame(&gray_), QvAssertFailure);
    EXPECT_TRUE(log.contains("Error in raw encoder, can not allocate buffer, size=1024"));
    out_.lock();  // not left locked
    out_.unlock();
    EXPECT_EQ(enc().close(), 0);
}

TEST_F(RawVideo, FailureOfTheWorkerReachesTheCaller) {
    format(QvFourcc::GRAY, 32, 32, true);
    for (const bool through : {true, false}) {
        if (through) out_.setParam(rawWriteThrough, 1);
        out_.data.clear();
        out_.failAfter = 1500;
        start();
        int result = 0;
        for (int i = 0; i < 1000 && result == 0; ++i) result = enc().writeFrame(&gray_);
        EXPECT_EQ(result, -1);
        EXPECT_STREQ(enc().errorDesc(), through ? "Can not write to the output"
                                                : "Error in raw encoder, can not allocate buffer, size=1024");
        EXPECT_EQ(enc().close(), QvStatus::failed);
        EXPECT_EQ(out_.data.size(), 1024u);
        out_.failAfter = SIZE_MAX;
        ASSERT_EQ(enc().open(), 0) << "the failure belongs to the run before";
        EXPECT_EQ(enc().writeFrame(&gray_), 0);
        EXPECT_EQ(enc().close(), 0);
        if (through) out_.setParam(rawWriteThrough, 0);
    }
}

TEST_F(RawVideo, RefusesWhatDoesNotFit) {
    format(QvFourcc::I420, 64, 48);
    QvFrame good = makePicture(QvFourcc::I420, 64, 48);
    EXPECT_EQ(enc().writeFrame(&good), QvStatus::illegalState);
    EXPECT_EQ(enc().open(), QvStatus::failed);
    EXPECT_STREQ(enc().errorDesc(), "Output stream not attached");
    start();
    EXPECT_EQ(enc().open(), QvStatus::failed);
    QvFrame none;
    QvFrame small = makePicture(QvFourcc::I420, 64, 46);
    QvFrame other = makePicture(QvFourcc::I422, 64, 48);
    for (QvFrame* frame : {static_cast<QvFrame*>(nullptr), &none, &small, &other})
        EXPECT_EQ(enc().writeFrame(frame), QvStatus::invalidArgument);
    EXPECT_TRUE(out_.data.empty());
    EXPECT_EQ(enc().writeFrame(&good), 0);
    EXPECT_EQ(enc().close(), 0);
    const std::pair<const char*, Any> rows[] = {
        {"type", 1234}, {"width", -4}, {"width", 1 << 30}, {"framerate", 0}};
    for (const auto& [name, value] : rows)
        EXPECT_EQ(enc().setParam(name, value), QvStatus::invalidParam) << name;
    EXPECT_EQ(get("width"), 64);
}

}  // namespace
