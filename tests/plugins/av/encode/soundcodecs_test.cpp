// The bit rates that a codec has for a sample rate and a number of channels: the first and the last of them.
#include "plugins/av/encode/soundcodecs.h"

#include <gtest/gtest.h>

namespace av {
namespace {

TEST(SoundCodecs, BitRatesFollowFromSampleRateAndChannels) {
    const struct {
        const char* module;
        int samplerate, channels, first, last;
    } cases[] = {
        {"aacaenc", 8000, 1, 32, 48},                                     // 6 bits for a sample
        {"aacaenc", 48000, 2, 32, 512},  {"mp3aenc", 32000, 2, 32, 320},  // MPEG-1
        {"mp3aenc", 24000, 2, 8, 160},                                    // MPEG-2
        {"mpegaenc", 48000, 1, 32, 384}, {"ddaenc", 48000, 2, 32, 640},
        {"ddaenc", 48000, 3, 64, 640},    // 32 are too few
        {"opusaenc", 48000, 1, 16, 256},  // of a channel
        {"opusaenc", 48000, 2, 16, 510},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.module) + " " + std::to_string(c.samplerate));
        const SoundCodec* const codec = soundCodec(c.module);
        ASSERT_TRUE(codec);
        const auto rates = codec->kilobitsFor(c.samplerate, c.channels);
        ASSERT_FALSE(rates.empty());
        EXPECT_EQ(rates.front(), c.first);
        EXPECT_EQ(rates.back(), c.last);
    }
    EXPECT_TRUE(soundCodec("flacaenc")->kilobitsFor(48000, 2).empty());
    EXPECT_FALSE(soundCodec("noaenc"));
}

}  // namespace
}  // namespace av
