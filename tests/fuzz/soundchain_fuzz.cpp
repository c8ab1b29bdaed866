// Chains of sound filters with any parameters and samples: nothing crashes, and sound that is written in
// small blocks comes out as it does in one.
#include <climits>
#include <cmath>
#include <memory>
#include <string>
#include <vector>

#include <fuzzer/FuzzedDataProvider.h>

#include "core/arch/qvexception.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvpcm.h"
#include "tests/fuzz/fuzz.h"
#include "tests/support/engine.h"

namespace {

using Input = FuzzedDataProvider;
using Chain = std::vector<std::unique_ptr<QvCodec>>;
using Params = std::vector<std::pair<std::string, Any>>;

// Filters that this build lacks are passed over. A rate converter holds samples back by its blocks.
constexpr const char* names[] = {"adelay", "dynamics", "audiolevel", "panning",  "normalizer",
                                 "avol",   "aquant",   "chconvert",  "srconvert"};
constexpr int effects = 6;  // of these: as many samples of 32 bits out as in, whatever the blocks

QvAudioFilter& filterOf(const std::unique_ptr<QvCodec>& codec) { return static_cast<QvAudioFilter&>(*codec); }

double anyNumber(Input& input) {
    constexpr double special[] = {0,      -0.0,     1,         -1,  100,     1e-300, 1e300,
                                  -1e300, HUGE_VAL, -HUGE_VAL, NAN, INT_MAX, INT_MIN};
    const auto choice = input.ConsumeIntegral<uint8_t>();
    if (choice < std::size(special)) return special[choice];
    return choice < 128 ? input.ConsumeIntegralInRange(-100, 100) / 10.0
                        : input.ConsumeFloatingPoint<double>();
}

Any anyValue(Input& input, int depth) {
    switch (input.ConsumeIntegralInRange(0, depth > 0 ? 7 : 4)) {
        case 0: return Any(input.ConsumeIntegralInRange(-10, 100));
        case 1: return Any(input.ConsumeIntegral<int>());
        case 2: return Any(anyNumber(input));
        case 3: return Any(input.ConsumeBool() ? "loudness" : "rms");
        case 4: return Any();
        case 5: {
            AnyVector list;
            for (int i = input.ConsumeIntegralInRange(0, 9); i > 0; --i)
                list.append(anyValue(input, depth - 1));
            return Any(list);
        }
        case 6: {
            AnyDict dict("peakLeveldB", anyNumber(input), "truePeakdB", anyNumber(input));
            for (const char* key : {"samplePeakdB", "rmsdB", "integratedLoudness"})
                dict.set(key, anyNumber(input));
            return Any(dict);
        }
        default: {
            AnyVector points;
            for (int i = input.ConsumeIntegralInRange(0, 9); i > 0; --i)
                points.append(Any(AnyDict("time", anyNumber(input), "volume", anyValue(input, 0), "out_ch",
                                          input.ConsumeIntegralInRange(-1, 8))));
            return Any(points);
        }
    }
}

Params anyParams(Input& input, const QvCodec& codec) {
    const AnyVector rows = qvParameters(codec);
    Params params;
    for (int i = input.ConsumeIntegralInRange(0, 12); i > 0; --i) {
        const int row = input.ConsumeIntegralInRange(-1, rows.size() - 1);
        params.emplace_back(row < 0 ? "_streamReport" : rows.at(row).asDict().get("name").asString(),
                            anyValue(input, 2));
    }
    return params;
}

struct Plan {
    std::vector<int> filters;
    std::vector<Params> params;
};

// False if a filter does not open.
bool build(const Plan& plan, Chain& chain) {
    for (std::size_t i = 0; i < plan.filters.size(); ++i) {
        chain.emplace_back(qv_registry()->newCodec(names[plan.filters[i]]));
        for (const auto& [name, value] : plan.params[i]) {
            try {
                chain.back()->setParam(name.c_str(), value);
            } catch (const QvException&) {
            }
        }
        AnyDict state;
        chain.back()->store(state);
        require(chain.back()->restore(state) == 0);
        if (chain.back()->open() != 0) return false;
    }
    return true;
}

// Each filter gives all that it has to the next. False at the first failure.
bool write(Chain& chain, QvPcm& block, std::string& out) {
    QvPcm* pcm = &block;
    for (const auto& codec : chain) {
        QvAudioFilter& filter = filterOf(codec);
        if (filter.write(*pcm) != 0) return false;
        if (pcm != &block) pcm->setSamples(0);
        pcm = filter.pcm();
        require(filter.samples() == 0 || (pcm->inited() && pcm->samples() == filter.samples()));
        if (filter.samples() == 0) return true;
    }
    out.append(reinterpret_cast<const char*>(pcm->ptr(0)), static_cast<std::size_t>(pcm->bytes()));
    return filterOf(chain.back()).erase(pcm->samples()) == 0;
}

// The bytes that come out; false if something failed.
bool run(const Plan& plan, const QvPcm& sound, const std::vector<int>& blocks, std::string& out) {
    Chain chain;
    if (!build(plan, chain)) return false;
    std::size_t turn = 0;
    for (int at = 0; at < sound.samples();) {
        const int wanted = blocks.empty() ? sound.samples() : blocks[turn++ % blocks.size()];
        const int count = std::min(wanted, sound.samples() - at);
        QvPcm block;
        require(block.init(count, sound.channels(), sound.bytesPerSample(), sound.samplerate()) == 0);
        if (count > 0 && block.write(count, sound.ptr(at)) != 0) return false;
        if (!write(chain, block, out)) return false;
        at += count;
        if (turn > 100000) return false;  // blocks of no samples
    }
    for (const auto& codec : chain) codec->close();
    return true;
}

QvPcm anySound(Input& input) {
    constexpr int rates[] = {48000, 44100, 1, 9, 100, INT_MAX, 0, -48000};
    const int channels = input.ConsumeIntegralInRange(1, 16), samples = input.ConsumeIntegralInRange(0, 700);
    const int bytes = input.ConsumeIntegralInRange(0, 15) ? 4 : input.ConsumeIntegralInRange(1, 3);
    QvPcm sound;
    require(sound.init(samples, channels, bytes,
                       rates[input.ConsumeIntegralInRange<std::size_t>(0, std::size(rates) - 1)]) == 0);
    sound.setSamples(samples);
    const auto seed = input.ConsumeBytes<uint8_t>(64);
    for (int i = 0; samples > 0 && !seed.empty() && i < sound.bytes(); ++i) {
        const auto byte = seed[static_cast<std::size_t>(i * 7 + i / 64) % seed.size()];
        sound.ptr(0)[i] = static_cast<unsigned char>(byte + i % 251);
    }
    return sound;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const EngineScope engine;
    Input input(data, size);
    Plan plan;
    bool sameCount = true;
    for (int i = input.ConsumeIntegralInRange(1, 3); i > 0; --i) {
        const int choice = input.ConsumeIntegralInRange(0, static_cast<int>(std::size(names)) - 1);
        const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(names[choice]));
        if (!codec) continue;
        plan.filters.push_back(choice);
        plan.params.push_back(anyParams(input, *codec));
        sameCount = sameCount && choice < effects;
    }
    if (plan.filters.empty()) return 0;
    const QvPcm sound = anySound(input);
    std::vector<int> blocks;
    for (int i = input.ConsumeIntegralInRange(1, 5); i > 0; --i)
        blocks.push_back(input.ConsumeIntegralInRange(0, 90));
    try {
        std::string whole, parts;
        const bool done = run(plan, sound, {}, whole), doneToo = run(plan, sound, blocks, parts);
        if (done && doneToo && sameCount) require(whole == parts);
    } catch (const QvException&) {
        // What the contract of a filter forbids, such as another width.
    }
    return 0;
}
