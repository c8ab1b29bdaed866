#include "builtin/kernels/convert/pipeline.h"

#include <algorithm>
#include <array>
#include <cstring>

#include "builtin/kernels/lines/lines.h"
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
    const Plane& at = picture.planes[std::min(plane, 2)];
    return at.data + at.stride * y;
}

// Full-level samples reach to the end of their range; all others are 256 times as large with 16 bits.
bool fullRange(const Format& format, int plane) { return plane == 3 || format.family() == Family::rgb; }

template <class S>
class Band {
  public:
    Band(const Plan& plan, Lines<S>& lines, const Picture& source, const Picture& target, int field,
         int first, int last)
        : plan_(plan),
          lines_(lines),
          source_(source),
          target_(target),
          field_(field),
          first_(first),
          last_(last) {
        lines_.forget();
        const Group& luma = scaling(0).luma;
        lumaInPlace_ = !deep && luma.copies() && luma.across.offset == 0 &&
                       luma.across.source == plan.request.width && !hasMatrix() && !source.format->planar() &&
                       target.format->planar();
    }

    void targetLine(int y) {
        const Format& format = *target_.format;
        if (!format.planar()) return packTarget(y);
        planeInto(0, y);
        if (format.planes() == 1 || y % format.down()) return;
        const int chroma = y / format.down();
        if (chroma >= chromaGroup().down.target) return;
        if (plan_.pixels)
            return chromaOfPixels(chroma, lineOf(target_, 1, chroma), lineOf(target_, 2, chroma));
        planeInto(1, chroma);
        planeInto(2, chroma);
    }

  private:
    using Word = typename Lines<S>::Word;
    static constexpr bool deep = sizeof(S) == 2;

    const Scaling& scaling(int stage) const { return stage ? plan_.second[field_] : plan_.scaling[field_]; }
    const Group& chromaGroup() const { return scaling(plan_.again ? 1 : 0).chroma; }

    // --- Source.

    S* sourcePlace(int plane, int y, bool& fresh) { return lines_.source[plane].at(y, fresh); }

    const S* sourceLine(int plane, int y) {
        const Format& format = *source_.format;
        if (plane > 0 && format.has(lumaOnly)) return lines_.neutral.get();
        if (!format.planar()) return packedSource(plane, y);
        const Byte* line = lineOf(source_, plane, y);
        if constexpr (!deep) {
            return line;
        } else {
            bool fresh;
            S* place = sourcePlace(plane, y, fresh);
            if (!fresh) return place;
            if (format.packing == Packing::planar16)
                raiseWords(place, line, count(source_.planeWidth(plane)), source_.depth);
            else
                widen(place, line, count(source_.planeWidth(plane)), false);
            return place;
        }
    }

    const S* packedSource(int plane, int y) {
        bool fresh, ignored;
        S* places[4];
        places[0] = sourcePlace(0, y, fresh);
        for (int p = 1; p < 4; ++p) places[p] = sourcePlace(p, y, ignored);
        if constexpr (!deep)
            if (S* target = targetLuma(y)) places[0] = target;
        const S* line = places[plane];
        if (!plan_.alpha) places[3] = nullptr;
        if (fresh) unpack(y, places);
        return line;
    }

    // The target's own line, if luma goes there as it is and the line is one of this band.
    Byte* targetLuma(int y) const {
        if (!lumaInPlace_) return nullptr;
        const int line = y - scaling(0).luma.down.offset;
        return line >= first_ && line < last_ ? lineOf(target_, 0, line) : nullptr;
    }

