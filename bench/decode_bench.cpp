// Sources: how near reading comes to plain reads and copies of the same bytes. Ratios are printed as the
// counter "ratio", ours to the plain way measured just before.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/decode/qvtestgenerator.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "core/media/qvbuffer.h"
#include "core/stream/qvbytesource.h"

namespace {

// The fastest of several runs each, taken in turns, in processor time: other work on the machine counts for
// little.
template <class Ours, class Plain>
double ratio(Ours&& ours, Plain&& plain) {
    const auto time = [](auto& work) {
        const std::clock_t begin = std::clock();
        work();
        return static_cast<double>(std::clock() - begin);
    };
    double best = 1e18;
    double bestPlain = 1e18;
    for (int i = 0; i < 15; ++i) {
        bestPlain = std::min(bestPlain, time(plain));
        best = std::min(best, time(ours));
    }
    return best / bestPlain;
}

struct ScratchFile {
    explicit ScratchFile(const char* suffix)
        : name("/tmp/tarsel-bench-" + std::to_string(getpid()) + suffix) {}
    ~ScratchFile() { std::remove(name.c_str()); }
    std::string name;
};

void readPlainly(const std::string& name, std::vector<char>& block) {
    const int file = open(name.c_str(), O_RDONLY);
    while (read(file, block.data(), block.size()) > 0) benchmark::DoNotOptimize(block.data());
    close(file);
}

std::unique_ptr<QvDecodePipe> make(const char* module, const std::string& name) {
    QvCodec* codec = qv_registry()->newCodec(module);
    auto* decoder = static_cast<QvDecodePipe*>(codec->getInterface(2));
    decoder->setParam("filename", name.c_str());
    return std::unique_ptr<QvDecodePipe>(decoder);
}

void rawFrames(benchmark::State& state) {
    const ScratchFile file(".raw");
    constexpr int frameBytes = 1920 * 1080 * 3 / 2;
    std::ofstream(file.name, std::ios::binary) << std::string(static_cast<std::size_t>(frameBytes) * 60, 'x');
    auto decoder = make("rawdec", file.name);
    decoder->setParam("width", 1920);
    decoder->setParam("height", 1080);
    decoder->setParam("FOURCC", "I420");
    decoder->open();
    std::vector<char> block(1 << 20);
    for (auto _ : state) {
        const auto ours = [&] {
            decoder->seekToFrame(0, 0);
            while (decoder->readFrame(0) == 0) benchmark::DoNotOptimize(decoder->getFramePtr(0));
        };
        state.counters["ratio"] = ratio(ours, [&] { readPlainly(file.name, block); });
    }
}
BENCHMARK(rawFrames)->Iterations(1)->Unit(benchmark::kMillisecond);

std::string wavHeader(unsigned dataBytes) {
    const auto word = [](unsigned value) { return std::string(reinterpret_cast<const char*>(&value), 4); };
    return "RIFF" + word(dataBytes + 36) + "WAVEfmt " + word(16) + word(1 | 2 << 16) + word(48000) +
           word(192000) + word(4 | 16 << 16) + "data" + word(dataBytes);
}

// Blocks of `range` samples against `read` of the same size.
void wavBlocks(benchmark::State& state) {
    const ScratchFile file(".wav");
    constexpr unsigned dataBytes = 100 << 20;
    std::ofstream(file.name, std::ios::binary) << wavHeader(dataBytes) << std::string(dataBytes, 'x');
    auto decoder = make("wavdec", file.name);
    decoder->open();
    const int samples = static_cast<int>(state.range(0));
    std::vector<char> block(static_cast<std::size_t>(samples) * 4);
    for (auto _ : state) {
        const auto ours = [&] {
            decoder->seekToSample(0, 0);
            while (decoder->readSamples(samples, 0) > 0) benchmark::DoNotOptimize(decoder->getAudioPtr(0));
        };
        state.counters["ratio"] = ratio(ours, [&] { readPlainly(file.name, block); });
    }
}
BENCHMARK(wavBlocks)->Arg(160)->Arg(1600)->Arg(4096)->Arg(48000)->Iterations(1)->Unit(
    benchmark::kMillisecond);

// The same from memory, and by callbacks from there, against the file: no copy that reading a file does not
// make.
void wavFromMemory(benchmark::State& state) {
    const ScratchFile file(".wav");
    constexpr unsigned dataBytes = 100 << 20;
    const std::string bytes = wavHeader(dataBytes) + std::string(dataBytes, 'x');
    std::ofstream(file.name, std::ios::binary) << bytes;
    auto fromFile = make("wavdec", file.name);
    fromFile->open();
    std::size_t at = 0;
    QvSourceCallbacks callbacks{.read = [&](void* to, std::size_t count) -> long long {
                                    const std::size_t got = bytes.copy(static_cast<char*>(to), count, at);
                                    at += got;
                                    return static_cast<long long>(got);
                                },
                                .seek =
                                    [&](long long position) {
                                        at = static_cast<std::size_t>(position);
                                        return true;
                                    },
                                .size = [&] { return static_cast<long long>(bytes.size()); }};
    const std::unique_ptr<QvDecodePipe> memory(QvDecFactory::decodeSource(
        state.range(1) ? qvCallbackSource(callbacks) : qvBlockSource(bytes.data(), bytes.size()),
        Any("a.wav")));
    const int samples = static_cast<int>(state.range(0));
    const auto readAll = [samples](QvDecodePipe& decoder) {
        decoder.seekToSample(0, 0);
        while (decoder.readSamples(samples, 0) > 0) benchmark::DoNotOptimize(decoder.getAudioPtr(0));
    };
    for (auto _ : state)
        state.counters["ratio"] = ratio([&] { readAll(*memory); }, [&] { readAll(*fromFile); });
}
BENCHMARK(wavFromMemory)
    ->ArgsProduct({{160, 1600, 48000}, {0, 1}})
    ->Iterations(1)
    ->Unit(benchmark::kMillisecond);

// A frame of the test card against a copy of its bytes.
void testCard(benchmark::State& state) {
    GeneratorVParams video;
    video.width = 1920;
    video.height = 1080;
    video.framerate.set25p();
    video.duration = MediaTime(10.0);
    const std::unique_ptr<QvDecodePipe> decoder(QvTestGenerator::create(&video, nullptr));
    decoder->open();
    const QvFrame& frame = *decoder->getFramePtr(0);
    const QvFrame from = frame;
    QvFrame to = frame;
    constexpr int frames = 100;
    for (auto _ : state) {
        const auto plain = [&] {
            for (int i = 0; i < frames; ++i) {
                std::memcpy(to.plane(), from.plane(), static_cast<std::size_t>(from.total_bytes()));
                benchmark::DoNotOptimize(to.plane());
            }
        };
        const auto ours = [&] {
            for (int i = 0; i < frames; ++i) decoder->readFrame(0);
        };
        state.counters["ratio"] = ratio(ours, plain);
    }
}
BENCHMARK(testCard)->Iterations(1)->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    init_wrapper(nullptr);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    cleanup_wrapper();
}
