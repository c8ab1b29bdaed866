#include "builtin/muxers/filestreams.h"

#include <sys/stat.h>

#include <chrono>
#include <future>

#include "core/encode/qvfilemux.h"
#include "core/measure/fourcc.h"
#include "core/preset/qvprofile.h"
#include "tests/support/output_pipe.h"

namespace {

constexpr int width = 16, height = 12, pictures = 30, rate = 48000;

// The same streams through encoders, and as files.
class FileStreams : public OutputPipe {
  protected:
    FileStreams() : OutputPipe("pipe.avi") {}

    void encode(const QvFramerate& framerate) {
        pipe_->clearStreams();
        addVideo(QvFourcc::I420, width, height, framerate);
        addAudio(2, 16, rate);
        ASSERT_EQ(pipe_->open(), 0) << pipe_->errorDesc();
        std::string video, sound;
        const double each = rate / framerate.rate().ratio();
        long long heard = 0;
        for (unsigned i = 0; i < pictures; ++i) {
            video += writePicture(i);
            const auto due = static_cast<long long>((i + 1) * each + 0.5);
            sound += writeSound(static_cast<int>(due - heard), i);
            heard = due;
        }
        ASSERT_EQ(pipe_->close(), 0) << pipe_->errorDesc();
        videoFile_ = folder_.write("in.i420", video);
        soundFile_ = folder_.write("in.pcm", sound);
    }
    void configure(QvFileMux& mux, const QvFramerate& framerate) const {
        QvFileMuxStream& video =
            mux.config().addStream(qvVideoStream, Any(videoFile_.c_str()), Any("rawvenc"));
        video.framerate = framerate;
        video.params = AnyDict("type", static_cast<int>(QvFourcc::I420), "width", width, "height", height);
        QvFileMuxStream& sound =
            mux.config().addStream(qvAudioStream, Any(soundFile_.c_str()), Any("rawaenc"));
        sound.samplerate = rate;
        sound.channels = 2;
        sound.bitsPerSample = 16;
    }
    int run(QvFileMux& mux, const char* muxer, const char* name) const {
        return mux.run(muxer, Any(folder_.file(name).c_str()));
    }

