#include "core/filter/qvfiltersetup.h"

#include <map>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvregistry.h"
#include "core/job/filtersstate.h"
#include "core/measure/qvgeometry.h"

namespace {

using FilterList = std::vector<std::unique_ptr<QvCodec>>;

bool removeFrom(FilterList& list, const QvCodec* filter) {
    for (auto i = list.begin(); i != list.end(); ++i) {
        if (i->get() != filter) continue;
        list.erase(i);
        return true;
    }
    return false;
}

QvCodec* findByName(const FilterList& list, const char* name) {
    for (const auto& filter : list)
        if (Any(filter->name()) == name) return filter.get();
    return nullptr;
}

AnyDict stateOf(const QvCodec& filter) {
    AnyDict state;
    filter.store(state);
    return state;
}

std::unique_ptr<QvCodec> newFilter(const char* name) {
    std::unique_ptr<QvCodec> filter(qv_registry()->newCodec(name));
    if (!filter) qv_log()->error("[QvFilterSetup::addFilter] Failed to add filter %s.", name);
    return filter;
}

}  // namespace

struct QvFilterSetup::Private {
    FilterList front;
    FilterList back;
    std::map<std::string, std::unique_ptr<QvCodec>> singles;
};

QvFilterSetup::QvFilterSetup() : p_(std::make_unique<Private>()) {}

QvFilterSetup::~QvFilterSetup() = default;

QvCodec* QvFilterSetup::addFilter(const char* name, bool front) {
    auto filter = newFilter(name);
    if (!filter) return nullptr;
    FilterList& list = front ? p_->front : p_->back;
    const int last = list.empty() ? 0 : list.back()->getParam("_position").asInt32(0);
    filter->setParam("_on", 1);
    filter->setParam("_position", last + 1);
    filter->setParam("_front", front ? 1 : 0);
    list.push_back(std::move(filter));
    return list.back().get();
}

void QvFilterSetup::removeFilter(QvCodec* filter) {
    if (removeFrom(p_->front, filter) || removeFrom(p_->back, filter)) return;
    std::erase_if(p_->singles, [&](const auto& entry) { return entry.second.get() == filter; });
}

int QvFilterSetup::nrFilters(bool front, bool back) const {
    return static_cast<int>((front ? p_->front.size() : 0) + (back ? p_->back.size() : 0));
}

QvCodec* QvFilterSetup::filter(const char* name) const {
    if (auto* found = findByName(p_->front, name)) return found;
    return findByName(p_->back, name);
}

QvCodec* QvFilterSetup::filter(int index, bool front) const {
    const FilterList& list = front ? p_->front : p_->back;
    if (index < 0 || index >= static_cast<int>(list.size())) return nullptr;
    return list[static_cast<std::size_t>(index)].get();
}

void QvFilterSetup::storeLists(FiltersState& state) const {
    state.clear();
    for (const auto* list : {&p_->front, &p_->back})
        for (const auto& filter : *list) state.appendFilter(filter->name(), stateOf(*filter));
}

void QvFilterSetup::storeSingles(FiltersState& state) const {
    for (const auto& [name, filter] : p_->singles) state.setFilter(name.c_str(), stateOf(*filter));
}

QvCodec* QvFilterSetup::single(const char* name) const {
    const auto found = p_->singles.find(name);
    return found == p_->singles.end() ? nullptr : found->second.get();
}

void QvFilterSetup::removeSingle(const char* name) { p_->singles.erase(name); }

QvCodec* QvFilterSetup::replaceSingle(const char* name) {
    removeSingle(name);
    auto filter = newFilter(name);
    if (!filter) return nullptr;
    filter->setParam("_on", 1);
    return (p_->singles[name] = std::move(filter)).get();
}

void QvVFilterSetup::store(FiltersState& state, int) const {
    storeLists(state);
    storeSingles(state);
}

int QvVFilterSetup::restore(const FiltersState&) { QV_FAIL("TODO"); }

QvCodec* QvVFilterSetup::addLogo(const Any& filename, int x, int y, bool front) {
    auto* logo = addFilter("logo", front);
    if (!logo) return nullptr;
    logo->setParam("filename", filename);
    logo->setParam("xpos", x);
    logo->setParam("ypos", y);
    return logo;
}

QvCodec* QvVFilterSetup::addTimecode(QvTimecodeMode mode, const Any& font, bool front) {
    auto* timecode = addFilter("timecode", front);
    if (!timecode) return nullptr;
    if (font.isText()) timecode->setParam("font_filename", font);
    timecode->setParam("mode", static_cast<int>(mode));
    return timecode;
}

QvCodec* QvVFilterSetup::addBrightness(double brightness, double contrast, double gamma, bool front) {
    auto* filter = addFilter("brightness", front);
    if (!filter) return nullptr;
    filter->setParam("brightness", brightness);
    filter->setParam("contrast", contrast);
    filter->setParam("gamma", gamma);
    return filter;
}

QvCodec* QvVFilterSetup::addUserDataCallback(const void* callback, const void* context, bool front) {
    auto* filter = addFilter("userdata", front);
    if (!filter) return nullptr;
    filter->setParam("context", Any(context));
    filter->setParam("callback", Any(callback));
    return filter;
}

void QvVFilterSetup::setFlip(bool flip) {
    removeSingle("flipper");
    if (!flip) return;
    if (auto* filter = replaceSingle("flipper")) filter->setParam("flip", 1);
}

void QvVFilterSetup::setDeinterlace(QvDeinterlaceMethod method) {
    removeSingle("deinterlace");
    if (method == QV_DEINTERLACE_NONE) return;
    if (auto* filter = replaceSingle("deinterlace"))
        filter->setParam("deinterlace", static_cast<int>(method));
}

void QvVFilterSetup::setCrop(int mode, int inputWidth, int inputHeight, const QvRect& crop, int padTop,
                             int padBottom, int padLeft, int padRight) {
    removeSingle("cropper");
    if (mode == 0) return;
    auto* cropper = replaceSingle("cropper");
    if (!cropper) return;
    cropper->setParam("inputWidth", inputWidth);
    cropper->setParam("inputHeight", inputHeight);
    cropper->setParam("mode", mode);
    if (mode == 4 || mode == 5) return;
    cropper->setParam("padTop", padTop);
    cropper->setParam("padLeft", padLeft);
    cropper->setParam("padBottom", padBottom);
    cropper->setParam("padRight", padRight);
    if (crop.width() < 1 || crop.height() < 1) return;
    cropper->setParam("cropWidth", crop.width());
    cropper->setParam("cropHeight", crop.height());
    cropper->setParam("moveCropBox", QvPoint(crop.left(), crop.top()));
}

QvCodec* QvVFilterSetup::cropFilter() const { return single("cropper"); }

QvCodec* QvVFilterSetup::deinterlaceFilter() const { return single("deinterlace"); }

QvCodec* QvVFilterSetup::flipFilter() const { return single("flipper"); }

void QvAFilterSetup::store(FiltersState& state, int) const { storeLists(state); }

int QvAFilterSetup::restore(const FiltersState&) { QV_FAIL("TODO"); }

QvCodec* QvAFilterSetup::addVolume(double volumedB, bool mute, bool front) {
    auto* filter = addFilter("avol", front);
    if (!filter) return nullptr;
    filter->setParam("volume", volumedB);
    filter->setParam("mute", mute ? 1 : 0);
    return filter;
}
