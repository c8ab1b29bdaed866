#include "core/caption/text/textlayout_p.h"

#include <string>

#include "core/caption/text/linewrap_p.h"
#include "core/caption/text/styledtext_p.h"
#include "core/caption/text/textshaping_p.h"

namespace {

constexpr long long firstPen = 64;  // a pixel of room for what hangs over to the left

using Characters = std::span<const StyledCharacter>;

// One glyph for each character, side by side.
void placeInOrder(Characters text, TextLine& line) {
    long long pen = firstPen;
    const FontFace* lastFace = nullptr;
    unsigned last = 0;
    for (const StyledCharacter& c : text) {
        FontFace& face = *c.face;
        if (isInvisible(c.value) || !face.usable()) continue;
        const unsigned index = face.indexOf(c.value);
        if (lastFace == &face) pen += face.kerning(last, index);
        const int advance = face.glyph(index).advance;
        line.glyphs.push_back({&face, index, pen, 0, c.index, advance});
        pen += advance;
        line.width += advance / 64;
        lastFace = &face;
        last = index;
    }
}

// `paragraph`: the line that `text` is of.
TextLine place(Characters text, const Paragraph& paragraph) {
    TextLine line;
    if (paragraph.shaped)
        line.width = (shape(text, paragraph, firstPen, line.glyphs) - firstPen) / 64;
    else
        placeInOrder(text, line);
    return line;
}

std::vector<StyledCharacter> readLine(std::u32string_view text, FontFaces& faces, FontStyle& style) {
    auto characters = withoutTags(text, style);
    chooseFaces(characters, faces);
    return characters;
}

// How far each character moves the pen, if the glyphs are those of the whole line.
std::vector<long long> advancesOf(const TextLine& line, Characters text) {
    std::vector<long long> byIndex(text.empty() ? 0 : static_cast<std::size_t>(text.back().index) + 1);
    for (const PlacedGlyph& glyph : line.glyphs)
        byIndex[static_cast<std::size_t>(glyph.character)] += glyph.advance;
    std::vector<long long> advances;
    for (const StyledCharacter& c : text) advances.push_back(byIndex[static_cast<std::size_t>(c.index)]);
    return advances;
}

}  // namespace

TextLine layOutLine(std::u32string_view text, FontFaces& faces, FontStyle& style) {
    const auto characters = readLine(text, faces, style);
    return place(characters, paragraphOf(characters));
}

std::vector<TextLine> layOutLines(std::u32string_view text, FontFaces& faces, FontStyle& style,
                                  long long widest) {
    const auto characters = readLine(text, faces, style);
    std::vector<TextLine> lines;
    const Paragraph paragraph = paragraphOf(characters);
    lines.push_back(place(characters, paragraph));
    if (widest <= 0 || lines[0].width <= widest) return lines;
    std::u32string values;
    for (const StyledCharacter& c : characters) values += c.value;
    const auto parts = wrapLine(values, advancesOf(lines[0], characters), widest * 64);
    if (parts.size() < 2) return lines;
    lines.clear();
    for (const LinePart& part : parts)
        lines.push_back(place(Characters(characters).subspan(part.begin, part.end - part.begin), paragraph));
    return lines;
}
