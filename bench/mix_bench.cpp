// The mix of many sounds against copies of the same bytes.
#include <cstring>
#include <vector>

#include "bench/ratio.h"
#include "core/compose/qvaudiomix.h"
#include "core/media/qvpcm.h"

namespace {

constexpr int streams = 16;
constexpr int samples = 48000;

QvPcm buffer(int channels) {
    QvPcm pcm;
    pcm.init(samples, channels, 4, 48000);
    pcm.setSamples(samples);
    for (int i = 0; i < pcm.bytes(); ++i) pcm.ptr(0)[i] = static_cast<unsigned char>(i % 4 == 3 ? 0 : i * 7);
    return pcm;
}

void compare(QvRatioBench& bench, const char* name, int outs, double weight, bool everywhere) {
    std::vector<QvPcm> inputs(streams);
    AnyVector counts;
    TPtrList<QvPcm> list;
    for (QvPcm& input : inputs) {
        input = buffer(1);
        counts.append(Any(1));
        list.append(&input);
    }
    QvAudioMix mix;
    mix.init(outs, counts);
    for (int out = 0; out < outs; ++out)
        for (int stream = 0; stream < streams; ++stream)
            if (everywhere || stream % outs == out) mix.setWeight(out, stream, 0, weight);
    QvPcm output = buffer(outs);
    std::vector<unsigned char> from(static_cast<std::size_t>((streams + outs) * samples * 4), 1),
        to(from.size());
    bench.compare(
        name, 3.0, [&] { mix.mixChannels(samples, output, list); },
        [&] { std::memcpy(to.data(), from.data(), from.size()); });
}

}  // namespace

int main() {
    QvRatioBench bench("the mix of 16 mono sounds of one second : memcpy of bytes in and out",
                       QvBenchClock::thread);
    compare(bench, "side by side, 16 channels", 16, 1.0, false);
    compare(bench, "into 2 channels, 8 sounds each, weight 0.7", 2, 0.7, false);
    compare(bench, "into 2 channels, all sounds in both, weight 0.7", 2, 0.7, true);
    compare(bench, "into 1 channel, weight 0.7", 1, 0.7, true);
}
