#include "builtin/sound/effects/normalizer.h"

#include <algorithm>
#include <array>
#include <climits>
#include <cmath>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/sound/effects/soundvalues.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = NormalizerSettings;
using Mode = Settings::Mode;

constexpr int workBytes = 4;
// What is quieter, in dB below full scale, is silence: lifting it would only lift the noise.
constexpr double silenceLevel = -90;

struct ModeRow {
    const char* name;
    const char* level;  // key of the report
    const char* unit;
    double target;
};
constexpr std::array<ModeRow, 3> modes = {{
    {"peak", "samplePeakdB", "dBFS", -3},
    {"rms", "rmsdB", "dBFS", -20},
    {"loudness", "integratedLoudness", "LUFS", -23},
}};

const ModeRow& rowOf(Mode mode) { return modes[static_cast<std::size_t>(mode)]; }

int setMode(Settings& settings, const Any& value) {
    std::string name;
    if (!qvparam::convert(value, name)) return QvStatus::invalidParam;
    for (std::size_t i = 0; i < modes.size(); ++i) {
        if (name != modes[i].name) continue;
        settings.mode = static_cast<Mode>(i);
        return QvStatus::ok;
    }
    return QvStatus::invalidParam;
}

void getMode(const Settings& settings, Any& value) { value = rowOf(settings.mode).name; }

constexpr double lowestTarget = -90, highestTarget = 20;

int setTarget(Settings& settings, const Any& value) {
    double target = 0;
    if (!qvparam::convert(value, target) || !(target >= lowestTarget && target <= highestTarget))
        return QvStatus::invalidParam;
    settings.target = target;
    return QvStatus::ok;
}

double targetOf(const Settings& settings) { return settings.target.value_or(rowOf(settings.mode).target); }

void getTarget(const Settings& settings, Any& value) { value = targetOf(settings); }

// clang-format off
constexpr QvParamRow<Settings> rows[] = {
    {.name = "mode", .member = QvParamAccess<Settings>{setMode, getMode}, .flags = qvParamStored,
     .help = "what becomes equal to `target`: `peak` (the highest sample), `rms` or `loudness` (EBU R 128)"},
    {.name = "target", .member = QvParamAccess<Settings>{setTarget, getTarget}, .flags = qvParamStored,
     .min = lowestTarget, .max = highestTarget, .unit = "dBFS, LUFS",
     .help = "the level to reach; if it is not set, -3 dBFS for peak, -20 dBFS for rms, -23 LUFS for loudness"},
    {.name = "truePeak", .member = &Settings::truePeak, .flags = qvParamStored, .min = -60, .max = 20,
     .unit = "dBTP", .help = "the highest true peak; where it would be passed, the gain is lower"},
    {.name = "gain", .member = &Settings::gain, .flags = qvParamReadOnly, .unit = "dB",
     .help = "what the sound is amplified by, since it was opened"},
};
// clang-format on
static_assert(qvParamTableOk<Settings>(rows));

// Rounds to the nearest integer, the even one of two: the sum has no bits left for a fraction.
double rounded(double value) {
    constexpr double noFraction = 6755399441055744.0;  // 1.5 * 2^52
    return value + noFraction - noFraction;
}

}  // namespace

QvCodec* newNormalizer() { return new QvNormalizer; }

QvNormalizer::QvNormalizer() : SoundFilterOf("normalizer::writepcm", rows) {}

int QvNormalizer::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "_streamReport") == 0) {
        _traceParam(name, value);
        if (!value.isDict()) return setError(QvStatus::invalidParam, "'_streamReport' is no dictionary");
        report_ = value.asDict();
        return QvStatus::ok;
    }
    const int result = SoundFilterOf::setParam(name, value);
    if (result != QvStatus::ok && std::strcmp(name, "mode") == 0)
        return setError(result, "'mode' is 'peak', 'rms' or 'loudness'");
    return result;
}

void QvNormalizer::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "_needsReport") == 0)
        value = QvReportNeed::loudness;
    else
        SoundFilterOf::getParam(name, value);
}

void QvNormalizer::store(AnyDict& dict) const {
    SoundFilterOf::store(dict);
    qvStoreParamRows<Settings>(rows_, settings_, dict);
    if (!settings_.target) dict.remove("target");
}

int QvNormalizer::restore(const AnyDict& dict) {
    if (const int result = SoundFilterOf::restore(dict)) return result;
    return _restoreRows<Settings>(rows_, settings_, dict);
}

int QvNormalizer::open() {
    if (const int result = SoundFilterOf::open()) return result;
    settings_.gain = chooseGain();
    factor_ = std::pow(10.0, settings_.gain / 20);
    qv_dbg()->info("Opening normalizer, gain is %.2f dB", settings_.gain);
    return QvStatus::ok;
}

double QvNormalizer::chooseGain() const {
    const auto& [modeName, key, unit, unused] = rowOf(settings_.mode);
    double level = 0, peak = 0;
    if (!qvparam::convert(report_.get(key), level) || !qvparam::convert(report_.get("truePeakdB"), peak)) {
        qv_log()->warning("The sound is not normalized: its level is not known");
        return 0;
    }
    if (peak < silenceLevel) {
        qv_log()->info("The sound is silent, there is nothing to normalize");
        return 0;
    }
    if (!std::isfinite(level)) {
        qv_log()->warning("The sound is not normalized: it is too short or too quiet for a loudness");
        return 0;
    }
    const double wanted = targetOf(settings_) - level, most = settings_.truePeak - peak;
    if (wanted <= most) return wanted;
    qv_log()->warning("The sound reaches %.1f %s instead of %.1f: its true peak is at the limit of %.1f dBTP",
                      level + most, unit, targetOf(settings_), settings_.truePeak);
    return most;
}

int QvNormalizer::write(QvPcm& pcm) {
    requireOpened();
    if (pcm.bytesPerSample() != workBytes) return setError(QvStatus::failed, "Only 32 bit samples supported");
    unsigned char* room = nullptr;
    const QvPcmFormat format{pcm.samplerate(), pcm.channels(), workBytes * 8};
    if (const int result = makeRoom(format, pcm.samples(), room)) return result;
    if (room && factor_ == 1.0) {
        std::memcpy(room, pcm.ptr(0), static_cast<std::size_t>(pcm.bytes()));
    } else if (room) {
        const int* from = soundValues(pcm);
        int* to = reinterpret_cast<int*>(room);
        const auto count = static_cast<std::size_t>(pcm.samples()) * static_cast<std::size_t>(pcm.channels());
        for (std::size_t i = 0; i < count; ++i)
            to[i] = static_cast<int>(std::clamp<double>(rounded(from[i] * factor_), INT_MIN, INT_MAX));
    }
    output_.copyMeta(pcm);
    return QvStatus::ok;
}
