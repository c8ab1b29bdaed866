#include "builtin/sound/effects/normalizer.h"

#include <cmath>

#include "core/filter/qvfilter.h"
#include "tests/builtin/sound/sounds.h"

namespace {

using Opened = OpenedSound<QvNormalizer>;

AnyDict report(double samplePeak, double truePeak, double rms, double loudness) {
    return AnyDict("samplePeakdB", samplePeak, "truePeakdB", truePeak, "rmsdB", rms, "integratedLoudness",
                   loudness, "loudnessRange", 3.0, "peakLeveldB", -2.0);
}

AnyDict with(AnyDict params, const AnyDict& levels) {
    params.set("_streamReport", Any(levels));
    return params;
}

double gainOf(const AnyDict& params) { return Opened(params).getParam("gain").asFloat(99.0); }

TEST(QvNormalizer, ReachesItsTargetAsFarAsTheTruePeakAllows) {
    const double none = -HUGE_VAL;
    struct {
        AnyDict params, levels;
        double gain;
        const char* said;  // a line of the log
    } const rows[] = {
        {AnyDict("target", -1), report(-12, -11.5, -30, -33), 10.5,
         "reaches -1.5 dBFS instead of -1.0: its true peak is at the limit of -1.0 dBTP"},
        {{}, report(-12, -11.5, -30, -33), 9, nullptr},
        {AnyDict("target", -1, "truePeak", 0), report(-12, -11.5, -30, -33), 11, nullptr},
        {AnyDict("mode", "rms"), report(-12, -11.5, -30, -33), 10, nullptr},
        {AnyDict("mode", "rms", "target", -40), report(-12, -11.5, -30, -33), -10, nullptr},
        {AnyDict("mode", "loudness"), report(-12, -11.5, -30, -33), 10, nullptr},
        {AnyDict("mode", "loudness", "target", -16), report(-12, -11.5, -30, -33), 10.5,
         "reaches -22.5 LUFS instead of -16.0"},
        {AnyDict("mode", "loudness", "target", -16, "truePeak", -20), report(-12, -11.5, -30, -33), -8.5,
         "reaches -41.5 LUFS"},
        // Silence stays silence, and so does what has too little sound for a loudness.
        {AnyDict("mode", "loudness"), report(none, none, none, none), 0, "The sound is silent"},
        {{}, report(-130, -129, -140, none), 0, "The sound is silent"},
        {AnyDict("mode", "loudness"), report(-12, -11, -30, none), 0,
         "too short or too quiet for a loudness"},
        // Without a report, or with one of the peak alone.
        {{}, AnyDict("peakLeveldB", -20.0), 0, "its level is not known"},
        {{}, AnyDict("samplePeakdB", "loud", "truePeakdB", -3.0), 0, "its level is not known"},
        {{}, AnyDict("samplePeakdB", -3.0, "truePeakdB", std::nan("")), 0, "its level is not known"},
    };
    for (const auto& row : rows) {
        const LogCapture log;
        EXPECT_NEAR(gainOf(with(row.params, row.levels)), row.gain, 1e-9);
        EXPECT_TRUE(!row.said || log.contains(row.said)) << row.said;
        EXPECT_EQ(log.count("", QvLogMask::warning), row.said && !std::strstr(row.said, "silent") ? 1 : 0);
    }
    const LogCapture log;
    EXPECT_EQ(gainOf({}), 0);
    EXPECT_TRUE(log.contains("The sound is not normalized: its level is not known", QvLogMask::warning));
}

TEST(QvNormalizer, TheGainIsLinearAndBounded) {
    const Values in = noise(16 * 300, 21);
    for (const double gain : {-20.0, 0.0, 6.0, 19.0}) {
        const double factor = std::pow(10.0, gain / 20);
        Values expected;
        for (const int value : in)
            expected.push_back(
                static_cast<int>(std::clamp(std::nearbyint(value * factor), -2147483648.0, 2147483647.0)));
        const AnyDict params("mode", "peak", "target", gain - 40, "truePeak", 20.0);
        EXPECT_EQ(throughBlocks<QvNormalizer>(with(params, report(-40, -40, -50, -50)), in, 16), expected)
            << gain;
    }
    Opened unknown;
    EXPECT_EQ(throughFilter(unknown, in, 16, {100}), in);
}

TEST(QvNormalizer, ParametersAreCheckedAndStored) {
    QvNormalizer filter, other;
    filter.init();
    other.init();
    EXPECT_EQ(filter.getParam("_needsReport"), Any(QvReportNeed::loudness));
    EXPECT_EQ(filter.getParam("target"), Any(-3.0));
    for (const auto& [name, value] : {std::pair{"mode", Any("loud")},
                                      {"mode", Any(1)},
                                      {"target", Any(21)},
                                      {"target", Any(std::nan(""))},
                                      {"truePeak", Any(-61)},
                                      {"_streamReport", Any(3)}})
        EXPECT_EQ(filter.setParam(name, value), QvStatus::invalidParam) << name;
    filter.setParam("mode", "loudness");
    EXPECT_EQ(filter.getParam("target"), Any(-23.0)) << "the default of the mode";
    AnyDict state;
    filter.store(state);
    EXPECT_FALSE(state.isSet("target"));
    for (const double target : {-16.0, -3.0}) {  // the latter is the default of another mode
        filter.setParam("target", target);
        filter.store(state);
        EXPECT_EQ(other.restore(state), 0);
        EXPECT_EQ(other.getParam("mode"), Any("loudness"));
        EXPECT_EQ(other.getParam("target"), Any(target));
    }
    state.set("target", 5.0), state.set("mode", "loud");
    EXPECT_NE(other.restore(state), 0);
    EXPECT_EQ(other.getParam("target"), Any(-3.0)) << "one bad value, and none is taken";
    QvPcm pcm = soundOf({1, 2}, 2);
    EXPECT_EQ(failureOf([&] { other.write(pcm); }), "Not opened");
    other.open();
    pcm.init(1, 2, 2, 48000);
    EXPECT_EQ(failureOf([&] { other.write(pcm); }), "Only 32 bit samples supported");
}

}  // namespace
