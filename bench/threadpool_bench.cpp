// What sharing a picture's bands costs: the pool against a loop on one thread and against threads that are
// started anew for each picture. The figures to read are the ratios to SerialLoop of the same argument.
#include <benchmark/benchmark.h>

#include <thread>
#include <vector>

#include "core/engine/threads/qvthreadpool.h"

namespace {

constexpr int bands = 16;

// Work of a band: `size` bytes changed, as by a light kernel.
struct Picture {
    explicit Picture(std::int64_t size) : rows(static_cast<std::size_t>(size) * bands, 1) {}
    void band(int index) {
        const std::size_t size = rows.size() / bands;
        unsigned char* const row = rows.data() + static_cast<std::size_t>(index) * size;
        for (std::size_t i = 0; i < size; ++i) row[i] = static_cast<unsigned char>(row[i] * 3 + 1);
        benchmark::DoNotOptimize(row);
    }
    std::vector<unsigned char> rows;
};

void SerialLoop(benchmark::State& state) {
    Picture picture(state.range(0));
    for (auto _ : state)
        for (int i = 0; i < bands; ++i) picture.band(i);
}

void Pool(benchmark::State& state) {
    Picture picture(state.range(0));
    for (auto _ : state) qvThreadPool().parallelFor(bands, [&](int i) { picture.band(i); });
    state.counters["width"] = qvThreadPool().width();
}

void FreshThreads(benchmark::State& state) {
    Picture picture(state.range(0));
    const int width = qvThreadPool().width();
    for (auto _ : state) {
        std::vector<std::thread> threads;
        for (int t = 0; t < width; ++t)
            threads.emplace_back([&, t] {
                for (int i = t; i < bands; i += width) picture.band(i);
            });
        for (auto& thread : threads) thread.join();
    }
}

// Bytes of a band: nothing, small, 1920x1080 and 3840x2160 in 4:2:0.
constexpr std::int64_t sizes[] = {0, 4096, 194'400, 777'600};
void arguments(benchmark::internal::Benchmark* benchmark) {
    for (const std::int64_t size : sizes) benchmark->Arg(size);
    benchmark->UseRealTime();
}
BENCHMARK(SerialLoop)->Apply(arguments);
BENCHMARK(Pool)->Apply(arguments);
BENCHMARK(FreshThreads)->Apply(arguments);

}  // namespace

BENCHMARK_MAIN();
