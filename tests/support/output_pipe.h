// An encode pipe of the engine without streams, which writes into a folder of its own, and the raw streams
// that tests put into it.
#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <vector>

#include "core/encode/qvencodepipe.h"
#include "core/measure/qvgeometry.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"
#include "tests/support/temp_folder.h"

class OutputPipe : public testing::Test {
  protected:
    explicit OutputPipe(const char* filename = "out.x") {
        pipe_->clearStreams();
        pipe_->setFilename(Any(folder_.file(filename).c_str()));
    }

    void addVideo(unsigned type, int width, int height, const QvFramerate& rate = QvFramerate(25.0)) {
        const int nr = pipe_->addVideoStream("rawvenc");
        ASSERT_GE(nr, 0) << pipe_->errorDesc();
        const AnyDict params("type", static_cast<int>(type), "width", width, "height", height, "framerate",
                             rate);
        ASSERT_EQ(pipe_->videoEncoder(nr)->setParamDict(params), 0);
        videos_.resize(static_cast<size_t>(nr));
        videos_.push_back({type, width, height});
    }
    void addAudio(int channels, int bits, int samplerate) {
        const int nr = pipe_->addAudioStream("rawaenc");
        ASSERT_GE(nr, 0) << pipe_->errorDesc();
        const AnyDict params("channels", channels, "bitsPerSample", bits, "samplerate", samplerate);
        ASSERT_EQ(pipe_->audioEncoder(nr)->setParamDict(params), 0);
        audios_.resize(static_cast<size_t>(nr));
        audios_.push_back({channels, (bits + 7) / 8, samplerate});
    }
    QvFrame picture(unsigned seed, size_t nr = 0) const {
        return makePicture(videos_[nr].type, videos_[nr].width, videos_[nr].height, seed);
    }
    // These write and return the bytes that they gave.
    std::string writePicture(unsigned seed) {
        QvFrame frame = picture(seed);
        EXPECT_EQ(pipe_->writeFrame(&frame, 0), 0) << pipe_->errorDesc();
        return pictureBytes(frame);
    }
    std::string writeSound(int samples, unsigned seed, size_t nr = 0) {
        QvPcm pcm;
        fillSound(pcm, samples, audios_[nr].channels, audios_[nr].bytes, audios_[nr].samplerate, seed);
        EXPECT_EQ(pipe_->writePcm(&pcm, static_cast<int>(nr)), 0) << pipe_->errorDesc();
        return soundBytes(pcm);
    }
    std::string read(const std::string& name) const { return TempFolder::read(folder_.file(name)); }

    EngineScope engine_;
    TempFolder folder_;
    std::unique_ptr<QvEncodePipe> pipe_{QvEncodePipe::create()};

  private:
    struct Video {
        unsigned type;
        int width, height;
    };
    struct Audio {
        int channels, bytes, samplerate;
    };
    std::vector<Video> videos_;
    std::vector<Audio> audios_;
};
