#include "tarsel/presets/ranges.h"

#include <algorithm>
#include <vector>

#include "tarsel/presets/outputpreset.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// A range and whose it is.
struct Range {
    Any range;
    std::string owner;
};

// That of the preset, and that of the encoder: a value has to be in both.
std::vector<Range> rangesOf(const QvPreset* preset, const QvCodec& encoder, const char* name) {
    std::vector<Range> ranges;
    if (const auto meta = preset ? preset->presetMeta() : std::nullopt; meta && meta->isSet(name))
        ranges.push_back({meta->get(name), "the preset " + inQuotes(preset->name())});
    if (isRawEncoder(encoder)) return ranges;
    try {
        ranges.push_back({encoder.getParam(name), std::string("the encoder '") + encoder.name() + "'"});
    } catch (const QvParamException&) {
        // It names none.
    }
    return ranges;
}

[[noreturn]] void refuse(const char* option, const std::string& value, const Range& range,
                         const std::string& values) {
    throw failure(Msg::presetRange, {std::string(option) + " " + value, range.owner, values});
}

std::string sizeText(int width, int height) { return std::to_string(width) + "x" + std::to_string(height); }

void checkBounds(const Range& range, int width, int height) {
    const AnyDict& bounds = range.range.asDict();
    const int wmin = bounds.getInt32("wmin", 1), wmax = bounds.getInt32("wmax", width);
    const int hmin = bounds.getInt32("hmin", 1), hmax = bounds.getInt32("hmax", height);
    if (width < wmin || width > wmax || height < hmin || height > hmax)
        refuse("--size", sizeText(width, height), range,
               sizeText(wmin, hmin) + " to " + sizeText(wmax, hmax));
}

void checkSize(const Range& range, int width, int height) {
    if (range.range.isDict()) return checkBounds(range, width, height);
    if (!range.range.isVector()) return;
    std::vector<std::string> sizes;
    for (const Any& size : range.range.asVector()) {
        if (!size.isDict()) continue;
        const int w = size.asDict().getInt32("w"), h = size.asDict().getInt32("h");
        if (w == width && h == height) return;
        sizes.push_back(sizeText(w, h));
    }
    if (!sizes.empty()) refuse("--size", sizeText(width, height), range, joined(sizes));
}

void checkRate(const Range& range, const QvFramerate& rate) {
    if (!range.range.isVector() || range.range.asVector().empty()) return;
    std::vector<std::string> rates;
    for (const Any& one : range.range.asVector()) {
        if (!one.isFramerate()) continue;
        const QvFramerate& offered = one.asFramerate();
        const bool sameScan = (offered.interlaced() != 0) == (rate.interlaced() != 0);
        if (sameScan && formatRate(QvFramerate(offered.rate())) == formatRate(QvFramerate(rate.rate())))
            return;
        rates.push_back(formatRate(offered));
    }
    if (!rates.empty()) refuse("--rate", formatRate(rate), range, joined(rates));
}

void checkNumber(const char* option, const Range& range, int value) {
    if (!range.range.isVector()) return;
    std::vector<std::string> numbers;
    for (const Any& one : range.range.asVector()) {
        if (!one.isInt()) continue;
        if (one.toInt32() == value) return;
        numbers.push_back(std::to_string(one.toInt32()));
    }
    if (!numbers.empty()) refuse(option, std::to_string(value), range, joined(numbers));
}

}  // namespace

void checkPictureRanges(const QvPreset* preset, const QvCodec& encoder, int width, int height,
                        const QvFramerate& rate) {
    for (const Range& range : rangesOf(preset, encoder, "sizeRange")) checkSize(range, width, height);
    for (const Range& range : rangesOf(preset, encoder, "framerateRange")) checkRate(range, rate);
}

void checkSoundRanges(const QvPreset* preset, const QvCodec& encoder, int samplerate, int channels,
                      int bits) {
    const struct {
        const char *option, *range;
        int value;
    } rows[] = {{"--samplerate", "samplerateRange", samplerate},
                {"--channels", "channelsRange", channels},
                {"--bits", "bitsPerSampleRange", bits}};
    for (const auto& row : rows)
        for (const Range& range : rangesOf(preset, encoder, row.range))
            checkNumber(row.option, range, row.value);
}
