#include "builtin/kernels/convert/basicstages.h"

#include <algorithm>
#include <cmath>
#include <utility>

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

struct Passes {
    std::shared_ptr<const AcrossPass> across;
    std::shared_ptr<const DownPass> down;
    bool empty() const { return across->axis.source == 0 || down->axis.source == 0; }
};

struct Side {
    Mapping across, down;
    int width = 0, height = 0;
    const Format* chroma = nullptr;  // whose grid chroma lies on; null: that of luma
};

class Builder {
  public:
    Builder(const Route& route, int field) : route_(route), request_(route.request), field_(field) {}

    StageList build() {
        read();
        const Format* from = route_.source->family() == Family::yuv ? route_.source : nullptr;
        const Format* to = route_.target->family() == Family::yuv ? route_.target : nullptr;
        if (route_.change == Change::toYuv) change();
        // Another matrix needs chroma at luma's size.
        const bool changed = route_.change == Change::otherMatrix;
        scale(from, changed ? nullptr : to, request_.across, request_.down, request_.sourceWidth,
              request_.sourceHeight);
        if (route_.change != Change::toYuv && route_.change != Change::none) change();
        if (changed && (to->across() > 1 || to->down() > 1))
            scale(nullptr, to, {}, {}, request_.width, request_.height);
        write();
        list_.sweep();
        return std::move(list_);
    }

  private:
    int planes() const { return route_.alpha ? 4 : 3; }
    static bool isChroma(int plane) { return plane == 1 || plane == 2; }
    int lines(int n) const { return fieldLines(n, route_.fields, field_); }

    Stage& make(Work work, int plane, int width) {
        Stage stage;
        stage.work = work;
        stage.words = route_.deep;
        stage.gives[static_cast<size_t>(plane)].width = width;
        const int index = list_.add(std::move(stage));
        return list_.at(index);
    }
    int last() const { return static_cast<int>(list_.stages.size()) - 1; }

    // `plane` is from now on what the last stage gives.
    void take(int plane) { feeds_[static_cast<size_t>(plane)] = {last(), plane}; }
    Feed& feed(int plane) { return feeds_[static_cast<size_t>(plane)]; }

    void neutral(int plane, int width) {
        make(Work::neutral, 0, std::max(width, 1));
        feed(plane) = {last(), 0};
    }

    void read() {
        const Format& format = *route_.source;
        make(Work::source, 0, 0).format = &format;
        const int width = request_.sourceWidth;
        if (!format.planar()) return unpack(width);
        for (int p = 0; p < 3; ++p) {
            if (p > 0 && format.has(lumaOnly)) {
                neutral(p, width);
                continue;
            }
            Stage& stage = make(Work::raise, p, p ? width / format.across() : width);
            stage.reads[0] = {0, p};
            stage.bits = format.packing == Packing::planar16 ? request_.sourceDepth : 8;
            take(p);
        }
    }

    void unpack(int width) {
        const Format& format = *route_.source;
        Stage& stage = make(Work::unpack, 0, width);
        stage.format = &format;
        stage.words = format.deep();
        stage.reads[0] = {0, 0};
        if (format.packing == Packing::nv16) stage.reads[1] = {0, 1};
        for (int p = 1; p < planes(); ++p)
            stage.gives[static_cast<size_t>(p)].width = isChroma(p) ? width / format.across() : width;
        for (int p = 0; p < planes(); ++p) take(p);
        if (route_.deep && !format.deep())
            for (int p = 0; p < planes(); ++p) {
                Stage& raised = make(Work::raise, p, isChroma(p) ? width / format.across() : width);
                raised.reads[0] = feed(p);
                raised.full = fullRange(format, p);
                take(p);
            }
    }

    void change() {
        const int width = route_.change == Change::toYuv ? request_.sourceWidth : request_.width;
        Stage& stage = make(Work::change, 0, width);
        for (int p = 0; p < 3; ++p) {
            stage.reads[static_cast<size_t>(p)] = feed(p);
            stage.gives[static_cast<size_t>(p)].width = width;
        }
        for (int p = 0; p < 3; ++p) take(p);
    }

    // Chroma that keeps its place over luma of unchanged size is interpolated linearly by the standard
    // filter.
    Filter chromaFilter(const Mapping& luma) const {
        return request_.standard && std::abs(luma.step) == 1 ? Filter::linear : request_.filter;
    }

    Axis axis(const Mapping& mapping, int source, int target, Filter filter) const {
        if (source > 0 && target > 0) return makeAxis(mapping, source, target, filter, route_.deep);
        Axis none;
        none.source = 0;
        none.target = std::max(target, 0);
        return none;
    }

