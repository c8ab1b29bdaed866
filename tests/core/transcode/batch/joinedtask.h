// Stored tasks of several segments over real files, and what comes out of them.
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/measure/fourcc.h"
#include "core/transcode/batch/qvbatchtask.h"
#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/task/qvtaskstate.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/wav_bytes.h"

class JoinedTask : public testing::Test {
  protected:
    static constexpr int width = 32,
                         height = 16;  // of the output, which has 25 frames and 48000 samples a second

    JoinedTask() { state_.set("encoder", output(1)); }

    // A rate of 0: sound alone.
    AnyDict output(int sounds, const QvFramerate& rate = QvFramerate::f25p(), int samplerate = 48000) const {
        const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        pipe->clearStreams();
        if (rate.rate().ratio() > 0) {
            pipe->addVideoStream("rawvenc");
            pipe->videoEncoder(0)->setParamDict(AnyDict("type", static_cast<int>(QvFourcc::GRAY), "width",
                                                        width, "height", height, "framerate", rate));
        }
        for (int i = 0; i < sounds; ++i) {
            pipe->addAudioStream("rawaenc");
            pipe->audioEncoder(i)->setParamDict(
                AnyDict("channels", 1, "bitsPerSample", 16, "samplerate", samplerate));
        }
        AnyDict encoder;
        pipe->store(encoder);
        return encoder;
    }

    // Raw pictures, each of one level, rising by one from frame to frame. The entry of "files".
    AnyDict film(const std::string& name, int frames, int first, const QvFramerate& rate, int w, int h) {
        std::string bytes;
        for (int i = 0; i < frames; ++i)
            bytes += std::string(static_cast<std::size_t>(w * h), static_cast<char>(first + i));
        const std::string file = folder_.write(name, bytes);
        return entry(file,
                     AnyDict("name", "rawdec", "FOURCC", "GRAY", "width", w, "height", h, "framerate", rate));
    }
    // One level throughout.
    AnyDict sound(const std::string& name, long long samples, int level, unsigned rate) {
        std::string bytes;
        for (long long i = 0; i < samples; ++i) bytes += leBytes(static_cast<std::uint64_t>(level), 2);
        return entry(
            folder_.write(name, riff(wavChunk("fmt ", wavFormat(1, 1, rate, 16)) + wavChunk("data", bytes))),
            AnyDict());
    }
    static AnyDict entry(const std::string& file, const AnyDict& decoder) {
        AnyDict made("filename", file.c_str());
        if (!decoder.empty()) made.set("decoder", decoder);
        return made;
    }
    static Any source(int type, const AnyDict& file, std::optional<InOutPoints> points = {}, int number = 0) {
        AnyDict made("file", file.get("filename"), "stream", Any(Pair(type, number)));
        if (points) {
            ProcessParams params;
            params.setInOutPoints(*points);
            made.set("process", static_cast<const AnyDict&>(params));
        }
        return Any(made);
    }
    static InOutPoints cut(double from, double to) { return {MediaTime(from), MediaTime(to)}; }

    void add(const AnyVector& sources, const AnyVector& files) {
        if (!state_.get("streams").isVector()) {
            AnyVector streams;
            for (const Any& one : sources)
                streams.append(AnyDict("type", one.asDict().get("stream").asPair().first));
            state_.set("streams", streams);
            state_.set("segments", AnyVector());
            state_.setOutputFilename(folder_.file("out.x").c_str());
        }
        state_.addSegment(sources, files);
    }

    // A task as a run has it.
    struct Open {
        Open() = default;
        Open(Open&&) = default;
        ~Open() {
            task.reset();
            pipe.reset();
            decoders.deleteAll();
        }
        QvDPipeList decoders;
        std::unique_ptr<QvEncodePipe> pipe;
        std::unique_ptr<QvBatchTask> task;
        std::string error;
    };
    std::unique_ptr<Open> restore(int options = 0) {
        auto made = std::make_unique<Open>();
        QvEncodePipe* pipe = nullptr;
        Any error;
        made->task.reset(QvBatchTask::fromState(state_, made->decoders, &pipe, options, nullptr, &error));
        made->pipe.reset(pipe);
        made->error = error.asString("");
        return made;
    }
    static int run(QvTask& task, std::string* error = nullptr) {
        QvTranscoder transcoder(&task);
        transcoder.setParam("startDelay", 0);
        const int result = transcoder.transcode(true);
        if (error) *error = transcoder.errorDesc();
        return result;
    }

    // The output of that ending; of several the first.
    std::string written(const char* ending) const {
        std::string name;
        for (const auto& file : std::filesystem::directory_iterator(folder_.path())) {
            const std::string found = file.path().string();
            if (file.path().filename().string().find("out") != 0 || file.path().extension() != ending)
                continue;
            if (name.empty() || found < name) name = found;
        }
        return name.empty() ? "" : TempFolder::read(name);
    }
    // The level of each picture; -1 for one that is not of one level.
    std::vector<int> levels(const std::string& bytes) const {
        std::vector<int> all;
        constexpr std::size_t size = width * height;
        EXPECT_EQ(bytes.size() % size, 0u);
        for (std::size_t at = 0; at + size <= bytes.size(); at += size) {
            const std::string picture = bytes.substr(at, size);
            const bool flat = picture.find_first_not_of(picture[0]) == std::string::npos;
            all.push_back(flat ? static_cast<unsigned char>(picture[0]) : -1);
        }
        return all;
    }
    static std::vector<int> samples(const std::string& bytes) {
        std::vector<int> all;
        for (std::size_t at = 0; at + 2 <= bytes.size(); at += 2)
            all.push_back(static_cast<short>(leNumber(bytes, at, 2)));
        return all;
    }

    EngineScope engine_;
    TempFolder folder_;
    QvTaskState state_;
};
