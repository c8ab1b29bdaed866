#include "builtin/kernels/convert/plan.h"

#include <algorithm>
#include <cmath>

#include "builtin/kernels/convert/workspace.h"
#include "builtin/kernels/lines/rgbchroma.h"

namespace srk {

namespace {

// Where the first chroma line lies, in luma lines of its field. The fields of 4:2:0 have theirs a quarter
// line up and down from the middle.
double chromaOffset(const Format& format, int fields, int field) {
    const double progressive = format.downOffset();
    if (fields == 1 || format.down() == 1) return progressive;
    return progressive + (field == 0 ? -0.25 : 0.25);
}

// How one side's chroma lies over its luma.
struct Siting {
    int factor = 1;
    double offset = 0;
};

Mapping chromaMapping(const Mapping& luma, const Siting& from, const Siting& to) {
    return {(luma.first + luma.step * to.offset - from.offset) / from.factor,
            luma.step * to.factor / from.factor};
}

Mapping fieldMapping(const Mapping& frame, int fields, int field) {
    if (fields == 1) return frame;
    return {(frame.first + field * frame.step - field) / 2, frame.step};
}

struct Maker {
    const Request& request;
    Plan& plan;

    // Chroma that keeps its place over luma of unchanged size is interpolated linearly by the standard
    // filter.
    Filter filterOf(const Mapping& luma) const {
        return request.standard && std::abs(luma.step) == 1 ? Filter::linear : request.filter;
    }

    Axis axis(const Mapping& mapping, int source, int target, Filter filter) const {
        if (source <= 0 || target <= 0) {
            Axis none;
            none.source = 0;
            none.target = std::max(target, 0);
            return none;
        }
        return makeAxis(mapping, source, target, filter, plan.deep);
    }

    Group group(Axis across, Axis down) const {
        Group made;
        made.across = std::move(across);
        made.down = std::move(down);
        if (made.empty() || made.across.target == 0) return made;
        if (plan.deep)
            made.deepAcross = makeDeepAcross(made.across);
        else
            made.bytesAcross = makeAcross(made.across);
        return made;
    }

    static Group::Spread chromaSpread(const Mapping& mapping, const Axis& across, Filter filter) {
        const int from = across.source, to = across.target;
        if (mapping == Mapping{0, 2} && filter == Filter::nearest && to == from / 2)
            return Group::everySecond;
        if (mapping != Mapping{0, 0.5} || from != to / 2) return Group::none;
        return filter == Filter::nearest  ? Group::repeated
               : filter == Filter::linear ? Group::doubled
                                          : Group::none;
    }

    // Where nothing is filtered across, or by two, the pass down works on samples, if its weights let it.
    void setSpread(Group& group, Group::Spread spread) const {
        if (group.empty() || group.across.target == 0) return;
        if (group.across.copies) spread = Group::asIs;
        if (spread == Group::none) return;
        if (plan.deep) {
            group.spread = spread;
            return;
        }
        group.bytesDown = downBytesWeights(group.down);
        if (group.down.copies || group.down.taps == 1 || !group.bytesDown.empty()) group.spread = spread;
    }

