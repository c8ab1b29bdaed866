#include "builtin/sound/effects/panning.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "builtin/creators.h"
#include "builtin/sound/soundvalues.h"
#include "core/measure/qvgeometry.h"

namespace {

// An input at or below this level, in percent, is no part of the mean.
constexpr double audible = 1e-8;

constexpr QvParamRow<CurveFilter::Settings> row(const char* name) {
    return {.name = name,
            .flags = qvParamByHand,
            .help =
                "where this input channel goes: points of \"out_ch\" (0 to 7), \"time\" in seconds and "
                "\"volume\" in percent",
            .type = Any::Vector};
}

constexpr QvParamRow<CurveFilter::Settings> rows[] = {
    row("panning_list_0"), row("panning_list_1"), row("panning_list_2"), row("panning_list_3"),
    row("panning_list_4"), row("panning_list_5"), row("panning_list_6"), row("panning_list_7"),
};
static_assert(qvParamTableOk<CurveFilter::Settings>(rows));

template <class Array>
auto& at(Array& array, int index) {
    return array[static_cast<std::size_t>(index)];
}

}  // namespace

QvCodec* newPanning() { return new CAudioPanning; }

CAudioPanning::CAudioPanning() : CurveFilter(rows) {}

int CAudioPanning::init() {
    const int result = CurveFilter::init();
    if (result == QvStatus::ok) highest_ = 0;
    return result;
}

bool CAudioPanning::setList(int channel, const AnyVector& list, const char*& why) {
    std::array<std::vector<LevelCurve::Point>, curveChannels> points;
    for (int i = 0; i < list.size(); ++i) {
        LevelCurve::Point point;
        int output = 0;
        why =
            "a point has an \"out_ch\" from 0 to 7, a \"time\" in seconds and an integer \"volume\" in "
            "percent";
        if (!readPoint(list.at(i), point) || !qvparam::convert(list.at(i).asDict().get("out_ch"), output) ||
            output < 0 || output >= curveChannels)
            return false;
        at(points, output).push_back(point);
    }
    for (int output = 0; output < curveChannels; ++output) {
        if (!at(points, output).empty()) highest_ = std::max(highest_, output);
        at(at(curves_, channel), output) = LevelCurve(std::move(at(points, output)));
    }
    return true;
}

AnyVector CAudioPanning::list(int channel) const {
    AnyVector points;
    for (int output = 0; output <= highest_; ++output) {
        for (const auto& point : at(at(curves_, channel), output).points()) {
            AnyDict described = describePoint(point);
            described.set("out_ch", output);
            points.append(Any(described));
        }
    }
    return points;
}

int CAudioPanning::write(QvPcm& pcm) {
    const int outputs = std::max(pcm.channels(), highest_ + 1);
    int* to = nullptr;
    if (const int result = begin(pcm, outputs, to)) return result;
    for (int output = 0; to && output < std::min(outputs, curveChannels); ++output) {
        Mix mix = sourcesOf(output, pcm);
        if (mix.count > 0) mixOutput(mix, pcm, to + output, outputs);
    }
    finish(pcm);
    return QvStatus::ok;
}

CAudioPanning::Mix CAudioPanning::sourcesOf(int output, const QvPcm& pcm) const {
    Mix mix;
    for (int input = 0; input < std::min(pcm.channels(), curveChannels); ++input) {
        const LevelCurve& curve = at(at(curves_, input), output);
        if (!curve.empty())
            at(mix.sources, mix.count++) = {LevelCurve::Walk(curve, secondsAt(pcm, 0)), input};
    }
    return mix;
}

void CAudioPanning::mixOutput(Mix& mix, const QvPcm& pcm, int* to, int step) const {
    const int* from = soundValues(pcm);
    for (int i = 0; i < pcm.samples(); ++i, from += pcm.channels(), to += step) {
        const double time = secondsAt(pcm, i);
        long long sum = 0;
        int parts = 0;
        for (int s = 0; s < mix.count; ++s) {
            Source& source = at(mix.sources, s);
            const double level = source.walk.at(time);
            if (!(level > audible)) continue;
            sum += static_cast<long long>(from[source.from] * level / LevelCurve::whole);
            ++parts;
        }
        *to = saturated(parts > 1 ? sum / parts : sum);
    }
}
