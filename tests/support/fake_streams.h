// A source and an output for tests of links: every frame and sample that passes is written down.
#pragma once

#include <algorithm>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "builtin/pipes/encodepipe2.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"

// One video stream and any number of audio streams. Frames are GRAY, numbered from 0; 16-bit samples count up
// from 1, the same in every channel.
class FakeDecoder : public QvDecodePipe {
  public:
    FakeDecoder(int frames, const QvFramerate& rate, int width = 16, int height = 8) {
        video = AnyDict("framerate", rate, "frames", frames, "width", width, "height", height, "FOURCC",
                        static_cast<int>(QvFourcc::GRAY), "frameAspect", 1.0);
        setState(stateInitialised);
    }
    FakeDecoder& audio(long long samples, int samplerate, int channels = 2) {
        auto& track = *tracks.emplace_back(std::make_unique<Track>());
        track.params = AnyDict("samplerate", samplerate, "channels", channels, "bitsPerSample", 16,
                               "bytesPerSample", 2, "codec", "PCM");
        if (samples >= 0) track.params.set("samples", samples);
        track.total = samples >= 0 ? samples : (1LL << 40);
        track.pcm.init(0, channels, 2, samplerate);
        return *this;
    }

    int nrStreams(int type) const override {
        return type == 1 ? 1 : type == 2 ? static_cast<int>(tracks.size()) : 0;
    }
    void getStreamParams(int type, int stream, AnyDict& out) const override {
        out = type == 1 ? video : track(stream).params;
    }
    void getParam(const char* name, Any& value) const override {
        if (extra.isSet(name))
            value = extra.get(name);
        else
            QvDecodePipe::getParam(name, value);
    }
    int setParam(const char* name, const Any& value) override {
        set.set(name, value);
        return 0;
    }
    int seekToFrame(long long frame, int) override {
        if (seekResult != 0) return seekResult;
        next = static_cast<int>(frame);
        return 0;
    }
    int seekToSample(long long sample, int stream) override {
        track(stream).position = sample;
        return 0;
    }
    int readFrame(int) override {
        if (next == failAt) return setError(-1, "the disc is gone");
        if (next >= available()) return QvStatus::endOfStream;
        if (!frame.inited())
            frame.init(static_cast<unsigned>(video.getInt32("FOURCC")), video.getInt32("width"),
                       video.getInt32("height"));
        frame.framerate = video.get("framerate").asFramerate();
        frame.frameNr = next++;
        ++read;
        return 0;
    }
    int readSamples(int count, int stream) override {
        auto& [params, total, position, pcm] = track(stream);
        requests.push_back(count);
        const int n = static_cast<int>(std::min<long long>(count, total - position));
        pcm.setSamples(0);
        if (n < 1) return QvStatus::endOfStream;
        if (pcm.size() < n) pcm.init(n, pcm.channels(), 2, pcm.samplerate());
        pcm.setSamples(n);
        auto* value = reinterpret_cast<short*>(pcm.ptr(0));
        for (int i = 0; i < n * pcm.channels(); ++i)
            *value++ = static_cast<short>((position + i / pcm.channels()) % 1000 + 1);
        position += n;
        return n;
    }
    int nrFrames(int) const override { return video.getInt32("frames"); }
    long long nrSamples(int stream) const override { return track(stream).total; }
    QvFrame* getFramePtr(int) override { return &frame; }
    QvPcm* getAudioPtr(int stream) override { return &track(stream).pcm; }
    int select(int, int) override { return 0; }
    int deselect(int, int) override { return 0; }
    int selected(AnyDict&) const override { return 0; }
    bool isSelected(int, int) const override { return true; }

    struct Track {
        AnyDict params;
        long long total = 0;
        long long position = 0;
        QvPcm pcm;
    };
    Track& track(int stream) const { return *tracks.at(static_cast<std::size_t>(stream)); }
    int available() const { return truncatedAt >= 0 ? truncatedAt : video.getInt32("frames"); }

    AnyDict video;
    AnyDict extra;  // answers of getParam
    AnyDict set;    // what setParam got
    std::vector<std::unique_ptr<Track>> tracks;
    std::vector<int> requests;
    QvFrame frame;
    int next = 0;
    int read = 0;
    int truncatedAt = -1;
    int failAt = -1;
    int seekResult = 0;
};

template <class Base>
class FakeEncoder : public Base {
  public:
    int setParam(const char* name, const Any& value) override {
        if (refused.isSet(name)) return Base::setParam("unknown", value);
        params.set(name, value);
        return 0;
    }
    void getParam(const char* name, Any& value) const override {
        if (params.isSet(name))
            value = params.get(name);
        else
            Base::getParam(name, value);
    }
    int open() override { return 0; }
    int close() override { return 0; }

