#include "builtin/kernels/convert/workspace.h"

#include <algorithm>

#include "builtin/kernels/convert/pipeline.h"

namespace srk {

namespace {

int tapsDown(const Plan& plan) {
    int taps = 1;
    for (const auto* set : {plan.scaling, plan.second})
        for (int f = 0; f < 2; ++f) taps = std::max({taps, set[f].luma.down.taps, set[f].chroma.down.taps});
    return taps;
}

template <class S>
constexpr S neutralSample = sizeof(S) == 1 ? 128 : 32768;

}  // namespace

template <class S>
Lines<S>::Lines(const Plan& plan) {
    // Enough that the windows of luma and chroma around one target line find their lines again.
    const int slots = tapsDown(plan) + 8;
    const int width = plan.workWidth + wordBlock;
    for (auto& ring : source) ring.set(slots, width);
    for (auto& ring : matrixed) ring.set(slots, width);
    for (auto& stage : stages)
        for (int p = 0; p < planes; ++p) {
            stage.words[p].set(slots, width);
            stage.out[p].set(1, width);
        }
    const size_t around = static_cast<size_t>(width) + beforeLine + behindLine;
    padded.grow(around);
    if (sizeof(S) == 2) paddedWide.grow(around);
    narrowLength = static_cast<size_t>(width);
    narrow.grow(planes * narrowLength);
    neutral.grow(static_cast<size_t>(width));
    std::fill_n(neutral.get(), width, neutralSample<S>);
    if (plan.pixels && plan.source->packing != Packing::bytes4) pixels.set(slots, 4 * width);
}

template <class S>
void Lines<S>::forget() {
    for (auto& ring : source) ring.forget();
    for (auto& ring : matrixed) ring.forget();
    pixels.forget();
    for (auto& stage : stages)
        for (int p = 0; p < planes; ++p) {
            stage.words[p].forget();
            stage.out[p].forget();
        }
}

template struct Lines<Byte>;
template struct Lines<uint16_t>;

Workspace::Workspace(const Plan& plan) {
    if (plan.deep)
        words = std::make_unique<Lines<uint16_t>>(plan);
    else
        bytes = std::make_unique<Lines<Byte>>(plan);
}

Workspace::~Workspace() = default;

}  // namespace srk
