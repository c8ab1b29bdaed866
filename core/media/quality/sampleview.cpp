#include "core/measure/fourcc.h"
#include "core/media/quality/sampleview_p.h"
#include "core/media/qvframe.h"

namespace {

struct Component {
    char name;
    signed char plane;
    signed char offset;  // samples
    signed char step;    // samples
    bool chroma;         // half the columns
};

struct Layout {
    unsigned fourcc;
    int count;
    Component component[3];
};

namespace F = QvFourcc;

// clang-format off
constexpr Layout layouts[] = {
    {F::GRAY, 1, {{'Y', 0, 0, 1, false}}},
    {F::I420, 3, {{'Y', 0, 0, 1, false}, {'U', 1, 0, 1, true},  {'V', 2, 0, 1, true}}},
    {F::YV12, 3, {{'Y', 0, 0, 1, false}, {'U', 1, 0, 1, true},  {'V', 2, 0, 1, true}}},
    {F::I422, 3, {{'Y', 0, 0, 1, false}, {'U', 1, 0, 1, true},  {'V', 2, 0, 1, true}}},
    {F::W016, 3, {{'Y', 0, 0, 1, false}, {'U', 1, 0, 1, true},  {'V', 2, 0, 1, true}}},
    {F::YUY2, 3, {{'Y', 0, 0, 2, false}, {'U', 0, 1, 4, true},  {'V', 0, 3, 4, true}}},
    {F::YUYV, 3, {{'Y', 0, 0, 2, false}, {'U', 0, 1, 4, true},  {'V', 0, 3, 4, true}}},
    {F::UYVY, 3, {{'Y', 0, 1, 2, false}, {'U', 0, 0, 4, true},  {'V', 0, 2, 4, true}}},
    {F::Y216, 3, {{'Y', 0, 0, 2, false}, {'U', 0, 1, 4, true},  {'V', 0, 3, 4, true}}},
    {F::BGR3, 3, {{'R', 0, 2, 3, false}, {'G', 0, 1, 3, false}, {'B', 0, 0, 3, false}}},
    {F::BGR4, 3, {{'R', 0, 2, 4, false}, {'G', 0, 1, 4, false}, {'B', 0, 0, 4, false}}},
    {F::BGRA, 3, {{'R', 0, 2, 4, false}, {'G', 0, 1, 4, false}, {'B', 0, 0, 4, false}}},
    {F::ARGB, 3, {{'R', 0, 1, 4, false}, {'G', 0, 2, 4, false}, {'B', 0, 3, 4, false}}},
};
// clang-format on

const Layout* layoutOf(unsigned fourcc) {
    for (const Layout& layout : layouts)
        if (layout.fourcc == fourcc) return &layout;
    return nullptr;
}

}  // namespace

SampleViews qvSampleViews(const QvFrame& frame) {
    SampleViews views;
    const Layout* layout = frame.inited() ? layoutOf(frame.four_cc()) : nullptr;
    if (!layout) return views;
    const QvPixelFormat& format = *qvPixelFormat(layout->fourcc);
    for (; views.count < layout->count; ++views.count) {
        const Component& from = layout->component[views.count];
        const bool halfRows = from.chroma && format.chroma == QvChroma::quarter;
        views.view[static_cast<std::size_t>(views.count)] = {
            .name = from.name,
            .data = frame.plane(from.plane) + from.offset * format.sampleBytes,
            .stride = frame.stride(from.plane),
            .step = from.step * format.sampleBytes,
            .width = from.chroma ? frame.width() / 2 : frame.width(),
            .height = halfRows ? frame.height() / 2 : frame.height(),
            .bytes = format.sampleBytes};
    }
    return views;
}
