#include "core/media/qvloudness.h"

#include <cmath>
#include <numbers>

#include "core/engine/status.h"
#include "core/media/qvpcm.h"
#include "tests/support/checks.h"

namespace {

constexpr double none = QvLoudness::silence;

struct Part {
    double seconds, dB;  // of a 1 kHz sine; below -200: silence
};

// The same sine in the given channels of a sound.
void add(QvLoudness& meter, std::vector<Part> parts, int channels, const std::vector<int>& sounding, int rate,
         int bytes = 4, double hertz = 1000, double phase = 0) {
    long long at = 0;
    for (const auto& [seconds, dB] : parts) {
        const double amplitude = dB < -200 ? 0 : std::pow(10, dB / 20) * (1 << 23);
        long long left = std::llround(seconds * rate);
        while (left > 0) {
            const int count = static_cast<int>(std::min<long long>(left, 3000));
            QvPcm pcm;
            pcm.init(count, channels, bytes, rate);
            pcm.setSamples(count);
            for (int i = 0; i < count; ++i, ++at) {
                const double turns = hertz * static_cast<double>(at) / rate;
                int value =
                    static_cast<int>(std::lround(amplitude * std::sin(2 * std::numbers::pi * turns + phase)));
                if (bytes < 4) value >>= 8 * (3 - bytes);
                for (int c = 0; c < channels; ++c) {
                    const bool silent = std::find(sounding.begin(), sounding.end(), c) == sounding.end();
                    const int stored = (silent ? 0 : value) + (bytes == 1 ? 128 : 0);
                    std::memcpy(pcm.ptr(i) + c * bytes, &stored, static_cast<std::size_t>(bytes));
                }
            }
            ASSERT_EQ(meter.add(pcm), 0);
            left -= count;
        }
    }
}

// The requirements for meters, with their tolerance of 0.1 LU: gates at -70 LUFS and 10 LU below the rest.
TEST(QvLoudness, MeetsTheTestSignalsOfEbuTech3341) {
    struct {
        std::vector<Part> parts;
        double loudness;
    } const rows[] = {
        {{{5, -23}}, -23},
        {{{5, -33}}, -33},
        {{{3, -36}, {20, -23}, {3, -36}}, -23},
        {{{3, -72}, {3, -36}, {20, -23}, {3, -36}, {3, -72}}, -23},
        {{{6, -26}, {6.03, -20}, {6, -26}}, -23},
    };
    for (const auto& row : rows) {
        QvLoudness meter;
        ASSERT_EQ(meter.init(2, 48000), 0);
        add(meter, row.parts, 2, {0, 1}, 48000);
        EXPECT_NEAR(meter.integrated(), row.loudness, 0.1);
    }
    QvLoudness meter;
    ASSERT_EQ(meter.init(2, 48000), 0);
    add(meter, {{20, -20}, {20, -30}}, 2, {0, 1}, 48000);
    EXPECT_NEAR(meter.range(), 10, 1) << "EBU Tech 3342";
}

TEST(QvLoudness, ChannelsWeighByTheirPlace) {
    // A sine of -20 dBFS alone in one channel is -23.0 LUFS at the front, 1.5 LU more in a surround.
    struct {
        int channels, channel;
        double loudness;
    } const rows[] = {{1, 0, -23},   {2, 1, -23},   {5, 2, -23},   {6, 2, -23},   {6, 3, none},
                      {6, 4, -21.5}, {6, 5, -21.5}, {5, 3, -21.5}, {8, 3, none},  {8, 4, -21.5},
                      {8, 7, -21.5}, {8, 0, -23},   {7, 6, -23},   {16, 15, -23}, {64, 40, -23}};
    for (const auto& [channels, channel, loudness] : rows) {
        QvLoudness meter;
        ASSERT_EQ(meter.init(channels, 48000), 0);
        add(meter, {{2, -20}}, channels, {channel}, 48000);
        if (loudness == none)
            EXPECT_EQ(meter.integrated(), none) << channels << ", " << channel;
        else
            EXPECT_NEAR(meter.integrated(), loudness, 0.1) << channels << ", " << channel;
        EXPECT_NEAR(meter.samplePeak(), -20, 0.01) << "peaks are of all channels";
        EXPECT_NEAR(meter.rms(), -23.01 - 10 * std::log10(channels), 0.01);
    }
    // Where a mask gives the places: 2.1, film with one back, 6.1, four with heights, bits that are too few.
    struct {
        long long mask;
        int channels, channel;
        double loudness;
    } const places[] = {{0xB, 3, 2, none},      {0x107, 4, 2, -23},   {0x107, 4, 3, -21.5},
                        {0x70F, 7, 3, none},    {0x70F, 7, 4, -21.5}, {0x70F, 7, 6, -21.5},
                        {0xFF, 8, 6, -23},      {0xFF, 8, 4, -21.5},  {0x5003, 4, 3, -23},
                        {0x28003, 4, 3, -21.5}, {0x8, 2, 1, -23},     {0x8, 2, 0, none}};
    for (const auto& [mask, channels, channel, loudness] : places) {
        QvLoudness meter;
        ASSERT_EQ(meter.init(channels, 48000, mask), 0);
        add(meter, {{2, -20}}, channels, {channel}, 48000);
        if (loudness == none)
            EXPECT_EQ(meter.integrated(), none) << mask << ", " << channel;
        else
            EXPECT_NEAR(meter.integrated(), loudness, 0.1) << mask << ", " << channel;
    }
}

TEST(QvLoudness, WidthsAgree) {
    for (const int bytes : {1, 2, 3, 4}) {
        QvLoudness meter;
        ASSERT_EQ(meter.init(1, 44100), 0);
        add(meter, {{3, -6}}, 1, {0}, 44100, bytes);
        EXPECT_NEAR(meter.integrated(), -9, 0.1) << bytes;
        EXPECT_NEAR(meter.samplePeak(), -6, bytes == 1 ? 0.15 : 0.01) << bytes;
        EXPECT_EQ(meter.samples(), 3 * 44100);
    }
}

// A sine at a quarter of the rate, sampled halfway up: its peaks lie between the samples.
TEST(QvLoudness, TruePeaksLieBetweenSamples) {
    QvLoudness meter;
    ASSERT_EQ(meter.init(2, 48000), 0);
    add(meter, {{1, -6}}, 2, {0, 1}, 48000, 4, 12000, std::numbers::pi / 4);
    EXPECT_NEAR(meter.samplePeak(), -9.01, 0.01);
    EXPECT_NEAR(meter.truePeak(), -6, 0.3);
}

TEST(QvLoudness, SilenceAndRefusals) {
    QvLoudness meter;
    EXPECT_EQ(meter.integrated(), none);
    EXPECT_EQ(meter.truePeak(), none);
    EXPECT_EQ(meter.rms(), none);
    QvPcm pcm;
    pcm.init(10, 2, 2, 48000);
    EXPECT_EQ(meter.add(pcm), QvStatus::illegalState);
    for (const auto& [channels, rate] :
         {std::pair{0, 48000}, {65, 48000}, {2, 0}, {2, -1}, {-1, 48000}, {2, INT_MAX}})
        EXPECT_EQ(meter.init(channels, rate), QvStatus::invalidArgument) << channels << ", " << rate;
    ASSERT_EQ(meter.init(1, 48000), 0);
    EXPECT_EQ(meter.add(pcm), QvStatus::invalidArgument);
    ASSERT_EQ(meter.init(2, 48000), 0);
    add(meter, {{3, -300}}, 2, {}, 48000);
    EXPECT_EQ(meter.integrated(), none);
    EXPECT_EQ(meter.range(), 0);
    EXPECT_EQ(meter.samplePeak(), none);
}

}  // namespace
