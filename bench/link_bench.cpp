// What a link costs beside the work that it passes on: a step without a pipe, through an empty chain of one
// in-place filter, and of an audio link, each against the bare calls of decoder and encoder.
#include <benchmark/benchmark.h>

#include <chrono>
#include <cstdio>

#include "builtin/modules.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/translink.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

constexpr int frames = 1 << 30;

// Encoders that keep nothing.
struct Output : FakeEncodePipe {
    using FakeEncodePipe::FakeEncodePipe;
    int writeFrame(QvFrame* frame, int) override {
        benchmark::DoNotOptimize(frame);
        return 0;
    }
};

void bareVideo(benchmark::State& state) {
    FakeDecoder decoder(frames, QvFramerate::f25p());
    Output encoder(QvFramerate::f25p());
    for (auto _ : state) {
        decoder.readFrame(0);
        encoder.writeFrame(decoder.getFramePtr(0), 0);
    }
}
BENCHMARK(bareVideo);

void linkWithoutPipe(benchmark::State& state) {
    FakeDecoder decoder(frames, QvFramerate::f25p());
    Output encoder(QvFramerate::f25p());
    TransVLink link;
    link.init(&decoder, 0, &encoder, 0);
    link.open(nullptr);
    for (auto _ : state) benchmark::DoNotOptimize(link.processFrame(0));
}
BENCHMARK(linkWithoutPipe);

void bareAudio(benchmark::State& state) {
    FakeDecoder decoder(1, QvFramerate::f25p());
    decoder.audio(-1, 48000);
    for (auto _ : state) {
        decoder.requests.clear();
        benchmark::DoNotOptimize(decoder.readSamples(1920, 0));
    }
}
BENCHMARK(bareAudio);

// Its filter copies the samples once more.
void audioPipe(benchmark::State& state) {
    FakePlugin plugin;
    plugin.audio("avol").add(new QvAfModule);
    std::unique_ptr<QvAProcessPipe> pipe(QvAProcessPipe::create());
    auto* filter = static_cast<FakeAudioFilter*>(qv_registry()->newCodec("avol"));
    pipe->addFilter(filter, -1);
    pipe->open();
    FakeDecoder decoder(1, QvFramerate::f25p());
    decoder.audio(-1, 48000);
    for (auto _ : state) {
        decoder.requests.clear();
        filter->written.clear();
        pipe->process(&decoder, 0, 1920);
        pipe->erase(1920);
    }
    pipe.reset();
}
BENCHMARK(audioPipe);

}  // namespace

BENCHMARK_MAIN();
