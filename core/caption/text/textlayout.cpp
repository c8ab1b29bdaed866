#include <algorithm>

#include "core/caption/text/textlayout_p.h"
#include "core/caption/text/textshaping_p.h"

namespace {

constexpr long long firstPen = 64;  // a pixel of room for what hangs over to the left

using View = std::u32string_view;

constexpr struct {
    View text;
    FontStyle style;
} styleTags[] = {
    {U"<i>", FontStyle::italic},
    {U"<b>", FontStyle::bold},
    {U"</i>", FontStyle::regular},
    {U"</b>", FontStyle::regular},
};

// What other players take for colours, places and lines under the text; it is nothing to be read.
constexpr View plainTags[] = {U"<u>", U"</u>", U"<s>", U"</s>", U"<font>", U"</font>"};

bool opensHiddenTag(View text) {
    const bool code = text.size() > 2 && text[0] == U'{' && text[2] == U':' && (text[1] | 0x20) >= U'a' &&
                      (text[1] | 0x20) <= U'z';  // "{y:i}" of SUB files
    return code || text.starts_with(U"<font ") || text.starts_with(U"{\\");
}

// Characters of the tag that a text begins with, 0 without one.
std::size_t tagAt(View text, FontStyle& style) {
    if (text[0] != U'<' && text[0] != U'{') return 0;
    for (const auto& tag : styleTags)
        if (text.starts_with(tag.text)) {
            style = tag.style;
            return tag.text.size();
        }
    for (const View tag : plainTags)
        if (text.starts_with(tag)) return tag.size();
    if (!opensHiddenTag(text)) return 0;
    return text.find(text[0] == U'<' ? U'>' : U'}') + 1;  // an open one is text
}

// Controls, and marks that only steer the layout; no font has a picture for them.
bool isInvisible(char32_t c) {
    return c < 0x20 || c == 0x7F || (c >= 0x200B && c <= 0x200F) || (c >= 0x202A && c <= 0x202E) ||
           (c >= 0x2060 && c <= 0x2069) || c == 0xFEFF;
}

std::vector<StyledCharacter> withoutTags(View line, FontStyle& style) {
    std::vector<StyledCharacter> text;
    text.reserve(line.size());
    for (std::size_t at = 0; at < line.size();) {
        if (const std::size_t tag = tagAt(line.substr(at), style)) {
            at += tag;
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

TextLine layOutLine(View text, FontFaces& faces, FontStyle& style) {
    TextLine line;
    const auto characters = withoutTags(text, style);
    if (needsShaping(characters))
        line.width = (shape(characters, faces, firstPen, line.glyphs) - firstPen) / 64;
    else
        placeInOrder(characters, faces, line);
    return line;
}
