#include "builtin/sound/format/avol.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/sound/format/soundrows.h"
#include "builtin/sound/soundvalues.h"
#include "core/engine/modules/qvmodule.h"
#include "core/filter/qvprocessutil.h"

namespace {

using S = AVolSettings;

constexpr int coarse = 5, fine = 16;  // fraction bits of a gain

int setPrecision(S& settings, const Any& value) {
    int bits = 0;
    if (!qvparam::convert(value, bits) || (bits != coarse && bits != fine)) return QvStatus::invalidParam;
    settings.precision = bits;
    return QvStatus::ok;
}

void getPrecision(const S& settings, Any& value) { value = settings.precision; }

int takeReport(S& settings, const Any& value) {
    if (!value.isDict()) return QvStatus::invalidParam;
    qvparam::convert(value.asDict().get("peakLeveldB"), settings.peakLevel);
    return QvStatus::ok;
}

constexpr double least = std::numeric_limits<double>::lowest(), most = std::numeric_limits<double>::max();

// clang-format off
constexpr QvParamRow<S> rows[] = {
    {"volume",          &S::volume,  qvParamStored, least, most, "", "dB", "gain of all channels"},
    {"mute",            &S::mute,    qvParamStored, 0, 1, "", "", "silences all channels"},
    {"channel1_volume", &S::volume1, qvParamStored, least, most, "Channel 1 volume[dB]", "dB", "added to volume"},
    {"channel2_volume", &S::volume2, qvParamStored, least, most, "Channel 2 volume[dB]", "dB", "added to volume"},
    {"channel3_volume", &S::volume3, qvParamStored, least, most, "Channel 3 volume[dB]", "dB", "added to volume"},
    {"channel4_volume", &S::volume4, qvParamStored, least, most, "Channel 4 volume[dB]", "dB", "added to volume"},
    {"channel5_volume", &S::volume5, qvParamStored, least, most, "Channel 5 volume[dB]", "dB", "added to volume"},
    {"channel6_volume", &S::volume6, qvParamStored, least, most, "Channel 6 volume[dB]", "dB", "added to volume"},
    {"channel7_volume", &S::volume7, qvParamStored, least, most, "Channel 7 volume[dB]", "dB", "added to volume"},
    {"channel8_volume", &S::volume8, qvParamStored, least, most, "Channel 8 volume[dB]", "dB", "added to volume"},
    {"channel1_mute",   &S::mute1,   qvParamStored, 0, 1, "Channel 1 mute"},
    {"channel2_mute",   &S::mute2,   qvParamStored, 0, 1, "Channel 2 mute"},
    {"channel3_mute",   &S::mute3,   qvParamStored, 0, 1, "Channel 3 mute"},
    {"channel4_mute",   &S::mute4,   qvParamStored, 0, 1, "Channel 4 mute"},
    {"channel5_mute",   &S::mute5,   qvParamStored, 0, 1, "Channel 5 mute"},
    {"channel6_mute",   &S::mute6,   qvParamStored, 0, 1, "Channel 6 mute"},
    {"channel7_mute",   &S::mute7,   qvParamStored, 0, 1, "Channel 7 mute"},
    {"channel8_mute",   &S::mute8,   qvParamStored, 0, 1, "Channel 8 mute"},
    {.name = "precision", .member = QvParamAccess<S>{setPrecision, getPrecision}, .flags = qvParamStored,
     .unit = "bits", .help = "5 (gains up to 6 dB, which wrap around) or 16 (up to 48 dB, values are limited)"},
    {.name = "_streamReport", .member = QvParamAccess<S>{takeReport, nullptr}, .help = "a dictionary",
     .type = Any::Dict},
    {.name = "_needsReport", .flags = qvParamByHand | qvParamReadOnly, .type = Any::Int32},
};
// clang-format on
static_assert(qvParamTableOk<S>(rows));

struct Channel {
    double S::*volume;
    bool S::*mute;
};
constexpr Channel channels[] = {{&S::volume1, &S::mute1}, {&S::volume2, &S::mute2}, {&S::volume3, &S::mute3},
                                {&S::volume4, &S::mute4}, {&S::volume5, &S::mute5}, {&S::volume6, &S::mute6},
                                {&S::volume7, &S::mute7}, {&S::volume8, &S::mute8}};
static_assert(std::size(channels) == S::channels);

int32_t gainOf(const S& settings, const Channel& channel) {
    if (settings.mute || settings.*channel.mute) return 0;
    const double highest = settings.precision == coarse ? 6.0 : 48.0;
    const double gain = std::pow(10, std::min(settings.volume + settings.*channel.volume, highest) / 20);
    if (settings.precision == coarse) return static_cast<int32_t>(gain * (1 << coarse));
    return static_cast<int32_t>(std::lround(gain * (1 << fine)));
}

bool isChannelRow(const QvParamRow<S>& row) { return *row.description != 0; }

AnyVector describeChannels() {
    AnyVector set;
    for (const auto& row : rows) {
        if (!isChannelRow(row)) continue;
        const bool flag = qvparam::kindOfRow(row) == qvparam::Kind::flag;
        set.append(
            Any(QvProcessUtil::createParamDesc(row.name, flag ? Any::Int32 : Any::Float,
                                               flag ? QV_GUI_CHECKBOX : QV_GUI_EDIT, row.description)));
    }
    return set;
}

constexpr size_t minPeriod = 256;  // values, so that loops over a period are long

}  // namespace

