#include "plugins/av/picture/picturetimes.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <cstdlib>

#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

constexpr Rational table[] = {{24000, 1001}, {24, 1}, {25, 1},       {30000, 1001},
                              {30, 1},       {50, 1}, {60000, 1001}, {60, 1}};

double number(Rational r) { return static_cast<double>(r.num) / static_cast<double>(r.den); }

// Times are rounded to units, the first one too: a unit of difference is no variation where units are fine.
// Where a picture lasts for a few units only, half a unit has to do.
double slack(double period) { return period >= 4 ? 1.0 : 0.5; }

bool isConstant(const std::vector<TimedPicture>& pictures, Rational base, Rational rate) {
    const double period = 1.0 / (number(rate) * number(base));  // in units
    const double allowed = slack(period) + 1e-6;
    const std::int64_t first = pictures.front().time;
    for (std::size_t i = 1; i < pictures.size(); ++i)
        if (std::fabs(static_cast<double>(pictures[i].time - first) - static_cast<double>(i) * period) >
            allowed)
            return false;
    return true;
}

bool isRate(Rational r) {
    return r.num > 0 && r.den > 0 && r.num <= INT_MAX && r.den <= INT_MAX && number(r) <= 1000 &&
           number(r) > 1e-3;
}

Rational average(const std::vector<TimedPicture>& pictures, Rational base) {
    const auto count = static_cast<std::int64_t>(pictures.size()) - 1;
    const std::int64_t length = pictures.back().time - pictures.front().time;
    if (count <= 0 || length <= 0 || length > INT64_MAX / base.num) return {0, 1};
    // Times of more than 2^30 units can't all be exact to a unit of such a rate anyway.
    int num = 0, den = 1;
    av_reduce(&num, &den, count * base.den, length * base.num, 1 << 24);
    return {num, den};
}

// The simplest one that all times fit to, among the average with ever larger denominators.
Rational fitted(const std::vector<TimedPicture>& pictures, Rational base) {
    const Rational mean = average(pictures, base);
    if (!isRate(mean)) return {0, 1};
    for (int limit = 10; limit <= 100'000'000; limit *= 10) {
        int num = 0, den = 1;
        av_reduce(&num, &den, mean.num, mean.den, limit);
        if (isRate({num, den}) && isConstant(pictures, base, {num, den})) return {num, den};
    }
    return {0, 1};
}

Rational constantRate(const std::vector<TimedPicture>& pictures, Rational base,
                      const std::vector<Rational>& hints) {
    if (pictures.size() < 2) {
        for (const Rational& hint : hints)
            if (isRate(hint) && number(hint) <= 120) return hint;
        return {25, 1};
    }
    const double mean = number(average(pictures, base));
    if (mean <= 0) return {0, 1};
    const auto fits = [&](Rational rate) {
        return isRate(rate) && std::fabs(number(rate) / mean - 1) < 0.5 && isConstant(pictures, base, rate);
    };
    // A short film fits several; what is stated, or usual, is meant.
    for (const Rational& hint : hints)
        if (fits(hint)) return hint;
    Rational best{0, 1};
    for (const Rational& usual : table)
        if (fits(usual) &&
            (best.num == 0 || std::fabs(number(usual) - mean) < std::fabs(number(best) - mean)))
            best = usual;
    return best.num > 0 ? best : fitted(pictures, base);
}

Rational nearestUsual(double mean) {
    return *std::min_element(std::begin(table), std::end(table), [mean](Rational a, Rational b) {
        return std::fabs(number(a) - mean) < std::fabs(number(b) - mean);
    });
}

// Of a picture only the time of decoding is known: it is presented when the next picture is decoded that
// later ones refer to. One that is presented as soon as it is decoded is none of these.
std::int64_t presentation(const std::vector<IndexedPacket>& packets, std::size_t of, std::int64_t duration) {
    constexpr std::size_t mostReordered = 32;
    std::int64_t latest = packets[of].dts;
    const std::size_t end = std::min(packets.size(), of + mostReordered);
    for (std::size_t i = of + 1; i < end; ++i) {
        if (packets[i].dts == AV_NOPTS_VALUE) continue;
        latest = packets[i].dts;
        if (packets[i].pts != packets[i].dts) return latest;
    }
    return std::clamp(latest, -limits::farthest, limits::farthest) + duration;
}

