// Carries out a list of stages over one band: each line of the target pulls the lines that it needs, so that
// what lies between the pictures stays in the cache.
#include <algorithm>
#include <array>
#include <bit>
#include <cstring>

#include "builtin/kernels/convert/plan.h"
#include "builtin/kernels/convert/workspace.h"
#include "builtin/kernels/lines/lines.h"
#include "builtin/kernels/lines/packedchroma.h"
#include "builtin/kernels/lines/rgbchroma.h"
#include "builtin/kernels/lines/rows16.h"
#include "builtin/kernels/lines/rows8.h"
#include "builtin/kernels/lines/yuvrgb.h"
#include "builtin/kernels/scale/deep.h"

namespace srk {

namespace {

size_t count(int n) { return static_cast<size_t>(n); }

// One field of a picture.
Picture fieldOf(Picture picture, int fields, int field) {
    for (auto& plane : picture.planes) {
        if (!plane.data) continue;
        plane.data += plane.stride * field;
        plane.stride *= fields;
    }
    return picture;
}

Byte* lineOf(const Picture& picture, int plane, int y) {
    const Plane& at = picture.planes[count(plane)];
    return at.data + at.stride * y;
}

template <class T>
T* as(Byte* line) {
    return reinterpret_cast<T*>(line);
}
template <class T>
const T* as(const Byte* line) {
    return reinterpret_cast<const T*>(line);
}

class Band {
  public:
    Band(const Plan& plan, Workspace& workspace, const Picture& source, const Picture& target, int field,
         int first, int last)
        : plan_(plan),
          list_(plan.lists[count(field)]),
          workspace_(workspace),
          source_(source),
          target_(target),
          first_(first),
          last_(last),
          tags_(workspace.tags.data()) {
        std::fill(workspace_.tags.begin(), workspace_.tags.end(), -1);
        for (int p = 0; p < target.format->planes(); ++p) {
            const int down = p ? target.format->down() : 1;
            const Plane& at = target.planes[p];
            const bool odd = (reinterpret_cast<uintptr_t>(at.data) | static_cast<size_t>(at.stride)) & 1;
            planes_[count(p)] = {(first + down - 1) / down, (last + down - 1) / down, !odd};
        }
    }

    void run() {
        if (list_.apart) {
            for (const auto& output : list_.outputs) runAlone(output);
            return;
        }
        for (int y = first_; y < last_; ++y)
            for (const auto& output : list_.outputs) {
                if (y & (output.down - 1)) continue;  // 1, 2 or 4
                const int line = y >> std::countr_zero(static_cast<unsigned>(output.down));
                if (line < output.lines) made(list_.at(output.stage), line + output.shift);
            }
    }

  private:
    using Places = std::array<Byte*, 4>;
    struct TargetPlane {
        int first, last;  // lines of this band
        bool aligned;     // words may be written
    };

    // All lines of one output in a row: memory is fastest when it is accessed in order.
    void runAlone(const Output& output) {
        const Stage& stage = list_.at(output.stage);
        const int first = (first_ + output.down - 1) / output.down,
                  last = std::min((last_ + output.down - 1) / output.down, output.lines);
        if (stage.work == Work::copy) return copyLines(stage, first, last);
        for (int y = first; y < last; ++y) made(stage, y + output.shift);
    }

    void copyLines(const Stage& stage, int first, int last) const {
        const int plane = stage.plane;
        const size_t bytes = count(stage.gives[count(plane)].width);
        for (int y = first; y < last; ++y)
            std::memmove(lineOf(target_, plane, y), lineOf(source_, plane, y), bytes);
    }

    // --- Where lines are.

    // A line of the target, if it belongs to this band and the stage can write there.
    Byte* targetLine(const Stage& stage, const Buffer& buffer, int y) const {
        const TargetPlane& plane = planes_[count(buffer.target)];
        const int line = y - buffer.shift;
        if (line < plane.first || line >= plane.last || !(plane.aligned || stage.anywhere)) return nullptr;
        return lineOf(target_, buffer.target, line);
    }

