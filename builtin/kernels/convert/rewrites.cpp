#include "builtin/kernels/convert/rewrites.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "builtin/kernels/lines/rgbchroma.h"
#include "core/measure/fourcc.h"

namespace srk {

namespace {

size_t count(int n) { return static_cast<size_t>(n); }

int sizeOf(const StageList& list) { return static_cast<int>(list.stages.size()); }

// Calls each(index) for the stages of a kind that are in the list now, not for those that a call adds.
// Returns whether any call returned true.
template <class Each>
bool forEach(StageList& list, Work work, const Each& each) {
    bool any = false;
    for (int i = 0, n = sizeOf(list); i < n; ++i)
        if (list.at(i).work == work && each(i)) any = true;
    return any;
}

// The stage that a feed reads, if it is of this kind and read without an offset; otherwise null.
Stage* readOf(StageList& list, const Feed& feed, Work work) {
    if (feed.none() || !feed.straight()) return nullptr;
    Stage& stage = list.at(feed.stage);
    return stage.work == work ? &stage : nullptr;
}

bool isPixels(const Format& format) {
    return format.packing == Packing::bytes4 || format.packing == Packing::bytes3;
}

// --- Whole lines.

// Lines of the same format are copied.
bool linesCopied(const Route& route, StageList& list) {
    if (route.plain != Core::lines) return false;
    const Format& format = *route.target;
    StageList copied;
    Stage source;
    source.format = route.source;
    copied.add(source);
    for (int p = 0; p < format.planes(); ++p) {
        const int down = p ? format.down() : 1;
        Stage copy;
        copy.work = Work::copy;
        copy.reads[0] = {0, p};
        auto& gives = copy.gives[count(p)];
        gives.width = static_cast<int>(lineBytes(format, route.request.width, p));
        gives.target = p;
        if (gives.width > 0)
            copied.outputs.push_back({copied.add(copy), down, route.request.height / down, 0});
    }
    list = std::move(copied);
    return true;
}

// Pixels of three and of four bytes become each other without planes.
bool pixelsShuffled(const Route& route, StageList& list) {
    if (route.plain != Core::packed8) return false;
    Stage& pack = list.at(list.outputs.front().stage);
    pack.work = Work::shuffle;
    pack.reads = {};
    pack.reads[0] = {0, 0};
    list.sweep();
    return true;
}

// --- Steps without effect.

// Planes of 8 bits are read directly from the source.
bool sourceRead(const Route& route, StageList& list) {
    if (route.deep) return false;
    return forEach(list, Work::raise, [&](int i) {
        const Feed from = list.at(i).reads[0];
        for (int p = 0; p < 4; ++p) list.redirect(i, p, from);
        return true;
    });
}

// A plane that keeps its size is not scaled: its readers get offsets instead.
bool copiesDropped(const Route&, StageList& list) {
    return forEach(list, Work::down, [&](int i) {
        const Stage down = list.at(i);
        const Stage* across = readOf(list, down.reads[0], Work::across);
        if (!across || !down.down->axis.copies || !across->across->axis.copies) return false;
        Feed from = across->reads[0];
        from.down += down.down->axis.offset;
        from.across += across->across->axis.offset;
        for (int p = 0; p < 4; ++p) list.redirect(i, p, from);
        return true;
    });
}

// --- The pass down first, while lines are short.

// The work that remains for a plane that is scaled down first; none: it has to be scaled across first.
std::optional<Work> lastAfterDown(const AcrossPass& pass) {
    const int from = pass.axis.source, to = pass.axis.target;
    if (pass.axis.copies) return Work::downSamples;
    if (pass.mapping == Mapping{0, 2} && pass.filter == Filter::nearest && to == from / 2) return Work::evens;
    if (pass.mapping != Mapping{0, 0.5} || from != to / 2) return std::nullopt;
    if (pass.filter == Filter::nearest) return Work::twice;
    if (pass.filter == Filter::linear) return Work::between;
    return std::nullopt;
}

// A plane that is not scaled across, or by exactly two, can be scaled down first, on samples, if the weights
// fit. A pass across that takes means then rounds a second time.
bool downFirst(const Route& route, StageList& list) {
    return forEach(list, Work::down, [&](int i) {
        const Stage down = list.at(i);
        const Stage* across = readOf(list, down.reads[0], Work::across);
        if (!across) return false;
        const AcrossPass& pass = *across->across;
        const auto last = lastAfterDown(pass);
        const Axis& axis = down.down->axis;
        if (!last || (pass.axis.copies && axis.copies)) return false;
        auto weighed = std::make_shared<DownPass>(*down.down);
        if (!route.deep) weighed->bytes = downBytesWeights(axis);
        if (!route.deep && !axis.copies && axis.taps > 1 && weighed->bytes.empty()) return false;
        Feed from = across->reads[0];
        Stage samples = down;
        samples.work = Work::downSamples;
        samples.down = std::move(weighed);
        samples.reads[0] = from;
        if (last == Work::downSamples) {
            samples.reads[0].across += pass.axis.offset;
            list.at(i) = std::move(samples);
            return true;
        }
        for (auto& gives : samples.gives)
            if (gives.width > 0) gives.width = pass.axis.source;
        if (axis.copies)
            from.down += axis.offset;
        else
            from = {list.add(std::move(samples)), down.reads[0].plane};
        list.at(i).work = *last;
        list.at(i).reads[0] = from;
        return true;
    });
}

// --- RGB to luma and chroma of half its width.

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

// The stage that completes a plane of stage `change` at half its width, if nothing else reads that plane;
// otherwise -1. `filtered` is false if every second sample is dropped.
int chromaOfHalves(StageList& list, int change, int plane, bool& filtered) {
    for (int i = 0; i < sizeOf(list); ++i) {
        const Stage& last = list.at(i);
        Feed from = last.reads[0];
        if (last.work == Work::evens) {
            if (const Stage* down = readOf(list, from, Work::downSamples)) from = down->reads[0];
            filtered = false;
        } else if (last.work == Work::down) {
            const Stage* across = readOf(list, from, Work::across);
            if (!across || across->across->bytes.form != Across::halves) continue;
            from = across->reads[0];
            filtered = true;
        } else {
            continue;
        }
        if (from.is(change, plane)) return list.readers(change, plane) == 1 ? i : -1;
    }
    return -1;
}

// The pixels that a change reads unpacked, as pixels of four bytes.
Feed pixelsOf(const Route& route, StageList& list, const Stage& unpack, int unpackIndex) {
    const auto& fours = formats()[static_cast<size_t>(formatNumber(qvFourcc("BGR4")))];
    if (unpack.format->packing == Packing::bytes4) return unpack.reads[0];
    Stage stage;
    stage.gives[0].width = static_cast<int>(lineBytes(fours, route.request.sourceWidth, 0));
    stage.format = &fours;
    stage.pixels = route.request.sourceWidth;
    if (unpack.format->packing == Packing::bytes3) {
        stage.work = Work::shuffle;
        stage.reads[0] = unpack.reads[0];
    } else {
        stage.work = Work::pack;
        for (int p = 0; p < 3; ++p) stage.reads[count(p)] = {unpackIndex, p};
    }
    return {list.add(std::move(stage)), 0};
}

// Chroma of every second pixel is filtered before the matrix, which saves three of four products and a
// rounding.
bool chromaBeforeMatrix(const Route& route, StageList& list) {
    const Request& request = route.request;
    if (route.deep || route.change != Change::toYuv || route.target->across() != 2) return false;
    if (request.across != Mapping{} || request.width != request.sourceWidth) return false;
    const auto found = std::find_if(list.stages.begin(), list.stages.end(),
                                    [](const Stage& stage) { return stage.work == Work::change; });
    if (found == list.stages.end()) return false;
    const int change = static_cast<int>(found - list.stages.begin());
    const int unpackIndex = found->reads[0].stage;
    const Stage unpack = list.at(unpackIndex);
    // Luma that is not scaled is written or packed at once.
    Stage* luma = nullptr;
    if (!list.onlyReader(change, 0, &luma) || (luma->work != Work::lower && luma->work != Work::pack))
        return false;
    bool filtered = false;
    const int u = chromaOfHalves(list, change, 1, filtered), v = chromaOfHalves(list, change, 2, filtered);
    if (u < 0 || v < 0) return false;
    auto down = std::make_shared<DownPass>(*list.at(u).down);
    down->pixels = pixelWeights(down->axis);
    if (down->pixels.empty()) return false;

    const Feed pixels = pixelsOf(route, list, unpack, unpackIndex);
    Stage ofLuma;
    ofLuma.work = Work::pixelLuma;
    ofLuma.reads[0] = pixels;
    ofLuma.gives[0].width = request.sourceWidth;
    list.redirect(change, 0, {list.add(std::move(ofLuma)), 0});
    Stage ofChroma;
    ofChroma.work = Work::pixelChroma;
    ofChroma.halves = filtered;
    ofChroma.reads[0] = pixels;
    ofChroma.gives[1].width = ofChroma.gives[2].width = request.width / 2;
    ofChroma.down = std::move(down);
    const int chroma = list.add(std::move(ofChroma));
    list.redirect(u, 1, {chroma, 1});
    list.redirect(v, 2, {chroma, 2});
    return true;
}

// --- Packed 4:2:2 to chroma of fewer lines.

// Weights of the pass down as packedToChroma takes them; empty: they do not fit.
std::vector<Byte> packedWeights(const Axis& down) {
    if (down.copies || down.taps == 1) return {0, 0, 0, 0};
    if (down.taps != 4) return {};
    std::vector<Byte> weights;
    weights.reserve(down.weights.size());
    for (const int weight : down.weights) {
        if (weight < 0 || weight >= unity) return {};
        weights.push_back(static_cast<Byte>(weight));
    }
    return weights;
}

// The stage that scales a plane of an unpacked picture down and keeps its width, if nothing else reads that
// plane; otherwise -1.
int onlyScaledDown(StageList& list, int unpack, int plane) {
    Stage* reader = nullptr;
    const Feed* feed = list.onlyReader(unpack, plane, &reader);
    const bool fits = feed && feed->straight() && reader->work == Work::downSamples &&
                      reader->gives[count(plane)].width == list.at(unpack).gives[count(plane)].width;
    return fits ? static_cast<int>(reader - list.stages.data()) : -1;
}

// The stage that scales chroma down reads it from the packed pixels itself.
bool chromaFromPacked(const Route& route, StageList& list) {
    if (route.deep) return false;
    return forEach(list, Work::unpack, [&](int i) {
        const Stage unpack = list.at(i);
        if (unpack.format->packing != Packing::yuyv && unpack.format->packing != Packing::uyvy) return false;
        const int u = onlyScaledDown(list, i, 1), v = onlyScaledDown(list, i, 2);
        if (u < 0 || v < 0) return false;
        auto down = std::make_shared<DownPass>(*list.at(u).down);
        down->pixels = packedWeights(down->axis);
        if (down->pixels.empty()) return false;
        Stage chroma = unpack;
        chroma.work = Work::packedChroma;
        chroma.gives[0].width = 0;
        chroma.down = std::move(down);
        const int made = list.add(std::move(chroma));
        list.redirect(u, 1, {made, 1});
        list.redirect(v, 2, {made, 2});
        list.at(i).work = Work::packedLuma;
        list.at(i).gives[1].width = list.at(i).gives[2].width = 0;
        return true;
    });
}

// --- Two stages in one.

bool matrixOfPixels(const Route& route, StageList& list) {
    if (route.deep || route.change != Change::toYuv) return false;
    return forEach(list, Work::change, [&](int i) {
        const Stage* unpack = readOf(list, list.at(i).reads[0], Work::unpack);
        if (!unpack || unpack->format->packing != Packing::bytes4) return false;
        const Feed pixels = unpack->reads[0];
        list.at(i).work = Work::unpackToYuv;
        list.at(i).reads = {};
        list.at(i).reads[0] = pixels;
        return true;
    });
}

bool matrixIntoPixels(const Route& route, StageList& list) {
    if (route.deep || route.change != Change::toRgb || route.alpha) return false;
    return forEach(list, Work::pack, [&](int i) {
        const Stage* change = readOf(list, list.at(i).reads[0], Work::change);
        if (!change || !isPixels(*list.at(i).format)) return false;
        list.at(i).work = Work::packFromYuv;
        list.at(i).reads = change->reads;
        return true;
    });
}

// The matrix repeats the chroma samples that it reads.
bool chromaRepeatedByMatrix(const Route&, StageList& list) {
    return forEach(list, Work::packFromYuv, [&](int i) {
        auto& reads = list.at(i).reads;
        const Stage* u = readOf(list, reads[1], Work::twice);
        const Stage* v = readOf(list, reads[2], Work::twice);
        if (!u || !v) return false;
        list.at(i).halves = true;
        reads[1] = u->reads[0];
        reads[2] = v->reads[0];
        return true;
    });
}

// --- Less of a line, or none.

// Samples that a crop cuts off are not raised.
bool raiseTrimmed(const Route&, StageList& list) {
    return forEach(list, Work::raise, [&](int i) {
        for (int p = 0; p < 4; ++p) {
            Stage* reader = nullptr;
            Feed* feed = list.at(i).gives[count(p)].width ? list.onlyReader(i, p, &reader) : nullptr;
            if (!feed || reader->work != Work::lower) continue;
            const int width = reader->gives[count(p)].width;
            if (feed->straight() && list.at(i).gives[count(p)].width == width) continue;
            list.at(i).reads[0].down += feed->down;
            list.at(i).reads[0].across += feed->across;
            list.at(i).gives[count(p)].width = width;
            feed->down = feed->across = 0;
            return true;
        }
        return false;
    });
}

// A stage whose samples already have the target's form writes into the target's lines directly.
bool madeInTarget(const Route&, StageList& list) {
    bool any = false;
    for (auto& output : list.outputs) {
        const Stage& lower = list.at(output.stage);
        if (lower.work != Work::lower) continue;
        const Feed from = lower.reads[0];
        Stage& maker = list.at(from.stage);
        const bool same = lower.words ? maker.words && lower.bits == 16 : !maker.words;
        if (!same || from.across != 0 || maker.work == Work::source || maker.work == Work::neutral) continue;
        const auto own = std::find_if(lower.gives.begin(), lower.gives.end(),
                                      [](const Buffer& buffer) { return buffer.target >= 0; });
        Buffer& gives = maker.gives[count(from.plane)];
        if (gives.width != own->width || list.readers(from.stage, from.plane) != 1) continue;
        gives.target = own->target;
        gives.shift = from.down;
        output.stage = from.stage;
        output.shift = from.down;
        any = true;
    }
    return any;
}

// Chroma of a target that has none is not worked out.
bool unreadDropped(const Route& route, StageList& list) {
    if (route.change != Change::toYuv) return false;
    bool any = false;
    for (const Work work : {Work::change, Work::unpackToYuv})
        any |= forEach(list, work, [&](int i) {
            if (list.readers(i, 1) || list.readers(i, 2)) return false;
            for (const size_t p : {size_t{1}, size_t{2}}) list.at(i).gives[p].width = 0;
            return true;
        });
    return any;
}

constexpr Rewrite rows[] = {
    {"lines copied", linesCopied},
    {"pixels shuffled", pixelsShuffled},
    {"source read", sourceRead},
    {"copies dropped", copiesDropped},
    {"down first", downFirst, true},
    {"chroma before matrix", chromaBeforeMatrix, true, true},
    {"chroma from packed", chromaFromPacked},
    {"matrix of pixels", matrixOfPixels},
    {"matrix into pixels", matrixIntoPixels},
    {"chroma repeated by matrix", chromaRepeatedByMatrix},
    {"raise trimmed", raiseTrimmed},
    {"made in target", madeInTarget},
    {"unread dropped", unreadDropped},
};

}  // namespace

std::span<const Rewrite> rewrites() { return rows; }

}  // namespace srk