    void unpack(int y, S* const places[4]) {
        const Format& format = *source_.format;
        const Byte* line = lineOf(source_, 0, y);
        const int width = source_.width;
        if constexpr (!deep) {
            Byte* const u = lumaTarget() ? nullptr : places[1];
            if (plan_.rgbToYuv && format.packing == Packing::bytes4)
                return rgb4ToYuv(yuvRows(), line, places[0], u, places[2], count(width));
            unpackLine(format, line, Line8{{places[0], places[1], places[2], places[3]}}, width);
            if (plan_.rgbToYuv)
                rgbToYuv(yuvRows(), places[0], places[1], places[2], places[0], u, places[2], count(width));
        } else {
            if (format.deep()) {
                const Byte* chroma = format.packing == Packing::nv16 ? lineOf(source_, 1, y) : nullptr;
                unpackLine(format, line, chroma, Line16{{places[0], places[1], places[2], places[3]}}, width);
            } else {
                const Line8 bytes = narrowLines();
                unpackLine(format, line, bytes, width);
                for (int p = 0; p < (plan_.alpha ? 4 : 3); ++p) {
                    const int n = p == 1 || p == 2 ? source_.planeWidth(p) : width;
                    widen(places[p], bytes.plane[p], count(n), fullRange(format, p));
                }
            }
            if (!plan_.rgbToYuv) return;
            S* const yuv[3] = {places[0], lumaTarget() ? nullptr : places[1], places[2]};
            deepMatrix(deepRows(), places, yuv, count(width));
        }
    }

    // No chroma is asked for.
    bool lumaTarget() const { return target_.format->has(lumaOnly); }

    const ToYuv& yuvRows() const {
        return toYuv(plan_.request.targetMatrix, source_.format->family() == Family::video);
    }

    // The matrix of whichever stage has one.
    Deep deepRows() const {
        const auto& request = plan_.request;
        if (plan_.levels) return deepLevels(plan_.target->family() == Family::video);
        if (plan_.otherMatrix) return deepToOther(request.sourceMatrix);
        if (plan_.rgbToYuv)
            return plan_.floatRgb ? floatToYuv(request.targetMatrix)
                                  : deepToYuv(request.targetMatrix, plan_.source->family() == Family::video);
        return plan_.floatRgb ? floatToRgb(request.sourceMatrix)
                              : deepToRgb(request.sourceMatrix, plan_.target->family() == Family::video);
    }

    Line8 narrowLines() {
        Line8 line;
        for (size_t p = 0; p < 4; ++p) line.plane[p] = lines_.narrow.get() + p * lines_.narrowLength;
        return line;
    }

    // --- RGB to luma and chroma of half its width, without anything between.

    const Byte* pixelsOf(int y) {
        const Format& format = *source_.format;
        const Byte* line = lineOf(source_, 0, y);
        if (format.packing == Packing::bytes4) return line;
        bool fresh;
        Byte* const pixels = lines_.pixels.at(y, fresh);
        if (!fresh) return pixels;
        const int width = source_.width;
        if (format.packing == Packing::bytes3) {
            pack3to4(pixels, line, count(width));
        } else {
            const Line8 planes = narrowLines();
            unpackLine(format, line, planes, width);
            join4(pixels, planes.plane[0], planes.plane[1], planes.plane[2], nullptr, count(width));
        }
        return pixels;
    }

    void lumaOfPixels(int y, Byte* to) {
        rgb4ToLuma(yuvRows(), pixelsOf(y + scaling(0).luma.down.offset), to, count(source_.width));
    }

    void chromaOfPixels(int y, Byte* u, Byte* v) {
        const Group& group = chromaGroup();
        const Axis& down = group.down;
        const int start = down.copies ? y + down.offset : down.start[count(y)];
        const Byte* lines[4];
        for (int t = 0; t < 4; ++t)
            lines[t] = pixelsOf(std::clamp(start + std::min(t, down.taps - 1), 0, down.source - 1));
        const Byte* weights = group.pixelsDown.data() + (down.taps > 1 ? 4 * count(y) : 0);
        const bool filtered = group.spread != Group::everySecond;
        rgb4ToChroma(yuvRows(), lines, weights, filtered, u, v, count(source_.width));
    }

    // --- Scaling.

    const S* upstream(int stage, int plane, int y) {
        return stage ? matrixedLine(plane, y) : sourceLine(plane, y);
    }

    // Chroma of a source that has none.
    bool isNeutral(int stage, int plane) const {
        return stage == 0 && (plane == 1 || plane == 2) && source_.format->has(lumaOnly);
    }

