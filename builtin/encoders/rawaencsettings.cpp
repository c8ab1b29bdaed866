#include "builtin/encoders/rawaencsettings.h"

#include <algorithm>

#include "builtin/encoders/rawsettings.h"
#include "core/engine/qvutil.h"
#include "core/measure/qvgeometry.h"

namespace {

// Families of profiles, the upper half of a profile number, whose sound is 48 kHz at 24 bits.
constexpr int broadcastFamilies[] = {
    0x0208,  // P2
    0x020D,  // XDCAM IMX
    0x020E,  // XDCAM EX
    0x020F,  // XDCAM HD
    0x0210,  // AVC-Intra
};

bool isBroadcast(int profile) {
    return std::find(std::begin(broadcastFamilies), std::end(broadcastFamilies), profile >> 16) !=
           std::end(broadcastFamilies);
}

constexpr int samplerates[] = {8000, 11025, 16000, 22050, 32000, 44100, 48000, 88200, 96000, 176400, 192000};
constexpr int broadcastSamplerate = 48000;

using Settings = RawAudioSettings;
using Access = QvParamAccess<Settings>;

int setProfile(Settings& settings, const Any& value) {
    if (!qvparam::convert(value, settings.profile)) return QvStatus::invalidParam;
    if (isBroadcast(settings.profile)) {
        settings.samplerate = broadcastSamplerate;
        settings.bitsPerSample = 24;
    }
    return QvStatus::ok;
}

int bitrateInt(const Settings& settings) { return rawsettings::bitrateInt(settings.bitrate()); }
int kilobits(const Settings& settings) { return static_cast<int>(settings.bitrate() / 1024); }

void samplerateRange(const Settings& settings, Any& value) {
    AnyVector range;
    for (const int rate : samplerates)
        if (!isBroadcast(settings.profile) || rate == broadcastSamplerate) range.append(rate);
    value = range;
}

void channelsRangeDesc(const Settings&, Any& value) {
    AnyVector all;
    for (int channels = 1; channels <= 8; ++channels) all.append(QvUtil::channelDesc(channels, true));
    value = all;
}

// The number of the channel comes in with the value.
void channelName(const Settings&, Any& value) {
    if (value.isInt())
        value = Any::sprintf("channel %d", (value.toInt32() & 15) + 1);
    else
        value = "which channel?";
}

}  // namespace

std::span<const QvParamRow<RawAudioSettings>> RawAudioSettings::rows() {
    using S = const Settings&;
    const auto zero = [](S, Any& v) { v = 0; };
    const auto refuse = [](Settings&, const Any&) { return QvStatus::failed; };
    const auto ignore = [](Settings&, const Any&) { return QvStatus::ok; };
    static const QvParamRow<Settings> table[] = {
        {"framerate", {}, qvParamIgnored},
        {"decoderStruct", {}, qvParamIgnored},
        {.name = "smartRender", .member = Access{ignore, zero}, .help = "accepted, without effect"},
        {.name = "smartRenderingOn", .member = Access{refuse, zero}, .help = "refused"},
        {.name = "type",
         .member = &Settings::type,
         .flags = qvParamWriteOnly,
         .help = "kept, without effect"},
        {.name = "profile",
         .member = Access{setProfile, nullptr},
         .flags = qvParamWriteOnly,
         .help = "a QvProfile; those of broadcasting set 48000 Hz and 24 bits",
         .type = Any::Int32},
        {.name = "settings",
         .flags = qvParamByHand | qvParamWriteOnly,
         .help = "several parameters at once",
         .type = Any::Dict},
        {"samplerate", &Settings::samplerate, qvParamStored, 1, 1000000, "", "Hz"},
        {"channels", &Settings::channels, qvParamStored, 1, 32, "", "", "samples of one instant"},
        {"bitsPerSample", &Settings::bitsPerSample, qvParamStored, 1, 32, "", "bits"},
        {"aBitrate", Access{nullptr, [](S s, Any& v) { v = kilobits(s); }}},
        {"bitrate", Access{nullptr, [](S s, Any& v) { v = QvBitrate(QvBitrate::cbr, bitrateInt(s)); }}},
        {"estimateSecKb",
         Access{nullptr, [](S s, Any& v) { v = Any(static_cast<float>(kilobits(s) * 0.125)); }}},
        {"bitsPerSampleRange", Access{nullptr, [](S, Any& v) { v = AnyVector(16, 24); }}},
        {"samplerateRange", Access{nullptr, samplerateRange}},
        {"aBitrateRange", Access{nullptr, [](S s, Any& v) { v = AnyVector(kilobits(s)); }}},
        {"bitrateRange", Access{nullptr, [](S s, Any& v) { v = rawsettings::bitrateRange(bitrateInt(s)); }}},
        {"channelsRange", Access{nullptr, [](S, Any& v) { v = AnyVector(1, 2, 3, 4, 5, 6, 7, 8); }}},
        {"channelsRangeDesc", Access{nullptr, channelsRangeDesc}},
        {"extension", Access{nullptr, [](S, Any& v) { v = "wav"; }}},
        {"channelName", Access{nullptr, channelName}},
    };
    return table;
}
