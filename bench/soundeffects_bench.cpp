// What sound effects cost on stereo of 32-bit samples, as ratios to copying the samples.
#include <cmath>
#include <cstring>
#include <memory>
#include <string>
#include <utility>

#include "bench/ratio.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvloudness.h"
#include "core/media/qvpcm.h"

namespace {

constexpr int channels = 2, rate = 48000, samples = 1 << 21;  // 16 MiB

// A sine that fades from full scale to -80 dB, so that each stage of the dynamics has something to do.
QvPcm sound() {
    QvPcm pcm;
    pcm.init(samples, channels, 4, rate);
    pcm.setSamples(samples);
    auto* value = reinterpret_cast<int*>(pcm.ptr(0));
    for (int i = 0; i < samples * channels; ++i)
        value[i] = static_cast<int>(8e6 * std::sin(0.03 * i) * std::pow(10, -4.0 * i / (samples * channels)));
    return pcm;
}

AnyVector curve(int points, double spacing, int output) {
    AnyVector list;
    for (int i = 0; i < points; ++i) {
        AnyDict point("time", i * spacing, "volume", i % 100);
        if (output >= 0) point.set("out_ch", output);
        list.append(Any(point));
    }
    return list;
}

void measure(QvRatioBench& bench, const char* title, const char* name, const AnyDict& params, double aim) {
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(name));
    auto& filter = dynamic_cast<QvAudioFilter&>(*codec);
    filter.setParamDict(params);
    if (filter.open() != 0) return QvRatioBench::tell(std::string("can't open ") + name, 0, "");
    QvPcm from = sound(), copy = sound();
    const auto bytes = static_cast<size_t>(from.bytes());
    const auto ours = [&] {
        filter.write(from);
        filter.erase(filter.samples());
    };
    bench.compare(std::string(title) + " : memcpy", aim, ours,
                  [&] { std::memcpy(copy.ptr(0), from.ptr(0), bytes); });
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    {
        QvRatioBench bench("sound effects, stereo, 44 seconds");
        measure(bench, "adelay of 2 s", "adelay", AnyDict("delay", 2000), 2);
        const AnyDict levels("volume_list_0", Any(curve(5, 0.001, -1)), "volume_list_1",
                             Any(curve(5, 0.001, -1)));
        measure(bench, "audiolevel, past its 5 points", "audiolevel", levels, 4);
        const AnyDict many("volume_list_0", Any(curve(100000, 0.1, -1)), "volume_list_1",
                           Any(curve(100000, 0.1, -1)));
        measure(bench, "audiolevel, 100000 points", "audiolevel", many, 20);
        const AnyDict across("panning_list_0", Any(curve(100000, 0.1, 1)), "panning_list_1",
                             Any(curve(100000, 0.1, 0)));
        measure(bench, "panning, 100000 points", "panning", across, 20);
        measure(bench, "dynamics off", "dynamics", {}, 2);
        const std::pair<std::string, double> stages[] = {
            {"limiter", 10}, {"compressor", 20}, {"expander", 80}, {"noisegate", 10}};
        for (const auto& [stage, aim] : stages) {
            const AnyDict on((stage + "Active").c_str(), 1);
            measure(bench, ("dynamics, " + stage).c_str(), "dynamics", on, aim);
        }
        const AnyDict report("samplePeakdB", -9.0, "truePeakdB", -9.0);
        measure(bench, "normalizer", "normalizer", AnyDict("_streamReport", Any(report)), 2.5);
        QvLoudness meter;
        meter.init(channels, rate);
        const QvPcm from = sound();
        QvPcm copy = sound();
        bench.compare(
            "loudness and true peak : memcpy", 150, [&] { meter.add(from); },
            [&] { std::memcpy(copy.ptr(0), from.ptr(0), static_cast<size_t>(from.bytes())); });
    }
    cleanup_wrapper();
}
