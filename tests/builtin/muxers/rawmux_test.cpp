#include "builtin/muxers/rawmux.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <memory>
#include <set>

#include "core/encode/qvencodepipe.h"
#include "core/engine/init.h"
#include "core/engine/qvexception.h"
#include "core/engine/qvregistry.h"
#include "core/media/qvimage.h"
#include "tests/support/log_capture.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"

namespace {

unsigned little(const std::string& bytes, size_t at, int width) {
    unsigned value = 0;
    for (int i = width; i-- > 0;)
        value = value << 8 | static_cast<unsigned char>(bytes[at + static_cast<size_t>(i)]);
    return value;
}

class RawMuxing : public testing::Test {
  protected:
    RawMuxing() {
        init_wrapper(nullptr);
        pipe_.reset(QvEncodePipe::create());
        pipe_->setFilename(Any(folder_.file("out.x").c_str()));
    }
    ~RawMuxing() override {
        pipe_.reset();
        cleanup_wrapper();
    }

    void streams(int videos, int audios) {
        pipe_->clearStreams();
        for (int i = 0; i < videos; ++i) ASSERT_EQ(pipe_->addVideoStream("rawvenc"), i);
        for (int i = 0; i < audios; ++i) ASSERT_EQ(pipe_->addAudioStream("rawaenc"), i);
    }
    void videoFormat(unsigned type, int width, int height) {
        pipe_->setParam("video0", AnyDict("type", static_cast<int>(type), "width", width, "height", height));
    }
    Any mux(const char* name) { return static_cast<QvCodec*>(pipe_->getMuxer())->getParam(name); }
    std::vector<std::string> names(const Any& list) {
        std::vector<std::string> found;
        for (const auto& name : list.asVector())
            found.push_back(
                std::filesystem::path(name.asString()).lexically_relative(folder_.path()).string());
        return found;
    }
    std::vector<std::string> onDisk() {
        std::set<std::string> found;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(folder_.path()))
            if (entry.is_regular_file())
                found.insert(entry.path().lexically_relative(folder_.path()).string());
        return {found.begin(), found.end()};
    }
    std::string read(const char* name) { return TempFolder::read(folder_.file(name)); }

    TempFolder folder_;
    std::unique_ptr<QvEncodePipe> pipe_;
};

using Names = std::vector<std::string>;

TEST_F(RawMuxing, Naming) {
    struct Row {
        const char* filename;
        int videos, audios;
        Names names;
    };
    for (const auto& row :
         {Row{"a.mpg", 1, 1, {"a.raw", "a.wav"}}, Row{"a.mpg", 1, 2, {"a#00.raw", "a#00.wav", "a#01.wav"}},
          Row{"a.b.c", 1, 0, {"a.b.raw"}}, Row{"plain", 0, 1, {"plain.wav"}},
          Row{"dir.with/plain", 2, 0, {"dir.with/plain#00.raw", "dir.with/plain#01.raw"}}}) {
        SCOPED_TRACE(row.filename);
        streams(row.videos, row.audios);
        pipe_->setFilename(Any(folder_.file(row.filename).c_str()));
        EXPECT_EQ(names(mux("filenames")), row.names);
    }
}

TEST_F(RawMuxing, DisabledStreamsGetNoFile) {
    streams(1, 1);
    videoFormat(QvFourcc::GRAY, 32, 32);
    pipe_->videoStream(0)->setEnabled(false);
    ASSERT_EQ(pipe_->open(), 0);
    EXPECT_EQ(pipe_->close(), 0);
    EXPECT_EQ(onDisk(), Names{"out.wav"});
    EXPECT_EQ(names(mux("filenames")), (Names{"out.raw", "out.wav"}));
    EXPECT_EQ(names(mux("filesWritten")), Names{"out.wav"});
    pipe_->audioStream(0)->setEnabled(false);
    EXPECT_THROW(pipe_->open(), QvAssertFailure);
    EXPECT_EQ(pipe_->getState(), QvCodec::stateInitialised);
}

