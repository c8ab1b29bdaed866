#include "builtin/sinks/memsink.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstring>
#include <memory>
#include <thread>

#include "builtin/muxers/memmux.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/init.h"
#include "core/engine/qvexception.h"
#include "core/engine/qvregistry.h"
#include "core/stream/auxinfoid.h"
#include "tests/support/pictures.h"

namespace {

class MemOutput : public testing::Test {
  protected:
    MemOutput() {
        init_wrapper(nullptr);
        pipe_.reset(QvEncodePipe::create());
        pipe_->clearStreams();
        if (pipe_->setMuxer("memmux") != 0 || pipe_->addVideoStream("rawvenc") != 0 ||
            pipe_->addAudioStream("rawaenc") != 0)
            ADD_FAILURE() << pipe_->errorDesc();
    }
    ~MemOutput() override {
        pipe_.reset();
        cleanup_wrapper();
    }
    void videoFormat(unsigned type, int width, int height) {
        pipe_->setParam("video0", AnyDict("type", static_cast<int>(type), "width", width, "height", height));
    }

    std::unique_ptr<QvEncodePipe> pipe_;
};

// A consumer on another thread sees every unit whole and in order while encoding goes on.
TEST_F(MemOutput, PollingConsumerGetsEveryUnit) {
    constexpr int count = 200;
    videoFormat(QvFourcc::I420, 320, 240);
    for (const int accelerated : {0, 1}) {
        SCOPED_TRACE(accelerated);
        pipe_->setParam("video0/accelerationOn", accelerated);
        ASSERT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
        auto* queue = pipe_->outputQueue();
        ASSERT_NE(queue, nullptr);
        std::atomic<bool> done = false;
        unsigned frames = 0;
        std::string sound;
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
                    sound += data;
                else
                    EXPECT_TRUE(data == pictureBytes(makePicture(QvFourcc::I420, 320, 240, frames++)));
            }
        });
        std::string given;
        QvPcm pcm;
        for (unsigned i = 0; i < count; ++i) {
            QvFrame frame = makePicture(QvFourcc::I420, 320, 240, i);
            ASSERT_EQ(pipe_->writeFrame(&frame, 0), 0);
            fillSound(pcm, 1920, 2, 2, 48000, i);
            given += soundBytes(pcm);
            ASSERT_EQ(pipe_->writePcm(&pcm, 0), 0);
        }
        EXPECT_EQ(pipe_->close(), 0);
        done = true;
        consumer.join();
        EXPECT_EQ(frames, static_cast<unsigned>(count));
        EXPECT_TRUE(sound == given);
    }
}

TEST_F(MemOutput, PicturesLargerThanTheUsualRing) {
    videoFormat(QvFourcc::BGR4, 1920, 1080);
    ASSERT_EQ(pipe_->open(), 0);
    for (unsigned i = 0; i < 2; ++i) {
        QvFrame frame = makePicture(QvFourcc::BGR4, 1920, 1080, i);
        ASSERT_EQ(pipe_->writeFrame(&frame, 0), 0);
    }
    pipe_->close();
    for (unsigned i = 0; i < 2; ++i) {
        const auto item = pipe_->outputQueue()->popData();
        ASSERT_EQ(item.payloadSize(), 1920 * 1080 * 4);
        EXPECT_EQ(
            std::memcmp(item.payload(), makePicture(QvFourcc::BGR4, 1920, 1080, i).plane(0), 1920 * 1080 * 4),
            0);
    }
    EXPECT_EQ(pipe_->outputQueue()->hasData(), 0);
}

TEST_F(MemOutput, BackToFiles) {
    ASSERT_EQ(pipe_->open(), 0);
    EXPECT_EQ(pipe_->setMuxer("rawmux"), QvStatus::illegalState);
    EXPECT_EQ(pipe_->close(), 0);
    ASSERT_EQ(pipe_->setMuxer("rawmux"), 0);
    EXPECT_STREQ(pipe_->sink()->name(), "filesink");
    EXPECT_EQ(pipe_->outputQueue(), nullptr);
    EXPECT_EQ(pipe_->nrStreams(), 2);
}

TEST(MemSink, States) {
    MemSink sink;
    EXPECT_EQ(sink.open(), QvStatus::illegalState);
    EXPECT_STREQ(sink.errorDesc(), "open: illegal state");
    sink.init();
    ASSERT_EQ(sink.open(), 0);
    EXPECT_EQ(sink.open(), QvStatus::illegalState);
    EXPECT_EQ(sink.close(), 0);
    EXPECT_EQ(static_cast<int>(sink.getState()), 3);
    EXPECT_EQ(sink.open(), 0);
    EXPECT_NE(sink.getInterface(qvOutputQueueInterface), nullptr);
    EXPECT_EQ(sink.getInterface(6), nullptr);
}

TEST(MemMux, States) {
    MemMux muxer;
    EXPECT_THROW(muxer.addStream(qvVideoStream, AnyDict()), QvAssertFailure);
    EXPECT_STREQ(muxer.errorDesc(), "addStream: illegal state");
    muxer.init();
    EXPECT_EQ(muxer.addStream(3, AnyDict()), nullptr);
    EXPECT_EQ(muxer.errorCode(), QvStatus::invalidStructure);
    for (const int type : {1, 2, 4}) EXPECT_NE(muxer.addStream(type, AnyDict()), nullptr);
    EXPECT_EQ(muxer.nrStreams(0), 3);
    EXPECT_EQ(muxer.open(), -1) << "nowhere to put the units";
}

}  // namespace
