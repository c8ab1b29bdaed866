#include "builtin/sound/effects/dynamics.h"

#include <cstring>

#include "builtin/creators.h"
#include "builtin/sound/soundvalues.h"
#include "core/engine/log/qvlog.h"
#include "core/filter/qvprocessutil.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = DynamicsSettings;

constexpr auto stateOpen = static_cast<QvCodec::State>(3);
constexpr int workBytes = 4;

// Wider than what a user interface offers, and narrow enough that all arithmetic stays finite.
constexpr double lowestLevel = -200, highestLevel = 100;
constexpr double lowestRatio = 0.1, highestRatio = 1000;
constexpr double longestTime = 1e12;

// clang-format off
constexpr QvParamRow<Settings> level(const char* name, double Settings::*member, const char* help) {
    return {name, member, qvParamStored, lowestLevel, highestLevel, "", "dB", help};
}
constexpr QvParamRow<Settings> ratio(const char* name, double Settings::*member, const char* help) {
    return {name, member, qvParamStored, lowestRatio, highestRatio, "", "", help};
}
constexpr QvParamRow<Settings> attack(const char* name, double Settings::*member) {
    return {name, member, qvParamStored, 0, longestTime, "", "us", "how fast the stage follows a rising level"};
}
constexpr QvParamRow<Settings> release(const char* name, double Settings::*member) {
    return {name, member, qvParamStored, 0, longestTime, "", "ms", "how fast the stage follows a falling level"};
}
constexpr QvParamRow<Settings> active(const char* name, bool Settings::*member, const char* help) {
    return {.name = name, .member = member, .flags = qvParamStored, .help = help};
}

constexpr QvParamRow<Settings> rows[] = {
    active("limiterActive", &Settings::limiter, "holds levels above limiterLevel at that level"),
    level("limiterLevel", &Settings::limiterLevel, "below full scale"),
    attack("limiterAttack", &Settings::limiterAttack),
    release("limiterRelease", &Settings::limiterRelease),
    active("compressorActive", &Settings::compressor, "draws levels above compressorLevel nearer to it"),
    level("compressorLevel", &Settings::compressorLevel, "below full scale"),
    ratio("compressorRatio", &Settings::compressorRatio, "of the distance in dB to compressorLevel, one part is left"),
    attack("compressorAttack", &Settings::compressorAttack),
    release("compressorRelease", &Settings::compressorRelease),
    active("expanderActive", &Settings::expander, "moves levels below expanderLevel farther away from it"),
    level("expanderLevel", &Settings::expanderLevel, "below full scale"),
    ratio("expanderRatio", &Settings::expanderRatio, "the distance in dB to expanderLevel becomes so many times as large"),
    attack("expanderAttack", &Settings::expanderAttack),
    release("expanderRelease", &Settings::expanderRelease),
    active("noisegateActive", &Settings::noisegate, "fades to silence in 0.1 s below noisegateLevel, and in again above it"),
    level("noisegateLevel", &Settings::noisegateLevel, "below full scale"),
    attack("noisegateAttack", &Settings::noisegateAttack),
    release("noisegateRelease", &Settings::noisegateRelease),
    {.name = "_channels", .member = &Settings::channels, .min = 0,
     .help = "channels of the sound that is to come; 0: not known before it comes"},
    {.name = "peakLeveldB", .member = &Settings::peakdB, .flags = qvParamReadOnly, .unit = "dB",
     .help = "peak of the input, from the last report"},
    {.name = "peakLevel", .member = &Settings::peak, .flags = qvParamReadOnly,
     .help = "the same as an amplitude; 8388608 is full scale"},
};
// clang-format on
static_assert(qvParamTableOk<Settings>(rows));

// What a user interface offers, in its order. A label for a level or a ratio goes with a slider.
struct Offered {
    const char* name;
    const char* label;
    double min, max;  // both 0: a check box
};
constexpr Offered offered[] = {
    {"limiterActive", "Use Limiter", 0, 0},
    {"limiterLevel", "Limiter Level [dB]", -100, -1},
    {"compressorActive", "Use Compressor", 0, 0},
    {"compressorLevel", "Compressor Level [dB]", -100, -1},
    {"compressorRatio", "Compressor Ratio", 1, 10},
    {"expanderActive", "Use Expander", 0, 0},
    {"expanderLevel", "Expander Level [dB]", -100, -1},
    {"expanderRatio", "Expander Ratio", 1, 10},
    {"noisegateActive", "Use Noise Gate", 0, 0},
    {"noisegateLevel", "Noise Gate Level [dB]", -100, -1},
};

AnyVector paramSet() {
    AnyVector set;
    for (const auto& [name, label, min, max] : offered)
        set.append(Any(max == 0 && min == 0
                           ? QvProcessUtil::createParamDesc(name, Any::Int32, QV_GUI_CHECKBOX, label)
                           : QvProcessUtil::createParamDesc(name, Any::Float, QV_GUI_SLIDER, label, Any(min),
                                                            Any(max))));
    return set;
}

}  // namespace

QvCodec* newDynamics() { return new Dynamics; }

Dynamics::Dynamics() : SoundFilter("dynamics::writepcm") {}

