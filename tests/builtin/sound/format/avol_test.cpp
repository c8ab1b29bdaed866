// Gains of the level filter, in both precisions.
#include "builtin/sound/format/avol.h"

#include <cmath>

#include "core/arch/qvassert.h"
#include "tests/builtin/sound/sounds.h"
#include "tests/support/log_capture.h"
#include "tests/support/vector_targets.h"

namespace {

using Opened = OpenedSound<QvAVol>;

int32_t coarse(int32_t value, int gain) {
    return static_cast<int32_t>(static_cast<uint32_t>(value) * static_cast<uint32_t>(gain)) >> 5;
}

int32_t fine(int32_t value, double dB) {
    const double product = std::floor(value * std::round(std::pow(10, dB / 20) * 65536) / 65536 + 0.5);
    return static_cast<int32_t>(std::clamp(product, -2147483648.0, 2147483647.0));
}

}  // namespace

TEST(AVol, GainsAreThoseOfTheTable) {
    const struct {
        double volume, channel;
        bool mute, channelMute;
        int gain;
    } rows[] = {{0, 0, false, false, 32},         {10, 0, false, false, 63},   {6, 0, false, false, 63},
                {5, 5, false, false, 63},         {-6, 0, false, false, 16},   {-6.1, 0, false, false, 15},
                {-3, -3, false, false, 16},       {20, -20, false, false, 32}, {-1e300, 0, false, false, 0},
                {1e308, 1e308, false, false, 63}, {0, 0, true, false, 0},      {0, 0, false, true, 0}};
    const Values in = noise(2 * 900);
    for (const int64_t target : machineTargets())
        for (const auto& row : rows) {
            const OnTarget only(target);
            Opened filter{{"volume", row.volume},
                          {"mute", row.mute ? 1 : 0},
                          {"channel2_volume", row.channel},
                          {"channel2_mute", row.channelMute ? 1 : 0}};
            const Values out = throughFilter(filter, in, 2, {1, 300, 7});
            ASSERT_EQ(out.size(), in.size());
            for (size_t i = 1; i < in.size(); i += 2)
                ASSERT_EQ(out[i], coarse(in[i], row.gain)) << row.volume << " + " << row.channel;
        }
}

TEST(AVol, FinePrecisionLimitsInsteadOfWrapping) {
    const Values in = noise(3 * 700);
    for (const int64_t target : machineTargets())
        for (const double dB : {0.0, -0.01, -20.0, -90.0, 6.02, 20.0, 48.0, 60.0}) {
            const OnTarget only(target);
            Opened filter{{"precision", 16}, {"volume", dB}};
            const Values out = throughFilter(filter, in, 3, {256, 1});
            for (size_t i = 0; i < in.size(); ++i)
                ASSERT_EQ(out[i], dB == 0 ? in[i] : fine(in[i], std::min(dB, 48.0))) << in[i] << " at " << dB;
        }
}

TEST(AVol, OneToEightChannelsHaveTheirOwnGains) {
    for (int channels = 1; channels <= 16; ++channels) {
        LogCapture log;
        QvAVol filter;
        ASSERT_EQ(filter.init(), 0);
        for (int c = 1; c <= 8; ++c)
            filter.setParam(Any::sprintf("channel%d_volume", c).asString(), -3.0 * c);
        filter.setParam("channel3_mute", 1);
        ASSERT_EQ(filter.open(), 0);
        const Values in = noise(static_cast<size_t>(channels) * 300);
        const Values out = throughFilter(filter, in, channels, {100, 3});
        for (size_t i = 0; i < in.size(); ++i) {
            const int c = static_cast<int>(i) % channels + 1;
            const int gain = c == 3 || c > 8 ? 0 : static_cast<int>(std::pow(10, -3.0 * c / 20) * 32);
            ASSERT_EQ(out[i], coarse(in[i], gain)) << "channel " << c << " of " << channels;
        }
        EXPECT_EQ(log.count("only the first 8 of", QvLogMask::warning), channels > 8 ? 1 : 0);
        EXPECT_TRUE(log.contains("Opening audio volume module", QvLogMask::info));
        EXPECT_TRUE(log.contains("Channel 3 gain: MUTE"));
        EXPECT_TRUE(log.contains("Channel 8 gain: -24.000000dB"));
    }
}

TEST(AVol, TheNextWriteHasTheNewGain) {
    Opened filter{{"volume", 0.0}};
    EXPECT_EQ(throughFilter(filter, {320}, 1), Values{320});
    filter.setParam("mute", 1);
    EXPECT_EQ(throughFilter(filter, {320}, 1), Values{0});
    filter.setParam("mute", 0);
    filter.setParam("channel1_volume", -100.0);
    EXPECT_EQ(throughFilter(filter, {320}, 1), Values{0});
    filter.close();
    filter.setParam("channel1_volume", 0.0);
    filter.open();
    EXPECT_EQ(throughFilter(filter, {320, 640}, 2), (Values{320, 640})) << "another number of channels";
}

TEST(AVol, StoresWhatItIs) {
    Opened filter{{"volume", -4.5}, {"mute", 1}};
    AnyDict stored;
    filter.store(stored);
    EXPECT_EQ(stored.get("volume"), Any(-4.5));
    EXPECT_EQ(stored.get("mute"), Any(1));
    EXPECT_EQ(stored.get("type"), Any(13));
    EXPECT_FALSE(stored.isSet("channel1_volume") || stored.isSet("precision"))
        << "those are as in a new filter";
    filter.setParam("channel5_volume", 2.0);
    filter.setParam("precision", 16);
    filter.store(stored);
    QvAVol other;
    ASSERT_EQ(other.init(), 0);
    ASSERT_EQ(other.restore(stored), 0) << other.errorDesc();
    for (const char* name : {"volume", "mute", "channel5_volume", "precision", "channel4_mute"})
        EXPECT_EQ(other.getParam(name), filter.getParam(name)) << name;
    LogCapture log;
    stored.set("volume", "loud");
    EXPECT_EQ(other.restore(stored), QvStatus::invalidParam);
    EXPECT_EQ(other.getParam("volume"), Any(-4.5));
    EXPECT_TRUE(log.contains("Can not restore "));
    EXPECT_EQ(other.setParam("precision", 8), QvStatus::invalidParam);
    EXPECT_EQ(other.setParam("volume", std::nan("")), QvStatus::invalidParam);
}

TEST(AVol, DescribesItselfAndTakesAReport) {
    QvAVol filter;
    EXPECT_THROW(filter.setParam("volume", 1.0), QvAssertFailure);
    ASSERT_EQ(filter.init(), 0);
    const Any set = filter.getParam("paramSet");
    ASSERT_TRUE(set.isVector());
    ASSERT_EQ(set.asVector().size(), 16);
    EXPECT_EQ(set.asVector().at(7).asDict().get("description"), Any("Channel 8 volume[dB]"));
    EXPECT_EQ(set.asVector().at(15).asDict().get("name"), Any("channel8_mute"));
    EXPECT_EQ(filter.getParam("_needsReport"), Any(0));
    EXPECT_EQ(filter.setParam("_streamReport", AnyDict("peakLeveldB", -3.0)), 0);
    ASSERT_EQ(filter.open(), 0);
    EXPECT_EQ(throughFilter(filter, {12345}, 1), Values{12345});
    QvPcm narrow = pcmOf(noiseBytes(8), 1, 2);
    EXPECT_THROW(filter.write(narrow), QvAssertFailure);
}
