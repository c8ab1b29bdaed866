#include "core/transcode/push/pushencoder.h"

#include <atomic>
#include <thread>

#include "core/engine/qvutil.h"
#include "core/job/processparams.h"
#include "tests/support/checks.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/output_pipe.h"

namespace {

constexpr int width = 64, height = 48, samplerate = 48000;
const QvFramerate rate(QvRatio(30000, 1001));
const AnyDict videoFormat("FOURCC", static_cast<int>(QvFourcc::I420), "width", width, "height", height,
                          "framerate", rate);

class Pushing : public OutputPipe {
  protected:
    void add(QvPushEncoder& push, bool video, bool audio, int bufferLength = 48000) {
        AnyDict pictures = videoFormat;
        AnyDict sound("samplerate", samplerate, "channels", 2, "bitsPerSample", 16, "bufferLength",
                      bufferLength);
        ASSERT_EQ(push.setEncoder(pipe_.get()), 0);
        if (video) {
            addVideo(QvFourcc::I420, width, height, rate);
            ASSERT_EQ(push.addVideoStream(pictures, nullptr), 0);
        }
        if (audio) {
            addAudio(2, 16, samplerate);
            ASSERT_EQ(push.addAudioStream(sound, nullptr), 0);
        }
    }
    static void waitUntil(QvPushEncoder& push, bool (QvPushEncoder::*needs)(int) const) {
        while (!(push.*needs)(0) && push.running()) push.process();
    }
};

void writeSamples(QvPushEncoder& push, int count, unsigned seed, std::string& all) {
    QvPcm pcm;
    fillSound(pcm, count, 2, 2, samplerate, seed);
    ASSERT_EQ(push.writeSamples(&pcm, 0), 0);
    all += soundBytes(pcm);
}

// Buffers too small for their writers, two of which run at the same time as the worker: nothing is lost,
// nothing doubled.
TEST_F(Pushing, EverythingArrives) {
    constexpr int frames = 60, before = 20;
    LogCapture log;
    QvPushEncoder push;
    add(push, true, true, 500);
    ASSERT_EQ(push.open(), 0) << push.errorDesc();
    std::string pictures, sound;
    const auto pushPicture = [&](int number) {
        QvFrame frame = picture(static_cast<unsigned>(number));
        frame.setTimestamp(number);
        ASSERT_EQ(push.writeFrame(&frame, 0), 0);
        pictures += pictureBytes(frame);
    };
    for (int i = 0; i < before; ++i) pushPicture(i);
    writeSamples(push, 1200, 1, sound);  // more than twice what fits
    EXPECT_EQ(log.count("[FrameBuffer] *** Growing buffer to"), 3);
    writeSamples(push, 1000, 2, sound);

    ASSERT_EQ(push.start(), 0);
    std::thread videoWriter([&] {
        for (int i = before; i < frames; ++i) pushPicture(i);
    });
    std::thread audioWriter([&] {
        for (unsigned i = 0; i < 130; ++i)
            writeSamples(push, 100 + static_cast<int>(i * 37 % 1900), i, sound);
        EXPECT_EQ(push.writeSamples(nullptr, 0), 0);
    });
    videoWriter.join();
    audioWriter.join();
    waitUntil(push, &QvPushEncoder::needsVideo);
    EXPECT_FALSE(push.finished());
    EXPECT_EQ(push.writeFrame(nullptr, 0), QvStatus::endOfStream);
    waitUntil(push, &QvPushEncoder::needsVideo);
    EXPECT_FALSE(push.running());
    EXPECT_EQ(push.close(false), 0);
    ASSERT_EQ(pipe_->close(), 0);
    EXPECT_EQ(read("out.raw"), pictures);
    const auto samples = static_cast<size_t>(QvUtil::samplesForFrames(frames, rate, samplerate));
    ASSERT_GT(sound.size(), samples * 4);
    EXPECT_EQ(read("out.wav").substr(80), sound.substr(0, samples * 4));
}

TEST_F(Pushing, FormatsAreChecked) {
    const struct {
        int rate, channels, bytes, bits;
        int logged;  // lines
    } rows[] = {{96000, 2, 0, 16, 0}, {96001, 2, 0, 16, 1}, {0, 2, 0, 16, 1},
                {48000, 0, 0, 16, 1}, {0, 0, 5, 0, 3},      {48000, 1, 4, 0, 0},
                {48000, 1, 0, 20, 0}, {48000, 1, 2, 24, 1}, {48000, 1, 0, 0, 1}};
    QvPushEncoder push;
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        LogCapture log;
        AnyDict format("samplerate", row.rate, "channels", row.channels);
        if (row.bytes) format.set("bytesPerSample", row.bytes);
        if (row.bits) format.set("bitsPerSample", row.bits);
        EXPECT_EQ(push.addAudioStream(format, nullptr), row.logged ? -1 : 0);
        EXPECT_EQ(log.count("[PushEncoder] addAudioStream - invalid", QvLogMask::error), row.logged);
    }
}

