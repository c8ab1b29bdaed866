#include "builtin/video/levels/brightness.h"

#include <algorithm>
#include <cmath>

#include "builtin/creators.h"
#include "builtin/kernels/lines/samplerows.h"
#include "core/arch/qvassert.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = BrightnessSettings;

constexpr QvParamRow<Settings> rows[] = {
    {"brightness", &Settings::brightness, qvParamStored, -1, 1, "Brightness", "",
     "added to the level; 1 is the distance from black to white"},
    {"contrast", &Settings::contrast, qvParamStored, 0, 10, "Contrast", "", "spreads levels about mid-grey"},
    {"gamma", &Settings::gamma, qvParamStored, 0.1, 10, "Gamma", "", "above 1 lightens the middle"},
};
static_assert(qvParamTableOk<Settings>(rows));

bool isAccepted(unsigned fourcc) {
    switch (fourcc) {
        case QvFourcc::BGRA:
        case QvFourcc::BGR4:
        case QvFourcc::BGR3:
        case QvFourcc::GRAY:
        case QvFourcc::I420:
        case QvFourcc::YV12:
        case QvFourcc::YUYV:
        case QvFourcc::YUY2:
        case QvFourcc::UYVY:
        case QvFourcc::b64a:
        case QvFourcc::W016:
        case QvFourcc::Y216:
        case QvFourcc::ARGB: return true;
        default: return false;
    }
}

// What the filter works on: the luma of YUV, all colours of RGB.
SampleRole roleOf(const SampleLayout& layout) {
    return layout.chosen(SampleRole::luma) ? SampleRole::luma : SampleRole::colour;
}

template <class Sample>
void fillTable(std::vector<Sample>& table, const SampleLayout& layout, SampleRole role, const Settings& s) {
    const double black = layout.black(role), range = layout.white(role) - black;
    table.resize(size_t{1} << layout.bits);
    for (size_t i = 0; i < table.size(); ++i) {
        const double level = (static_cast<double>(i) - black) / range;
        const double moved = std::clamp((level - 0.5) * s.contrast + 0.5 + s.brightness, 0.0, 1.0);
        table[i] = static_cast<Sample>(std::lround(black + range * std::pow(moved, 1 / s.gamma)));
    }
}

}  // namespace

QvCodec* newBrightness() { return new Brightness; }

Brightness::Brightness() : InPlaceEffectOf("brightness", rows) {}

void Brightness::makeTable(const SampleLayout& layout, SampleRole role) {
    if (madeFor_ == &layout && madeWith_ == settings_) return;
    if (layout.wide())
        fillTable(table16_, layout, role, settings_);
    else
        fillTable(table8_, layout, role, settings_);
    madeFor_ = &layout;
    madeWith_ = settings_;
}

int Brightness::change(const QvFrame& from, QvFrame& to) {
    QV_ASSERT_MSG(isAccepted(from.four_cc()), "Unknown colorspace in brightness filter");
    if (settings_ == Settings()) {
        copySamples(to, from);
        return QvStatus::ok;
    }
    const SampleLayout& layout = sampleLayout(from.four_cc());
    const SampleRole role = roleOf(layout);
    makeTable(layout, role);
    copySamples(to, from, 1);
    const unsigned chosen = layout.chosen(role);
    const size_t samples = layout.rowSamples(from, 0);
    for (int y = 0; y < from.height(); ++y) {
        const unsigned char* in = from.plane() + static_cast<std::ptrdiff_t>(from.stride()) * y;
        unsigned char* out = to.plane() + static_cast<std::ptrdiff_t>(to.stride()) * y;
        if (layout.wide())
            srk::lookUpWords(out, in, table16_.data(), chosen, samples);
        else
            srk::lookUpBytes(out, in, table8_.data(), chosen, samples);
    }
    return QvStatus::ok;
}
