#include "tarsel/job/task/divide.h"

#include <algorithm>
#include <memory>
#include <string_view>

#include "tarsel/words/messages.h"

namespace {

// Modules whose result depends on one frame or sample and nothing else, or that convert a format.
constexpr std::string_view kDivisible[] = {"aquant",  "avol",        "bobber",  "brightness", "chconvert",
                                           "cropper", "deinterlace", "flipper", "frconvert",  "logo",
                                           "scaler",  "srconvert",   "userdata"};

// A module of a plug-in says so by its attribute.
bool isDivisible(const std::string& name) {
    if (std::find(std::begin(kDivisible), std::end(kDivisible), name) != std::end(kDivisible)) return true;
    const QvModule* const module = qv_registry()->module(name.c_str());
    return module && module->getAttr("divisible").isTrue();
}

// False where nothing is left to do.
bool divideFade(QvCodec& filter, const SegmentPlace& place) {
    const int in = place.index == 0 ? filter.getParam("fade_in").asInt32(0) : 0;
    const int out = place.index + 1 == place.count ? filter.getParam("fade_out").asInt32(0) : 0;
    if (std::max(in, out) > place.frames)
        throw failure(Msg::fadeTooLong, {std::to_string(std::max(in, out)), std::to_string(place.frames)});
    filter.setParam("fade_in", in);
    filter.setParam("fade_out", out);
    filter.setParam("frames_count", static_cast<int>(place.frames));
    return in > 0 || out > 0;
}

// The clock of the texts begins at the start of the output.
void moveSubtitles(QvCodec& filter, const SegmentPlace& place) {
    const QvRatio rate = place.rate.rate();
    const double ms = static_cast<double>(place.first - place.before) * 1000.0 * rate.den / rate.num;
    filter.setParam("delay", filter.getParam("delay").toDouble() + ms);
}

void moveTimecode(QvCodec& filter, const SegmentPlace& place) {
    const bool ofInput = filter.getParam("start") == "InPoint";
    if (ofInput && place.ofCuts) return;
    filter.setParam("start", "FirstInputFrame");
    const int offset = ofInput ? 0 : filter.getParam("startOffset").asInt32(0);
    filter.setParam("startOffset", static_cast<int>(offset - place.before));
}

// False for a filter that goes.
bool divide(QvCodec& filter, const SegmentPlace& place) {
    const std::string name = filter.name();
    if (name == "videofade") return divideFade(filter, place);
    if (name == "subtitle") {
        if (!place.ofCuts) moveSubtitles(filter, place);
        return true;
    }
    if (name == "timecode") {
        moveTimecode(filter, place);
        return true;
    }
    if (!isDivisible(name)) throw failure(Msg::filterNotDivided, {name});
    return true;
}

}  // namespace

void divideFilters(FiltersState& filters, const SegmentPlace& place) {
    const AnyVector names = filters.names();
    for (int i = 0; i < filters.count(); ++i) {
        const std::unique_ptr<QvCodec> filter(qv_registry()->newCodec(names.at(i).asString("")));
        if (!filter) continue;  // refused where the segment was planned
        AnyDict state = filters.filterAt(i);
        if (!state.get("_on").isTrue()) continue;
        filter->restore(state);
        const bool stays = divide(*filter, place);
        filter->store(state);
        state.set("_on", stays ? 1 : 0);
        filters.setFilterAt(i, state);
    }
    filters.removeInactive();
}