// Of each frame at that rate, the picture that it shows: the one before it where none is of its time. Empty
// if a picture lies between frames.
std::vector<std::uint32_t> shownWithHoles(const std::vector<TimedPicture>& pictures, Rational base,
                                          Rational rate) {
    const double period = 1.0 / (number(rate) * number(base));
    const double length = static_cast<double>(pictures.back().time - pictures.front().time) / period;
    if (length >= limits::variableFrames) return {};
    std::vector<std::uint32_t> shown;
    shown.reserve(static_cast<std::size_t>(length) + 2);
    for (std::size_t i = 0; i < pictures.size(); ++i) {
        const double time = static_cast<double>(pictures[i].time - pictures.front().time);
        const double frame = std::round(time / period);
        if (std::fabs(time - frame * period) > slack(period) + 1e-6) return {};
        const auto at = static_cast<std::size_t>(frame);
        if (at < shown.size()) return {};
        shown.resize(at, static_cast<std::uint32_t>(i > 0 ? i - 1 : 0));
        shown.push_back(static_cast<std::uint32_t>(i));
    }
    return shown;
}

}  // namespace

std::vector<TimedPicture> presentedPictures(const std::vector<IndexedPacket>& packets,
                                            std::int64_t usualDuration, std::int64_t longestStep) {
    constexpr std::int64_t most = limits::farthest;
    std::vector<TimedPicture> pictures;
    pictures.reserve(packets.size());
    std::int64_t due = 0, expected = 0, shift = 0;
    for (std::size_t i = 0; i < packets.size(); ++i) {
        const IndexedPacket& packet = packets[i];
        const std::int64_t duration = packet.duration > 0 ? packet.duration : usualDuration;
        if (packet.dts != AV_NOPTS_VALUE) {
            const std::int64_t decoded = std::clamp(packet.dts, -most, most);
            if (i > 0 && std::llabs(decoded + shift - expected) > longestStep)
                shift = std::clamp(expected - decoded, -2 * most, 2 * most);
            expected = decoded + shift + duration;
        }
        std::int64_t time = packet.pts;
        if (time == AV_NOPTS_VALUE && packet.dts != AV_NOPTS_VALUE) time = presentation(packets, i, duration);
        time = time != AV_NOPTS_VALUE ? std::clamp(time, -most, most) + shift : due;
        due = time + duration;
        if (!(packet.flags & AV_PKT_FLAG_DISCARD)) pictures.push_back({time, i});
    }
    std::stable_sort(pictures.begin(), pictures.end(),
                     [](const TimedPicture& a, const TimedPicture& b) { return a.time < b.time; });
    return pictures;
}

PicturePlan planPictures(const std::vector<TimedPicture>& pictures, Rational base,
                         const std::vector<Rational>& hints, std::int64_t lastDuration, bool holes) {
    PicturePlan plan;
    if (pictures.empty()) return plan;
    const Rational rate = constantRate(pictures, base, hints);
    if (rate.num > 0) {
        plan.rate = QvRatio(static_cast<int>(rate.num), static_cast<int>(rate.den));
        plan.frames = static_cast<int>(std::min<std::size_t>(pictures.size(), limits::frames));
        return plan;
    }
    for (const Rational& hint : hints) {
        if (!holes || !isRate(hint)) continue;
        plan.shown = shownWithHoles(pictures, base, hint);
        if (plan.shown.empty()) continue;
        plan.rate = QvRatio(static_cast<int>(hint.num), static_cast<int>(hint.den));
        plan.frames = static_cast<int>(plan.shown.size());
        return plan;
    }
    const std::int64_t first = pictures.front().time, length = pictures.back().time - first;
    const double seconds = static_cast<double>(length) * number(base);
    const double mean = seconds > 0 ? static_cast<double>(pictures.size() - 1) / seconds : 25.0;
    const Rational usual = nearestUsual(mean);
    plan.rate = QvRatio(static_cast<int>(usual.num), static_cast<int>(usual.den));
    plan.variable = true;
    const double period = 1.0 / (number(usual) * number(base));
    const double end = static_cast<double>(length + std::max<std::int64_t>(lastDuration, 0));
    const double frames =
        std::max(std::round(end / period), std::floor((static_cast<double>(length) - 0.5) / period) + 2);
    plan.frames = static_cast<int>(std::clamp(frames, 1.0, static_cast<double>(limits::variableFrames)));
    plan.shown.resize(static_cast<std::size_t>(plan.frames));
    std::size_t at = 0;
    for (std::size_t n = 0; n < plan.shown.size(); ++n) {
        const double latest = static_cast<double>(n) * period + slack(period);
        while (at + 1 < pictures.size() && static_cast<double>(pictures[at + 1].time - first) <= latest) ++at;
        plan.shown[n] = static_cast<std::uint32_t>(at);
    }
    return plan;
}

}  // namespace av
