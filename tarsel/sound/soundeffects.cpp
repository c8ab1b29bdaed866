#include "tarsel/sound/soundeffects.h"

#include <algorithm>
#include <cmath>

#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr double kLeastVolume = -120, kMostVolume = 48;  // dB
constexpr double kLeastTarget = -70, kMostTarget = 0;    // dBFS or LUFS
constexpr double kMostDelay = 3600;                      // seconds
constexpr int kMostSounds = 999;
constexpr int kFineGain = 16;  // fraction bits, with which a gain may be above 6 dB and clips

constexpr struct {
    const char* mode;
    double level;  // unless one is said
} kTargets[] = {{"loudness", -23}, {"peak", -1}, {"rms", -20}};

std::unique_ptr<QvCodec> filterNamed(const char* module) {
    return makeAnyCodec(module, QvModuleType::audioFilter);
}

// As it is when a task has been stored and read again, so that a job and its task give the same sound.
double asStored(double value) {
    constexpr double places = 1e6;
    return std::round(value * places) / places;
}

}  // namespace

double Volumes::of(int sound) const {
    for (const auto& [named, decibels] : each_)
        if (named == sound) return decibels;
    return all_;
}

int Volumes::highest() const {
    int highest = -1;
    for (const auto& row : each_) highest = std::max(highest, row.first);
    return highest;
}

Volumes parseVolumes(const std::vector<std::string>& given) {
    Volumes volumes;
    bool all = false;
    for (const std::string& text : given) {
        const size_t equals = text.find('=');
        const bool one = text.starts_with("a:") && equals != std::string::npos;
        std::string number = one ? text.substr(equals + 1) : text;
        if (number.size() > 1 && number[0] == '+' && number[1] != '-') number.erase(0, 1);
        const double decibels = parseDecimal(number, kLeastVolume, kMostVolume, "--volume");
        if (!one) {
            if (all) throw failure(Msg::optionRepeated, {"--volume"});
            all = true;
            volumes.all_ = decibels;
            continue;
        }
        const int sound =
            static_cast<int>(parseNumber(text.substr(2, equals - 2), 0, kMostSounds, "--volume"));
        for (const auto& row : volumes.each_)
            if (row.first == sound)
                throw failure(Msg::optionRepeated, {"--volume a:" + std::to_string(sound)});
        volumes.each_.emplace_back(sound, decibels);
    }
    return volumes;
}

SoundTarget parseTarget(const std::string& text) {
    std::vector<std::string> known;
    for (const auto& row : kTargets) {
        known.emplace_back(row.mode);
        if (text == row.mode) return {row.mode, row.level};
    }
    if (text == "true") return {kTargets[0].mode, kTargets[0].level};
    const size_t colon = text.find(':');
    const std::string mode = colon == std::string::npos ? kTargets[0].mode : text.substr(0, colon);
    const std::string level = colon == std::string::npos ? text : text.substr(colon + 1);
    for (const auto& row : kTargets) {
        if (mode == row.mode) return {mode, parseDecimal(level, kLeastTarget, kMostTarget, "--normalize")};
    }
    throw failure(Msg::nameUnknown, {"--normalize", "mode", mode, suggestion(mode, known), joined(known)});
}

MediaTime parseDelay(const std::string& text, const std::optional<QvFramerate>& rate) {
    const bool earlier = text.starts_with('-');
    const MediaTime time = parseTime(earlier ? text.substr(1) : text, rate, "--delay");
    if (time.seconds() > kMostDelay) throw failure(Msg::delayLong, {text});
    return earlier ? MediaTime() - time : time;
}

AnyDict volumeState(double decibels) {
    const auto filter = filterNamed("avol");
    setChecked(*filter, "precision", kFineGain, "--volume");
    setChecked(*filter, "volume", asStored(decibels), "--volume");
    return stateOf(*filter);
}

// Fractions of a gain have 16 bits, of which a large step down would leave few; a large step up is refused.
std::vector<AnyDict> gainStates(double decibels) {
    constexpr double mostAtOnce = 24;  // dB, to within 0.002 dB
    const double steps = std::ceil(std::abs(decibels) / mostAtOnce);
    if (steps < 1) return {};
    return std::vector<AnyDict>(static_cast<size_t>(steps), volumeState(decibels / steps));
}

AnyDict delayState(const MediaTime& delay) {
    const auto filter = filterNamed("adelay");
    setChecked(*filter, "delay", static_cast<int>(std::lround(delay.seconds() * 1000)), "--delay");
    return stateOf(*filter);
}

AnyDict normalizerState(const SoundTarget& target) {
    const auto filter = filterNamed("normalizer");
    setChecked(*filter, "mode", target.mode.c_str(), "--normalize");
    setChecked(*filter, "target", target.level, "--normalize");
    return stateOf(*filter);
}

// Where the two overlap they meet at the level that both have there.
AnyDict soundFadeState(const SoundFade& fade, int channels) {
    constexpr double whole = 100;  // percent
    AnyVector points;
    const auto add = [&](double time, double level) {
        points.append(Any(AnyDict("time", asStored(time), "volume", static_cast<int>(std::lround(level)))));
    };
    const double both = fade.in + fade.out;
    const bool meet = both > fade.length;
    if (fade.in > 0) add(0, 0);
    if (meet) add(fade.in * fade.length / both, whole * fade.length / both);
    if (!meet && fade.in > 0) add(fade.in, whole);
    if (!meet && fade.out > 0) add(fade.length - fade.out, whole);
    if (fade.out > 0) add(fade.length, 0);
    const auto filter = filterNamed("audiolevel");
    for (int channel = 0; channel < channels && !points.empty(); ++channel)
        setChecked(*filter, "volume_list_" + std::to_string(channel), Any(points), "--fade");
    return stateOf(*filter);
}