    const S* scaledLine(int stage, int plane, int y) {
        const Group& group = scaling(stage).of(plane);
        if (group.empty() || isNeutral(stage, plane)) return lines_.neutral.get();
        if (group.copies()) return upstream(stage, plane, y + group.down.offset) + group.across.offset;
        bool fresh;
        S* place = lines_.stages[stage].out[plane].at(y, fresh);
        if (fresh) scaledInto(stage, plane, y, place);
        return place;
    }

    void scaledInto(int stage, int plane, int y, S* to) {
        const Group& group = scaling(stage).of(plane);
        const int width = group.across.target;
        if (group.empty() || group.copies() || isNeutral(stage, plane)) {
            const S* line = scaledLine(stage, plane, y);
            if (line != to) std::memcpy(to, line, count(width) * sizeof(S));
            return;
        }
        if (group.spread != Group::none) return spreadInto(stage, plane, y, to);
        const Axis& down = group.down;
        const Word* words[maxTaps];
        for (int t = 0; t < down.taps; ++t) {
            const int from =
                down.copies ? y + down.offset : std::clamp(down.start[count(y)] + t, 0, down.source - 1);
            words[t] = wordLine(stage, plane, from);
        }
        if constexpr (deep) {
            static constexpr float one = 1;
            deepDown(words, down.copies ? &one : down.exact.data() + count(y) * count(down.taps), down.taps,
                     to, count(width));
        } else {
            scaleDown(words, down.copies ? nullptr : down.weights.data() + count(y) * count(down.taps),
                      down.taps, to, width);
        }
    }

    // Down first, while lines are short.
    void spreadInto(int stage, int plane, int y, S* to) {
        const Group& group = scaling(stage).of(plane);
        const int width = group.across.target;
        const bool asIs = group.spread == Group::asIs;
        const int n = asIs ? width : group.across.source;
        const S* line = downSamples(stage, plane, y, asIs ? to : lines_.padded.get(), n);
        if (asIs) {
            if (line != to) std::memcpy(to, line, count(n) * sizeof(S));
        } else if (group.spread == Group::doubled) {
            doubleLine(to, line, count(width));
        } else if (group.spread == Group::everySecond) {
            evens(to, line, count(width));
        } else {
            twice(to, line, count(width / 2));
            if (width & 1) to[width - 1] = line[width / 2 - 1];
        }
    }

    // The source line itself where it is copied, else `to`.
    const S* downSamples(int stage, int plane, int y, S* to, int n) {
        const Group& group = scaling(stage).of(plane);
        const Axis& down = group.down;
        const auto at = [&](int line) {
            return upstream(stage, plane, std::clamp(line, 0, down.source - 1)) + group.across.offset;
        };
        if (down.copies) return at(y + down.offset);
        const int start = down.start[count(y)];
        if (down.taps == 1) return at(start);
        const size_t first = count(y) * count(down.taps);
        const S* taps[maxTaps];
        for (int t = 0; t < down.taps; ++t) {
            if (copiesTap(down, first + count(t))) return at(start + t);
            taps[t] = at(start + t);
        }
        if constexpr (deep)
            deepDown(taps, down.exact.data() + first, down.taps, to, count(n));
        else
            scaleDownBytes(taps, group.bytesDown.data() + first, down.taps, to, n);
        return to;
    }

    static bool copiesTap(const Axis& axis, size_t tap) {
        return deep ? axis.exact[tap] == 1 : axis.weights[tap] == unity;
    }

    const Word* wordLine(int stage, int plane, int y) {
        bool fresh;
        Word* place = lines_.stages[stage].words[plane].at(y, fresh);
        if (!fresh) return place;
        const Group& group = scaling(stage).of(plane);
        const S* line = upstream(stage, plane, y);
        if constexpr (deep) {
            deepAcross(group.across, group.deepAcross, line, lines_.paddedWide.get(), place);
        } else {
            if (group.bytesAcross.form != Across::copy) {
                Byte* padded = lines_.padded.get() + beforeLine;
                padLine(padded, line, group.across.source);
                line = padded;
            }
            scaleAcross(group.bytesAcross, line, place);
        }
        return place;
    }

    // --- Behind scaling.

    bool hasMatrix() const { return plan_.yuvToRgb || plan_.otherMatrix || plan_.levels; }