// The header says what is there, and what is there is what was given.
TEST_F(RawMuxing, WavHoldsExactlyTheSamples) {
    for (const int bits : {8, 16, 24})
        for (int channels = 1; channels <= 8; ++channels)
            for (const int split : {0, 1}) {
                SCOPED_TRACE(testing::Message()
                             << channels << " channels, " << bits << " bits, split " << split);
                streams(0, 1);
                pipe_->getMuxer()->setParam("splitAudio", split);
                pipe_->setParam("audio0",
                                AnyDict("channels", channels, "bitsPerSample", bits, "samplerate", 44100));
                ASSERT_EQ(pipe_->open(), 0);
                std::string all;
                for (const int samples : {1, 1470, 200000, 7}) {
                    QvPcm pcm;
                    fillSound(pcm, samples, channels, bits / 8, 44100, static_cast<unsigned>(samples));
                    all += soundBytes(pcm);
                    ASSERT_EQ(pipe_->writePcm(&pcm, 0), 0);
                }
                ASSERT_EQ(pipe_->close(), 0);
                const auto written = names(mux("filesWritten"));
                ASSERT_EQ(written.size(), split ? static_cast<size_t>(channels) : 1u);
                const auto width = static_cast<size_t>(bits / 8);
                for (size_t file = 0; file < written.size(); ++file) {
                    const auto content = read(written[file].c_str());
                    std::string expected = all;
                    if (split) {
                        expected.clear();
                        for (size_t at = file * width; at < all.size();
                             at += width * static_cast<size_t>(channels))
                            expected += all.substr(at, width);
                    }
                    ASSERT_EQ(content.size(), 80 + expected.size());
                    EXPECT_TRUE(content.substr(80) == expected);
                    EXPECT_EQ(content.substr(0, 4) + content.substr(8, 4) + content.substr(72, 4),
                              "RIFFWAVEdata");
                    EXPECT_EQ(little(content, 4, 4), content.size() - 8);
                    EXPECT_EQ(little(content, 22, 2), split ? 1u : static_cast<unsigned>(channels));
                    EXPECT_EQ(little(content, 24, 4), 44100u);
                    EXPECT_EQ(little(content, 34, 2), static_cast<unsigned>(bits));
                    EXPECT_EQ(little(content, 76, 4), expected.size());
                    std::filesystem::remove(folder_.file(written[file]));
                }
            }
}

TEST_F(RawMuxing, OneFileForEachPicture) {
    struct Row {
        int total;
        Names names;
    };
    for (const auto& row : {Row{0, {"out#0.raw", "out#1.raw", "out#2.raw"}},
                            Row{1000, {"out#000.raw", "out#001.raw", "out#002.raw"}},
                            Row{1001, {"out#0000.raw", "out#0001.raw", "out#0002.raw"}}}) {
        SCOPED_TRACE(row.total);
        streams(1, 0);
        videoFormat(QvFourcc::I420, 48, 32);
        pipe_->setParam("muxer/splitVideo", 1);
        pipe_->setParam("muxer/_totalFrames", row.total);
        ASSERT_EQ(pipe_->open(), 0);
        for (unsigned i = 0; i < 3; ++i) {
            QvFrame frame = makePicture(QvFourcc::I420, 48, 32, i);
            ASSERT_EQ(pipe_->writeFrame(&frame, 0), 0);
        }
        ASSERT_EQ(pipe_->close(), 0);
        EXPECT_EQ(onDisk(), row.names);
        EXPECT_EQ(names(mux("filesWritten")), row.names);
        for (unsigned i = 0; i < 3; ++i) {
            EXPECT_TRUE(read(row.names[i].c_str()) == pictureBytes(makePicture(QvFourcc::I420, 48, 32, i)));
            std::filesystem::remove(folder_.file(row.names[i]));
        }
    }
}

