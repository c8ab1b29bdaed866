#include "tarsel/presets/encoderoptions.h"

#include <algorithm>
#include <charconv>
#include <climits>

#include "tarsel/presets/outputpreset.h"
#include "tarsel/source/setting.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

Any ask(const QvCodec& encoder, const char* name) {
    try {
        return encoder.getParam(name);
    } catch (const QvParamException&) {  // not one of its parameters
        return Any();
    }
}

std::string shortRate(long long bits) {
    if (bits % 1000000 == 0) return std::to_string(bits / 1000000) + "M";
    return bits % 1000 == 0 ? std::to_string(bits / 1000) + "k" : std::to_string(bits);
}

// The first range of a type that the encoder offers, in bits a second; empty for none.
std::vector<long long> rangeOf(const QvCodec& encoder, int type) {
    std::vector<long long> range;
    const Any all = ask(encoder, "bitrateRange");
    if (!all.isVector()) return range;
    for (const Any& one : all.asVector()) {
        if (!one.isDict() || one.asDict().getInt32("type", -1) != type) continue;
        const AnyVector values = one.asDict().getVector("range", AnyVector());
        for (const Any& value : values)
            if (value.isInt() || value.isDouble())
                range.push_back(value.isInt() ? value.toInt64() : static_cast<long long>(value.asDouble()));
        if (!range.empty()) break;
    }
    return range;
}

// A picture's range has two bounds; a sound's lists the rates that there are.
bool takes(const std::vector<long long>& range, int bits, bool listed) {
    if (range.empty()) return true;
    if (listed) return std::find(range.begin(), range.end(), bits) != range.end();
    return bits >= range.front() && bits <= range.back();
}

std::string rangeText(const std::vector<long long>& range, bool listed) {
    if (!listed) return shortRate(range.front()) + " to " + shortRate(range.back());
    std::vector<std::string> all;
    for (const long long bits : range) all.push_back(shortRate(bits));
    return joined(all);
}

void setBitrate(QvEncoder& encoder, int type, const std::string& text, const std::string& option) {
    const int bits = parseBitrate(text, option);
    const bool listed = type == qvAudioStream;
    const auto variable = listed ? std::vector<long long>() : rangeOf(encoder, QvBitrate::vbr);
    const bool isVariable = !variable.empty();
    const std::vector<long long> range = isVariable ? variable : rangeOf(encoder, QvBitrate::cbr);
    if (!takes(range, bits, listed))
        throw failure(Msg::presetRange,
                      {option + " " + text, std::string("the encoder '") + encoder.name() + "'",
                       rangeText(range, listed)});
    const QvBitrate rate(isVariable ? QvBitrate::vbr : QvBitrate::cbr, bits);
    setChecked(encoder, "bitrate", Any(rate), option);
}

// What its format decides of the rates of sound comes later, see setSoundRate.
bool isSoundRate(const std::string& key) { return key == "bitrate" || key == "aBitrate"; }

void setTwoPass(QvEncoder& encoder) {
    if (!ask(encoder, "twoPassPossible").isTrue()) throw failure(Msg::encoderNoTwoPass, {encoder.name()});
    setChecked(encoder, "twoPass", 1, "--two-pass");
}

}  // namespace

std::string EncoderOptions::given(int type) const {
    if (type == qvAudioStream)
        return !audioBitrate.empty() ? "--audio-bitrate" : !audio.empty() ? "--acodec" : "";
    if (!crf.empty()) return "--crf";
    if (!bitrate.empty()) return "--bitrate";
    return twoPass ? "--two-pass" : !video.empty() ? "--vcodec" : "";
}

std::string EncoderOptions::text(int type) const {
    const bool isVideo = type == qvVideoStream;
    std::vector<std::string> parts;
    const std::string& rate = isVideo ? bitrate : audioBitrate;
    if (isVideo && !crf.empty()) parts.push_back("crf " + crf);
    if (!rate.empty()) parts.push_back("bitrate " + rate);
    for (const auto& [key, value] : isVideo ? video : audio) parts.push_back(key + " " + inQuotes(value));
    if (isVideo && twoPass) parts.emplace_back("two passes");
    return joined(parts);
}

bool EncoderOptions::sets(std::string_view name) const {
    return std::any_of(video.begin(), video.end(), [name](const auto& set) { return set.first == name; });
}

void EncoderOptions::check() const {
    if (!crf.empty() && !bitrate.empty()) throw failure(Msg::optionsExclude, {"--crf", "--bitrate"});
    if (!crf.empty() && twoPass) throw failure(Msg::optionsExclude, {"--crf", "--two-pass"});
}

int parseBitrate(const std::string& text, const std::string& option) {
    double number = 0;
    const char* const last = text.data() + text.size();
    const auto [end, error] = std::from_chars(text.data(), last, number, std::chars_format::fixed);
    const double unit = end == last                                       ? 1
                        : end + 1 == last && (*end == 'k' || *end == 'K') ? 1e3
                        : end + 1 == last && (*end == 'm' || *end == 'M') ? 1e6
                                                                          : 0;
    const double bits = number * unit;
    if (error != std::errc() || !(bits >= 1) || bits > INT_MAX)
        throw failure(Msg::bitrateWrong, {option, text});
    return static_cast<int>(bits + 0.5);
}

void setEncoder(QvEncoder& encoder, int type, const EncoderOptions& options, const std::string& output) {
    const std::string first = options.given(type);
    if (first.empty()) return;
    const bool video = type == qvVideoStream;
    if (isRawEncoder(encoder) && first != (video ? "--vcodec" : "--acodec"))
        throw failure(Msg::encoderRaw, {first, output});
    // It decides what the others may be.
    for (const auto& [key, value] : options.video)
        if (video && key == "standard")
            setGuessed(encoder, key, value, std::string("--vcodec ") + encoder.name());
    if (video && !options.crf.empty()) setGuessed(encoder, "crf", options.crf, "--crf");
    if (video && !options.bitrate.empty()) setBitrate(encoder, type, options.bitrate, "--bitrate");
    for (const auto& [key, value] : video ? options.video : options.audio)
        if (video || !isSoundRate(key))
            setGuessed(encoder, key, value, std::string(video ? "--vcodec " : "--acodec ") + encoder.name());
    if (video && options.twoPass) setTwoPass(encoder);
}

void setSoundRate(QvEncoder& encoder, const EncoderOptions& options) {
    if (!options.audioBitrate.empty())
        setBitrate(encoder, qvAudioStream, options.audioBitrate, "--audio-bitrate");
    for (const auto& [key, value] : options.audio)
        if (isSoundRate(key)) setGuessed(encoder, key, value, std::string("--acodec ") + encoder.name());
}

void checkQuality(const QvEncoder& encoder) {
    const Any quality = ask(encoder, "crf"), rate = ask(encoder, "vBitrate");
    if (quality.isFloat() && quality.toDouble() < 0 && rate.isFloat() && rate.toDouble() <= 0)
        throw failure(Msg::encoderNoQuality, {encoder.name()});
}
