// What links and pipes cost compared with the work that they pass on. The counter "ratio" is our time to that
// of the bare calls of decoder and encoder, the best of several runs taken in turns, in processor time.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <ctime>
#include <memory>

#include "builtin/modules.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/link/video/transvlink.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

constexpr int frames = 1 << 30;
constexpr int steps = 20000;
constexpr int dueSamples = 1920;

template <class Ours, class Plain>
double ratio(Ours&& ours, Plain&& plain) {
    const auto time = [](auto& work) {
        const std::clock_t begin = std::clock();
        for (int i = 0; i < steps; ++i) work();
        return static_cast<double>(std::clock() - begin);
    };
    double best = 1e18;
    double bestPlain = 1e18;
    for (int i = 0; i < 9; ++i) {
        bestPlain = std::min(bestPlain, time(plain));
        best = std::min(best, time(ours));
    }
    return best / bestPlain;
}

// A frame of the size that the smallest job has, copied where an encoder would read it.
struct CopyingOutput : FakeEncodePipe {
    using FakeEncodePipe::FakeEncodePipe;
    int writeFrame(QvFrame* frame, int) override {
        kept = *frame;
        benchmark::DoNotOptimize(kept.plane(0));
        return 0;
    }
    QvFrame kept;
};

void linkWithoutPipe(benchmark::State& state) {
    FakeDecoder decoder(frames, QvFramerate::f25p(), 352, 288);
    CopyingOutput encoder(QvFramerate::f25p(), 352, 288);
    TransVLink link;
    link.init(&decoder, 0, &encoder, 0);
    link.open(nullptr);
    for (auto _ : state) {
        state.counters["ratio"] = ratio([&] { link.processFrame(0); },
                                        [&] {
                                            decoder.readFrame(0);
                                            encoder.writeFrame(decoder.getFramePtr(0), 0);
                                        });
    }
}
BENCHMARK(linkWithoutPipe)->Iterations(1);

// One filter, which copies the samples, and the output buffer, which copies them again.
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
        state.counters["ratio"] = ratio(
            [&] {
                decoder.requests.clear();
                filter->written.clear();
                pipe->process(&decoder, 0, dueSamples);
                pipe->erase(dueSamples);
            },
            [&] {
                decoder.requests.clear();
                decoder.readSamples(dueSamples, 0);
            });
    }
    pipe.reset();
}
BENCHMARK(audioPipe)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
