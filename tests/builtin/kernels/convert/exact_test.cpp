// Pictures against a run of the same filters in doubles, over both directions at once.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <numbers>
#include <vector>

#include "builtin/kernels/scale/axis.h"
#include "core/filter/srscaler.h"
#include "core/measure/fourcc.h"

namespace {

struct Size {
    int w, h;
};

// Planes of doubles, whose samples are code values.
struct Plane {
    Size size;
    std::vector<double> at;
    explicit Plane(Size s) : size(s), at(static_cast<size_t>(s.w) * static_cast<size_t>(s.h)) {}
    double& operator()(int x, int y) { return at[static_cast<size_t>(y * size.w + x)]; }
    double operator()(int x, int y) const {
        return at[static_cast<size_t>(std::clamp(y, 0, size.h - 1) * size.w + std::clamp(x, 0, size.w - 1))];
    }
};

// In 1/256, between the centres of the outermost source samples.
struct Span {
    int first, last;
};
constexpr Span whole(int n) { return {0, (n - 1) * 256}; }

// Where target samples lie in the source.
struct Positions {
    double first, step;
    Positions(Span span, int n) {
        const int t = (std::abs(span.last - span.first) + n + 256) / (2 * n);
        const int shift = span.last > span.first ? t - 128 : 128 - t;
        first = (span.first + shift) / 256.0;
        step = n == 1 ? 1 : (span.last - span.first - 2 * shift) / 256.0 / (n - 1);
    }
    double at(int i, int source) const { return std::clamp(first + i * step, 0.0, source - 1.0); }
    // Every target sample is a source sample.
    bool copies() const { return step == 1 && first == std::floor(first); }
};

struct Tap {
    int at;
    double weight;
};

double catmullRom(double x) {
    x = std::abs(x);
    if (x >= 2) return 0;
    return x < 1 ? 1 - x * x * (2.5 - 1.5 * x) : 2 - x * (4 - x * (2.5 - 0.5 * x));
}

std::vector<Tap> tapsOf(unsigned kind, const Positions& positions, double position) {
    if (kind == QvScale::nearest || positions.copies())
        return {{static_cast<int>(std::ceil(position - 0.5)), 1}};
    const double step = std::abs(positions.step);
    const int base = static_cast<int>(std::floor(position));
    std::vector<Tap> taps;
    if (kind == QvScale::high) {
        const auto phases = srk::sincPhases(1 / step);
        const auto& phase = phases[static_cast<size_t>(std::lround((position - base) * 8))];
        for (int t = 0; t < 8; ++t) taps.push_back({base - 3 + t, phase[static_cast<size_t>(t)] / 128});
        return taps;
    }
    const double stretch = std::max(step, 1.0);
    double sum = 0;
    for (int at = base - static_cast<int>(2 * stretch) - 1; at <= base + 2 * stretch + 2; ++at) {
        const double weight = catmullRom((at - position) / stretch);
        if (weight != 0) taps.push_back({at, weight});
        sum += weight;
    }
    for (auto& tap : taps) tap.weight /= sum;
    return taps;
}

// Weights of bytes are whole numbers with a sum of 128: the largest remainders are rounded up.
void toWhole(std::vector<Tap>& taps) {
    int left = 128;
    for (auto& tap : taps) left -= static_cast<int>(std::floor(tap.weight * 128));
    const auto remainder = [](const Tap& tap) { return tap.weight * 128 - std::floor(tap.weight * 128); };
    std::vector<Tap> sorted = taps;
    std::stable_sort(sorted.begin(), sorted.end(),
                     [&](const Tap& a, const Tap& b) { return remainder(a) > remainder(b); });
    for (auto& tap : taps) {
        const auto rank =
            std::find_if(sorted.begin(), sorted.end(), [&](const Tap& t) { return t.at == tap.at; });
        tap.weight = (std::floor(tap.weight * 128) + (rank - sorted.begin() < left)) / 128;
    }
}

Plane scaled(const Plane& from, Size to, unsigned kind, Span across, Span down, bool whole) {
    Plane out(to);
    const auto taps = [&](Span span, int i, int n, int source) {
        const Positions positions(span, n);
        auto made = tapsOf(kind, positions, positions.at(i, source));
        if (whole) toWhole(made);
        return made;
    };
    for (int y = 0; y < to.h; ++y) {
        const auto rows = taps(down, y, to.h, from.size.h);
        for (int x = 0; x < to.w; ++x)
            for (const auto& column : taps(across, x, to.w, from.size.w))
                for (const auto& row : rows)
                    out(x, y) += from(column.at, row.at) * column.weight * row.weight;
    }
    return out;
}

// 8 or 16 bits of luma through the scaler.
template <class S>
Plane through(const Plane& from, Size to, unsigned flags, const int* rectangles) {
    const unsigned fourcc = sizeof(S) == 1 ? qvFourcc("GRAY") : qvFourcc("Y16 ");
    const auto pack = [](int w) { return (w + 3) & ~3; };
    std::vector<S> in(static_cast<size_t>(pack(from.size.w) * from.size.h)),
        out(static_cast<size_t>(pack(to.w) * to.h));
    for (int y = 0; y < from.size.h; ++y)
        for (int x = 0; x < from.size.w; ++x)
            in[static_cast<size_t>(y * pack(from.size.w) + x)] = static_cast<S>(from(x, y));
    EXPECT_EQ(
        SRScaler(rectangles ? QvScale::cropSource : 0, fourcc, in.data(),
                 pack(from.size.w) * static_cast<int>(sizeof(S)), from.size.w, from.size.h, fourcc,
                 out.data(), pack(to.w) * static_cast<int>(sizeof(S)), to.w, to.h, 0, flags, rectangles),
        1);
    Plane result(to);
    for (int y = 0; y < to.h; ++y)
        for (int x = 0; x < to.w; ++x) result(x, y) = out[static_cast<size_t>(y * pack(to.w) + x)];
    return result;
}

// Rings that grow narrower up to `highest` cycles a sample at the nearer edge.
Plane zonePlate(Size size, double highest, double most) {
    Plane plane(size);
    const double cx = (size.w - 1) / 2.0, cy = (size.h - 1) / 2.0, r = std::min(cx, cy);
    for (int y = 0; y < size.h; ++y)
        for (int x = 0; x < size.w; ++x) {
            const double d = (x - cx) * (x - cx) + (y - cy) * (y - cy);
            plane(x, y) =
                std::floor(most / 2 * (1 + 0.9 * std::cos(std::numbers::pi * highest / r * d)) + 0.5);
        }
    return plane;
}

double worstOf(const Plane& a, const Plane& b, double most) {
    double worst = 0;
    for (size_t i = 0; i < a.at.size(); ++i)
        worst = std::max(worst, std::abs(a.at[i] - std::clamp(b.at[i], 0.0, most)));
    return worst;
}

constexpr unsigned kinds[] = {QvScale::nearest, QvScale::high, QvScale::standard};

struct Case {
    Size from, to;
    Span across, down;
};
const Case cases[] = {
    {{61, 47}, {33, 29}, whole(61), whole(47)},
    {{61, 47}, {97, 121}, whole(61), whole(47)},
    {{64, 48}, {64, 31}, whole(64), whole(48)},
    {{90, 61}, {47, 183}, whole(90), whole(61)},
    {{61, 47}, {43, 32}, {5 * 256 + 77, 50 * 256 + 13}, {-3 * 256, 40 * 256 + 128}},
    {{61, 47}, {80, 60}, {50 * 256 + 13, 5 * 256 + 77}, {3 * 256 + 1, 40 * 256}},
    {{37, 35}, {5, 4}, whole(37), whole(35)},
    {{5, 3}, {64, 50}, whole(5), whole(3)},
};

}  // namespace

