#include "core/caption/text/styledtext_p.h"

#include <string>

#include <hb.h>

namespace {

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

bool isControl(char32_t c) { return c < 0x20 || c == 0x7F; }

// Calls `take` with each cluster and the place of its first character.
template <class Take>
void forClusters(std::span<const StyledCharacter> text, Take take) {
    std::u32string cluster;
    for (std::size_t begin = 0; begin < text.size(); begin += cluster.size()) {
        cluster.assign(1, text[begin].value);
        for (std::size_t at = begin + 1; at < text.size() && extendsCluster(text[at].value); ++at)
            cluster += text[at].value;
        take(cluster, begin);
    }
}

}  // namespace

bool isInvisible(char32_t c) {
    return (c >= 0x200B && c <= 0x200F) || (c >= 0x202A && c <= 0x202E) || (c >= 0x2060 && c <= 0x2069) ||
           (c >= 0xFE00 && c <= 0xFE0F) || c == 0xFEFF;
}

bool extendsCluster(char32_t c) {
    if (c < 0x300) return false;
    if (isInvisible(c)) return true;
    switch (hb_unicode_general_category(hb_unicode_funcs_get_default(), c)) {
        case HB_UNICODE_GENERAL_CATEGORY_NON_SPACING_MARK:
        case HB_UNICODE_GENERAL_CATEGORY_SPACING_MARK:
        case HB_UNICODE_GENERAL_CATEGORY_ENCLOSING_MARK: return true;
        default: return false;
    }
}

std::vector<StyledCharacter> withoutTags(View line, FontStyle& style) {
    std::vector<StyledCharacter> text;
    text.reserve(line.size());
    for (std::size_t at = 0; at < line.size();) {
        if (const std::size_t tag = tagAt(line.substr(at), style)) {
            at += tag;
            continue;
        }
        if (!isControl(line[at])) text.push_back({line[at], style, static_cast<int>(at)});
        ++at;
    }
    return text;
}

int placeTag(View text) {
    constexpr View tag = U"{\\an";
    const std::size_t at = text.find(tag);
    if (at == text.npos || at + tag.size() >= text.size()) return 0;
    const char32_t digit = text[at + tag.size()];
    return digit >= U'1' && digit <= U'9' ? static_cast<int>(digit - U'0') : 0;
}

void collectMissing(std::span<const StyledCharacter> text, FontFaces& faces, FontFaces::Missing& missing) {
    forClusters(text,
                [&](View cluster, std::size_t begin) { faces.collect(cluster, text[begin].style, missing); });
}

void chooseFaces(std::span<StyledCharacter> text, FontFaces& faces) {
    FontFaces::Missing missing;
    collectMissing(text, faces, missing);
    faces.find(missing);
    forClusters(text, [&](View cluster, std::size_t begin) {
        FontFace* whole = faces.faceOf(cluster, text[begin].style);
        for (std::size_t i = 0; i < cluster.size(); ++i) {
            StyledCharacter& c = text[begin + i];
            FontFace* const own = &faces[static_cast<std::size_t>(c.style)];
            FontFace* const single = whole ? whole : faces.faceOf(cluster.substr(i, 1), c.style);
            // Without its style's font nothing is drawn.
            c.face = single && own->usable() ? single : own;
        }
    });
}