int Dynamics::init() {
    if (getState() == stateInitialised) return setError(QvStatus::failed, "Already initialized");
    if (getState() == stateCreated) {
        if (const int result = SoundFilter::init()) return result;
    }
    settings_ = {};
    setState(stateInitialised);
    return QvStatus::ok;
}

int Dynamics::checkChannels(int channels) {
    if (channels <= maxChannels()) return QvStatus::ok;
    return setError(QvStatus::failed, "dynamics works on up to %d channels, the sound has %d", maxChannels(),
                    channels);
}

int Dynamics::open() {
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Not initialized, or already open");
    if (const int result = checkChannels(settings_.channels)) return result;
    setState(stateOpen);
    return QvStatus::ok;
}

int Dynamics::close() {
    setState(stateInitialised);
    return QvStatus::ok;
}

int Dynamics::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "_streamReport") == 0) {
        _traceParam(name, value);
        return takeReport(value);
    }
    if (const auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return SoundFilter::setParam(name, value);
}

int Dynamics::takeReport(const Any& report) {
    double peak = 0;
    if (!report.isDict() || !qvparam::convert(report.asDict().get("peakLeveldB"), peak) ||
        !(peak <= highestLevel))
        return setError(QvStatus::invalidParam, "'_streamReport' has no \"peakLeveldB\" in dB");
    settings_.peakdB = peak;
    settings_.peak = dynamics::thresholdOf(peak);
    return QvStatus::ok;
}

void Dynamics::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "_needsReport") == 0)
        value = 1;
    else if (std::strcmp(name, "paramSet") == 0)
        value = paramSet();
    else if (!qvGetParamRow<Settings>(rows, settings_, name, value))
        SoundFilter::getParam(name, value);
}

void Dynamics::store(AnyDict& dict) const {
    SoundFilter::store(dict);
    qvStoreParamRows<Settings>(rows, settings_, dict);
}

int Dynamics::restore(const AnyDict& dict) {
    if (const int result = SoundFilter::restore(dict)) return result;
    return _restoreRows<Settings>(rows, settings_, dict);
}

std::array<Dynamics::Stage, Dynamics::stageCount> Dynamics::prepare(int samplerate) const {
    const auto stage = [&](bool isActive, double dB, double attackTime, double releaseTime,
                           double ratioOf = 1) {
        return Stage{isActive,
                     {.attack = dynamics::attackShare(attackTime, samplerate),
                      .release = dynamics::releaseShare(releaseTime, samplerate),
                      .threshold = dynamics::thresholdOf(dB),
                      .ratio = ratioOf,
                      .ramp = static_cast<int>(static_cast<float>(samplerate) / 10.0)}};
    };
    const Settings& s = settings_;
    return {
        stage(s.limiter, s.limiterLevel, s.limiterAttack, s.limiterRelease),
        stage(s.compressor, s.compressorLevel, s.compressorAttack, s.compressorRelease, s.compressorRatio),
        stage(s.expander, s.expanderLevel, s.expanderAttack, s.expanderRelease, s.expanderRatio),
        stage(s.noisegate, s.noisegateLevel, s.noisegateAttack, s.noisegateRelease)};
}

// Room for all samples of `like` at the end of a buffer. One that is empty may change its channels.
int Dynamics::append(QvPcm& buffer, const QvPcm& like, int*& room) {
    if (buffer.inited() && buffer.samples() == 0 && buffer.channels() != like.channels()) buffer.destroy();
    unsigned char* bytes = nullptr;
    const int result =
        makeRoom(buffer, {like.samplerate(), like.channels(), workBytes * 8}, like.samples(), bytes);
    room = reinterpret_cast<int*>(bytes);
    return result;
}

int Dynamics::write(QvPcm& pcm) {
    if (!opened()) return setError(QvStatus::failed, "Not opened");
    if (pcm.bytesPerSample() != workBytes) return setError(QvStatus::failed, "Only 32 bit samples supported");
    if (const int result = checkChannels(pcm.channels())) return result;
    if (pcm.samplerate() < 1) return setError(QvStatus::failed, "The sound has no sample rate");
    const auto stages = prepare(pcm.samplerate());
    const QvPcm* from = &pcm;
    for (std::size_t i = 0; i < stageCount; ++i) {
        if (!stages[i].active) continue;
        int* to = nullptr;
        if (const int result = append(buffers_[i], *from, to)) return result;
        for (int channel = 0; to && channel < pcm.channels(); ++channel)
            dynamics::stages[i](stages[i].work, channels_[i][static_cast<std::size_t>(channel)],
                                soundValues(*from) + channel, to + channel, from->samples(), pcm.channels());
        from = &buffers_[i];
    }
    if (from != &pcm && output_.inited()) output_.setSamples(0);  // what waits there, the last stage has too
    int* to = nullptr;
    if (const int result = append(output_, *from, to)) return result;
    if (to) std::memcpy(to, from->ptr(0), static_cast<std::size_t>(from->bytes()));
    output_.copyMeta(pcm);
    return QvStatus::ok;
}

int Dynamics::erase(int n) {
    for (QvPcm& buffer : buffers_) buffer.erase(n);
    return output_.erase(n);
}
