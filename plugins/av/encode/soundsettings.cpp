#include "plugins/av/encode/soundsettings.h"

#include <algorithm>
#include <cstdlib>
#include <string_view>

#include "core/preset/qvprofile.h"
#include "plugins/av/encode/libraryoptions.h"

namespace av {

namespace {

using S = SoundSettings;
using C = const S&;
using Access = QvParamAccess<S>;

AnyVector vectorOf(std::span<const int> values, int factor = 1) {
    AnyVector all;
    for (const int value : values) all.append(value * factor);
    return all;
}

bool holds(std::span<const int> values, int value) {
    return std::find(values.begin(), values.end(), value) != values.end();
}

std::span<const int> kilobitsOf(C s) { return s.codec->kilobitsFor(s.samplerate, s.channels); }

int setKilobits(S& s, double wanted) {
    const int kilobits = wanted > 0 && wanted < 1e6 ? static_cast<int>(wanted) : 0;
    if (kilobits != wanted || !holds(kilobitsOf(s), kilobits)) return QvStatus::invalidParam;
    s.kilobits = kilobits;
    return QvStatus::ok;
}

int setBitrate(S& s, const Any& value) {
    if (!value.isBitrate()) return QvStatus::invalidParam;
    return setKilobits(s, value.asBitrate().target / 1000.0);
}

int setABitrate(S& s, const Any& value) {
    double wanted = 0;
    return qvparam::convert(value, wanted) ? setKilobits(s, wanted) : QvStatus::invalidParam;
}

int setRate(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || !holds(s.codec->rates, wanted)) return QvStatus::invalidParam;
    s.samplerate = wanted;
    return QvStatus::ok;
}

int setChannels(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || !holds(s.codec->channels, wanted)) return QvStatus::invalidParam;
    s.channels = wanted;
    return QvStatus::ok;
}

int setBits(S& s, const Any& value) {
    int wanted = 0;
    if (!qvparam::convert(value, wanted) || (wanted != 16 && wanted != 24)) return QvStatus::invalidParam;
    s.bits = wanted;
    return QvStatus::ok;
}

int setOptionText(S& s, const Any& value) {
    std::string wanted;
    const AVCodec* const library = s.codec->library();
    if (!qvparam::convert(value, wanted)) return QvStatus::invalidParam;
    // PCM has no library: it accepts an empty text only.
    if (!wanted.empty() && (!library || !checkOptions(*library, wanted).empty()))
        return QvStatus::invalidParam;
    s.options = wanted;
    return QvStatus::ok;
}

// Video CDs have the sample rate of audio CDs.
int setProfile(S& s, const Any& value) {
    if (!qvparam::convert(value, s.profile)) return QvStatus::invalidParam;
    const std::string_view symbol = qvProfileToSym(s.profile);
    if ((symbol == "VCD" || symbol == "SVCD") && holds(s.codec->rates, 44100)) s.samplerate = 44100;
    return QvStatus::ok;
}

void bitrateRange(C s, Any& value) {
    AnyDict row("type", static_cast<int>(QvBitrate::cbr));
    row.set("range", s.codec->kilobits.empty() ? AnyVector(static_cast<int>(s.bitsPerSecond()))
                                               : vectorOf(kilobitsOf(s), 1000));
    AnyVector all;
    all.append(row);
    value = all;
}

const QvParamRow<S> table[] = {
    {.name = "profile",
     .member = Access{setProfile, [](C s, Any& v) { v = s.profile; }},
     .help = "number of a preset",
     .type = Any::Int32},
    {.name = "samplerate",
     .member = Access{setRate, [](C s, Any& v) { v = s.samplerate; }},
     .flags = qvParamStored,
     .unit = "Hz",
     .type = Any::Int32},
    {.name = "channels",
     .member = Access{setChannels, [](C s, Any& v) { v = s.channels; }},
     .flags = qvParamStored,
     .type = Any::Int32},
    {.name = "bitsPerSample",
     .member = Access{setBits, [](C s, Any& v) { v = s.bits; }},
     .flags = qvParamStored,
     .help = "of the input samples: 16 or 24",
     .type = Any::Int32},
    {.name = "aBitrate",
     .member = Access{setABitrate, [](C s, Any& v) { v = static_cast<int>(s.bitsPerSecond() / 1000); }},
     .unit = "kbit/s",
     .type = Any::Int32},
    {.name = "bitrate",
     .member =
         Access{setBitrate,
                [](C s, Any& v) { v = QvBitrate(QvBitrate::cbr, static_cast<int>(s.bitsPerSecond())); }},
     .flags = qvParamStored,
     .type = Any::Bitrate},
    {"threads", &S::threads, qvParamStored, 0, 64, "", "", "threads of the codec; 0: one per core"},
    {.name = "avOptions",
     .member = Access{setOptionText, [](C s, Any& v) { v = Any(s.options.c_str()); }},
     .flags = qvParamStored,
     .help = "options of the library, name=value:name=value",
     .type = Any::String},
    {"framerate", {}, qvParamIgnored},
    {"type", {}, qvParamIgnored},
    {"pal", {}, qvParamIgnored},
    {"samplerateRange", Access{nullptr, [](C s, Any& v) { v = vectorOf(s.codec->rates); }}},
    {"channelsRange", Access{nullptr, [](C s, Any& v) { v = vectorOf(s.codec->channels); }}},
    {"bitsPerSampleRange", Access{nullptr, [](C, Any& v) { v = AnyVector(16, 24); }}},
    {"bitrateRange", Access{nullptr, bitrateRange}},
    {"aBitrateRange", Access{nullptr, [](C s, Any& v) { v = vectorOf(kilobitsOf(s)); }}},
    {"estimateSecKb",
     Access{nullptr, [](C s, Any& v) { v = Any(static_cast<float>(s.bitsPerSecond() / 8000)); }}},
    {"extension", Access{nullptr, [](C s, Any& v) { v = s.codec->extension; }}},
};

}  // namespace

double SoundSettings::bitsPerSecond() const {
    const auto all = kilobitsOf(*this);
    if (all.empty()) return 1.0 * samplerate * channels * bits;
    return 1000.0 * *std::min_element(all.begin(), all.end(), [this](int a, int b) {
               return std::abs(a - kilobits) < std::abs(b - kilobits);
           });
}

std::span<const QvParamRow<SoundSettings>> SoundSettings::rows() { return table; }

}  // namespace av