    AnyDict params;
    AnyDict refused;  // names that it does not know
    int result = 0;
};

class FakeVideoEncoder : public FakeEncoder<QvVideoEncoder> {
  public:
    int writeFrame(QvFrame* frame) override {
        numbers.push_back(frame ? frame->frameNr : -1);
        addresses.push_back(frame);
        return result;
    }
    QvFrame* lastFrame() override { return nullptr; }

    std::vector<int> numbers;
    std::vector<QvFrame*> addresses;
};

class FakeAudioEncoder : public FakeEncoder<QvAudioEncoder> {
  public:
    int writePcm(QvPcm* pcm, int samples) override {
        const int count = samples < 0 && pcm ? pcm->samples() : samples;
        counts.push_back(count);
        total += count;
        addresses.push_back(pcm);
        for (int i = 0; pcm && i < count; ++i) {
            short value = 0;
            std::memcpy(&value, pcm->ptr(i), pcm->bytesPerSample() < 2 ? 1 : 2);
            values.push_back(value);
        }
        return result;
    }

    std::vector<int> counts;
    std::vector<QvPcm*> addresses;
    std::vector<int> values;  // of the first channel
    long long total = 0;
};

// One video and any number of audio encoders, without multiplexer and sink.
class FakeEncodePipe : public EncodePipe2 {
  public:
    FakeEncodePipe(const QvFramerate& rate, int width = 16, int height = 8) {
        video.params = AnyDict("framerate", rate, "width", width, "height", height, "inFOURCC",
                               AnyVector(Any(static_cast<int>(QvFourcc::GRAY))));
    }
    FakeEncodePipe& audio(int samplerate, int channels = 2, int bits = 16) {
        audios.push_back(std::make_unique<FakeAudioEncoder>());
        audios.back()->params =
            AnyDict("samplerate", samplerate, "channels", channels, "bitsPerSample", bits);
        return *this;
    }

    int setParam(const char* name, const Any& value) override {
        set.set(name, value);
        return 0;
    }
    void getParam(const char* name, Any& value) const override {
        const std::string full = name;
        const auto slash = full.find('/');
        if (slash == std::string::npos) return;
        encoder(full[0] == 'a' ? 2 : 1, full[5] - '0')->getParam(full.c_str() + slash + 1, value);
    }
    int open() override { return 0; }
    int close() override { return 0; }
    int abort() override { return 0; }
    int writeFrame(QvFrame* frame, int) override { return video.writeFrame(frame); }
    int writePcm(QvPcm* pcm, int stream) override { return audioEncoder(stream)->writePcm(pcm); }
    int nrStreams(int mask) const override {
        return (mask & 1 ? 1 : 0) + (mask & 2 ? static_cast<int>(audios.size()) : 0);
    }
    QvOStream* stream(int type, int nr) const override {
        return nr < 0 || nr >= nrStreams(type) ? nullptr : streamAt(type == 1 ? nr : 1 + nr);
    }
    QvOStream* streamAt(int index) const override {
        while (static_cast<int>(records.size()) <= index)
            records.push_back(std::make_unique<QvOStream>(records.empty() ? 1 : 2));
        return records.at(static_cast<std::size_t>(index)).get();
    }
    QvEncoder* encoder(int type, int nr) const override {
        if (type == 1) return videoEncoder(nr);
        return audioEncoder(nr);
    }
    QvVideoEncoder* videoEncoder(int) const override { return const_cast<FakeVideoEncoder*>(&video); }
    QvAudioEncoder* audioEncoder(int nr) const override {
        return audios.at(static_cast<std::size_t>(nr)).get();
    }
    QvMuxer* getMuxer() const override { return muxer; }
    const QvPreset* activePreset() const override { return nullptr; }

    FakeVideoEncoder video;
    std::vector<std::unique_ptr<FakeAudioEncoder>> audios;
    AnyDict set;
    QvMuxer* muxer = nullptr;

  private:
    mutable std::vector<std::unique_ptr<QvOStream>> records;
};

// Takes every parameter, answers with what it was given, and has at most one video stream.
class FakeMuxer : public FakeEncoder<QvMuxer> {
  public:
    explicit FakeMuxer(const char* name, QvBufStream* video = nullptr) : name_(name), video_(video) {}
    const char* name() const override { return name_; }
    QvBufStream* addStream(int, const AnyDict&) override { return nullptr; }
    void removeStreams(int) override {}
    void removeStream(int, int) override {}
    int nrStreams(int type) const override { return type == 1 && video_ ? 1 : 0; }
    QvBufStream* stream(int, int) const override { return video_; }

  private:
    const char* name_;
    QvBufStream* video_;
};