QvCodec* newAvol() { return new QvAVol; }

QvAVol::QvAVol() : StoredFilterOf("avol::writepcm", rows) { computeGains(); }

int QvAVol::init() {
    const int result = StoredFilterOf::init();
    computeGains();
    return result;
}

void QvAVol::computeGains() {
    for (size_t i = 0; i < gains_.size(); ++i) gains_[i] = gainOf(settings_, channels[i]);
    period_.clear();
}

int QvAVol::setParam(const char* name, const Any& value) {
    const int result = StoredFilterOf::setParam(name, value);
    computeGains();
    return result;
}

void QvAVol::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "_needsReport") == 0)
        value = 0;
    else if (std::strcmp(name, "paramSet") == 0)
        value = describeChannels();
    else
        StoredFilterOf::getParam(name, value);
}

void QvAVol::store(AnyDict& dict) const {
    StoredFilterOf::store(dict);
    dict.set("volume", settings_.volume);
    dict.set("mute", settings_.mute ? 1 : 0);
    dict.set("type", QvModuleType::audioFilter);
}

int QvAVol::restore(const AnyDict& dict) {
    const int result = StoredFilterOf::restore(dict);
    computeGains();
    return result;
}

int QvAVol::open() {
    requireInited();
    qv_dbg()->info("Opening audio volume module");
    if (settings_.mute)
        qv_dbg()->info("Master gain: MUTE");
    else
        qv_dbg()->info("Master gain: %ddB", static_cast<int>(std::clamp(settings_.volume, -1e9, 1e9)));
    for (int i = 0; i < S::channels; ++i) {
        if (settings_.*channels[i].mute)
            qv_dbg()->info("Channel %d gain: MUTE", i + 1);
        else
            qv_dbg()->info("Channel %d gain: %fdB", i + 1, settings_.*channels[i].volume);
    }
    computeGains();
    return StoredFilterOf::open();
}

void QvAVol::spreadGains(int count) {
    const auto inSample = static_cast<size_t>(count);
    period_.resize((minPeriod + inSample - 1) / inSample * inSample);
    for (size_t i = 0; i < period_.size(); ++i) {
        const size_t channel = i % inSample;
        period_[i] = channel < gains_.size() ? gains_[channel] : 0;
    }
}

int QvAVol::write(QvPcm& pcm) {
    requireWide(pcm);
    if (pcm.samples() < 1) return QvStatus::ok;
    warnOfSilence(pcm.channels());
    int32_t* room = nullptr;
    if (const int result = makeWideRoom(pcm, pcm.channels(), room)) return result;
    output_.copyMeta(pcm);
    if (period_.empty()) spreadGains(pcm.channels());
    const auto apply = settings_.precision == coarse ? snd::gain5 : snd::gain16;
    apply(room, soundValues(pcm), static_cast<size_t>(pcm.samples()) * static_cast<size_t>(pcm.channels()),
          period_.data(), period_.size());
    return QvStatus::ok;
}
