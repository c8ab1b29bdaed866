// The normalizer in a pipe, from its report to what comes out.
#include <cmath>
#include <numbers>

#include "core/arch/qvexception.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/jobdescription.h"
#include "core/media/qvloudness.h"
#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/builtin/sound/sounds.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"

namespace {

Values sine(int samples, int channels, double amplitude, double hertz) {
    Values values;
    for (int i = 0; i < samples; ++i)
        values.insert(values.end(), static_cast<std::size_t>(channels),
                      static_cast<int>(std::lround(amplitude * (1 << 23) *
                                                   std::sin(2 * std::numbers::pi * hertz * i / 48000))));
    return values;
}

// One stream of 32-bit samples, as a mixed input has them.
class WideDecoder : public FakeDecoder {
  public:
    WideDecoder(const Values& values, int channels) : FakeDecoder(1, QvFramerate::f25p()) {
        const int samples = static_cast<int>(values.size()) / channels;
        audio(samples, 48000, channels);
        track(0).params.set("bytesPerSample", 4);
        track(0).params.set("bitsPerSample", 32);
        sound_ = soundOf(values, channels);
        EXPECT_EQ(QvDecodePipe::open(), 0);
    }
    int open() override { return 0; }
    int readSamples(int count, int) override {
        auto& [params, total, position, pcm] = track(0);
        const int n = static_cast<int>(std::min<long long>(count, total - position));
        pcm.init(std::max(n, 0), sound_.channels(), 4, sound_.samplerate());
        if (n < 1) return QvStatus::endOfStream;
        pcm.write(n, sound_.ptr(static_cast<int>(position)));
        position += n;
        return n;
    }

