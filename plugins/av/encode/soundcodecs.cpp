#include "plugins/av/encode/soundcodecs.h"

#include <algorithm>
#include <array>
#include <cstring>

#include "core/measure/fourcc.h"

namespace av {

namespace {

constexpr int aacRates[] = {8000,  11025, 12000, 16000, 22050, 24000,
                            32000, 44100, 48000, 64000, 88200, 96000};
constexpr int mpegRates[] = {16000, 22050, 24000, 32000, 44100, 48000};
constexpr int mp3Rates[] = {8000, 11025, 12000, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr int dolbyRates[] = {32000, 44100, 48000};
constexpr int anyRates[] = {8000,  11025, 16000, 22050, 24000,  32000,
                            44100, 48000, 88200, 96000, 176400, 192000};
constexpr int opusRates[] = {8000, 12000, 16000, 24000, 48000};
constexpr int aacKilobits[] = {32, 48, 64, 96, 112, 128, 160, 192, 224, 256, 320, 384, 448, 512};
constexpr int layer2Kilobits[] = {32, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320, 384};
constexpr int layer3Kilobits[] = {32, 40, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320};
constexpr int dolbyKilobits[] = {32, 64, 96, 128, 160, 192, 224, 256, 320, 384, 448, 512, 576, 640};
constexpr int opusKilobits[] = {16, 24, 32, 48, 64, 96, 128, 160, 192, 256, 320, 384, 448, 510};
// Layers 2 and 3 at the sample rates of MPEG-2, and partly of MPEG-2.5.
constexpr int lowRateKilobits[] = {8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160};

constexpr int upTo2[] = {1, 2};
constexpr int upTo6[] = {1, 2, 3, 4, 5, 6};
constexpr int upTo8[] = {1, 2, 3, 4, 5, 6, 7, 8};
constexpr int aacChannels[] = {1, 2, 3, 4, 5, 6, 8};  // no layout of ADTS has seven

// clang-format off
constexpr auto codecs = std::to_array<SoundCodec>({
    {"aacaenc",       "aac",        qvFourcc("AAC "), "aac",  aacRates,   aacKilobits,    aacChannels, 160},
    {"mpegaenc",      "mp2",        qvFourcc("MP2 "), "mp2",  mpegRates,  layer2Kilobits, upTo2, 224, lowRateKilobits},
    {"mpegpcmenc",    "",           qvFourcc("PCM "), "pcm",  anyRates,   {},         upTo8, 0},
    {"mp3aenc",       "libmp3lame", qvFourcc("MP3 "), "mp3",  mp3Rates,   layer3Kilobits, upTo2, 192, lowRateKilobits},
    {"ddaenc",        "ac3",        qvFourcc("AC-3"), "ac3",  dolbyRates, dolbyKilobits,  upTo6, 192},
    {"ddproaenc",     "ac3",        qvFourcc("AC-3"), "ac3",  dolbyRates, dolbyKilobits,  upTo6, 384},
    {"ddplusproaenc", "eac3",       qvFourcc("EC-3"), "eac3", dolbyRates, dolbyKilobits,  upTo6, 384},
    {"flacaenc",      "flac",       qvFourcc("FLAC"), "flac", anyRates,   {},         upTo8, 0},
    {"opusaenc",      "libopus",    qvFourcc("OPUS"), "opus", opusRates,  opusKilobits,   upTo8, 128},
});
// clang-format on

constexpr int leastMpeg1Rate = 32000;
constexpr int opusKilobitsPerChannel = 256;
constexpr int aacBitsPerSample = 6;        // the most for a channel: 6144 bits in a frame of 1024 samples
constexpr int dolbySurroundKilobits = 64;  // the least for more than two channels

std::span<const int> upTo(std::span<const int> values, int most) {
    const auto end = std::upper_bound(values.begin(), values.end(), most);
    return values.first(static_cast<std::size_t>(end - values.begin()));
}

std::span<const int> from(std::span<const int> values, int least) {
    const auto begin = std::lower_bound(values.begin(), values.end(), least);
    return values.subspan(static_cast<std::size_t>(begin - values.begin()));
}

}  // namespace

const SoundCodec* soundCodec(const char* module) {
    for (const SoundCodec& row : codecs)
        if (std::strcmp(row.module, module) == 0) return &row;
    return nullptr;
}

std::span<const int> SoundCodec::kilobitsFor(int samplerate, int channelCount) const {
    if (samplerate < leastMpeg1Rate && !lowKilobits.empty()) return lowKilobits;
    if (kilobits.data() == opusKilobits && channelCount == 1) return upTo(kilobits, opusKilobitsPerChannel);
    if (kilobits.data() == aacKilobits)
        return upTo(kilobits, aacBitsPerSample * samplerate * channelCount / 1000);
    if (kilobits.data() == dolbyKilobits && channelCount > 2) return from(kilobits, dolbySurroundKilobits);
    return kilobits;
}

}  // namespace av