    const S* matrixedLine(int plane, int y) {
        if (plane == 3) return scaledLine(0, plane, y);
        bool fresh, ignored;
        S* places[3];
        places[0] = lines_.matrixed[0].at(y, fresh);
        for (int p = 1; p < 3; ++p) places[p] = lines_.matrixed[p].at(y, ignored);
        if (fresh) applyMatrix(y, places);
        return places[plane];
    }

    void applyMatrix(int y, S* const places[3]) {
        const S* from[3];
        for (int p = 0; p < 3; ++p) from[p] = scaledLine(0, p, y);
        const size_t width = count(plan_.request.width);
        if constexpr (deep) {
            deepMatrix(deepRows(), from, places, width);
        } else if (plan_.yuvToRgb) {
            yuvToRgb(rgbRows(), from[0], from[1], from[2], places[0], places[1], places[2], width);
        } else if (plan_.otherMatrix) {
            for (int p = 0; p < 3; ++p) std::memcpy(places[p], from[p], width);
            yuvToOther(toOther(plan_.request.sourceMatrix), places[0], places[1], places[2], width);
        } else {
            const auto change = plan_.target->family() == Family::video ? toVideoLevels : toFullLevels;
            for (int p = 0; p < 3; ++p) change(places[p], from[p], width);
        }
    }

    const ToRgb& rgbRows() const {
        return toRgb(plan_.request.sourceMatrix, plan_.target->family() == Family::video);
    }

    // --- Target.

    const S* finalLine(int plane, int y) {
        if (plan_.again) return scaledLine(1, plane, y);
        return hasMatrix() ? matrixedLine(plane, y) : scaledLine(0, plane, y);
    }

    void finalInto(int plane, int y, S* to, int width) {
        if (hasMatrix() && !plan_.again)
            std::memcpy(to, matrixedLine(plane, y), count(width) * sizeof(S));
        else
            scaledInto(plan_.again ? 1 : 0, plane, y, to);
    }

    // A plane that only becomes wider needs no line between. False: it needs more.
    bool raisedInto(int plane, int y, uint16_t* to, int width) {
        const Group& group = scaling(0).of(plane);
        const Format& format = *source_.format;
        if (hasMatrix() || !format.planar() || !group.copies() || isNeutral(0, plane)) return false;
        const Byte* from = lineOf(source_, plane, y + group.down.offset);
        if (format.packing == Packing::planar16)
            raiseWords(to, from + 2 * group.across.offset, count(width), source_.depth);
        else
            widen(to, from + group.across.offset, count(width), false);
        return true;
    }

    void planeInto(int plane, int y) {
        const Format& format = *target_.format;
        const int width = plane ? plan_.request.width / format.across() : plan_.request.width;
        Byte* line = lineOf(target_, plane, y);
        if constexpr (!deep) {
            if (plan_.pixels) return lumaOfPixels(y, line);
            finalInto(plane, y, line, width);
        } else {
            const bool inPlace = format.packing == Packing::planar16 && target_.depth == 16 &&
                                 reinterpret_cast<uintptr_t>(line) % alignof(uint16_t) == 0;
            if (inPlace) {
                auto* const words = reinterpret_cast<uint16_t*>(line);
                if (!raisedInto(plane, y, words, width)) finalInto(plane, y, words, width);
                return;
            }
            if (format.packing == Packing::planar16)
                lowerWords(line, finalLine(plane, y), count(width), target_.depth);
            else
                narrow(line, finalLine(plane, y), count(width), false);
        }
    }

    void packTarget(int y) {
        const Format& format = *target_.format;
        const int width = plan_.request.width;
        Byte* line = lineOf(target_, 0, y);
        if (!deep && plan_.yuvToRgb && packFused(y, line)) return;
        S* planes[4] = {};
        if (!deep && plan_.pixels)
            pixelsTarget(y, planes);
        else
            for (int p = 0; p < (plan_.alpha ? 4 : 3); ++p) planes[p] = const_cast<S*>(finalLine(p, y));
        if constexpr (!deep) {
            packLine(format, Line8{{planes[0], planes[1], planes[2], planes[3]}}, line, width);
        } else if (format.deep()) {
            Byte* chroma = format.packing == Packing::nv16 ? lineOf(target_, 1, y) : nullptr;
            packLine(format, Line16{{planes[0], planes[1], planes[2], planes[3]}}, line, chroma, width);
        } else {
            Line8 bytes = narrowLines();
            for (int p = 0; p < (plan_.alpha ? 4 : 3); ++p) {
                const int n = p == 1 || p == 2 ? width / format.across() : width;
                narrow(bytes.plane[p], planes[p], count(n), fullRange(format, p));
            }
            if (!plan_.alpha) bytes.plane[3] = nullptr;
            packLine(format, bytes, line, width);
        }
    }