    Passes passes(const Mapping& across, Filter filterAcross, int sourceWidth, int width, const Mapping& down,
                  Filter filterDown, int sourceLines, int targetLines) const {
        auto a = std::make_shared<AcrossPass>();
        auto d = std::make_shared<DownPass>();
        a->mapping = across;
        a->filter = filterAcross;
        a->axis = axis(across, sourceWidth, width, filterAcross);
        d->axis = axis(down, sourceLines, targetLines, filterDown);
        if (a->axis.source > 0 && d->axis.source > 0) {
            if (route_.deep)
                a->words = makeDeepAcross(a->axis);
            else
                a->bytes = makeAcross(a->axis);
        }
        return {std::move(a), std::move(d)};
    }

    // `from` and `to`: on whose grids chroma lies; null: that of luma.
    void scale(const Format* from, const Format* to, const Mapping& across, const Mapping& downFrame,
               int sourceWidth, int sourceHeight) {
        const Mapping down = fieldMapping(downFrame, route_.fields, field_);
        const Passes luma = passes(across, request_.filter, sourceWidth, request_.width, down,
                                   request_.filter, lines(sourceHeight), lines(request_.height));
        Siting fromAcross, fromDown, toAcross, toDown;
        if (from) {
            fromAcross = {from->across(), from->acrossOffset()};
            fromDown = {from->down(), chromaOffset(*from, route_.fields, field_)};
        }
        if (to) {
            toAcross = {to->across(), to->acrossOffset()};
            toDown = {to->down(), chromaOffset(*to, route_.fields, field_)};
        }
        const Passes chroma =
            passes(chromaMapping(across, fromAcross, toAcross), chromaFilter(across),
                   sourceWidth / fromAcross.factor, request_.width / toAcross.factor,
                   chromaMapping(down, fromDown, toDown), chromaFilter(down),
                   lines(sourceHeight / fromDown.factor), lines(request_.height / toDown.factor));
        for (int p = 0; p < planes(); ++p) scalePlane(p, isChroma(p) ? chroma : luma);
    }

    void scalePlane(int plane, const Passes& by) {
        const int width = by.across->axis.target;
        if (by.empty()) return neutral(plane, width);
        if (list_.at(feed(plane).stage).work == Work::neutral) return neutral(plane, width);
        Stage& across = make(Work::across, plane, width);
        across.across = by.across;
        across.reads[0] = feed(plane);
        take(plane);
        Stage& down = make(Work::down, plane, width);
        down.down = by.down;
        down.reads[0] = feed(plane);
        take(plane);
    }

    Stage& lower(int plane, int width, bool full, int bits) {
        Stage& stage = make(Work::lower, plane, width);
        stage.reads[0] = feed(plane);
        stage.full = full;
        stage.bits = bits;
        stage.words = route_.deep && bits > 8;
        take(plane);
        return stage;
    }

    void write() {
        const Format& format = *route_.target;
        if (!format.planar()) return pack();
        for (int p = 0; p < format.planes(); ++p) {
            const int down = p ? format.down() : 1,
                      width = p ? request_.width / format.across() : request_.width;
            const int height = lines(request_.height / down);
            if (width == 0 || height == 0) continue;
            const int bits = format.packing == Packing::planar16 ? request_.targetDepth : 8;
            lower(p, width, false, bits).gives[static_cast<size_t>(p)].target = p;
            list_.outputs.push_back({last(), down, height, 0});
        }
    }

    void pack() {
        const Format& format = *route_.target;
        if (route_.deep && !format.deep())
            for (int p = 0; p < planes(); ++p)
                lower(p, isChroma(p) ? request_.width / format.across() : request_.width,
                      fullRange(format, p), 8);
        Stage& stage = make(Work::pack, 0, static_cast<int>(lineBytes(format, request_.width, 0)));
        stage.words = format.deep();
        stage.format = &format;
        stage.pixels = request_.width;
        stage.gives[0].target = 0;
        for (int p = 0; p < planes(); ++p) stage.reads[static_cast<size_t>(p)] = feed(p);
        list_.outputs.push_back({last(), 1, lines(request_.height), 0});
    }

    const Route& route_;
    const Request& request_;
    const int field_;
    StageList list_;
    std::array<Feed, 4> feeds_;
};

}  // namespace

StageList basicStages(const Route& route, int field) { return Builder(route, field).build(); }

}  // namespace srk
