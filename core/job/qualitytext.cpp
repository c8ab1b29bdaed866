#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <limits>

#include "core/job/qualitytext_p.h"

namespace {

constexpr int digits = 4;
constexpr std::size_t mostPlanes = 3;

// By the C locale, whatever the program's is.
std::string number(double value, const char* infinite) {
    if (std::isinf(value)) return value > 0 ? infinite : std::string("-") + infinite;
    if (std::isnan(value)) return "nan";
    std::array<char, 400> text;
    const auto end =
        std::to_chars(text.data(), text.data() + text.size(), value, std::chars_format::fixed, digits);
    return std::string(text.data(), end.ptr);
}

std::string jsonNumber(double value) { return std::isfinite(value) ? number(value, "") : "null"; }

bool isSsim(std::size_t index, std::size_t count) {
    return count % 2 == 0 && count <= 2 * mostPlanes && index >= count / 2;
}

std::string nameOf(std::size_t index, std::size_t count) {
    const std::size_t planes = count % 2 == 0 ? count / 2 : count;
    if (planes > mostPlanes) return "value" + std::to_string(index + 1);
    return std::string(isSsim(index, count) ? "ssim_" : "psnr_") + "yuv"[index % planes];
}

std::size_t mostValues(const std::vector<QualityFrame>& frames) {
    std::size_t most = 0;
    for (const QualityFrame& frame : frames) most = std::max(most, frame.values.size());
    return most;
}

// Of the frames that have this value.
double meanOf(const std::vector<QualityFrame>& frames, std::size_t index, std::size_t count) {
    const bool decibels = nameOf(index, count).starts_with("psnr");
    double sum = 0;
    std::size_t found = 0;
    for (const QualityFrame& frame : frames) {
        if (index >= frame.values.size()) continue;
        sum += decibels ? std::pow(10.0, -frame.values[index] / 10) : frame.values[index];
        ++found;
    }
    const double mean = sum / static_cast<double>(std::max<std::size_t>(found, 1));
    if (!decibels) return mean;
    return mean > 0 ? -10 * std::log10(mean) : std::numeric_limits<double>::infinity();
}

}  // namespace

std::string qvQualityLines(const std::vector<QualityFrame>& frames) {
    std::string text;
    for (std::size_t i = 0; i < frames.size(); ++i) {
        text += std::to_string(i) + '\t' + std::to_string(frames[i].bytes);
        for (const double value : frames[i].values) text += '\t' + number(value, "inf");
        text += '\n';
    }
    return text;
}

std::string qvQualityCsv(const std::vector<QualityFrame>& frames) {
    const std::size_t count = mostValues(frames);
    std::string text = "frame,bytes";
    for (std::size_t i = 0; i < count; ++i) text += ',' + nameOf(i, count);
    text += '\n';
    for (std::size_t i = 0; i < frames.size(); ++i) {
        text += std::to_string(i) + ',' + std::to_string(frames[i].bytes);
        for (std::size_t k = 0; k < count; ++k)
            text += ',' + (k < frames[i].values.size() ? number(frames[i].values[k], "inf") : std::string());
        text += '\n';
    }
    return text;
}

std::string qvQualityJson(const std::vector<QualityFrame>& frames) {
    const std::size_t count = mostValues(frames);
    std::string text = "{\"frames\":[";
    double bytes = 0;
    for (std::size_t i = 0; i < frames.size(); ++i) {
        bytes += frames[i].bytes;
        text += (i ? ",\n{\"frame\":" : "\n{\"frame\":") + std::to_string(i) +
                ",\"bytes\":" + std::to_string(frames[i].bytes);
        for (std::size_t k = 0; k < frames[i].values.size(); ++k)
            text += ",\"" + nameOf(k, count) + "\":" + jsonNumber(frames[i].values[k]);
        text += '}';
    }
    text += "],\n\"mean\":{\"bytes\":" +
            jsonNumber(bytes / static_cast<double>(std::max<std::size_t>(frames.size(), 1)));
    for (std::size_t k = 0; k < count; ++k)
        text += ",\"" + nameOf(k, count) + "\":" + jsonNumber(meanOf(frames, k, count));
    return text + "}}\n";
}