    void pixelsTarget(int y, S* planes[4]) {
        if constexpr (!deep) {
            bool ignored;
            for (int p = 0; p < 3; ++p) planes[p] = lines_.stages[0].out[p].at(y, ignored);
            lumaOfPixels(y, planes[0]);
            chromaOfPixels(y, planes[1], planes[2]);
        }
    }

    // Chroma of every second pixel at the target's line, where the nearest is taken: a line of the source.
    const S* shortChroma(int plane, int y) {
        return downSamples(0, plane, y, lines_.padded.get(), chromaGroup().across.source);
    }

    bool packFused(int y, Byte* line) {
        if constexpr (!deep) {
            const auto packing = target_.format->packing;
            if (packing != Packing::bytes4 && packing != Packing::bytes3) return false;
            const bool repeated = chromaGroup().spread == Group::repeated;
            const Byte* from[3] = {scaledLine(0, 0, y)};
            for (int p = 1; p < 3; ++p) from[p] = repeated ? shortChroma(p, y) : scaledLine(0, p, y);
            const size_t width = count(plan_.request.width);
            (packing == Packing::bytes4 ? yuvToRgb4 : yuvToRgb3)(rgbRows(), from[0], from[1], from[2], line,
                                                                 width, repeated);
            return true;
        }
        return false;
    }

    const Plan& plan_;
    Lines<S>& lines_;
    const Picture &source_, &target_;
    const int field_, first_, last_;
    bool lumaInPlace_ = false;  // unpacked straight into the target
};

// Lines as they stand, of every plane.
void copyLines(const Plan& plan, const Picture& source, const Picture& target, int first, int last) {
    const Format& format = *plan.target;
    for (int p = 0; p < format.planes(); ++p) {
        const int down = p ? format.down() : 1;
        const auto bytes = static_cast<size_t>(lineBytes(format, plan.request.width, p));
        const int end = std::min((last + down - 1) / down, target.planeHeight(p));
        if (bytes == 0) continue;
        for (int y = (first + down - 1) / down; y < end; ++y)
            std::memmove(lineOf(target, p, y), lineOf(source, p, y), bytes);
    }
}

void shuffleLines(const Plan& plan, const Picture& source, const Picture& target, int first, int last) {
    const size_t width = count(plan.request.width);
    const bool fromFours = plan.source->packing == Packing::bytes4,
               toFours = plan.target->packing == Packing::bytes4;
    for (int y = first; y < last; ++y) {
        const Byte* from = lineOf(source, 0, y);
        Byte* to = lineOf(target, 0, y);
        if (fromFours && toFours)
            std::memmove(to, from, 4 * width);
        else if (fromFours)
            pack4to3(to, from, width);
        else
            pack3to4(to, from, width);
    }
}

}  // namespace

void runBand(const Plan& plan, Workspace& workspace, const Picture& source, const Picture& target, int field,
             int first, int last) {
    const Picture from = fieldOf(source, plan.fields, field), to = fieldOf(target, plan.fields, field);
    if (plan.path.from == Core::lines) return copyLines(plan, from, to, first, last);
    if (plan.path.from == Core::packed8) return shuffleLines(plan, from, to, first, last);
    if (plan.deep) {
        Band<uint16_t> band(plan, *workspace.words, from, to, field, first, last);
        for (int y = first; y < last; ++y) band.targetLine(y);
    } else {
        Band<Byte> band(plan, *workspace.bytes, from, to, field, first, last);
        for (int y = first; y < last; ++y) band.targetLine(y);
    }
}

}  // namespace srk
