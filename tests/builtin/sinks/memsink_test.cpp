#include "builtin/sinks/memsink.h"

#include <atomic>
#include <thread>

#include "builtin/muxers/memmux.h"
#include "core/stream/auxinfoid.h"
#include "tests/support/checks.h"
#include "tests/support/output_pipe.h"

namespace {

class MemOutput : public OutputPipe {
  protected:
    MemOutput() { EXPECT_EQ(pipe_->setMuxer("memmux"), 0) << pipe_->errorDesc(); }
};

// A consumer on another thread sees every unit whole and in order while encoding goes on.
TEST_F(MemOutput, PollingConsumerGetsEveryUnit) {
    constexpr int count = 200;
    addVideo(QvFourcc::I420, 320, 240);
    addAudio(2, 16, 48000);
    for (const int accelerated : {0, 1}) {
        SCOPED_TRACE(accelerated);
        pipe_->setParam("video0/accelerationOn", accelerated);
        ASSERT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
        auto* queue = pipe_->outputQueue();
        ASSERT_NE(queue, nullptr);
        std::atomic<bool> done = false;
        unsigned frames = 0;
        std::string heard, given;
        std::thread consumer([&] {
            for (bool last = false;;) {
                if (!queue->hasData()) {
                    if (last) break;
                    last = done;
                    std::this_thread::yield();
                    continue;
                }
                const auto item = queue->popData();
                const std::string data(reinterpret_cast<const char*>(item.payload()),
                                       static_cast<size_t>(item.payloadSize()));
                if (item.infoId() == static_cast<int>(QvAuxId::AUDIO_AU_CODE))
                    heard += data;
                else
                    EXPECT_TRUE(data == pictureBytes(picture(frames++)));
            }
        });
        for (unsigned i = 0; i < count; ++i) {
            writePicture(i);
            given += writeSound(1920, i);
        }
        EXPECT_EQ(pipe_->close(), 0);
        done = true;
        consumer.join();
        EXPECT_EQ(frames, static_cast<unsigned>(count));
        EXPECT_TRUE(heard == given);
    }
}

TEST_F(MemOutput, PicturesLargerThanTheUsualRingAndBackToFiles) {
    addVideo(QvFourcc::BGR4, 1920, 1080);
    ASSERT_EQ(pipe_->open(), 0);
    EXPECT_EQ(pipe_->setMuxer("rawmux"), QvStatus::illegalState);
    for (unsigned i = 0; i < 2; ++i) writePicture(i);
    pipe_->close();
    for (unsigned i = 0; i < 2; ++i) {
        const auto item = pipe_->outputQueue()->popData();
        const std::string expected = pictureBytes(picture(i));
        EXPECT_TRUE(std::string_view(reinterpret_cast<const char*>(item.payload()),
                                     static_cast<size_t>(item.payloadSize())) == expected);
    }
    EXPECT_EQ(pipe_->outputQueue()->hasData(), 0);
    ASSERT_EQ(pipe_->setMuxer("rawmux"), 0);
    EXPECT_STREQ(pipe_->sink()->name(), "filesink");
    EXPECT_EQ(pipe_->outputQueue(), nullptr);
}

TEST(MemMux, States) {
    MemMux muxer;
    EXPECT_THROW(muxer.addStream(qvVideoStream, AnyDict()), QvAssertFailure);
    muxer.init();
    EXPECT_EQ(muxer.addStream(3, AnyDict()), nullptr);
    EXPECT_EQ(muxer.errorCode(), QvStatus::invalidStructure);
    for (const int type : {1, 2, 4}) EXPECT_NE(muxer.addStream(type, AnyDict()), nullptr);
    EXPECT_EQ(muxer.open(), -1) << "nowhere to put the units";
    MemSink sink;
    EXPECT_EQ(sink.open(), QvStatus::illegalState);
    sink.init();
    ASSERT_EQ(sink.open(), 0);
    EXPECT_EQ(sink.open(), QvStatus::illegalState);
    EXPECT_EQ(sink.close(), 0);
    EXPECT_EQ(sink.open(), 0);
    EXPECT_EQ(sink.getInterface(6), nullptr);
}

}  // namespace