    Byte* keptLine(const Stage& stage, const Buffer& buffer, int y) const {
        const size_t slot = count(y) & count(stage.slots - 1);
        return workspace_.lines.get() + buffer.offset + slot * buffer.stride;
    }

    Byte* placeOf(const Stage& stage, int plane, int y) const {
        const Buffer& buffer = stage.gives[count(plane)];
        if (buffer.width == 0) return nullptr;
        Byte* const at = buffer.target < 0 ? nullptr : targetLine(stage, buffer, y);
        return at ? at : keptLine(stage, buffer, y);
    }

    Places placesOf(const Stage& stage, int y) const {
        return {placeOf(stage, 0, y), placeOf(stage, 1, y), placeOf(stage, 2, y), placeOf(stage, 3, y)};
    }

    // What a feed reads for line y of its reader.
    const Byte* read(const Feed& feed, int y) {
        const Stage& stage = list_.at(feed.stage);
        return lineOfStage(stage, feed.plane, y + feed.down) + count(feed.across) * stage.item;
    }

    const Byte* readOrNull(const Feed& feed, int y) { return feed.none() ? nullptr : read(feed, y); }

    const Byte* lineOfStage(const Stage& stage, int plane, int y) {
        if (stage.work == Work::source) return lineOf(source_, plane, y);
        if (stage.work == Work::neutral) return workspace_.neutral.get();
        if (stage.work == Work::downSamples)
            if (const Byte* whole = tapTakenWhole(stage, y)) return whole;
        made(stage, y);
        return placeOf(stage, plane, y);
    }

    // Makes the lines y of a stage, unless they are there.
    void made(const Stage& stage, int y) {
        int& tag = tags_[stage.tags + (y & (stage.slots - 1))];
        if (tag != y) makeAll(stage, y, tag);
    }

    void makeAll(const Stage& stage, int y, int& tag) {
        if (stage.plane >= 0) {
            Byte* const to = placeOf(stage, stage.plane, y);
            makePlane(stage, y, to, stage.gives[count(stage.plane)].width);
            if (!stage.anywhere) copyToUnaligned(stage, stage.plane, y, to);
        } else {
            const Places places = placesOf(stage, y);
            makePlanes(stage, y, places);
            if (!stage.anywhere)
                for (int p = 0; p < 4; ++p) copyToUnaligned(stage, p, y, places[count(p)]);
        }
        tag = y;
    }

    // Copies a line of words that could not be written directly, as the target has odd addresses.
    void copyToUnaligned(const Stage& stage, int p, int y, const Byte* from) const {
        const Buffer& buffer = stage.gives[count(p)];
        if (buffer.target < 0) return;
        const TargetPlane& plane = planes_[count(buffer.target)];
        const int line = y - buffer.shift;
        if (plane.aligned || line < plane.first || line >= plane.last) return;
        std::memcpy(lineOf(target_, buffer.target, line), from, 2 * count(buffer.width));
    }

    // --- Work.

    // A line of `n` items of the one plane that a stage gives.
    void makePlane(const Stage& stage, int y, Byte* to, int n) {
        switch (stage.work) {
            case Work::raise: return raise(stage, read(stage.reads[0], y), to, count(n));
            case Work::across: return across(stage, read(stage.reads[0], y), to);
            case Work::down: return down(stage, y, to, n);
            case Work::downSamples: return downSamples(stage, y, to, n);
            case Work::twice:
            case Work::between:
            case Work::evens: return spread(stage, read(stage.reads[0], y), to, n);
            case Work::lower: return lower(stage, read(stage.reads[0], y), to, count(n));
            case Work::pack: return pack(stage, y, to);
            case Work::shuffle: return shuffle(stage, read(stage.reads[0], y), to);
            case Work::packFromYuv: return packFromYuv(stage, y, to);
            case Work::pixelLuma: return rgb4ToLuma(*plan_.rows.toYuv, read(stage.reads[0], y), to, count(n));
            case Work::packedLuma:
                return packedToLuma(read(stage.reads[0], y), to, count(n),
                                    stage.format->packing == Packing::yuyv);
            default: {
                Places places{};
                places[count(stage.plane)] = to;
                makePlanes(stage, y, places);
            }
        }
    }

