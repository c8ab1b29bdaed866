#include "builtin/sound/format/resampler.h"

#include <algorithm>
#include <cmath>
#include <numbers>

#include "builtin/sound/format/resamplerows.h"
#include "core/arch/qvassert.h"

namespace snd {

namespace {

constexpr int side = 512;  // length of the sinc on each side, in phases
constexpr double beta = 9.0;
constexpr double rolloff = 0.93;
constexpr double one = 16384;  // of a tap

static_assert(side * 2 == Resampler::phases * Resampler::taps);

// The modified Bessel function of the first kind and order 0.
double besselI0(double x) {
    double sum = 1, term = 1;
    for (int k = 1; term >= 1e-21 * sum; ++k) {
        term *= x / 2 / k * (x / 2 / k);
        sum += term;
    }
    return sum;
}

// The right half of the sinc, from its middle on.
std::vector<double> makeSinc(double cutoff) {
    std::vector<double> sinc(side + 1);
    sinc[0] = std::floor(cutoff * one + 0.1);
    const double atMiddle = besselI0(beta);
    for (int i = 1; i < side; ++i) {
        const double place = static_cast<double>(i) / (side - 1);
        const double window = besselI0(beta * std::sqrt(1 - place * place)) / atMiddle;
        const double x = i * std::numbers::pi / Resampler::phases;
        sinc[static_cast<size_t>(i)] = std::round(std::sin(x * cutoff) / x * window * one);
    }
    return sinc;  // the last one stays 0: it is reached by the last tap of phase 0 only
}

std::vector<double> makeTable(double cutoff) {
    const auto sinc = makeSinc(cutoff);
    std::vector<double> table;
    for (int phase = 0; phase < Resampler::phases; ++phase)
        for (int tap = 0; tap < Resampler::taps; ++tap) {
            const int place = (tap - Resampler::leftReach) * Resampler::phases - phase;
            table.push_back(sinc[static_cast<size_t>(std::abs(place))]);
        }
    return table;
}

// The first step leads to input position 0 and phase 0, with the accumulator at half the modulus.
RateWalk makeWalk(int inRate, int outRate) {
    const int64_t step = int64_t{outRate - inRate} * Resampler::phases;
    RateWalk walk;
    walk.modulus = outRate;
    walk.wholePhases = static_cast<int>(-(step / outRate));
    walk.rest = static_cast<int>(step % outRate);
    walk.phase = -walk.wholePhases;
    walk.accumulator = outRate / 2 - walk.rest;
    return walk;
}

}  // namespace

Resampler::Resampler(int inChannels, int outChannels, int inRate, int outRate)
    : inChannels_(inChannels), outChannels_(outChannels), inRate_(inRate), outRate_(outRate) {
    QV_ASSERT(inRate >= 1 && outRate >= 1 && inRate <= maxRate && outRate <= maxRate && inRate != outRate);
    QV_ASSERT(inChannels >= 1 && (inChannels == outChannels || inChannels + outChannels == 3));
    table_ = makeTable(outRate < inRate ? rolloff * outRate / inRate : 1.0);
    for (const double tap : table_) doubled_.insert(doubled_.end(), 2, tap);
    walk_ = makeWalk(inRate, outRate);
}

long long RateNeed::inputFor(long long n) const {
    return (n * outRate - (outRate - inRate) * (n - 1)) / outRate + Resampler::taps;
}

// After large steps the last output sample lies further on than inputFor counts. A view begins at most
// leftReach samples before the latest position, and a position is rounded to a phase.
long long RateNeed::viewFor(long long n) const {
    constexpr int rounding = 3;
    constexpr int around = Resampler::leftReach + Resampler::rightReach + rounding;
    return std::max(inputFor(n) + Resampler::taps, n * inRate / outRate + around);
}

void Resampler::makeOne(const double* view, long long count, int32_t* out) const {
    const long long start = walk_.index - leftReach;
    const auto first = std::max(0LL, -start), last = std::min<long long>(taps, count - start);
    const double* tap = &table_[static_cast<size_t>(walk_.phase) * taps];
    const auto sumOf = [&](int channel) {
        double sum = 0;
        for (long long k = first; k < last; ++k) sum += tap[k] * view[(start + k) * inChannels_ + channel];
        return sum;
    };
    if (inChannels_ > outChannels_) {
        out[0] = rounded<15>(sumOf(0) + sumOf(1));
        return;
    }
    for (int c = 0; c < outChannels_; ++c) out[c] = rounded<14>(sumOf(std::min(c, inChannels_ - 1)));
}

void Resampler::make(const double* view, long long count, int32_t* out, int n) {
    const RateTaps taps16{table_.data(), doubled_.data()};
    const RateRun run{view, leftReach, count - rightReach, inChannels_, outChannels_};
    for (int done = 0; done < n;) {
        done += makeInside(run, taps16, walk_, out + ptrdiff_t{done} * outChannels_, n - done);
        if (done == n) return;
        walk_.advance();
        makeOne(view, count, out + ptrdiff_t{done++} * outChannels_);
    }
}

int Resampler::makeAll(const double* view, long long count, int32_t* out, int n) {
    RateWalk ahead = walk_;
    int usable = 0;
    for (ahead.advance(); usable < n && ahead.index < count; ahead.advance()) ++usable;
    make(view, count, out, usable);
    return usable;
}

long long Resampler::consume() {
    const long long consumed = std::max<long long>(walk_.index - leftReach, 0);
    walk_.index -= consumed;
    return consumed;
}

}  // namespace snd