  private:
    QvPcm sound_;
};

struct Step {
    const char* filter;
    AnyDict params;
};

// The samples from..to through the filters, as a link does it; `meter` gets what comes out.
void play(WideDecoder& decoder, const std::vector<Step>& steps, int from, int to, QvLoudness& meter) {
    const std::unique_ptr<QvAProcessPipe> pipe(QvAProcessPipe::create());
    for (const auto& [name, params] : steps) {
        auto* filter = static_cast<QvAudioFilter*>(qv_registry()->newCodec(name));
        ASSERT_TRUE(filter) << name;
        EXPECT_EQ(filter->setParamDict(params), 0) << filter->errorDesc();
        pipe->addFilter(filter, -1);
    }
    QvProcessUtil::applyStreamReport(pipe.get(), &decoder, 0, from, to);
    ASSERT_EQ(pipe->open(), 0);
    decoder.seekToSample(from, 0);
    for (int left = to - from; left > 0;) {
        const int count = std::min(left, 1920);
        ASSERT_EQ(pipe->process(&decoder, 0, count), 0);
        ASSERT_EQ(pipe->pcm()->samples(), count);
        if (left == to - from) meter.init(pipe->pcm()->channels(), 48000);
        ASSERT_EQ(meter.add(*pipe->pcm()), 0);
        pipe->erase(count);
        left -= count;
    }
}

TEST(NormalizedChain, WhatComesOutHasTheLevel) {
    const EngineScope engine;
    Values values = sine(3 * 48000, 2, 0.5, 997);
    const Values quiet = sine(2 * 48000, 2, 0.05, 997);
    values.insert(values.end(), quiet.begin(), quiet.end());
    WideDecoder decoder(values, 2);
    AnyVector fall(Any(AnyDict("time", 0.0, "volume", 100)), Any(AnyDict("time", 2.0, "volume", 5)));
    const AnyDict curve("volume_list_0", Any(fall));
    const AnyDict squeeze("compressorActive", 1, "compressorLevel", -20.0, "limiterActive", 1);
    const std::vector<std::vector<Step>> chains = {
        {}, {{"audiolevel", curve}}, {{"dynamics", squeeze}, {"adelay", AnyDict("delay", 300)}}};
    for (auto chain : chains) {
        for (const auto& [mode, target, level] : {std::tuple{"peak", -12.0, &QvLoudness::samplePeak},
                                                  {"rms", -27.5, &QvLoudness::rms},
                                                  {"loudness", -30.0, &QvLoudness::integrated}}) {
            for (const auto& [from, to] : {std::pair{0, 5 * 48000}, {2 * 48000, 4 * 48000}}) {
                const LogCapture log;
                auto steps = chain;
                steps.push_back({"normalizer", AnyDict("mode", mode, "target", target)});
                QvLoudness meter;
                play(decoder, steps, from, to, meter);
                EXPECT_NEAR((meter.*level)(), target, 0.01)
                    << mode << " after " << chain.size() << " filters";
                EXPECT_EQ(log.count("", QvLogMask::warning), 0);
            }
        }
    }
}

TEST(NormalizedChain, TheTruePeakIsTheLimitAndSilenceStays) {
    const EngineScope engine;
    const LogCapture log;
    WideDecoder decoder(sine(3 * 48000, 6, 0.02, 11997), 6);
    QvLoudness meter;
    play(decoder, {{"normalizer", AnyDict("mode", "loudness", "target", 12.0, "truePeak", -2.0)}}, 0,
         3 * 48000, meter);
    EXPECT_NEAR(meter.truePeak(), -2, 0.05);
    EXPECT_TRUE(log.contains("its true peak is at the limit of -2.0 dBTP", QvLogMask::warning));
    WideDecoder silent(Values(6 * 48000, 0), 6);
    QvLoudness silence;
    play(silent, {{"normalizer", AnyDict("mode", "loudness")}}, 0, 48000, silence);
    EXPECT_EQ(silence.samplePeak(), QvLoudness::silence);
}

// The chain that the engine makes by itself, with its real converters.
TEST(SoundChain, IsRefusedBeforeItRuns) {
    const EngineScope engine;
    const auto filter = [](const char* name, int front) {
        return AnyVector(Any(AnyDict("name", name, "_on", 1, "_front", front)));
    };
    const struct {
        int inChannels, outChannels;
        AnyVector filters;
        const char *quality, *dither, *refused;  // null: it opens
    } rows[] = {
        {2, 2, {}, "standard", "triangular", nullptr},
        {2, 2, {}, "best", "none", "'quality' takes standard (16 taps"},
        {2, 2, {}, "standard", "some", "'dither' takes none or triangular"},
        {9, 2, filter("dynamics", 1), "standard", "none",
         "dynamics works on up to 8 channels, the sound has 9"},
        {9, 2, filter("dynamics", 0), "standard", "none", nullptr},
        {2, 16, filter("dynamics", 0), "standard", "none", "the sound has 16"},
        {2, 16, filter("avol", 0), "standard", "none", nullptr},
    };
    for (const auto& row : rows) {
        AudioJobDescription job;
        job.inBitsPerSample = job.outBitsPerSample = 16;
        job.inSamplerate = 44100, job.outSamplerate = 48000;
        job.inChannels = row.inChannels, job.outChannels = row.outChannels;
        for (int i = 0; i < row.outChannels; ++i) job.connMatrix.append(Any(AnyDict("channel", 0)));
        job.filters = row.filters;
        job.conversion.rateQuality = row.quality, job.conversion.dither = row.dither;
        MediaTime delay;
        std::string why;
        try {
            const std::unique_ptr<QvAProcessPipe> pipe(QvProcessUtil::createAudioPipe(job, delay));
            if (pipe->open() != 0) why = pipe->errorDesc();
        } catch (const QvAssertFailure& failure) {
            why = failure.what();
        }
        EXPECT_EQ(why.empty(), !row.refused) << why;
        EXPECT_NE(why.find(row.refused ? row.refused : ""), std::string::npos) << why;
    }
}

// A stop while the sound is measured ends the run before it begins.
TEST(NormalizedChain, AStopEndsTheMeasurement) {
    class Measured : public QvTranscoder {
      public:
        using QvTranscoder::QvTranscoder;
        void cbMeasure(double part) override {
            last = part;
            if (part > stopAt) requestStop();
        }
        void cbDone(int result) override { done = result; }
        double stopAt = 2, last = -1;
        int done = -99;
    };
    const EngineScope engine;
    for (const double stopAt : {2.0, 0.4}) {
        FakeDecoder decoder(1, QvFramerate::f25p());
        decoder.audio(480000, 48000);
        ASSERT_EQ(static_cast<QvDecodePipe&>(decoder).QvDecodePipe::open(), 0);
        FakeEncodePipe pipe(QvFramerate::f25p());
        pipe.audio(48000);
        QvTask task;
        task.setEncoder(&pipe);
        ProcessParams params;
        FiltersState filters;
        filters.appendFilter("normalizer", AnyDict("name", "normalizer", "_on", 1));
        params.setFilters(filters);
        ASSERT_GE(task.link(&decoder, qvAudioStream, 0, 0, params), 0) << task.errorDesc();
        Measured run(&task);
        run.setParam("startDelay", 0);
        run.stopAt = stopAt;
        const bool stopped = stopAt < 1;
        EXPECT_EQ(run.transcode(true), stopped ? QvStatus::failed : 0) << run.errorDesc();
        EXPECT_NEAR(run.last, std::min(stopAt, 1.0), 0.02);
        EXPECT_EQ(run.done, stopped ? -99 : 0);
        EXPECT_EQ(pipe.audios.front()->counts.empty(), stopped);
        EXPECT_EQ(std::strstr(run.errorDesc(), "Stopped while the sound was measured") != nullptr, stopped);
    }
}

}  // namespace
