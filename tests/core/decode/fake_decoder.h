// Decoders made of parameters, for tests of what the contract does by itself.
#pragma once

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "core/decode/basedecodepipe.h"
#include "core/engine/modules/qvmodule.h"
#include "core/media/qvbuffer.h"

// One video stream of `frames` at 25 a second and one audio stream of 16-bit mono at 48000 Hz, whose sample i
// has the value values[i % size].
class FakeDecoder : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;

    long long samples = 4000;
    std::vector<int> values = {0};
    int failAtSample = -1;  // reads that reach it fail with -1
    std::vector<std::string> calls;
    int openResult = 0;
    AnyVector overridable = AnyVector("frameAspect", "codec");

    using BaseDecodePipe::getParam;
    int setParam(const char* name, const Any& value) override {
        if (std::strcmp(name, "filenames") != 0) return BaseDecodePipe::setParam(name, value);
        return 0;
    }

    int open() override {
        calls.push_back("open");
        if (openResult != 0) return setError(openResult, "will not open");
        auto video = std::make_unique<DPipeVideoStream>();
        video->params = AnyDict("framerate", QvFramerate(25.0), "frames", 100, "frameAspect", 1.5);
        addStream(std::move(video));
        auto audio = std::make_unique<DPipeAudioStream>();
        audio->params = AnyDict("samplerate", 48000, "channels", 1, "bitsPerSample", 16, "bytesPerSample", 2,
                                "samples", samples);
        audio->pcm = std::make_unique<QvPcm>();
        audio->pcm->init(5000, 1, 2, 48000);
        pcm_ = audio->pcm.get();
        addStream(std::move(audio));
        return QvDecodePipe::open();
    }
    int seekToFrame(long long frame, int stream) override {
        calls.push_back("frame " + std::to_string(frame) + " of " + std::to_string(stream));
        return seekResult;
    }
    int seekToSample(long long sample, int stream) override {
        calls.push_back("sample " + std::to_string(sample) + " of " + std::to_string(stream));
        pcm_->setPosition(sample);
        return seekResult;
    }
    int seekResult = 0;
    int readSamples(int count, int) override {
        selectedWhenRead = isSelected(qvAudioStream, 0);
        count = static_cast<int>(std::min<long long>(count, samples - pcm_->position()));
        if (failAtSample >= 0 && pcm_->position() + count > failAtSample) return -1;
        if (count <= 0) return -4;
        for (int i = 0; i < count; ++i) {
            const int value = values[static_cast<std::size_t>(pcm_->position() + i) % values.size()];
            pcm_->ptr(i)[0] = static_cast<unsigned char>(value & 255);
            pcm_->ptr(i)[1] = static_cast<unsigned char>(value >> 8 & 255);
        }
        pcm_->setSamples(count);
        pcm_->setPosition(pcm_->position() + count);
        return count;
    }
    QvPcm* getAudioPtr(int) override { return pcm_; }
    bool selectedWhenRead = false;
    AnyVector overridableParams(int, int) override { return overridable; }

  private:
    QvPcm* pcm_ = nullptr;
};
