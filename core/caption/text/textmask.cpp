#include <algorithm>
#include <cstring>
#include <vector>

#include "core/caption/text/textlayout_p.h"
#include "core/caption/text/textmask_p.h"
#include "core/media/qvframe.h"
#include "core/media/wholecopy_p.h"
#include "core/value/anycontainer.h"

namespace {

using Byte = unsigned char;

constexpr long long farthest = 1 << 24;  // pixels; beyond any picture

int bounded(long long at) { return static_cast<int>(std::clamp(at, -farthest, farthest)); }

// Rounds toward negative infinity, so that glyphs left of the start keep their distances.
long long pixels(long long sixtyFourths) { return sixtyFourths >> 6; }

struct GlyphPlace {
    long long x;
    long long y;
    const FontGlyph& glyph;

    GlyphPlace(const PlacedGlyph& placed, int baseline)
        : x(pixels(placed.pen)), y(baseline - pixels(placed.rise)), glyph(placed.face->glyph(placed.glyph)) {
        x += glyph.left;
        y -= glyph.top;
    }
};

Byte* rowOf(QvFrame& frame, int y) { return frame.plane() + static_cast<std::ptrdiff_t>(y) * frame.stride(); }
const Byte* rowOf(const QvFrame& frame, int y) {
    return frame.plane() + static_cast<std::ptrdiff_t>(y) * frame.stride();
}

void clear(QvFrame& frame) {
    for (int y = 0; y < frame.height(); ++y)
        std::memset(rowOf(frame, y), 0, static_cast<std::size_t>(frame.width()));
}

void takeGreater(Byte* to, const Byte* from, int count) {
    for (int i = 0; i < count; ++i) to[i] = std::max(to[i], from[i]);
}

// `to` takes the greater of itself and of `from` moved by dx, dy.
void addMoved(QvFrame& to, const QvFrame& from, int dx, int dy) {
    const int count = to.width() - std::abs(dx);
    for (int y = std::max(0, dy); y < to.height() + std::min(0, dy) && count > 0; ++y)
        takeGreater(rowOf(to, y) + std::max(0, dx), rowOf(from, y - dy) + std::max(0, -dx), count);
}

// Letters joined with themselves moved to the four corners, bit by bit; the border stays.
void joinCorners(const QvFrame& letters, QvFrame& mask, int radius) {
    for (int y = radius; y < mask.height() - radius; ++y)
        for (const Byte* from : {rowOf(letters, y - radius), rowOf(letters, y + radius)})
            for (int x = radius; x < mask.width() - radius; ++x)
                rowOf(mask, y)[x] |= static_cast<Byte>(from[x - radius] | from[x + radius]);
}

// A row with the weights 1 2 1; outside there is nothing.
void sumRow(const Byte* row, int width, unsigned short* sums) {
    const auto sum = [](int a, int b, int c) { return static_cast<unsigned short>(a + 2 * b + c); };
    if (width == 1) sums[0] = sum(0, row[0], 0);
    if (width < 2) return;
    sums[0] = sum(0, row[0], row[1]);
    for (int x = 1; x < width - 1; ++x) sums[x] = sum(row[x - 1], row[x], row[x + 1]);
    sums[width - 1] = sum(row[width - 2], row[width - 1], 0);
}

// Each pixel of `out`, which has the size of the mask, becomes the mean of its 3 x 3 neighbourhood in the
// mask, with these weights both ways.
void blur(const QvFrame& mask, QvFrame& out) {
    const auto width = static_cast<std::size_t>(mask.width());
    std::vector<unsigned short> sums(width * (static_cast<std::size_t>(mask.height()) + 2));
    for (int y = 0; y < mask.height(); ++y)
        sumRow(rowOf(mask, y), mask.width(), sums.data() + width * (static_cast<std::size_t>(y) + 1));
    for (int y = 0; y < mask.height(); ++y) {
        const unsigned short* above = sums.data() + width * static_cast<std::size_t>(y);
        Byte* to = rowOf(out, y);
        for (std::size_t x = 0; x < width; ++x)
            to[x] = static_cast<Byte>((above[x] + 2 * above[x + width] + above[x + 2 * width] + 8) / 16);
    }
}

void drawGlyph(const GlyphPlace& place, int fields, const QvRect& area, QvFrame& mask) {
    const FontGlyph& glyph = place.glyph;
    const int left = bounded(std::max<long long>(place.x, area.left()));
    const int right = bounded(std::min<long long>(place.x + glyph.width, area.right()));
    const int top = bounded(std::max<long long>(place.y, area.top()));
    const int bottom = bounded(std::min<long long>(place.y + glyph.rows, area.bottom()));
    if (left >= right) return;
    for (int y = top; y < bottom; ++y) {
        if (fields & (y % 2 == 0 ? 1 : 2)) continue;
        const auto from = (y - place.y) * glyph.width + (left - place.x);
        takeGreater(rowOf(mask, y - area.top()) + (left - area.left()), glyph.coverage.data() + from,
                    right - left);
    }
}

}  // namespace

QvRect coveredArea(const TextLine& line, int baseline, int wide, int high) {
    long long left = 0, top = 0, right = wide, bottom = high;
    for (const PlacedGlyph& placed : line.glyphs) {
        const GlyphPlace place(placed, baseline);
        left = std::min(left, place.x);
        top = std::min(top, place.y);
        right = std::max(right, place.x + place.glyph.width);
        bottom = std::max(bottom, place.y + place.glyph.rows);
    }
    return QvRect(bounded(left), bounded(top), bounded(right), bounded(bottom));
}

void drawLetters(const TextLine& line, int baseline, const AnyVector& fieldMasks, const QvRect& area,
                 QvFrame& mask) {
    clear(mask);
    for (const PlacedGlyph& placed : line.glyphs)
        drawGlyph(GlyphPlace(placed, baseline), fieldMasks.at(placed.character).asInt32(0), area, mask);
}

void outlineMask(const QvFrame& letters, QvFrame& mask, int radius) {
    qvCopyWhole(mask, letters);
    if (radius > 1) return joinCorners(letters, mask, radius);
    for (const int dx : {1, -1}) addMoved(mask, letters, dx, 0);
    QvFrame wide;
    qvCopyWhole(wide, mask);
    for (const int dy : {1, -1}) addMoved(mask, wide, 0, dy);
}

void addShadow(QvFrame& mask, bool soft) {
    QvFrame caster;
    qvCopyWhole(caster, mask);
    if (soft) blur(mask, caster);
    addMoved(mask, caster, 1, 1);
}
