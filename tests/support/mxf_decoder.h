// A decoder for "mxf" in the place of one that a plug-in brings. Its files are a line of text: "video FRAMES
// SEED" or "audio SAMPLES SEED [SAMPLERATE]". Pictures are GRAY, 16x8 at 25/1, each byte the seed plus the
// frame; sounds are 16-bit mono that counts up from the seed, or can't be read where it is negative.
#pragma once

#include <cstring>
#include <fstream>
#include <string>

#include "core/decode/basedecodepipe.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/status.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvframerate.h"
#include "core/media/qvbuffer.h"
#include "core/media/qvpcm.h"

class MxfDecoder : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;
    using BaseDecodePipe::getParam;

    int open() override {
        std::ifstream in(filename().asString(""));
        std::string kind;
        if (!(in >> kind >> length_ >> seed_) || (kind != "video" && kind != "audio"))
            return setError(QvStatus::failed, "no such essence");
        if (!(in >> samplerate_)) samplerate_ = 48000;
        kind == "video" ? addPicture() : addSound();
        next_ = 0;
        return QvDecodePipe::open();
    }
    int seekToFrame(long long frame, int) override { return next_ = frame, 0; }
    int seekToSample(long long sample, int) override { return next_ = sample, 0; }
    int readFrame(int) override {
        if (next_ >= length_) return QvStatus::endOfStream;
        QvFrame& frame = *getFramePtr(0);
        frame.frameNr = static_cast<int>(next_);
        std::memset(frame.plane(0), static_cast<int>(seed_ + next_++) & 255,
                    static_cast<std::size_t>(frame.plane_bytes(0)));
        return 0;
    }
    int readSamples(int count, int) override {
        if (seed_ < 0) return setError(QvStatus::failed, "no such samples");
        const int n = static_cast<int>(std::min<long long>(count, length_ - next_));
        if (n < 1) return QvStatus::endOfStream;
        QvPcm& pcm = *getAudioPtr(0);
        if (pcm.size() < n) pcm.init(n, 1, 2, samplerate_);
        pcm.setSamples(n);
        for (int i = 0; i < n; ++i)
            reinterpret_cast<short*>(pcm.ptr(0))[i] = static_cast<short>(seed_ + next_++);
        return n;
    }
    QvFrame* getFramePtr(int) override {
        return static_cast<DPipeVideoStream*>(findStream(1, 0))->frame.get();
    }
    QvPcm* getAudioPtr(int) override { return static_cast<DPipeAudioStream*>(findStream(2, 0))->pcm.get(); }

  private:
    long long length_ = 0, seed_ = 0, next_ = 0;
    int samplerate_ = 48000;

    void addPicture() {
        auto stream = std::make_unique<DPipeVideoStream>();
        stream->frame = std::make_unique<QvFrame>();
        stream->frame->init(QvFourcc::GRAY, 16, 8);
        stream->params =
            AnyDict("FOURCC", static_cast<int>(QvFourcc::GRAY), "width", 16, "height", 8, "framerate",
                    QvFramerate::f25p(), "frames", static_cast<int>(length_), "frameAspect", 2.0);
        stream->params.set("duration", static_cast<double>(length_) / 25);
        stream->params.set("codec", "test");
        addStream(std::move(stream));
    }
    void addSound() {
        auto stream = std::make_unique<DPipeAudioStream>();
        stream->pcm = std::make_unique<QvPcm>();
        stream->pcm->init(1, 1, 2, samplerate_);
        stream->params = AnyDict("samplerate", samplerate_, "channels", 1, "bitsPerSample", 16,
                                 "bytesPerSample", 2, "samples", Any(length_), "codec", "PCM");
        stream->params.set("duration", static_cast<double>(length_) / samplerate_);
        addStream(std::move(stream));
    }
};

struct MxfModule : QvModule {
    MxfModule() : QvModule(QvModuleType::decoder, "mxftest", "MXF files of the tests", "MXF") {
        setAttr("exts", AnyVector(Any("mxf")));
        setAttr("priority", 10);
    }
    QvCodec* create() override { return _setAttrs(new MxfDecoder); }
};