    // `from` and `to`: whose chroma grids are met; null: chroma at luma size.
    Scaling scaling(const Mapping& across, const Mapping& downFrame, const Format* from, const Format* to,
                    int sourceWidth, int sourceHeight, int field) const {
        const int fields = plan.fields;
        const Mapping down = fieldMapping(downFrame, fields, field);
        Scaling made;
        const auto lines = [&](int n) { return fieldLines(n, fields, field); };
        made.luma = group(axis(across, sourceWidth, request.width, request.filter),
                          axis(down, lines(sourceHeight), lines(request.height), request.filter));
        Siting fromAcross, fromDown, toAcross, toDown;
        if (from) {
            fromAcross = {from->across(), from->acrossOffset()};
            fromDown = {from->down(), chromaOffset(*from, fields, field)};
        }
        if (to) {
            toAcross = {to->across(), to->acrossOffset()};
            toDown = {to->down(), chromaOffset(*to, fields, field)};
        }
        const Mapping chromaAcross = chromaMapping(across, fromAcross, toAcross);
        made.chroma = group(axis(chromaAcross, sourceWidth / fromAcross.factor,
                                 request.width / toAcross.factor, filterOf(across)),
                            axis(chromaMapping(down, fromDown, toDown), lines(sourceHeight / fromDown.factor),
                                 lines(request.height / toDown.factor), filterOf(down)));
        setSpread(made.luma, Group::none);
        setSpread(made.chroma, chromaSpread(chromaAcross, made.chroma.across, filterOf(across)));
        return made;
    }
};

// Weights of the pass down as rgb4ToChroma takes them; empty: they do not fit.
std::vector<Byte> pixelWeights(const Axis& down) {
    if (down.copies || down.taps == 1) return {chromaUnity, 0, 0, 0};
    if (down.taps != 4) return {};
    std::vector<Byte> weights;
    weights.reserve(down.weights.size());
    for (const int weight : down.weights) {
        if (weight % (unity / chromaUnity) != 0 || weight < 0) return {};
        weights.push_back(static_cast<Byte>(weight / (unity / chromaUnity)));
    }
    return weights;
}

bool readsPixels(const Format& format) {
    using enum Packing;
    return format.packing == bytes4 || format.packing == bytes3 || format.packing == rgb565 ||
           format.packing == rgb555;
}

// Chroma may be filtered before the matrix: every second pixel, alone or with a quarter of its neighbours.
void setPixels(Plan& plan) {
    const Request& request = plan.request;
    if (plan.deep || !plan.rgbToYuv || !readsPixels(*plan.source) || plan.target->across() != 2) return;
    if (request.across != Mapping{} || request.width != request.sourceWidth) return;
    for (int f = 0; f < plan.fields; ++f) {
        Group& chroma = plan.scaling[f].chroma;
        if (chroma.empty() || chroma.across.target == 0 || !plan.scaling[f].luma.copies()) return;
        if (chroma.bytesAcross.form != Across::halves && chroma.spread != Group::everySecond) return;
        chroma.pixelsDown = pixelWeights(chroma.down);
        if (chroma.pixelsDown.empty()) return;
    }
    plan.pixels = true;
}

int widest(const Plan& plan) { return std::max(plan.request.sourceWidth, plan.request.width); }

void setStages(Plan& plan) {
    const Format &a = *plan.source, &b = *plan.target;
    const bool fromYuv = a.family() == Family::yuv, toYuvFormat = b.family() == Family::yuv;
    plan.rgbToYuv = !fromYuv && toYuvFormat;
    plan.yuvToRgb = fromYuv && !toYuvFormat;
    plan.levels = !fromYuv && !toYuvFormat && a.family() != b.family();
    plan.otherMatrix = fromYuv && toYuvFormat && plan.request.sourceMatrix != plan.request.targetMatrix;
    plan.floatRgb = a.packing == Packing::floatRgb || b.packing == Packing::floatRgb;
    plan.alpha = a.alpha() && b.alpha();
    plan.again = plan.otherMatrix && (b.across() > 1 || b.down() > 1);
}

bool scales(const Request& request) {
    const Mapping same;
    return request.across != same || request.down != same || request.left || request.top;
}

}  // namespace

Plan::Plan() = default;
Plan::~Plan() = default;

void Plan::provideWorkspaces(int threads) const {
    const std::lock_guard guard(lock_);
    const auto wanted = std::min(static_cast<size_t>(threads), idle_.capacity());
    while (idle_.size() < wanted) idle_.push_back(std::make_unique<Workspace>(*this));
}

std::unique_ptr<Workspace> Plan::takeWorkspace() const {
    {
        const std::lock_guard guard(lock_);
        if (!idle_.empty()) {
            auto workspace = std::move(idle_.back());
            idle_.pop_back();
            return workspace;
        }
    }
    return std::make_unique<Workspace>(*this);
}

void Plan::keepWorkspaces() { idle_.reserve(mostKept); }

void Plan::giveBack(std::unique_ptr<Workspace> workspace) const noexcept {
    const std::lock_guard guard(lock_);
    if (idle_.size() < idle_.capacity()) idle_.push_back(std::move(workspace));
}

namespace {

std::shared_ptr<const Plan> makePlan(const Request& request) {
    auto plan = std::make_shared<Plan>();
    plan->request = request;
    plan->source = &formats()[static_cast<size_t>(request.source)];
    plan->target = &formats()[static_cast<size_t>(request.target)];
    setStages(*plan);
    const bool plain = !scales(request) && !plan->otherMatrix && request.sourceDepth == request.targetDepth;
    plan->path = pathOf(request.source, request.target, plain ? Use::plain : Use::scaling);
    if (!plan->path) return nullptr;
    plan->keepWorkspaces();
    plan->deep = isDeep(plan->path.from);
    plan->workWidth = widest(*plan);
    if (plan->path.from == Core::lines || plan->path.from == Core::packed8) return plan;
    plan->fields = request.interlaced ? 2 : 1;
    const Maker maker{plan->request, *plan};
    const Format* from = plan->rgbToYuv || plan->source->family() != Family::yuv ? nullptr : plan->source;
    const Format* to =
        plan->yuvToRgb || plan->otherMatrix || plan->target->family() != Family::yuv ? nullptr : plan->target;
    for (int f = 0; f < plan->fields; ++f) {
        plan->scaling[f] = maker.scaling(request.across, request.down, from, to, request.sourceWidth,
                                         request.sourceHeight, f);
        if (plan->again)
            plan->second[f] = maker.scaling({}, {}, nullptr, plan->target, request.width, request.height, f);
    }
    setPixels(*plan);
    return plan;
}

// The plans of the latest conversions: a chain of filters, or several, meet the same ones for each picture.
class Plans {
  public:
    std::shared_ptr<const Plan> of(const Request& request) {
        {
            const std::lock_guard guard(lock_);
            for (auto& entry : entries_)
                if (entry.plan && entry.plan->request == request) {
                    entry.used = ++clock_;
                    return entry.plan;
                }
        }
        auto made = makePlan(request);
        if (!made) return made;
        const std::lock_guard guard(lock_);
        auto& oldest = *std::min_element(entries_.begin(), entries_.end(),
                                         [](const Entry& a, const Entry& b) { return a.used < b.used; });
        oldest = {made, ++clock_};
        return made;
    }

  private:
    struct Entry {
        std::shared_ptr<const Plan> plan;
        unsigned long long used = 0;
    };
    std::mutex lock_;
    std::array<Entry, 16> entries_;
    unsigned long long clock_ = 0;
};

}  // namespace

std::shared_ptr<const Plan> planOf(const Request& request) {
    static Plans plans;
    return plans.of(request);
}

}  // namespace srk