TEST_F(RawMuxing, PicturesAsPng) {
    for (const unsigned type : {QvFourcc::BGR3, QvFourcc::BGR4}) {
        streams(1, 0);
        videoFormat(type, 34, 20);
        pipe_->setParam("muxer/splitVideo", 1);
        pipe_->setParam("muxer/rawAsPng", 1);
        LogCapture log;
        ASSERT_EQ(pipe_->open(), 0);
        QvFrame frame = makePicture(type, 34, 20);
        for (int i = 0; i < 2; ++i) ASSERT_EQ(pipe_->writeFrame(&frame, 0), 0);
        ASSERT_EQ(pipe_->close(), 0);
        EXPECT_EQ(log.count("Starting scaler"), type == QvFourcc::BGR3 ? 0 : 1) << "one for all pictures";
        ASSERT_EQ(names(mux("filesWritten")), (Names{"out#0.png", "out#1.png"}));
        QvFrame loaded;
        ASSERT_EQ(QvImage::loadFrame(loaded, Any(folder_.file("out#1.png").c_str()), nullptr, 0), 0);
        for (int y = 0; y < 20; ++y)
            for (int x = 0; x < 34; ++x)
                for (int c = 0; c < 3; ++c) ASSERT_EQ(loaded.pixelPtr(x, y)[c], frame.pixelPtr(x, y)[c]);
        for (const char* name : {"out#0.png", "out#1.png"}) std::filesystem::remove(folder_.file(name));
    }
}

// Samples of one picture of v210: 10 bits, three to a word, in the order Cb Y Cr Y.
std::vector<unsigned> v210Samples(const std::string& bytes, int width, int height) {
    std::vector<unsigned> samples;
    const size_t line = static_cast<size_t>(width + 47) / 48 * 128;
    for (int y = 0; y < height; ++y)
        for (int i = 0; i < 2 * width; ++i) {
            const unsigned word =
                little(bytes, static_cast<size_t>(y) * line + static_cast<size_t>(i / 3) * 4, 4);
            samples.push_back(word >> (i % 3 * 10) & 0x3FF);
        }
    return samples;
}

// Y216 goes in, also from the worker, into one file and into one for each picture.
TEST_F(RawMuxing, V210) {
    constexpr int width = 50, height = 6;
    constexpr size_t bytes = 2 * 128 * height;
    std::vector<QvFrame> pictures;
    for (unsigned i = 0; i < 3; ++i) pictures.push_back(makePicture(QvFourcc::Y216, width, height, i));
    for (const int accelerated : {0, 1})
        for (const int split : {0, 1}) {
            SCOPED_TRACE(testing::Message() << "worker " << accelerated << " split " << split);
            streams(1, 0);
            videoFormat(QvFourcc::v210, width, height);
            pipe_->setParam("video0/accelerationOn", accelerated);
            pipe_->setParam("muxer/splitVideo", split);
            ASSERT_EQ(pipe_->open(), 0);
            for (QvFrame& picture : pictures) ASSERT_EQ(pipe_->writeFrame(&picture, 0), 0);
            ASSERT_EQ(pipe_->close(), 0) << pipe_->errorDesc();
            std::string content;
            for (const auto& name : names(mux("filesWritten"))) {
                content += read(name.c_str());
                std::filesystem::remove(folder_.file(name));
            }
            ASSERT_EQ(content.size(), 3 * bytes);
            for (size_t i = 0; i < 3; ++i) {
                const auto samples = v210Samples(content.substr(i * bytes, bytes), width, height);
                for (size_t k = 0; k < samples.size(); ++k) {
                    const auto* source = pictures[i].plane(0) +
                                         k / (2 * width) * static_cast<size_t>(pictures[i].stride(0)) +
                                         (k % (2 * width) ^ 1) * 2;
                    const int ten = (source[0] | source[1] << 8) >> 6;
                    ASSERT_NEAR(static_cast<int>(samples[k]), ten, 1) << "picture " << i << " sample " << k;
                }
            }
        }
}

// What an abort leaves is known, so that nothing that looks whole need stay.
TEST_F(RawMuxing, AbortLeavesKnownFiles) {
    for (const int split : {0, 1}) {
        streams(1, 1);
        videoFormat(QvFourcc::GRAY, 32, 32);
        pipe_->setParam("muxer/splitVideo", split);
        pipe_->setParam("muxer/splitAudio", split);
        ASSERT_EQ(pipe_->open(), 0);
        QvFrame frame = makePicture(QvFourcc::GRAY, 32, 32);
        for (int i = 0; i < 4; ++i) ASSERT_EQ(pipe_->writeFrame(&frame, 0), 0);
        QvPcm pcm;
        fillSound(pcm, 100, 2, 2, 48000);
        ASSERT_EQ(pipe_->writePcm(&pcm, 0), 0);
        EXPECT_EQ(pipe_->abort(), 0);
        auto written = names(pipe_->getParam("filesWritten"));
        std::sort(written.begin(), written.end());
        EXPECT_EQ(written, onDisk());
        EXPECT_EQ(written.size(), split ? 6u : 2u);
        for (const auto& name : written) std::filesystem::remove(folder_.file(name));
    }
}

