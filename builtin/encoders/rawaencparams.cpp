// Parameters of the raw audio encoder.
#include <algorithm>

#include "builtin/encoders/rawaenc.h"
#include "builtin/encoders/rawsettings.h"
#include "core/arch/qvassert.h"
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

}  // namespace

struct RawAudioParams {
    using Enc = RawAudioEnc;
    using Access = QvParamAccess<Enc>;

    static int profile(Enc& enc, const Any& value) {
        if (!qvparam::convert(value, enc.profile_)) return QvStatus::invalidParam;
        if (isBroadcast(enc.profile_)) {
            enc.samplerate_ = broadcastSamplerate;
            enc.bitsPerSample_ = 24;
        }
        return QvStatus::ok;
    }

    static long long bitrate(const Enc& enc) {
        return static_cast<long long>(enc.samplerate_) * enc.channels_ * ((enc.bitsPerSample_ + 7) / 8) * 8;
    }
    static int bitrateInt(const Enc& enc) { return rawsettings::bitrateInt(bitrate(enc)); }
    static int kilobits(const Enc& enc) { return static_cast<int>(bitrate(enc) / 1024); }

    static void samplerateRange(const Enc& enc, Any& value) {
        AnyVector range;
        for (const int rate : samplerates)
            if (!isBroadcast(enc.profile_) || rate == broadcastSamplerate) range.append(rate);
        value = range;
    }
    static void channelsRangeDesc(const Enc&, Any& value) {
        AnyVector all;
        for (int channels = 1; channels <= 8; ++channels) all.append(QvUtil::channelDesc(channels, true));
        value = all;
    }
    // The number of the channel comes in with the value.
    static void channelName(const Enc&, Any& value) {
        if (value.isInt())
            value = Any::sprintf("channel %d", (value.toInt32() & 15) + 1);
        else
            value = "which channel?";
    }

    static std::span<const QvParamRow<Enc>> rows();
};

std::span<const QvParamRow<RawAudioEnc>> RawAudioParams::rows() {
    using E = const Enc&;
    const auto zero = [](E, Any& v) { v = 0; };
    const auto refuse = [](Enc&, const Any&) { return QvStatus::failed; };
    const auto ignore = [](Enc&, const Any&) { return QvStatus::ok; };
    static const QvParamRow<Enc> table[] = {
        {"framerate", {}, qvParamIgnored},
        {"decoderStruct", {}, qvParamIgnored},
        {.name = "smartRender", .member = Access{ignore, zero}, .help = "accepted, without effect"},
        {.name = "smartRenderingOn", .member = Access{refuse, zero}, .help = "refused"},
        {.name = "type", .member = &Enc::type_, .flags = qvParamWriteOnly, .help = "kept, without effect"},
        {.name = "profile",
         .member = Access{profile, nullptr},
         .flags = qvParamWriteOnly,
         .help = "a QvProfile; those of broadcasting set 48000 Hz and 24 bits",
         .type = Any::Int32},
        {.name = "settings",
         .member = Access{rawsettings::apply<Enc>, nullptr},
         .flags = qvParamWriteOnly,
         .help = "several parameters at once",
         .type = Any::Dict},
        {"samplerate", &Enc::samplerate_, qvParamStored, 1, 1000000, "", "Hz"},
        {"channels", &Enc::channels_, qvParamStored, 1, 32, "", "", "samples of one instant"},
        {"bitsPerSample", &Enc::bitsPerSample_, qvParamStored, 1, 32, "", "bits"},
        {"aBitrate", Access{nullptr, [](E e, Any& v) { v = kilobits(e); }}},
        {"bitrate", Access{nullptr, [](E e, Any& v) { v = QvBitrate(QvBitrate::cbr, bitrateInt(e)); }}},
        {"estimateSecKb",
         Access{nullptr, [](E e, Any& v) { v = Any(static_cast<float>(kilobits(e) * 0.125)); }}},
        {"bitsPerSampleRange", Access{nullptr, [](E, Any& v) { v = AnyVector(16, 24); }}},
        {"samplerateRange", Access{nullptr, samplerateRange}},
        {"aBitrateRange", Access{nullptr, [](E e, Any& v) { v = AnyVector(kilobits(e)); }}},
        {"bitrateRange", Access{nullptr, [](E e, Any& v) { v = rawsettings::bitrateRange(bitrateInt(e)); }}},
        {"channelsRange", Access{nullptr, [](E, Any& v) { v = AnyVector(1, 2, 3, 4, 5, 6, 7, 8); }}},
        {"channelsRangeDesc", Access{nullptr, channelsRangeDesc}},
        {"extension", Access{nullptr, [](E, Any& v) { v = "wav"; }}},
        {"channelName", Access{nullptr, channelName}},
    };
    return table;
}

int RawAudioEnc::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != stateCreated, "Not inited");
    if (!qvFindParamRow(RawAudioParams::rows(), name)) return QvAudioEncoder::setParam(name, value);
    _traceParam(name, value);
    if (auto result = qvSetParamRow(RawAudioParams::rows(), *this, name, value)) return *result;
    return QvAudioEncoder::setParam(name, value);
}

void RawAudioEnc::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow(RawAudioParams::rows(), *this, name, value)) QvAudioEncoder::getParam(name, value);
}

void RawAudioEnc::store(AnyDict& state) const { state = rawsettings::stored(RawAudioParams::rows(), *this); }

int RawAudioEnc::restore(const AnyDict& state) {
    if (state.get("name") != name()) return setError(QvStatus::failed, "restore - invalid name");
    return rawsettings::restore(*this, state, [this](const AnyDict& rows) {
        return _restoreRows(RawAudioParams::rows(), *this, rows);
    });
}
