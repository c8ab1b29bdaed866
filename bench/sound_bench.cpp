// Filters of sound: what they cost against copies of the same bytes, and the rate converter against its
// peers. CPU time, the median of 11 pairs that take turns, buffers of 16 MiB. Then what the standard quality
// of the rate converter does to tones.
#include <algorithm>
#include <array>
#include <cmath>
#include <complex>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <memory>
#include <numbers>
#include <vector>

#include "bench/ratio.h"
#include "builtin/decoders/wavvalues.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvpcm.h"
#if __has_include(<soxr.h>)
#include <soxr.h>
#endif
#ifdef QV_HAVE_LIBSWRESAMPLE
extern "C" {
#include <libavutil/channel_layout.h>
#include <libswresample/swresample.h>
}
#endif

namespace {

constexpr int bufferBytes = 16 << 20;
constexpr int pairs = 11;

double cpuSeconds() {
    timespec now{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) * 1e-9;
}

double timeOf(const std::function<void()>& work) {
    const double begin = cpuSeconds();
    work();
    benchmark::ClobberMemory();
    return cpuSeconds() - begin;
}

// The median of the ratios of pairs, so that what slows the machine down meets both sides.
void compare(const char* name, double aim, const std::function<void()>& ours,
             const std::function<void()>& peer) {
    std::array<double, pairs> ratios{}, times{}, peers{};
    ours();
    peer();
    for (size_t i = 0; i < pairs; ++i) {
        times[i] = timeOf(ours);
        peers[i] = timeOf(peer);
        ratios[i] = times[i] / peers[i];
    }
    const auto median = [](auto& list) {
        std::nth_element(list.begin(), list.begin() + pairs / 2, list.end());
        return list[pairs / 2];
    };
    const double ratio = median(ratios);
    std::printf("%-58s %9.3f ms %9.3f ms %8.2f %6.2f%s\n", name, median(times) * 1e3, median(peers) * 1e3,
                ratio, aim, ratio <= aim ? "" : "  above");
    std::fflush(stdout);
}

struct Param {
    const char* name;
    Any value;
};

std::unique_ptr<QvAudioFilter> opened(const char* module, const std::vector<Param>& params) {
    std::unique_ptr<QvAudioFilter> filter(static_cast<QvAudioFilter*>(qv_registry()->newCodec(module)));
    filter->init();
    for (const Param& param : params) filter->setParam(param.name, param.value);
    if (filter->open() != 0) std::printf("%s: %s\n", module, filter->errorDesc());
    return filter;
}

// Sound of 24 bits in the width that is asked for.
QvPcm buffer(int channels, int width, int bytes = bufferBytes) {
    QvPcm pcm;
    const int samples = bytes / channels / width;
    pcm.init(samples, channels, width, 48000);
    uint32_t random = 1;
    for (int i = 0; i < samples * channels; ++i) {
        random = random * 1664525 + 1013904223;
        const int32_t value = static_cast<int32_t>(random) >> (width == 4 ? 9 : 8);
        std::memcpy(pcm.ptr(0) + static_cast<ptrdiff_t>(i) * width, &value, static_cast<size_t>(width));
    }
    pcm.setSamples(samples);
    return pcm;
}

// Writes the buffer and takes what comes out.
std::function<void()> converter(QvAudioFilter& filter, QvPcm& in) {
    return [&] {
        filter.write(in);
        filter.erase(filter.samples());
    };
}

// Against copies of the bytes that go in and of those that come out.
void againstCopy(const char* name, const char* module, const std::vector<Param>& params, int channels,
                 int width) {
    const auto filter = opened(module, params);
    QvPcm in = buffer(channels, width);
    filter->write(in);
    const auto bytes = static_cast<size_t>(in.bytes()) + static_cast<size_t>(filter->pcm()->bytes());
    std::vector<char> from(bytes, 1), to(bytes);
    filter->erase(filter->samples());
    compare(
        name, 2.0,
        [&] {
            filter->write(in);
            filter->erase(filter->samples());
        },
        [&] { std::memcpy(to.data(), from.data(), bytes); });
}

// Values of files made into those of the engine.
void fileValues(const char* name, wav::Convert convert, size_t width) {
    const size_t count = static_cast<size_t>(bufferBytes) / width, bytes = count * (width + 3);
    std::vector<unsigned char> from(count * width), to(count * 3 + 1);
    for (size_t i = 0; i < count; ++i) {
        const double value = static_cast<double>(i * 2654435761u % 16777213) / 8388608 - 1;
        const auto single = static_cast<float>(value);
        const auto whole = static_cast<int32_t>(value * 2147483647);
        if (convert == wav::narrowInt32)
            std::memcpy(&from[i * width], &whole, width);
        else if (width == 4)
            std::memcpy(&from[i * width], &single, width);
        else
            std::memcpy(&from[i * width], &value, width);
    }
    std::vector<char> plainFrom(bytes, 1), plainTo(bytes);
    compare(
        name, 2.0, [&] { benchmark::DoNotOptimize(convert(to.data(), from.data(), count)); },
        [&] { std::memcpy(plainTo.data(), plainFrom.data(), bytes); });
}

AnyVector mean(std::initializer_list<int> channels) {
    AnyVector row;
    for (const int channel : channels) row.append(Any(channel));
    return row;
}

void rates() {
    QvPcm in = buffer(2, 4);
    const std::vector<Param> usual = {{"inSamplerate", 44100}, {"outSamplerate", 48000}, {"splsToGet", 1920}};
    std::vector<Param> best = usual;
    best.push_back({"quality", "high"});
#ifdef QV_HAVE_LIBSWRESAMPLE
    const auto standard = opened("srconvert", usual);
    SwrContext* swr = nullptr;
    AVChannelLayout stereo = AV_CHANNEL_LAYOUT_STEREO;
    swr_alloc_set_opts2(&swr, &stereo, AV_SAMPLE_FMT_S32, 48000, &stereo, AV_SAMPLE_FMT_S32, 44100, 0,
                        nullptr);
    swr_init(swr);
    const auto room = static_cast<size_t>(in.samples()) * 2;
    std::vector<int32_t> out(2 * room);
    compare("44.1 to 48 kHz, stereo, standard : libswresample", 1.0, converter(*standard, in), [&] {
        const uint8_t* from = in.ptr(0);
        auto* to = reinterpret_cast<uint8_t*>(out.data());
        swr_convert(swr, &to, static_cast<int>(room), &from, in.samples());
    });
    swr_free(&swr);
#else
    std::printf("libswresample-dev is not installed: no peer of the standard quality\n");
#endif
#if __has_include(<soxr.h>)
    const auto high = opened("srconvert", best);
    const auto io = soxr_io_spec(SOXR_INT32_I, SOXR_INT32_I);
    const auto quality = soxr_quality_spec(SOXR_VHQ, 0);
    soxr_t soxr = soxr_create(44100, 48000, 2, nullptr, &io, &quality, nullptr);
    const auto most = static_cast<size_t>(in.samples()) * 2;
    std::vector<int32_t> made(2 * most);
    compare("44.1 to 48 kHz, stereo, high : libsoxr", 1.1, converter(*high, in), [&] {
        size_t taken = 0, given = 0;
        soxr_process(soxr, in.ptr(0), static_cast<size_t>(in.samples()), &taken, made.data(), most, &given);
    });
    soxr_delete(soxr);
#else
    std::printf("libsoxr-dev is not installed: no high quality\n");
#endif
}

// The level of a tone after the rate converter, at the frequency where it should be or where it folds to, in
// dB.
double level(int inRate, int outRate, double frequency, double heardAt) {
    const auto filter = opened("srconvert", {{"inSamplerate", inRate}, {"outSamplerate", outRate}});
    constexpr double amplitude = 4e6;
    const int samples = inRate / 2;
    QvPcm pcm;
    pcm.init(samples, 1, 4, inRate);
    for (int i = 0; i < samples; ++i) {
        const auto value = static_cast<int32_t>(
            std::lround(amplitude * std::sin(2 * std::numbers::pi * frequency * i / inRate)));
        std::memcpy(pcm.ptr(i), &value, 4);
    }
    pcm.setSamples(samples);
    filter->write(pcm);
    const int first = 200, n = filter->samples() - 2 * first;
    std::complex<double> sum = 0;
    double weights = 0;
    for (int i = 0; i < n; ++i) {
        int32_t value = 0;
        std::memcpy(&value, filter->pcm()->ptr(first + i), 4);
        const double window = 0.5 - 0.5 * std::cos(2 * std::numbers::pi * i / n);
        sum += window * value * std::polar(1.0, -2 * std::numbers::pi * heardAt * i / outRate);
        weights += window;
    }
    return 20 * std::log10(std::abs(sum) * 2 / weights / amplitude + 1e-12);
}

void bands() {
    std::printf("\nlevels of tones after the rate converter of standard quality, in dB\n");
    const struct {
        int in, out;
    } rates[] = {{44100, 48000}, {48000, 44100}, {96000, 48000},
                 {48000, 96000}, {32000, 48000}, {192000, 44100}};
    for (const auto& rate : rates) {
        const double narrow = std::min(rate.in, rate.out) / 2.0;
        std::printf("%6d to %6d  pass band:", rate.in, rate.out);
        for (const double share : {0.05, 0.25, 0.5, 0.7, 0.8, 0.9})
            std::printf("  %.2f of %.1f kHz %6.2f", share, narrow / 1000,
                        level(rate.in, rate.out, share * narrow, share * narrow));
        std::printf("\n%17s stop band:", "");
        // Downwards tones above the new limit fold; upwards the images of tones below the old one.
        for (const double share : {0.02, 0.1, 0.2, 0.3}) {
            const double off = share * narrow;
            const bool down = rate.out < rate.in;
            const double tone = down ? narrow + off : narrow - off;
            if (down && tone >= rate.in / 2.0) continue;
            const double heard = down ? rate.out - tone : rate.in - tone;
            if (heard > rate.out / 2.0) continue;
            std::printf("  %8.0f Hz at %8.0f %7.1f", tone, heard, level(rate.in, rate.out, tone, heard));
        }
        std::printf("\n");
    }
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    std::printf("%-58s %12s %12s %8s %6s\n", "filters of sound, 16 MiB: ours, peer, ratio, aim", "ours",
                "peer", "ratio", "aim");
    for (const auto& [bits, width] : {std::pair(32, 1), {32, 2}, {32, 3}, {8, 4}, {16, 4}, {24, 4}}) {
        const std::string name =
            "aquant, " + std::to_string(width) + " bytes to " + std::to_string(bits) + " bits : copy";
        againstCopy(name.c_str(), "aquant", {{"outBitsPerSample", bits}}, 2, width);
    }
    againstCopy("aquant, 4 bytes to 16 bits with dither : copy", "aquant",
                {{"outBitsPerSample", 16}, {"dither", "triangular"}}, 2, 4);
    againstCopy("avol, stereo : copy", "avol", {{"volume", -3.0}}, 2, 4);
    againstCopy("avol, 6 channels : copy", "avol", {{"volume", -3.0}}, 6, 4);
    againstCopy("avol, stereo, 16 fraction bits : copy", "avol", {{"volume", 3.0}, {"precision", 16}}, 2, 4);
    againstCopy("chconvert, swap : copy", "chconvert", {{"connMatrix", AnyVector(Any(1), Any(0))}}, 2, 4);
    againstCopy("chconvert, stereo to mono : copy", "chconvert",
                {{"connMatrix", AnyVector(Any(mean({0, 1})))}}, 2, 4);
    againstCopy("chconvert, 6 to 2, two sources each : copy", "chconvert",
                {{"connMatrix", AnyVector(Any(mean({0, 4})), Any(mean({1, 5})))}}, 6, 4);
    againstCopy("chconvert, mono to stereo : copy", "chconvert", {{"connMatrix", AnyVector(Any(0), Any(0))}},
                1, 4);
    fileValues("wavdec, 32-bit PCM to 24 bits : copy", wav::narrowInt32, 4);
    fileValues("wavdec, 32-bit float to 24 bits : copy", wav::narrowFloat32, 4);
    fileValues("wavdec, 64-bit float to 24 bits : copy", wav::narrowFloat64, 8);
    rates();
    bands();
    cleanup_wrapper();
    return 0;
}