    // Lines of several planes at once; null: not wanted.
    void makePlanes(const Stage& stage, int y, const Places& to) {
        switch (stage.work) {
            case Work::unpack: return unpack(stage, y, to);
            case Work::change: return change(stage, y, to);
            case Work::unpackToYuv:
                return rgb4ToYuv(*plan_.rows.toYuv, read(stage.reads[0], y), to[0], to[1], to[2],
                                 count(stage.gives[0].width));
            case Work::pixelChroma: return pixelChroma(stage, y, to);
            case Work::packedChroma: return packedChroma(stage, y, to);
            default: return;
        }
    }

    void unpack(const Stage& stage, int y, const Places& to) {
        const Byte* const from = read(stage.reads[0], y);
        const int width = stage.gives[0].width;
        if (stage.words)
            unpackLine(
                *stage.format, from, readOrNull(stage.reads[1], y),
                Line16{{as<uint16_t>(to[0]), as<uint16_t>(to[1]), as<uint16_t>(to[2]), as<uint16_t>(to[3])}},
                width);
        else
            unpackLine(*stage.format, from, Line8{{to[0], to[1], to[2], to[3]}}, width);
    }

    static void raise(const Stage& stage, const Byte* from, Byte* to, size_t n) {
        if (!stage.words)
            std::memcpy(to, from, n);
        else if (stage.bits == 8)
            widen(as<uint16_t>(to), from, n, stage.full);
        else
            raiseWords(as<uint16_t>(to), from, n, stage.bits);
    }

    void lower(const Stage& stage, const Byte* from, Byte* to, size_t n) const {
        if (!plan_.route.deep)
            std::memmove(to, from, n);
        else if (stage.bits == 8)
            narrow(to, as<uint16_t>(from), n, stage.full);
        else
            lowerWords(to, as<uint16_t>(from), n, stage.bits);
    }

    void change(const Stage& stage, int y, const Places& to) {
        const Byte* from[3];
        for (size_t p = 0; p < 3; ++p) from[p] = read(stage.reads[p], y);
        const size_t n = count(stage.gives[0].width);
        if (stage.words) {
            const uint16_t* const words[3] = {as<uint16_t>(from[0]), as<uint16_t>(from[1]),
                                              as<uint16_t>(from[2])};
            uint16_t* const made[3] = {as<uint16_t>(to[0]), as<uint16_t>(to[1]), as<uint16_t>(to[2])};
            return deepMatrix(plan_.rows.deep, words, made, n);
        }
        switch (plan_.route.change) {
            case Change::none: return;
            case Change::toYuv:
                return rgbToYuv(*plan_.rows.toYuv, from[0], from[1], from[2], to[0], to[1], to[2], n);
            case Change::toRgb:
                return yuvToRgb(*plan_.rows.toRgb, from[0], from[1], from[2], to[0], to[1], to[2], n);
            case Change::otherMatrix:
                for (size_t p = 0; p < 3; ++p) std::memcpy(to[p], from[p], n);
                return yuvToOther(*plan_.rows.toOther, to[0], to[1], to[2], n);
            case Change::levels:
                for (size_t p = 0; p < 3; ++p)
                    (plan_.rows.toVideo ? toVideoLevels : toFullLevels)(to[p], from[p], n);
                return;
        }
    }

