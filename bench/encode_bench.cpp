// Writing uncompressed 1080p through the encode pipe (raw encoder, elementary export, file), compared with a
// bare write() of the same bytes to a file of the same folder, both for as many frames.
//
//     bench_encode     "ratio" is the pipe's best time to the bare best; 1 is no cost at all. BENCH_DIR names
//     the folder.
#include <benchmark/benchmark.h>

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/init.h"
#include "core/media/qvbuffer.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr int width = 1920;
constexpr int height = 1080;
constexpr int frames = 120;

std::string folder() {
    const char* named = std::getenv("BENCH_DIR");
    return named ? named : std::filesystem::temp_directory_path().string();
}

// Four pictures in turn, so that the source is not always in the cache.
std::vector<QvFrame> pictures() {
    std::vector<QvFrame> all(4);
    for (auto& frame : all) {
        frame.init(QvFourcc::I420, width, height);
        std::fill_n(frame.plane(0), frame.total_bytes(), static_cast<unsigned char>(&frame - all.data()));
    }
    return all;
}

double bareSeconds(std::vector<QvFrame>& all, const std::string& name) {
    const auto start = Clock::now();
    const int file = ::open(name.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    for (int i = 0; i < frames; ++i) {
        const auto& frame = all[static_cast<size_t>(i) % all.size()];
        if (::write(file, frame.plane(0), static_cast<size_t>(frame.total_bytes())) != frame.total_bytes())
            std::abort();
    }
    ::close(file);
    return std::chrono::duration<double>(Clock::now() - start).count();
}

double pipeSeconds(QvEncodePipe& pipe, std::vector<QvFrame>& all) {
    const auto start = Clock::now();
    if (pipe.open() != 0) std::abort();
    for (int i = 0; i < frames; ++i)
        if (pipe.writeFrame(&all[static_cast<size_t>(i) % all.size()], 0) != 0) std::abort();
    if (pipe.close() != 0) std::abort();
    return std::chrono::duration<double>(Clock::now() - start).count();
}

void rawToFile(benchmark::State& state) {
    init_wrapper(nullptr);
    const std::string stem = folder() + "/encode_bench";
    {
        std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        pipe->clearStreams();
        pipe->addVideoStream("rawvenc");
        pipe->setParam("video0",
                       AnyDict("type", static_cast<int>(QvFourcc::I420), "width", width, "height", height));
        pipe->setParam("video0/accelerationOn", static_cast<int>(state.range(0)));
        pipe->setFilename(Any((stem + ".x").c_str()));
        auto all = pictures();
        std::vector<double> ours;
        std::vector<double> bare;
        for (auto _ : state) {
            bare.push_back(bareSeconds(all, stem + ".bare"));
            ours.push_back(pipeSeconds(*pipe, all));
            state.SetIterationTime(ours.back());
        }
        std::sort(ours.begin(), ours.end());
        std::sort(bare.begin(), bare.end());
        state.counters["ratio"] = ours.front() / bare.front();
        state.counters["fps"] = frames / ours.front();
    }
    std::filesystem::remove(stem + ".bare");
    std::filesystem::remove(stem + ".raw");
    cleanup_wrapper();
}

BENCHMARK(rawToFile)
    ->ArgName("worker")
    ->Arg(0)
    ->Arg(1)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond)
    ->Iterations(9);

}  // namespace

BENCHMARK_MAIN();
