#include "builtin/sound/effects/dynamics.h"

#include <cmath>

#include "core/engine/status.h"
#include "core/filter/qvprocessutil.h"
#include "tests/builtin/sound/sounds.h"

namespace {

using Opened = OpenedSound<Dynamics>;

constexpr int fullScale = 1 << 23;

// The formulas as they are written down, one channel and one stage at a time.
struct Model {
    double level, attack = 1, release = 1000, ratio = 3;
    int rate = 48000;
    double e = 0;
    int below = 0, above = 0;

    double threshold() const {
        return static_cast<double>(static_cast<long long>(std::pow(10, level / 20) * 32767) << 8);
    }
    void follow(int x) {
        const double step = 1 / static_cast<float>(rate) * -2.2;
        const double A = 1 - std::exp(step / (attack / 1000 / 1000)),
                     R = 1 - std::exp(step / (release / 1000));
        e = (1 - R) * e + A * std::max(std::fabs(double(x)) - e, 0.0);
    }
    static int signedPower(int x, double exponent) {
        return x == 0 ? 0
                      : (x < 0 ? -1 : 1) *
                            static_cast<int>(std::pow(10, std::log10(std::fabs(double(x))) * exponent));
    }
    int limiter(int x) { return static_cast<int>(e > threshold() ? x * (threshold() / e) : x * 1.0); }
    int compressor(int x) {
        const double T = 20 * std::log10(threshold());
        return e > threshold() ? signedPower(x, T * (1 - 1 / ratio) / (20 * std::log10(e)) + 1 / ratio) : x;
    }
    int expander(int x) {
        const double T = 20 * std::log10(threshold());
        return e < threshold() ? signedPower(x, T * (1 - ratio) / (20 * std::log10(e)) + ratio) : x;
    }
    int gate(int x) {
        const int n = static_cast<int>(static_cast<float>(rate) / 10.0);
        if (e < threshold()) {
            ++below, above = 0;
            return static_cast<int>(x * std::max(1 - double(below) / n, 0.0));
        }
        ++above, below = 0;
        return static_cast<int>(x * std::min(double(above) / n, 1.0));
    }
};

using StageOf = int (Model::*)(int);

void apply(Values& values, int channels, const Model& start, StageOf stage) {
    std::vector<Model> models(static_cast<std::size_t>(channels), start);
    for (std::size_t i = 0; i < values.size(); ++i) {
        Model& model = models[i % static_cast<std::size_t>(channels)];
        model.follow(values[i]);
        values[i] = (model.*stage)(values[i]);
    }
}

// Loud and quiet parts, none of them near the smallest step.
Values program(std::size_t count) {
    Values values;
    for (std::size_t i = 0; i < count; ++i)
        values.push_back(static_cast<int>(fullScale * 0.9 * std::sin(0.05 * static_cast<double>(i)) *
                                          std::pow(10, -4.0 * (static_cast<double>(i % 5000) / 5000))) |
                         128);
    return values;
}

TEST(Dynamics, StagesFollowTheirFormulasInOrder) {
    for (const int channels : {1, 2, 8}) {
        const Values in = program(static_cast<std::size_t>(channels) * 9000);
        Values expected = in;
        AnyDict params("limiterActive", 1, "limiterLevel", -3.0, "limiterAttack", 200.0, "limiterRelease",
                       50.0);
        apply(expected, channels, {-3, 200, 50}, &Model::limiter);
        EXPECT_EQ(throughBlocks<Dynamics>(params, in, channels), expected) << "limiter";
        params.set("compressorActive", 1), params.set("compressorRatio", 2.5);
        apply(expected, channels, {-10, 1, 1000, 2.5}, &Model::compressor);
        EXPECT_EQ(throughBlocks<Dynamics>(params, in, channels), expected) << "compressor";
        params.set("expanderActive", 1), params.set("expanderRelease", 30.0);
        apply(expected, channels, {-20, 1, 30}, &Model::expander);
        EXPECT_EQ(throughBlocks<Dynamics>(params, in, channels), expected) << "expander";
        params.set("noisegateActive", 1), params.set("noisegateRelease", 10.0);
        apply(expected, channels, {-35, 1, 10}, &Model::gate);
        EXPECT_EQ(throughBlocks<Dynamics>(params, in, channels), expected) << "noise gate";
    }
}

TEST(Dynamics, OffItChangesNothing) {
    const Values in = noise(3000, 5);
    EXPECT_EQ(throughBlocks<Dynamics>({}, in, 3), in);
}

TEST(Dynamics, TheGateRestartsAtEachChangeOfSide) {
    Opened gate(AnyDict("noisegateActive", 1, "noisegateRelease", 0.001));
    Values in(4800, 0);
    in.push_back(fullScale / 2);
    in.push_back(0);
    const Values out = throughFilter(gate, in, 1, {1000});
    EXPECT_EQ(out[4800], fullScale / 2 / 4800) << "1 / n of what it is";
    EXPECT_EQ(out[4801], 0);
}

TEST(Dynamics, AnyParametersGiveSamples) {
    const Values in = noise(8 * 700, 11);
    for (const double level : {-200.0, -91.0, -20.0, 0.0, 100.0})
        for (const double ratio : {0.1, 1.0, 1000.0})
            for (const double time : {0.0, 1e12, 1e6}) {
                AnyDict params;
                for (const std::string stage : {"limiter", "compressor", "expander", "noisegate"}) {
                    params.set((stage + "Active").c_str(), 1);
                    params.set((stage + "Level").c_str(), level);
                    params.set((stage + "Attack").c_str(), time);
                    params.set((stage + "Release").c_str(), time);
                }
                params.set("compressorRatio", ratio), params.set("expanderRatio", ratio);
                EXPECT_EQ(throughBlocks<Dynamics>(params, in, 8, 9).size(), in.size());
            }
    // An envelope at the smallest step has no logarithm to divide by: what does not fit is silence.
    const AnyDict slow("expanderActive", 1, "expanderAttack", 1e6);
    EXPECT_EQ(throughBlocks<Dynamics>(slow, {1000, -1000, 0}, 1), (Values{0, 0, 0}));
}

TEST(Dynamics, StatesAndRefusals) {
    Dynamics filter;
    EXPECT_EQ(filter.open(), QvStatus::failed);
    EXPECT_EQ(filter.init(), 0);
    EXPECT_EQ(filter.init(), QvStatus::failed);
    QvPcm pcm = soundOf({1, 2}, 2);
    EXPECT_EQ(filter.write(pcm), QvStatus::failed);
    EXPECT_EQ(filter.open(), 0);
    EXPECT_EQ(filter.open(), QvStatus::failed);
    EXPECT_EQ(filter.write(pcm), 0);
    EXPECT_EQ(filter.close(), 0);
    EXPECT_EQ(filter.samples(), 1) << "what waits stays";
    filter.setParam("_channels", 9);
    EXPECT_EQ(filter.open(), QvStatus::failed);
    EXPECT_STREQ(filter.errorDesc(), "dynamics works on up to 8 channels, the sound has 9");
    filter.setParam("_channels", 8);
    EXPECT_EQ(filter.open(), 0);
    filter.erase(1);
    pcm = soundOf(Values(9, 1), 9);
    EXPECT_EQ(filter.write(pcm), QvStatus::failed);
    EXPECT_STREQ(filter.errorDesc(), "dynamics works on up to 8 channels, the sound has 9");
    pcm.init(1, 2, 2, 48000);
    EXPECT_EQ(filter.write(pcm), QvStatus::failed);
    pcm.init(1, 2, 4, 0);
    EXPECT_EQ(filter.write(pcm), QvStatus::failed);
    for (const auto& [name, value] : {std::pair{"limiterLevel", Any(std::nan(""))},
                                      {"expanderRatio", Any(0)},
                                      {"noisegateAttack", Any(-1.0)},
                                      {"compressorActive", Any("on")}})
        EXPECT_EQ(filter.setParam(name, value), QvStatus::invalidParam) << name;
}

TEST(Dynamics, AStageReadsAllThatThePreviousOneHolds) {
    Opened filter(AnyDict("limiterActive", 1, "noisegateActive", 1, "noisegateLevel", -100.0));
    QvPcm pcm = soundOf(Values(10, 1000), 1);
    filter.write(pcm);
    filter.write(pcm);
    EXPECT_EQ(filter.samples(), 30) << "without an erase between them";
    filter.erase(30);
    filter.write(pcm);
    EXPECT_EQ(filter.samples(), 10);
}

TEST(Dynamics, DescribesStoresAndTakesItsReport) {
    Dynamics filter, other;
    filter.init();
    other.init();
    const Any set = filter.getParam("paramSet");
    ASSERT_EQ(set.size(), 10);
    std::string names;
    for (const Any& row : set.asVector()) {
        EXPECT_TRUE(QvProcessUtil::checkParamDesc(row.asDict()));
        names += row.asDict().get("description").asString() + std::string(";");
    }
    EXPECT_EQ(names,
              "Use Limiter;Limiter Level [dB];Use Compressor;Compressor Level [dB];Compressor Ratio;"
              "Use Expander;Expander Level [dB];Expander Ratio;Use Noise Gate;Noise Gate Level [dB];");
    filter.setParam("noisegateRelease", 12.5);
    filter.setParam("expanderActive", 1);
    AnyDict state;
    filter.store(state);
    EXPECT_EQ(other.restore(state), 0);
    EXPECT_EQ(other.getParam("noisegateRelease"), Any(12.5));
    EXPECT_EQ(other.getParam("expanderActive"), Any(1));
    EXPECT_EQ(other.getParam("compressorLevel"), Any(-10.0));
    EXPECT_EQ(filter.getParam("_needsReport"), Any(1));
    EXPECT_EQ(filter.setParam("_streamReport", Any(AnyDict("peakLeveldB", -6.0))), 0);
    EXPECT_EQ(filter.getParam("peakLevel"), Any(16422.0 * 256));
    EXPECT_EQ(filter.setParam("_streamReport", Any(5)), QvStatus::invalidParam);
}

}  // namespace