TEST_F(RawMuxing, FailureToOpenOneClosesAll) {
    streams(1, 2);
    std::filesystem::create_directory(folder_.file("out#01.wav"));
    EXPECT_EQ(pipe_->open(), -1);
    EXPECT_EQ(pipe_->errorDesc(), "Unable to open output audio file " + folder_.file("out#01.wav"));
    EXPECT_EQ(names(mux("filesWritten")), Names{"out#00.wav"});
    std::filesystem::remove(folder_.file("out#01.wav"));
    EXPECT_EQ(pipe_->open(), 0);
    EXPECT_EQ(pipe_->close(), 0);
}

TEST_F(RawMuxing, FullDiskWhileWritingPictures) {
    streams(1, 0);
    videoFormat(QvFourcc::GRAY, 320, 200);
    for (const int split : {0, 1})
        for (const int accelerated : {0, 1}) {
            SCOPED_TRACE(testing::Message() << "split " << split << ", accelerated " << accelerated);
            pipe_->setParam("muxer/splitVideo", split);
            pipe_->setParam("video0/accelerationOn", accelerated);
            const auto name = folder_.file(split ? "out#1.raw" : "out.raw");
            std::filesystem::create_symlink("/dev/full", name);
            ASSERT_EQ(pipe_->open(), 0);
            QvFrame frame = makePicture(QvFourcc::GRAY, 320, 200);
            int result = 0;
            for (int i = 0; i < 100 && result == 0; ++i) result = pipe_->writeFrame(&frame, 0);
            EXPECT_EQ(result, -1);
            EXPECT_NE(std::string(pipe_->errorDesc()).find("No space left"), std::string::npos)
                << pipe_->errorDesc();
            EXPECT_NE(pipe_->close(), 0);
            std::filesystem::remove(name);
        }
}

TEST_F(RawMuxing, SinkMakesNoFile) {
    streams(1, 0);
    ASSERT_EQ(pipe_->open(), 0);
    ASSERT_EQ(pipe_->close(), 0);
    EXPECT_EQ(onDisk(), Names{"out.raw"});
}

TEST_F(RawMuxing, Contract) {
    streams(1, 1);
    EXPECT_EQ(mux("maxStreams"), Any(AnyDict("vids", 99, "auds", 99, "subs", 0, "total", 99)));
    EXPECT_EQ(mux("extension"), Any("raw"));
    EXPECT_EQ(mux("videoCodecs"), Any(AnyVector(Any("rawvenc"))));
    pipe_->setParam("muxer/splitAudio", 1);
    AnyDict state;
    pipe_->getMuxer()->store(state);
    EXPECT_EQ(state, AnyDict("name", "rawmux", "splitVideo", 0, "splitAudio", 1, "rawAsPng", 0));
    state.set("rawAsPng", 1);
    EXPECT_EQ(pipe_->getMuxer()->restore(state), 0);
    EXPECT_EQ(mux("rawAsPng"), Any(1));
    EXPECT_EQ(pipe_->getMuxer()->restore(AnyDict("name", "x")), -1);
    ASSERT_EQ(pipe_->open(), 0);
    EXPECT_THROW(pipe_->getMuxer()->setParam("rawAsPng", 0), QvAssertFailure);
    EXPECT_EQ(pipe_->close(), 0);
    RawMux alone;
    alone.init();
    alone.addStream(qvVideoStream, AnyDict());
    EXPECT_THROW(alone.open(), QvAssertFailure) << "no file name";
    EXPECT_THROW(alone.addStream(3, AnyDict()), QvAssertFailure);
}

}  // namespace
