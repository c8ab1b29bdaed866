#include <algorithm>

#include "core/caption/textlayout_p.h"
#include "core/caption/textshaping_p.h"

namespace {

constexpr long long firstPen = 64;  // a pixel of room for what hangs over to the left

constexpr struct {
    std::u32string_view text;
    FontStyle style;
} tags[] = {
    {U"<i>", FontStyle::italic},
    {U"<b>", FontStyle::bold},
    {U"</i>", FontStyle::regular},
    {U"</b>", FontStyle::regular},
};

// Controls, and marks that only steer the layout; no font has a picture for them.
bool isInvisible(char32_t c) {
    return c < 0x20 || c == 0x7F || (c >= 0x200B && c <= 0x200F) || (c >= 0x202A && c <= 0x202E) ||
           (c >= 0x2060 && c <= 0x2069) || c == 0xFEFF;
}

std::vector<StyledCharacter> withoutTags(std::u32string_view line, FontStyle& style) {
    std::vector<StyledCharacter> text;
    text.reserve(line.size());
    for (std::size_t at = 0; at < line.size();) {
        const auto rest = line.substr(at);
        const auto tag = std::find_if(std::begin(tags), std::end(tags),
                                      [&](const auto& t) { return rest.starts_with(t.text); });
        if (tag != std::end(tags)) {
            style = tag->style;
            at += tag->text.size();
            continue;
        }
        text.push_back({line[at], style, static_cast<int>(at)});
        ++at;
    }
    return text;
}

// One glyph for each character, side by side.
void placeInOrder(std::span<const StyledCharacter> text, FontFaces& faces, TextLine& line) {
    long long pen = firstPen;
    const FontFace* lastFace = nullptr;
    unsigned last = 0;
    for (const StyledCharacter& c : text) {
        FontFace& face = faces[static_cast<std::size_t>(c.style)];
        if (isInvisible(c.value) || !face.usable()) continue;
        const unsigned index = face.indexOf(c.value);
        if (lastFace == &face) pen += face.kerning(last, index);
        const int advance = face.glyph(index).advance;
        line.glyphs.push_back({&face, index, pen, 0, c.index});
        pen += advance;
        line.width += advance / 64;
        lastFace = &face;
        last = index;
    }
}

}  // namespace

TextLine layOutLine(std::u32string_view text, FontFaces& faces, FontStyle& style) {
    TextLine line;
    const auto characters = withoutTags(text, style);
    if (needsShaping(characters))
        line.width = (shape(characters, faces, firstPen, line.glyphs) - firstPen) / 64;
    else
        placeInOrder(characters, faces, line);
    return line;
}
