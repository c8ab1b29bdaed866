#include "builtin/sound/effects/curvefilter.h"

#include <algorithm>
#include <cmath>
#include <cstring>

#include "core/engine/log/qvlog.h"
#include "core/filter/qvprocessutil.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr const char* label = "volume list";
constexpr double maxSeconds = 1e12;  // of a point; far from where differences of times overflow

int channelOf(CurveFilter::Rows rows, const char* name) {
    const auto row = std::find_if(rows.begin(), rows.end(),
                                  [&](const auto& candidate) { return !std::strcmp(candidate.name, name); });
    return row == rows.end() ? -1 : static_cast<int>(row - rows.begin());
}

}  // namespace

CurveFilter::CurveFilter(Rows rows) : SoundFilter("custom avol::writepcm"), rows_(rows) {}

int CurveFilter::init() {
    if (const int result = SoundFilter::init()) return result;
    const char* why = nullptr;
    for (int channel = 0; channel < curveChannels; ++channel) setList(channel, AnyVector(), why);
    return QvStatus::ok;
}

int CurveFilter::open() {
    if (const int result = SoundFilter::open()) return result;
    qv_dbg()->info("Opening audio volume module");
    position_ = 0;
    return QvStatus::ok;
}

int CurveFilter::setParam(const char* name, const Any& value) {
    const int channel = channelOf(rows_, name);
    if (channel < 0) return SoundFilter::setParam(name, value);
    requireInited();
    _traceParam(name, value);
    const char* why = "it is no list";
    const bool isList = value.isVector() || !value.isValid();
    if (isList && setList(channel, value.isVector() ? value.asVector() : AnyVector(), why))
        return QvStatus::ok;
    return setError(QvStatus::invalidParam, "'%s': %s", name, why);
}

void CurveFilter::getParam(const char* name, Any& value) const {
    if (const int channel = channelOf(rows_, name); channel >= 0) {
        value = list(channel);
        return;
    }
    if (std::strcmp(name, "paramSet") == 0) {
        AnyVector set;
        for (const auto& row : rows_)
            set.append(Any(AnyDict("name", row.name, "guiControl", static_cast<int>(QV_GUI_EDITBOX), "type",
                                   static_cast<int>(Any::Vector), "description", label)));
        value = set;
        return;
    }
    qvGetParamRow<Settings>(rows_, Settings(), name, value);  // describes the rows
    SoundFilter::getParam(name, value);
}

void CurveFilter::store(AnyDict& dict) const {
    SoundFilter::store(dict);
    for (int channel = 0; channel < curveChannels; ++channel)
        dict.set(rows_[static_cast<std::size_t>(channel)].name, list(channel));
}

int CurveFilter::restore(const AnyDict& dict) {
    if (const int result = SoundFilter::restore(dict)) return result;
    int result = QvStatus::ok;
    for (const auto& row : rows_) {
        if (!dict.isSet(row.name)) continue;
        const Any& entry = dict.get(row.name);
        if (!entry.isVector()) qv_log()->warning("Can not restore %s from state dict", row.name);
        if (const int set = setParam(row.name, entry); result == QvStatus::ok) result = set;
    }
    return result;
}

bool CurveFilter::readPoint(const Any& entry, LevelCurve::Point& point) {
    return entry.isDict() && qvparam::convert(entry.asDict().get("time"), point.time) &&
           std::fabs(point.time) <= maxSeconds &&
           qvparam::convert(entry.asDict().get("volume"), point.volume);
}

AnyDict CurveFilter::describePoint(const LevelCurve::Point& point) {
    return AnyDict("time", point.time, "volume", point.volume);
}

int CurveFilter::begin(const QvPcm& pcm, int channels, int*& room) {
    requireWide(pcm);
    warnOfSilence(channels);
    const int result = makeWideRoom(pcm, channels, room);
    if (room) std::memset(room, 0, static_cast<std::size_t>(output_.samples2bytes(pcm.samples())));
    return result;
}

void CurveFilter::finish(const QvPcm& pcm) {
    position_ += pcm.samples();
    output_.copyMeta(pcm);
}