TEST(Exactness, EveryFilterIsWithinACodeValueOfDoubles) {
    for (const auto& c : cases)
        for (const unsigned kind : kinds) {
            const int rectangles[8] = {c.across.first, c.down.first, c.across.last, c.down.last, 0, 0, 0, 0};
            const Plane bytes = zonePlate(c.from, 0.3, 255), words = zonePlate(c.from, 0.5, 65535);
            EXPECT_LE(worstOf(through<uint8_t>(bytes, c.to, kind, rectangles),
                              scaled(bytes, c.to, kind, c.across, c.down, true), 255),
                      0.6)
                << c.from.w << 'x' << c.from.h << " to " << c.to.w << 'x' << c.to.h << " kind " << kind;
            EXPECT_LE(worstOf(through<uint16_t>(words, c.to, kind, rectangles),
                              scaled(words, c.to, kind, c.across, c.down, false), 65535),
                      1)
                << c.from.w << 'x' << c.from.h << " to " << c.to.w << 'x' << c.to.h << " kind " << kind;
        }
}

TEST(Exactness, WhatIsSymmetricStaysSoAtAnyRatio) {
    // Half a pixel of drift would move the rings by hundreds of code values.
    constexpr Size from = {64, 48};
    const Plane rings = zonePlate(from, 0.25, 65535);
    for (const unsigned kind : {QvScale::high, QvScale::standard})
        for (int w = 20; w < 200; w += 7) {
            const Size to = {w, w * 3 / 4 + w % 3};
            const Plane out = through<uint16_t>(rings, to, kind, nullptr);
            double worst = 0;
            for (int y = 0; y < to.h; ++y)
                for (int x = 0; x < to.w; ++x)
                    worst = std::max(worst, std::abs(out(x, y) - out(to.w - 1 - x, to.h - 1 - y)));
            // The designed filter jumps by an eighth of a pixel between two of its phases.
            EXPECT_LE(worst, kind == QvScale::high ? 6000 : 2) << to.w << 'x' << to.h << " kind " << kind;
        }
}