// Before and after the start, while the worker waits for either kind, while it works, while others write; and
// the same object continues in a new run.
TEST_F(Pushing, CloseAtEveryMoment) {
    QvPushEncoder push;
    EXPECT_EQ(push.close(true), 0);
    add(push, true, true);
    for (int moment = 0; moment < 10; ++moment) {
        SCOPED_TRACE(moment);
        ASSERT_EQ(push.open(), 0) << push.errorDesc();
        EXPECT_THROW(push.open(), QvAssertFailure);
        QvFrame frame = picture(1);
        std::string sound;
        std::atomic<bool> stop{false};
        std::thread writer;
        if (moment / 2 >= 1) {
            ASSERT_EQ(push.start(), 0);
        }
        if (moment / 2 >= 2) {
            EXPECT_EQ(push.writeFrame(&frame, 0), 0);
        }
        if (moment / 2 == 2) waitUntil(push, &QvPushEncoder::needsAudio);
        if (moment / 2 == 3) writeSamples(push, 10000, 1, sound);
        if (moment / 2 == 4) {
            writer = std::thread([&] {
                QvFrame own = picture(2);
                while (!stop && sound.size() < (8u << 20)) {
                    push.writeFrame(&own, 0);
                    writeSamples(push, 1602, 1, sound);
                }
            });
            push.process();
        }
        EXPECT_EQ(push.close(moment % 2), 0) << push.errorDesc();
        stop = true;
        if (writer.joinable()) writer.join();
        EXPECT_EQ(pipe_->close(), 0);
        EXPECT_EQ(read("out.raw").size() % static_cast<size_t>(frame.total_bytes()), 0u);
    }
}

TEST_F(Pushing, AFailingOutputIsTold) {
    for (const char* at : {"rawvenc.write", "rawaenc.write"})
        for (const auto how : {FailingOutputs::status, FailingOutputs::assertion}) {
            SCOPED_TRACE(at);
            const bool video = at[3] == 'v';
            pipe_.reset();
            FailingOutputs outputs;
            outputs.how = how;
            outputs.failAt = at;
            pipe_.reset(QvEncodePipe::create());
            pipe_->clearStreams();
            pipe_->setFilename(Any(folder_.file("out.x").c_str()));
            QvPushEncoder push;
            add(push, video, !video);
            ASSERT_EQ(push.open(), 0);
            ASSERT_EQ(push.start(), 0);
            QvFrame frame = makePicture(QvFourcc::I420, width, height);
            QvPcm sound;
            fillSound(sound, 2000, 2, 2, samplerate);
            int result = 0;
            for (int i = 0; i < 1000 && result == 0; ++i) {
                result = video ? push.writeFrame(&frame, 0) : push.writeSamples(&sound, 0);
                if (result == 0) push.process();
            }
            EXPECT_LT(result, 0);
            EXPECT_NE(std::string(push.errorDesc()).find(at), std::string::npos) << push.errorDesc();
            EXPECT_EQ(push.close(false), result);
            pipe_->abort();
            pipe_.reset();
        }
}

}  // namespace
