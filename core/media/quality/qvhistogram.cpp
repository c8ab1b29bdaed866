#include "core/media/quality/qvhistogram.h"

#include <algorithm>
#include <cmath>

#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/media/quality/sampleview_p.h"
#include "core/media/qvframe.h"

namespace {

constexpr int wordShift = 6;  // of 16-bit samples 10 bits count
constexpr int waveRows = 256;

struct Range {
    int levels, lowest, highest;
};

Range rangeOf(const SampleView& view) {
    const int scale = view.bytes == 1 ? 1 : 4;
    const int levels = 256 * scale;
    switch (view.name) {
        case 'Y': return {levels, 16 * scale, 235 * scale};
        case 'U':
        case 'V': return {levels, 16 * scale, 240 * scale};
        default: return {levels, 0, levels - 1};
    }
}

int levelAt(const SampleView& view, const unsigned char* row, int x) {
    return view.bytes == 1 ? qvSampleAt<std::uint8_t>(row, view.step, x)
                           : qvSampleAt<std::uint16_t>(row, view.step, x) >> wordShift;
}

struct Colour {
    int b, g, r;  // 0 to 255
};

Colour colourOf(char name) {
    switch (name) {
        case 'R': return {96, 96, 255};
        case 'G': return {96, 255, 96};
        case 'B':
        case 'U': return {255, 144, 96};
        case 'V': return {144, 96, 255};
        default: return {255, 255, 255};
    }
}

void drawLine(QvFrame& out, int left, int width, int row) {
    constexpr unsigned char shade = 72;
    unsigned char* to = out.pixelPtr(left, row);
    for (int i = 0; i < 3 * width; ++i) to[i] = std::max(to[i], shade);
}

// Columns of `view` from pixel `left` on.
void drawWave(const SampleView& view, QvFrame& out, int left, int full) {
    const Range range = rangeOf(view);
    const Colour colour = colourOf(view.name);
    const auto columns = static_cast<std::size_t>(view.width);
    std::vector<int> counts(columns * waveRows);
    for (int y = 0; y < view.height; ++y) {
        const unsigned char* const row = view.row(y);
        for (int x = 0; x < view.width; ++x)
            ++counts[static_cast<std::size_t>(levelAt(view, row, x) * waveRows / range.levels) * columns +
                     static_cast<std::size_t>(x)];
    }
    drawLine(out, left, view.width, waveRows - 1 - range.lowest * waveRows / range.levels);
    drawLine(out, left, view.width, waveRows - 1 - range.highest * waveRows / range.levels);
    const int whole = full > 0 ? full : std::max(1, view.height / 10);
    for (int level = 0; level < waveRows; ++level) {
        unsigned char* to = out.pixelPtr(left, waveRows - 1 - level);
        for (int x = 0; x < view.width; ++x, to += 3) {
            const int count = counts[static_cast<std::size_t>(level) * columns + static_cast<std::size_t>(x)];
            if (count == 0) continue;
            // The root keeps single samples visible.
            const double weight = std::sqrt(std::min(1.0, static_cast<double>(count) / whole));
            const int part[] = {colour.b, colour.g, colour.r};
            for (int i = 0; i < 3; ++i)
                to[i] = std::max(to[i], static_cast<unsigned char>(std::lround(part[i] * weight)));
        }
    }
}

}  // namespace

int QvHistogram::Channel::min() const {
    const auto first = std::find_if(counts.begin(), counts.end(), [](long long n) { return n > 0; });
    return first == counts.end() ? -1 : static_cast<int>(first - counts.begin());
}

int QvHistogram::Channel::max() const {
    const auto last = std::find_if(counts.rbegin(), counts.rend(), [](long long n) { return n > 0; });
    return last == counts.rend() ? -1 : static_cast<int>(counts.rend() - last) - 1;
}

double QvHistogram::Channel::mean() const {
    double sum = 0;
    for (std::size_t i = 0; i < counts.size(); ++i)
        sum += static_cast<double>(i) * static_cast<double>(counts[i]);
    return samples > 0 ? sum / static_cast<double>(samples) : 0.0;
}

int QvHistogram::Channel::percentile(double part) const {
    if (samples == 0) return -1;
    const double wanted = std::clamp(part, 0.0, 1.0) * static_cast<double>(samples);
    double sum = 0;
    for (std::size_t i = 0; i < counts.size(); ++i) {
        sum += static_cast<double>(counts[i]);
        if (sum >= wanted && counts[i] > 0) return static_cast<int>(i);
    }
    return max();
}

double QvHistogram::Channel::share(long long count) const {
    return samples > 0 ? static_cast<double>(count) / static_cast<double>(samples) : 0.0;
}

const QvHistogram::Channel& QvHistogram::channel(int index) const {
    QV_ASSERT(index >= 0 && index < count_);
    return channels_[static_cast<std::size_t>(index)];
}

void QvHistogram::clear() {
    count_ = 0;
    channels_ = {};
}

int QvHistogram::add(const QvFrame& frame) {
    if (!frame.inited()) return QvStatus::invalidArgument;
    const SampleViews views = qvSampleViews(frame);
    if (views.count == 0) return QvStatus::notSupported;
    for (std::size_t i = 0; i < static_cast<std::size_t>(count_); ++i) {
        const bool same = count_ == views.count && channels_[i].name == views.view[i].name &&
                          static_cast<int>(channels_[i].counts.size()) == rangeOf(views.view[i]).levels;
        if (!same) return QvStatus::invalidArgument;
    }
    count_ = views.count;
    for (std::size_t i = 0; i < static_cast<std::size_t>(count_); ++i) {
        const SampleView& view = views.view[i];
        const Range range = rangeOf(view);
        Channel& channel = channels_[i];
        channel.name = view.name;
        channel.lowest = range.lowest;
        channel.highest = range.highest;
        channel.counts.resize(static_cast<std::size_t>(range.levels));
        for (int y = 0; y < view.height; ++y) {
            const unsigned char* const row = view.row(y);
            for (int x = 0; x < view.width; ++x)
                ++channel.counts[static_cast<std::size_t>(levelAt(view, row, x))];
        }
        channel.samples += static_cast<long long>(view.width) * view.height;
        channel.atFloor = channel.counts.front();
        channel.atCeiling = channel.counts.back();
        channel.below = channel.above = 0;
        for (int level = 0; level < range.levels; ++level) {
            if (level < range.lowest) channel.below += channel.counts[static_cast<std::size_t>(level)];
            if (level > range.highest) channel.above += channel.counts[static_cast<std::size_t>(level)];
        }
    }
    return QvStatus::ok;
}

int QvHistogram::waveform(const QvFrame& frame, QvFrame& out, int full) {
    if (!frame.inited()) return QvStatus::invalidArgument;
    const SampleViews views = qvSampleViews(frame);
    if (views.count == 0) return QvStatus::notSupported;
    int width = 0;
    for (int i = 0; i < views.count; ++i) width += views.view[static_cast<std::size_t>(i)].width;
    if (out.init(QvFourcc::BGR3, width, waveRows) != QvStatus::ok) return QvStatus::outOfMemory;
    out.setRGB(0, 0, 0);
    int left = 0;
    for (int i = 0; i < views.count; ++i) {
        const SampleView& view = views.view[static_cast<std::size_t>(i)];
        if (view.width > 0) drawWave(view, out, left, full);
        left += view.width;
    }
    return QvStatus::ok;
}
