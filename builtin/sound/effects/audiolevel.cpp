#include "builtin/sound/effects/audiolevel.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "builtin/creators.h"
#include "builtin/sound/soundvalues.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr QvParamRow<CurveFilter::Settings> row(const char* name) {
    return {
        .name = name,
        .flags = qvParamByHand,
        .help = "level of this channel over time: points of \"time\" in seconds and \"volume\" in percent",
        .type = Any::Vector};
}

constexpr QvParamRow<CurveFilter::Settings> rows[] = {
    row("volume_list_0"), row("volume_list_1"), row("volume_list_2"), row("volume_list_3"),
    row("volume_list_4"), row("volume_list_5"), row("volume_list_6"), row("volume_list_7"),
};
static_assert(qvParamTableOk<CurveFilter::Settings>(rows));

}  // namespace

QvCodec* newAudiolevel() { return new CustomAudioVolume; }

CustomAudioVolume::CustomAudioVolume() : CurveFilter(rows) {}

int CustomAudioVolume::close() {
    qv_dbg()->info("Closing audio volume module");
    return CurveFilter::close();
}

bool CustomAudioVolume::setList(int channel, const AnyVector& list, const char*& why) {
    std::vector<LevelCurve::Point> points(static_cast<std::size_t>(list.size()));
    for (int i = 0; i < list.size(); ++i) {
        why = "a point has a \"time\" in seconds and an integer \"volume\" in percent";
        if (!readPoint(list.at(i), points[static_cast<std::size_t>(i)])) return false;
    }
    curves_[static_cast<std::size_t>(channel)] = LevelCurve(std::move(points));
    return true;
}

AnyVector CustomAudioVolume::list(int channel) const {
    AnyVector points;
    for (const auto& point : curves_[static_cast<std::size_t>(channel)].points())
        points.append(Any(describePoint(point)));
    return points;
}

int CustomAudioVolume::write(QvPcm& pcm) {
    int* to = nullptr;
    if (const int result = begin(pcm, pcm.channels(), to)) return result;
    const int channels = std::min(pcm.channels(), curveChannels);
    const bool unchanged =
        pcm.channels() <= curveChannels &&
        std::all_of(curves_.begin(), curves_.begin() + channels, [](const auto& c) { return c.empty(); });
    if (to && unchanged)
        std::memcpy(to, pcm.ptr(0), static_cast<std::size_t>(pcm.bytes()));
    else if (to)
        for (int channel = 0; channel < channels; ++channel) applyCurve(pcm, channel, to);
    finish(pcm);
    return QvStatus::ok;
}

void CustomAudioVolume::applyCurve(const QvPcm& pcm, int channel, int* to) const {
    LevelCurve::Walk walk(curves_[static_cast<std::size_t>(channel)], secondsAt(pcm, 0));
    const int step = pcm.channels();
    const int* from = soundValues(pcm) + channel;
    to += channel;
    int i = 0;
    for (; i < pcm.samples() && !walk.atEnd(); ++i, from += step, to += step)
        *to = saturated(*from * (walk.at(secondsAt(pcm, i)) / LevelCurve::whole));
    const double held = walk.at(secondsAt(pcm, i)) / LevelCurve::whole;
    for (; i < pcm.samples(); ++i, from += step, to += step) *to = saturated(*from * held);
}
