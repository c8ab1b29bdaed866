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

// The clock of the texts begins at the start of the output.
void moveSubtitles(QvCodec& filter, const SegmentPlace& place) {
    if (place.ofCuts) return;
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

}  // namespace

bool isDivisible(const std::string& filter) {
    if (std::find(std::begin(kDivisible), std::end(kDivisible), filter) != std::end(kDivisible)) return true;
    const QvModule* const module = qv_registry()->module(filter.c_str());
    return module && module->getAttr("divisible").isTrue();
}

void requireDivisible(const std::string& filter) {
    if (!isDivisible(filter)) throw failure(Msg::filterNotDivided, {filter});
}

void moveTexts(FiltersState& filters, const SegmentPlace& place) {
    const AnyVector names = filters.names();
    for (int i = 0; i < filters.count(); ++i) {
        const std::string name = names.at(i).asString("");
        if (name != "subtitle" && name != "timecode") continue;
        const std::unique_ptr<QvCodec> filter(qv_registry()->newCodec(name.c_str()));
        AnyDict state = filters.filterAt(i);
        filter->restore(state);
        name == "subtitle" ? moveSubtitles(*filter, place) : moveTimecode(*filter, place);
        filter->store(state);
        filters.setFilterAt(i, state);
    }
}
