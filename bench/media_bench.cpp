// What the picture and sound buffers cost, as ratios to memcpy of the bytes that they touch: 1.0 is a copy.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <vector>

#include "core/media/qvframe.h"
#include "core/media/qvpcm.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr int width = 1920;
constexpr int height = 1080;

template <class Work>
double secondsOf(Work work) {
    const auto start = Clock::now();
    work();
    return std::chrono::duration<double>(Clock::now() - start).count();
}

// Runs both in turn, so that they meet the same machine, and reports the ratio of their fastest rounds.
template <class Work>
void measure(benchmark::State& state, std::size_t touched, Work work) {
    std::vector<unsigned char> from(touched, 1), to(touched, 2);
    double ours = 1e9, copy = 1e9;
    for (auto _ : state) {
        ours = std::min(ours, secondsOf(work));
        copy = std::min(copy, secondsOf([&] {
                            std::memcpy(to.data(), from.data(), touched);
                            benchmark::DoNotOptimize(to.data());
                            benchmark::ClobberMemory();
                        }));
    }
    state.counters["to_memcpy"] = ours / copy;
    state.counters["GB_per_s"] = static_cast<double>(touched) / ours * 1e-9;
}

struct Pictures {
    QvFrame target, source, mask;

    explicit Pictures(unsigned fourcc) {
        for (QvFrame* frame : {&target, &source}) frame->init(fourcc, width, height);
        mask.init(QvFourcc::GRAY, width, height);
        target.setBlack();
        for (int i = 0; i < source.total_bytes(); ++i) source.plane()[i] = static_cast<unsigned char>(i * 7);
        for (int i = 0; i < mask.total_bytes(); ++i) mask.plane()[i] = static_cast<unsigned char>(i);
    }
    std::size_t bytes() const { return static_cast<std::size_t>(source.total_bytes()); }
};

void copyFrame(benchmark::State& state, unsigned fourcc) {
    Pictures pictures(fourcc);
    measure(state, pictures.bytes(), [&] { pictures.target = pictures.source; });
}

void blendMask(benchmark::State& state, unsigned fourcc) {
    Pictures pictures(fourcc);
    measure(state, pictures.bytes(), [&] { pictures.target.blend(0, 0, pictures.source, &pictures.mask); });
}

void blendAlpha(benchmark::State& state, unsigned fourcc) {
    Pictures pictures(fourcc);
    measure(state, pictures.bytes(), [&] { pictures.target.blend(0, 0, pictures.source, 0.4); });
}

void bob(benchmark::State& state, unsigned fourcc) {
    Pictures pictures(fourcc);
    QvFrame half;
    half.copyBob(pictures.source);
    measure(state, pictures.bytes() / 2, [&] { half.copyBob(pictures.source); });
}

void appendSound(benchmark::State& state) {
    constexpr int samples = 4096, rounds = 64;
    const std::vector<unsigned char> source(samples * 4, 3);
    QvPcm pcm;
    pcm.init(samples, 2, 2, 48000);
    measure(state, source.size() * rounds, [&] {
        pcm.erase(pcm.samples());
        for (int i = 0; i < rounds; ++i) pcm.write(samples, source.data());
    });
}

void appendGrowing(benchmark::State& state) {
    constexpr int samples = 4096, rounds = 64;
    const std::vector<unsigned char> source(samples * 4, 3);
    measure(state, source.size() * rounds, [&] {
        QvPcm pcm;
        pcm.init(samples, 2, 2, 48000);
        for (int i = 0; i < rounds; ++i) pcm.write(samples, source.data());
    });
}

#define QV_FORMATS(work)                           \
    BENCHMARK_CAPTURE(work, I420, QvFourcc::I420); \
    BENCHMARK_CAPTURE(work, YUY2, QvFourcc::YUY2); \
    BENCHMARK_CAPTURE(work, BGR3, QvFourcc::BGR3); \
    BENCHMARK_CAPTURE(work, BGRA, QvFourcc::BGRA); \
    BENCHMARK_CAPTURE(work, W016, QvFourcc::W016); \
    BENCHMARK_CAPTURE(work, b64a, QvFourcc::b64a)

QV_FORMATS(copyFrame);
QV_FORMATS(blendMask);
QV_FORMATS(blendAlpha);
QV_FORMATS(bob);
BENCHMARK(appendSound);
BENCHMARK(appendGrowing);

}  // namespace

BENCHMARK_MAIN();
