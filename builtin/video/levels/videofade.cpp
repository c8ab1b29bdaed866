#include "builtin/video/levels/videofade.h"

#include <algorithm>
#include <climits>
#include <cstring>

#include "builtin/creators.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = VideoFadeSettings;

constexpr uint32_t whole = 65536;
constexpr char firstKey[] = "first_frame";

constexpr QvParamRow<Settings> rows[] = {
    {"fade_in", &Settings::in, qvParamStored, 0, INT_MAX, "Frames count to fade in", "frames"},
    {"fade_out", &Settings::out, qvParamStored, 0, INT_MAX, "Frames count to fade out", "frames"},
    {"frames_count", &Settings::count, qvParamStored, 0, INT_MAX, "Total frames count in segment", "frames"},
    {.name = firstKey,
     .member = &Settings::first,
     .flags = qvParamStored,
     .min = 0,
     .max = INT_MAX,
     .unit = "frames",
     .help = "of the segment: the number of the frame that comes first"},
};
static_assert(qvParamTableOk<Settings>(rows));

// How much of 65536 is left `distance` frames from the black end of a fade.
uint32_t ramp(int distance, int length) {
    if (distance >= length) return whole;
    return static_cast<uint32_t>(static_cast<long long>(std::max(distance, 0)) * whole / length);
}

}  // namespace

QvCodec* newVideofade() { return new CVideoFade; }

CVideoFade::CVideoFade() : InPlaceEffectOf("videofade", rows) {}

int CVideoFade::setParam(const char* name, const Any& value) {
    int total = 0;
    if (std::strcmp(name, "_totalFrames") == 0 && qvparam::convert(value, total)) announced_ = total;
    return InPlaceEffectOf::setParam(name, value);
}

void CVideoFade::store(AnyDict& dict) const {
    InPlaceEffectOf::store(dict);
    if (settings_.first > 0 || !dict.get("state").isDict()) return;
    AnyDict state = dict.get("state").asDict();
    state.remove(firstKey);
    dict.set("state", state);
}

int CVideoFade::length() const { return settings_.count > 0 ? settings_.count : announced_; }

int CVideoFade::open() {
    qv_dbg()->info("Opening CVideoFade filter, in=%d, out=%d, count=%d", settings_.in, settings_.out,
                   settings_.count);
    position_ = settings_.first;
    return InPlaceEffectOf::open();
}

uint32_t CVideoFade::share(int frame) const {
    const uint32_t in = ramp(frame, settings_.in);
    if (settings_.out == 0 || length() <= 0) return in;
    const uint32_t out = ramp(length() - 1 - frame, settings_.out);
    return static_cast<uint32_t>(uint64_t{in} * out / whole);
}

int CVideoFade::change(const QvFrame& from, QvFrame& to) {
    if (position_ == settings_.first && settings_.out > 0 && length() <= 0)
        qv_log()->warning("The fade out is left out: 'frames_count' says how many frames there are");
    const uint32_t kept = share(position_);
    if (position_ < INT_MAX) ++position_;
    if (kept == whole) {
        copySamples(to, from);
        return QvStatus::ok;
    }
    const SampleLayout& layout = sampleLayout(from.four_cc());
    for (int p = 0; p < from.planes(); ++p) {
        const size_t samples = layout.rowSamples(from, p);
        // The planes of chroma have the same weights.
        if (p < 2) weights_.resize(layout, samples);
        for (size_t i = 0; i < samples && p < 2; ++i) {
            const SampleRole role = layout.role(p, i);
            weights_.fade(i, layout.black(role), role == SampleRole::keep ? whole : kept);
        }
        for (int y = 0; y < sampleRows(from, p); ++y)
            weights_.apply(to.plane(p) + static_cast<std::ptrdiff_t>(to.stride(p)) * y,
                           from.plane(p) + static_cast<std::ptrdiff_t>(from.stride(p)) * y, 0, samples);
    }
    return QvStatus::ok;
}
