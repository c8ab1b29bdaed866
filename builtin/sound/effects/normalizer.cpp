#include "builtin/sound/effects/normalizer.h"

#include <algorithm>
#include <array>
#include <climits>
#include <cmath>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/sound/soundvalues.h"
#include "builtin/sound/wordparam.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = NormalizerSettings;
using Mode = Settings::Mode;

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

constexpr std::array modeNames{modes[0].name, modes[1].name, modes[2].name};

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
    {.name = "mode", .member = wordParam<Settings, &Settings::mode, modeNames>, .flags = qvParamStored,
     .help = "peak (the highest sample), rms or loudness (EBU R 128): what becomes equal to target"},
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

QvNormalizer::QvNormalizer() : StoredFilterOf("normalizer::writepcm", rows) {}

int QvNormalizer::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "_streamReport") == 0) {
        _traceParam(name, value);
        if (!value.isDict()) return setError(QvStatus::invalidParam, "'_streamReport' is no dictionary");
        report_ = value.asDict();
        return QvStatus::ok;
    }
    return StoredFilterOf::setParam(name, value);
}

void QvNormalizer::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "_needsReport") == 0)
        value = QvReportNeed::loudness;
    else
        StoredFilterOf::getParam(name, value);
}

// Whether there is a target matters, not whether it differs from the default of some mode.
void QvNormalizer::store(AnyDict& dict) const {
    StoredFilterOf::store(dict);
    if (settings_.target)
        dict.set("target", *settings_.target);
    else
        dict.remove("target");
}

int QvNormalizer::open() {
    if (const int result = StoredFilterOf::open()) return result;
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
    requireWide(pcm);
    int* room = nullptr;
    if (const int result = makeWideRoom(pcm, pcm.channels(), room)) return result;
    if (room && factor_ == 1.0) {
        std::memcpy(room, pcm.ptr(0), static_cast<std::size_t>(pcm.bytes()));
    } else if (room) {
        const int* from = soundValues(pcm);
        const auto count = static_cast<std::size_t>(pcm.samples()) * static_cast<std::size_t>(pcm.channels());
        for (std::size_t i = 0; i < count; ++i) room[i] = saturated(rounded(from[i] * factor_));
    }
    output_.copyMeta(pcm);
    return QvStatus::ok;
}