    void across(const Stage& stage, const Byte* line, Byte* to) const {
        const AcrossPass& pass = *stage.across;
        if (stage.words)
            return deepAcross(pass.axis, pass.words, as<uint16_t>(line), workspace_.paddedWide.get(),
                              as<float>(to));
        if (pass.bytes.form != Across::copy) {
            Byte* const padded = workspace_.padded.get() + beforeLine;
            padLine(padded, line, pass.axis.source);
            line = padded;
        }
        scaleAcross(pass.bytes, line, as<int16_t>(to));
    }

    void down(const Stage& stage, int y, Byte* to, int n) {
        const Axis& axis = stage.down->axis;
        const size_t first = count(y) * count(axis.taps);
        const Byte* lines[maxTaps];
        window(stage, y, lines);
        if (stage.words) {
            static constexpr float one = 1;
            const float* sums[maxTaps];
            for (int t = 0; t < axis.taps; ++t) sums[t] = as<float>(lines[t]);
            return deepDown(sums, axis.copies ? &one : axis.exact.data() + first, axis.taps, as<uint16_t>(to),
                            count(n));
        }
        const int16_t* sums[maxTaps];
        for (int t = 0; t < axis.taps; ++t) sums[t] = as<int16_t>(lines[t]);
        scaleDown(sums, axis.copies ? nullptr : axis.weights.data() + first, axis.taps, to, n);
    }

    // The lines of all taps; those beyond the ends repeat the end.
    void window(const Stage& stage, int y, const Byte** lines) {
        const Axis& axis = stage.down->axis;
        const int start = axis.copies ? y + axis.offset : axis.start[count(y)], last = axis.source - 1;
        const Feed& feed = stage.reads[0];
        const Stage& from = list_.at(feed.stage);
        const Buffer& buffer = from.gives[count(feed.plane)];
        if (from.work != Work::across) {
            for (int t = 0; t < axis.taps; ++t) lines[t] = read(feed, std::clamp(start + t, 0, last));
            return;
        }
        const Byte* const kept = workspace_.lines.get() + buffer.offset;
        const int mask = from.slots - 1;
        for (int t = 0; t < axis.taps; ++t) {
            const int line = std::clamp(start + t, 0, last);
            made(from, line);
            lines[t] = kept + count(line & mask) * buffer.stride;
        }
    }

    // The source line whose tap has all of the weight, so that it can be copied; null if there is no such
    // tap.
    const Byte* tapTakenWhole(const Stage& stage, int y) {
        const Axis& axis = stage.down->axis;
        const int start = axis.copies ? y + axis.offset : axis.start[count(y)];
        const size_t first = count(y) * count(axis.taps);
        for (int t = 0; t < axis.taps; ++t)
            if (axis.copies || axis.taps == 1 ||
                (stage.words ? axis.exact[first + count(t)] == 1 : axis.weights[first + count(t)] == unity))
                return read(stage.reads[0], std::clamp(start + t, 0, axis.source - 1));
        return nullptr;
    }

    void downSamples(const Stage& stage, int y, Byte* to, int n) {
        const Axis& axis = stage.down->axis;
        // Without a target only its readers ask for lines, and they have checked already.
        const bool look = stage.gives[count(stage.plane)].target >= 0;
        if (const Byte* whole = look ? tapTakenWhole(stage, y) : nullptr) {
            std::memcpy(to, whole, count(n) * stage.item);
            return;
        }
        const size_t first = count(y) * count(axis.taps);
        const Byte* lines[maxTaps];
        window(stage, y, lines);
        if (!stage.words) return scaleDownBytes(lines, stage.down->bytes.data() + first, axis.taps, to, n);
        const uint16_t* words[maxTaps];
        for (int t = 0; t < axis.taps; ++t) words[t] = as<uint16_t>(lines[t]);
        deepDown(words, axis.exact.data() + first, axis.taps, as<uint16_t>(to), count(n));
    }

