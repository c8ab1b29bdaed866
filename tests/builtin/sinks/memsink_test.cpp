#include "builtin/sinks/memsink.h"

#include <atomic>

#include "core/stream/auxinfoid.h"
#include "tests/support/checks.h"
#include "tests/support/output_pipe.h"

namespace {

// A consumer on another thread sees every unit whole and in order during encoding.
TEST_F(OutputPipe, PollingConsumerGetsEveryUnit) {
    ASSERT_EQ(pipe_->setMuxer("memmux"), 0);
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

}  // namespace