    std::string videoFile_, soundFile_;
};

TEST_F(FileStreams, GiveTheFileThatEncodersGive) {
    for (const QvFramerate& framerate : {QvFramerate(25.0), QvFramerate(QvRatio(30000, 1001))}) {
        for (const char* muxer : {"rawavimux", "rawmux"}) {
            SCOPED_TRACE(muxer);
            const bool avi = std::string(muxer) == "rawavimux";
            pipe_.reset(QvEncodePipe::create());
            if (avi)
                ASSERT_EQ(pipe_->applyPreset(QvProfile::aviRaw, 0), 0);
            else
                ASSERT_EQ(pipe_->setMuxer(muxer), 0) << pipe_->errorDesc();
            pipe_->setFilename(Any(folder_.file("pipe.avi").c_str()));
            ASSERT_NO_FATAL_FAILURE(encode(framerate));
            QvFileMux mux;
            configure(mux, framerate);
            double last = 0;
            mux.config().watch = [&last](double part) {
                EXPECT_GT(part, last);
                last = part;
                return true;
            };
            ASSERT_EQ(run(mux, muxer, "mux.avi"), 0) << mux.errorDesc();
            EXPECT_EQ(last, 1);
            for (const char* ending : avi ? std::vector{".avi"} : std::vector{".raw", ".wav"}) {
                EXPECT_FALSE(read(std::string("pipe") + ending).empty());
                EXPECT_TRUE(read(std::string("mux") + ending) == read(std::string("pipe") + ending))
                    << ending;
            }
            EXPECT_EQ(mux.filesWritten().size(), avi ? 1 : 2);
        }
    }
}

// Coded data is carried as it is, with known units or without.
TEST_F(FileStreams, CodedDataStaysAsItIs) {
    const std::string coded = patternBytes(700'001);
    const std::string file = folder_.write("in.264", coded);
    for (const bool known : {false, true}) {
        QvFileMux mux;
        QvFileMuxStream& stream = mux.config().addStream(qvVideoStream, Any(file.c_str()), Any("x264venc"));
        stream.framerate = QvFramerate(25.0);
        if (known) stream.units = {1, 600'000, 100'000};
        stream.extension = known ? Any("h264") : Any();
        ASSERT_EQ(run(mux, "rawmux", "coded.x"), 0) << mux.errorDesc();
        EXPECT_TRUE(read(known ? "coded.h264" : "coded.264") == coded);
    }
}

TEST_F(FileStreams, RefuseWhatTheyCanNotCarry) {
    ASSERT_NO_FATAL_FAILURE(encode(QvFramerate(25.0)));
    const auto names = [this](bool video) {
        return std::string(video ? "Video" : "Audio") + " stream #0, '" + (video ? videoFile_ : soundFile_) +
               "': ";
    };
    const struct {
        std::function<void(QvFileMuxConfig&)> change;
        bool video;
        std::string reason;
    } rows[] = {
        {[](auto& c) { c.streams[0].params.set("width", 0); }, true,
         "there are no raw pictures I420 of 0x12"},
        {[](auto& c) { c.streams[0].params.set("width", 1 << 30); }, true,
         "there are no raw pictures I420 of 1073741824x12"},
        {[](auto& c) { c.streams[0].params.set("type", 1); }, true, "there are no raw pictures"},
        {[](auto& c) { c.streams[0].params.set("height", 13); }, true,
         "after the last whole picture there are"},
        {[](auto& c) {
             c.streams[0].units = {288, 30 * 288 - 288};
         },
         true, "unit 1 has 8352 bytes, a picture 288"},
        {[](auto& c) {
             c.streams[1].units = {2, 30 * 1920 * 4 - 2};
         },
         false, "unit 0 has 2 bytes, a sample of all channels 4"},
        {[](auto& c) { c.streams[1].channels = 7; }, false, "after the last whole sample there are"},
        {[](auto& c) { c.streams[1].bitsPerSample = 0; }, false, "its bits a sample are not set"},
    };
    for (const auto& row : rows)
        for (const char* muxer : {"rawavimux", "rawmux"}) {
            QvFileMux mux;
            configure(mux, QvFramerate(25.0));
            row.change(mux.config());
            EXPECT_LT(run(mux, muxer, "mux.avi"), 0);
            EXPECT_EQ(std::string(mux.errorDesc()).rfind(names(row.video) + row.reason, 0), 0u)
                << mux.errorDesc();
        }
    // A name that the multiplexer makes of the output's is that of an input.
    QvFileMux self;
    configure(self, QvFramerate(25.0));
    self.config().streams.pop_back();
    self.config().streams[0].extension = "i420";
    const std::string before = TempFolder::read(videoFile_);
    EXPECT_LT(run(self, "rawmux", "in.avi"), 0);
    EXPECT_EQ(self.errorDesc(), names(true) + "it is an output, too");
    EXPECT_TRUE(TempFolder::read(videoFile_) == before);
}

TEST_F(FileStreams, AStopIsNoSuccess) {
    ASSERT_NO_FATAL_FAILURE(encode(QvFramerate(25.0)));
    for (const bool byWatch : {true, false})
        for (const char* muxer : {"rawavimux", "rawmux"}) {
            QvFileMux mux;
            configure(mux, QvFramerate(25.0));
            int units = 0;
            mux.config().watch = [&](double) {
                if (++units == 10 && !byWatch) mux.requestStop();
                return units < 10 || !byWatch;
            };
            EXPECT_EQ(run(mux, muxer, "stopped.avi"), QvFileMux::cancelled);
            EXPECT_STREQ(mux.errorDesc(), "The run was stopped");
            EXPECT_EQ(units, 10);
            EXPECT_GT(mux.filesWritten().size(), 0);
            mux.config().watch = nullptr;
            EXPECT_EQ(run(mux, muxer, "again.avi"), 0) << mux.errorDesc();
        }
}

// The pipe has no reader: the run waits in the opening of its output, or has not come so far yet, which a
// stop that comes too early does not end.
TEST_F(FileStreams, AStopEndsTheWaitForAReader) {
    ASSERT_NO_FATAL_FAILURE(encode(QvFramerate(25.0)));
    const std::string pipe = folder_.file("pipe.fifo");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    QvFileMux mux;
    configure(mux, QvFramerate(25.0));
    mux.config().streams.pop_back();
    mux.config().output.set("exactName", 1);
    auto result = std::async(std::launch::async, [&] { return mux.run("rawmux", Any(pipe.c_str())); });
    while (result.wait_for(std::chrono::milliseconds(20)) != std::future_status::ready) mux.requestStop();
    EXPECT_EQ(result.get(), QvFileMux::cancelled);
    EXPECT_STREQ(mux.errorDesc(), "The run was stopped");
}

TEST_F(FileStreams, AFullDiscIsAFailure) {
    ASSERT_NO_FATAL_FAILURE(encode(QvFramerate(25.0)));
    for (const char* muxer : {"rawavimux", "rawmux"}) {
        QvFileMux mux;
        configure(mux, QvFramerate(25.0));
        EXPECT_LT(mux.run(muxer, Any("/dev/full/x.avi")), 0);
        EXPECT_NE(std::string(mux.errorDesc()).find("/dev/full/x"), std::string::npos) << mux.errorDesc();
        if (std::string(muxer) == "rawmux") continue;
        EXPECT_LT(mux.run(muxer, Any("/dev/full")), 0);
        EXPECT_NE(std::string(mux.errorDesc()).find("No space left"), std::string::npos) << mux.errorDesc();
    }
}

}  // namespace