    static void spread(const Stage& stage, const Byte* from, Byte* to, int n) {
        if (stage.words)
            spreadLine(stage.work, as<uint16_t>(to), as<uint16_t>(from), n);
        else
            spreadLine(stage.work, to, from, n);
    }

    template <class S>
    static void spreadLine(Work work, S* to, const S* from, int width) {
        if (work == Work::between) return doubleLine(to, from, count(width));
        if (work == Work::evens) return evens(to, from, count(width));
        twice(to, from, count(width / 2));
        if (width & 1) to[width - 1] = from[width / 2 - 1];
    }

    void pack(const Stage& stage, int y, Byte* to) {
        const Byte* from[4];
        for (size_t p = 0; p < 4; ++p) from[p] = readOrNull(stage.reads[p], y);
        const auto bytes = [&](size_t p) { return const_cast<Byte*>(from[p]); };
        const auto words = [&](size_t p) { return as<uint16_t>(bytes(p)); };
        if (!stage.words)
            return packLine(*stage.format, Line8{{bytes(0), bytes(1), bytes(2), bytes(3)}}, to, stage.pixels);
        Byte* const chroma = stage.format->packing == Packing::nv16 ? lineOf(target_, 1, y) : nullptr;
        packLine(*stage.format, Line16{{words(0), words(1), words(2), words(3)}}, to, chroma, stage.pixels);
    }

    void shuffle(const Stage& stage, const Byte* from, Byte* to) const {
        const size_t n = count(stage.pixels);
        const bool fromFours = source_.format->packing == Packing::bytes4,
                   toFours = stage.format->packing == Packing::bytes4;
        if (fromFours && toFours)
            std::memmove(to, from, 4 * n);
        else
            (fromFours ? pack4to3 : pack3to4)(to, from, n);
    }

    void packFromYuv(const Stage& stage, int y, Byte* to) {
        const Byte* from[3];
        for (size_t p = 0; p < 3; ++p) from[p] = read(stage.reads[p], y);
        const auto kernel = stage.format->packing == Packing::bytes4 ? yuvToRgb4 : yuvToRgb3;
        kernel(*plan_.rows.toRgb, from[0], from[1], from[2], to, count(stage.pixels), stage.halves);
    }

    // Fills in four lines of pixels and returns their weights. With fewer taps the last line is repeated.
    const Byte* fourLines(const Stage& stage, int y, const Byte** lines) {
        const int taps = stage.down->axis.taps;
        window(stage, y, lines);
        for (int t = taps; t < 4; ++t) lines[t] = lines[taps - 1];
        return stage.down->pixels.data() + (taps > 1 ? 4 * count(y) : 0);
    }

    void pixelChroma(const Stage& stage, int y, const Places& to) {
        const Byte* lines[maxTaps];
        const Byte* const weights = fourLines(stage, y, lines);
        rgb4ToChroma(*plan_.rows.toYuv, lines, weights, stage.halves, to[1], to[2],
                     count(plan_.route.request.sourceWidth));
    }

    void packedChroma(const Stage& stage, int y, const Places& to) {
        const Byte* lines[maxTaps];
        const Byte* const weights = fourLines(stage, y, lines);
        packedToChroma(lines, stage.down->axis.taps > 1 ? weights : nullptr, to[1], to[2],
                       count(stage.gives[1].width), stage.format->packing == Packing::yuyv);
    }

    const Plan& plan_;
    const StageList& list_;
    Workspace& workspace_;
    const Picture &source_, &target_;
    const int first_, last_;
    int* const tags_;
    std::array<TargetPlane, 3> planes_{};
};

}  // namespace

void runBand(const Plan& plan, Workspace& workspace, const Picture& source, const Picture& target, int field,
             int first, int last) {
    const int fields = plan.route.fields;
    const Picture from = fieldOf(source, fields, field), to = fieldOf(target, fields, field);
    Band(plan, workspace, from, to, field, first, last).run();
}

}  // namespace srk
