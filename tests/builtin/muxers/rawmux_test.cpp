#include "builtin/muxers/rawmux.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>
#include <thread>

#include "core/decode/qvdecoder.h"
#include "core/engine/modules/qvregistry.h"
#include "core/transcode/run/qvtranscoder.h"

#include "tests/support/checks.h"
#include "tests/support/output_pipe.h"

namespace {

struct RawMuxing : OutputPipe {
    void streams(int videos, int audios) {
        pipe_->clearStreams();
        for (int i = 0; i < videos; ++i) addVideo(QvFourcc::GRAY, 32, 32);
        for (int i = 0; i < audios; ++i) addAudio(2, 16, 48000);
    }
    void split(int video, int audio) {
        pipe_->setParam("muxer/splitVideo", video);
        pipe_->setParam("muxer/splitAudio", audio);
    }
    Any mux(const char* name) { return static_cast<QvCodec*>(pipe_->getMuxer())->getParam(name); }
    Texts names(const Any& list) {
        Texts found;
        for (const auto& name : list.asVector())
            found.push_back(
                std::filesystem::path(name.asString()).lexically_relative(folder_.path()).string());
        std::sort(found.begin(), found.end());
        return found;
    }
    Texts written() { return names(mux("filesWritten")); }
    // The bytes of a file, which goes.
    std::string takeFile(const std::string& name) {
        const std::string bytes = read(name);
        std::filesystem::remove(folder_.file(name));
        return bytes;
    }
};

TEST_F(RawMuxing, Naming) {
    const struct {
        const char* filename;
        int videos, audios;
        Texts names;
    } rows[] = {{"a.mpg", 1, 1, {"a.raw", "a.wav"}},
                {"a.mpg", 1, 2, {"a#00.raw", "a#00.wav", "a#01.wav"}},
                {"dir.with/plain", 2, 0, {"dir.with/plain#00.raw", "dir.with/plain#01.raw"}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.filename);
        streams(row.videos, row.audios);
        pipe_->setFilename(Any(folder_.file(row.filename).c_str()));
        EXPECT_EQ(names(mux("filenames")), row.names);
    }
}

TEST_F(RawMuxing, WavHoldsExactlyTheSamples) {
    for (const unsigned bits : {8U, 16U, 24U})
        for (unsigned channels = 1; channels <= 8; ++channels)
            for (const int splits : {0, 1}) {
                SCOPED_TRACE(testing::Message() << channels << " of " << bits << " bits, split " << splits);
                pipe_->clearStreams();
                addAudio(static_cast<int>(channels), static_cast<int>(bits), 44100);
                split(0, splits);
                ASSERT_EQ(pipe_->open(), 0);
                std::string all;
                for (const int samples : {1, 1470, 200000, 7})
                    all += writeSound(samples, static_cast<unsigned>(samples));
                ASSERT_EQ(pipe_->close(), 0);
                const Texts files = written();
                ASSERT_EQ(files.size(), splits ? channels : 1u);
                const size_t width = bits / 8;
                for (size_t file = 0; file < files.size(); ++file) {
                    const std::string content = takeFile(files[file]);
                    std::string expected;
                    for (size_t at = file * width; splits && at < all.size(); at += width * channels)
                        expected += all.substr(at, width);
                    if (!splits) expected = all;
                    ASSERT_EQ(content.size(), 80 + expected.size());
                    EXPECT_TRUE(content.substr(80) == expected);
                    EXPECT_EQ(leNumber(content, 22, 2), splits ? 1u : channels);
                    EXPECT_EQ(leNumber(content, 24, 4), 44100u);
                }
            }
}

TEST_F(RawMuxing, OneFileForEachPicture) {
    addVideo(QvFourcc::I420, 48, 32);
    split(1, 0);
    for (const auto& [total, files] : {std::pair(0, Texts{"out#0.raw", "out#1.raw", "out#2.raw"}),
                                       {1000, {"out#000.raw", "out#001.raw", "out#002.raw"}},
                                       {1001, {"out#0000.raw", "out#0001.raw", "out#0002.raw"}}}) {
        pipe_->setParam("muxer/_totalFrames", total);
        ASSERT_EQ(pipe_->open(), 0);
        for (unsigned i = 0; i < 3; ++i) writePicture(i);
        ASSERT_EQ(pipe_->close(), 0);
        EXPECT_EQ(written(), files);
        for (unsigned i = 0; i < 3; ++i) EXPECT_TRUE(takeFile(files[i]) == pictureBytes(picture(i)));
    }
}

// Y216 goes in, also from the worker, into one file and into one for each picture. A word of v210 has three
// samples of 10 bits, in the order Cb Y Cr Y.
TEST_F(RawMuxing, V210) {
    constexpr size_t width = 50, height = 6, line = 2 * 128;
    addVideo(QvFourcc::v210, width, height);
    for (const int accelerated : {0, 1})
        for (const int splits : {0, 1}) {
            SCOPED_TRACE(testing::Message() << "worker " << accelerated << " split " << splits);
            pipe_->setParam("video0/accelerationOn", accelerated);
            split(splits, 0);
            ASSERT_EQ(pipe_->open(), 0);
            std::vector<QvFrame> pictures;
            for (unsigned i = 0; i < 3; ++i)
                pictures.push_back(makePicture(QvFourcc::Y216, width, height, i));
            for (QvFrame& picture : pictures) ASSERT_EQ(pipe_->writeFrame(&picture, 0), 0);
            ASSERT_EQ(pipe_->close(), 0) << pipe_->errorDesc();
            std::string content;
            for (const auto& name : written()) content += takeFile(name);
            ASSERT_EQ(content.size(), 3 * line * height);
            for (size_t i = 0; i < 3 * height; ++i) {
                const QvFrame& source = pictures[i / height];
                const auto* row = source.plane(0) + i % height * static_cast<size_t>(source.stride(0));
                for (size_t k = 0; k < 2 * width; ++k) {
                    const auto ten = leNumber(content, i * line + k / 3 * 4, 4) >> (k % 3 * 10) & 0x3FF;
                    const unsigned char* sixteen = row + (k ^ 1) * 2;
                    ASSERT_NEAR(static_cast<int>(ten), (sixteen[0] | sixteen[1] << 8) >> 6, 1)
                        << "row " << i << " sample " << k;
                }
            }
        }
}

TEST_F(RawMuxing, FailureToOpenOneClosesAll) {
    streams(1, 2);
    std::filesystem::create_directory(folder_.file("out#01.wav"));
    EXPECT_EQ(pipe_->open(), QvStatus::failed);
    EXPECT_EQ(pipe_->errorDesc(), "Unable to open output audio file " + folder_.file("out#01.wav"));
    EXPECT_EQ(written(), Texts{"out#00.wav"});
    std::filesystem::remove(folder_.file("out#01.wav"));
    EXPECT_EQ(pipe_->open(), 0);
    EXPECT_EQ(pipe_->close(), 0);
}

// One stream under the very name, which may be a pipe; several would overwrite each other.
TEST_F(RawMuxing, AnExactName) {
    pipe_->setParam("muxer/exactName", 1);
    for (const auto& [videos, audios, splits] : {std::tuple{1, 1, 0}, {2, 0, 0}, {0, 1, 1}, {0, 1, 0}}) {
        streams(videos, audios);
        split(0, splits);
        const bool fits = videos + audios == 1 && !splits;
        EXPECT_EQ(pipe_->open() == 0, fits) << videos << audios << splits;
        if (!fits) continue;
        const std::string sound = writeSound(100, 1);
        ASSERT_EQ(pipe_->close(), 0);
        EXPECT_EQ(read("out.x").substr(80), sound);
        EXPECT_EQ(written(), Texts{"out.x"});
    }
    // It is stored where it is set, so that a task keeps the name.
    AnyDict named, plain;
    pipe_->getMuxer()->store(named);
    EXPECT_TRUE(named.get("exactName").isTrue());
    pipe_->setParam("muxer/exactName", 0);
    pipe_->getMuxer()->store(plain);
    EXPECT_FALSE(plain.isSet("exactName"));
    EXPECT_EQ(pipe_->getMuxer()->restore(named), 0);
    EXPECT_TRUE(pipe_->getMuxer()->QvCodec::getParam("exactName").isTrue());
}

struct CountingTranscoder : QvTranscoder {
    ~CountingTranscoder() override { QvTranscoder::stop(); }
    void cbDone(int result) override { results.push_back(result); }
    std::vector<int> results;
};

// stop() ends a run whose output nobody reads, or has not even opened; the next one writes as ever.
TEST_F(RawMuxing, AStopEndsAWaitForTheReader) {
    const std::string name = folder_.file("fifo");
    ASSERT_EQ(mkfifo(name.c_str(), 0600), 0);
    addVideo(QvFourcc::BGR4, 640, 480);
    pipe_->setParam("muxer/exactName", 1);
    pipe_->setFilename(Any(name.c_str()));
    const std::unique_ptr<QvCodec> made(qv_registry()->newCodec("testgen"));
    auto* decoder = dynamic_cast<QvDecodePipe*>(made.get());
    ASSERT_TRUE(decoder);
    const AnyDict video("width", 640, "height", 480, "framerate", 25.0, "duration", 20000.0);
    decoder->setParam("streams", AnyDict("vids", AnyVector(Any(video)), "auds", AnyVector()));
    ASSERT_EQ(decoder->open(), 0);
    CountingTranscoder t;
    t.setEncoder(pipe_.get());
    ASSERT_GE(t.link(decoder, 1, 0, 0), 0) << t.errorDesc();
    t.setParam("startDelay", 0);

    std::thread stopping([&] {
        while (!t.isTranscoding()) std::this_thread::yield();
        t.stop();
    });
    EXPECT_LT(t.transcode(false), 0) << "nobody opens the pipe";
    stopping.join();
    EXPECT_TRUE(t.results.empty());

    t.requestStop();  // between two runs: for the next one
    EXPECT_LT(t.transcode(false), 0);

    const int reader = open(name.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    for (const bool wait : {true, false}) {
        ASSERT_EQ(t.transcode(false), 0) << t.errorDesc();
        pollfd data{reader, POLLIN, 0};
        EXPECT_EQ(poll(&data, 1, 60'000), 1);
        if (!wait) t.requestStop();
        t.stop();
        char block[65536];
        while (::read(reader, block, sizeof block) > 0) {
        }
    }
    EXPECT_EQ(t.results, (std::vector{1, 1})) << "stopped runs, not failed ones";
    EXPECT_EQ(t.errorCode(), 0);
    close(reader);
}

}  // namespace
