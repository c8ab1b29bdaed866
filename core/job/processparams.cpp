#include "core/job/processparams.h"

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"

namespace {

constexpr const char* outOfRange = "index out of range";

const AnyVector* vectorOf(const AnyDict& dict, const char* key) {
    const Any& value = dict.get(key);
    return value.isVector() ? &value.asVector() : nullptr;
}

}  // namespace

InOutPoints::InOutPoints(const MediaTime& in, const MediaTime& out) {
    append(Any(in));
    append(Any(out));
}

int InOutPoints::count() const { return size() / 2; }

void InOutPoints::setInPoint(int index, const MediaTime& time) {
    QV_ASSERT_MSG(index >= 0 && index <= count(), outOfRange);
    if (index < count()) {
        set(2 * index, Any(time));
    } else {
        append(Any(time));
        append(Any(MediaTime()));
    }
}

void InOutPoints::setOutPoint(int index, const MediaTime& time) {
    QV_ASSERT_MSG(index >= 0 && index <= count(), outOfRange);
    if (index < count()) {
        set(2 * index + 1, Any(time));
    } else {
        append(Any(MediaTime()));
        append(Any(time));
    }
}

// A stored list can hold anything; what is no time is as good as absent.
MediaTime InOutPoints::inPoint(int index) const {
    QV_ASSERT_MSG(index >= 0 && index < count() && at(2 * index).isMediaTime(), outOfRange);
    return at(2 * index).asMediaTime();
}

MediaTime InOutPoints::outPoint(int index) const {
    QV_ASSERT_MSG(index >= 0 && index < count() && at(2 * index + 1).isMediaTime(), outOfRange);
    return at(2 * index + 1).asMediaTime();
}

MediaTime InOutPoints::duration(int index) const { return outPoint(index) - inPoint(index); }

void InOutPoints::setDuration(int index, const MediaTime& time) {
    QV_ASSERT_MSG(index >= 0 && index <= count(), outOfRange);
    if (index < count())
        setOutPoint(0, inPoint(index) + time);
    else
        setOutPoint(index, time);
}

void InOutPoints::move(int index, const MediaTime& delta) {
    setInPoint(index, inPoint(index) + delta);
    setOutPoint(index, inPoint(index) + delta);
}

void ProcessParams::setInOutPoints(const InOutPoints& points) {
    set("inOutPoints", static_cast<const AnyVector&>(points));
}

std::optional<InOutPoints> ProcessParams::inOutPoints() const {
    const auto* points = vectorOf(*this, "inOutPoints");
    return points ? std::optional<InOutPoints>(*points) : std::nullopt;
}

void ProcessParams::setFilters(const FiltersState& filters) {
    set("filters", static_cast<const AnyDict&>(filters));
}

std::optional<FiltersState> ProcessParams::filters() const {
    const Any& filters = get("filters");
    return filters.isDict() ? std::optional<FiltersState>(filters.asDict()) : std::nullopt;
}

void ProcessParams::setChapterPoints(const AnyVector& points) { set("chapters", points); }

const AnyVector* ProcessParams::chapterPoints() const { return vectorOf(*this, "chapters"); }

void ProcessParams::setAudioChannelMap(const AnyVector& map) { set("audioChannelMap", map); }

const AnyVector* ProcessParams::audioChannelMap() const { return vectorOf(*this, "audioChannelMap"); }

void ProcessParams::setAudioConversion(const AudioConversion& conversion) {
    set("audioConversion", conversion.stored());
}

std::optional<AudioConversion> ProcessParams::audioConversion() const {
    const Any& stored = get("audioConversion");
    return stored.isDict() ? std::optional<AudioConversion>(stored.asDict()) : std::nullopt;
}

void ProcessParams::setHoldLast(bool on) { set("holdLast", on ? 1 : 0); }

bool ProcessParams::holdLast() const { return getInt32("holdLast", 0) != 0; }

void ProcessParams::setSmartRender(int mode) {
    constexpr int modes = 3;
    const bool known = mode >= 0 && mode < modes;
    if (!known) qv_dbg()->error("ProcessParams: invalid smartRender mode %d", mode);
    set("smartRender", known ? mode : 0);
}

int ProcessParams::smartRender() const { return getInt32("smartRender", 0); }

void ProcessParams::setQualityLog(const QvEncodingQualityStatsSetup& setup) {
    set("qualityStats", static_cast<const AnyVector&>(setup));
}

std::optional<QvEncodingQualityStatsSetup> ProcessParams::getQualityStatsSetup() const {
    const auto* logs = vectorOf(*this, "qualityStats");
    return logs ? std::optional<QvEncodingQualityStatsSetup>(*logs) : std::nullopt;
}

void MetaProcessParams::setCcMode(bool do608, bool do708, int fmt, bool valid608_1Fillers,
                                  bool valid608_2Fillers) {
    set("do608", do608 ? 1 : 0);
    set("do708", do708 ? 1 : 0);
    set("fmt", fmt);
    set("valid608_1Fillers", valid608_1Fillers ? 1 : 0);
    set("valid608_2Fillers", valid608_2Fillers ? 1 : 0);
}

bool MetaProcessParams::doCc608() const { return getInt32("do608", 0) != 0; }

bool MetaProcessParams::doCc708() const { return getInt32("do708", 0) != 0; }

int MetaProcessParams::ccUserDataFmt() const { return getInt32("fmt", -1); }

bool MetaProcessParams::valid608_1Fillers() const { return getInt32("valid608_1Fillers", 0) != 0; }

bool MetaProcessParams::valid608_2Fillers() const { return getInt32("valid608_2Fillers", 0) != 0; }
