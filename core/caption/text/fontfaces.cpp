#include "core/caption/text/fontfaces_p.h"

#include <algorithm>

#include <hb.h>

#include "core/arch/platform.h"
#include "core/caption/text/styledtext_p.h"
#include "core/value/any.h"

namespace {

constexpr QvFontFace likes[] = {QvFontFace::sans, QvFontFace::sansItalic, QvFontFace::sansBold};
static_assert(std::size(likes) == fontStyles);

// The one letter that a letter and its marks make, which shaping takes where the font has it; 0 without one.
char32_t composed(std::u32string_view cluster) {
    hb_codepoint_t whole = cluster[0];
    for (const char32_t mark : cluster.substr(1))
        if (!hb_unicode_compose(hb_unicode_funcs_get_default(), whole, mark, &whole)) return 0;
    return whole;
}

bool has(const FontFace& face, std::u32string_view cluster) {
    const auto drawable = [&face](char32_t c) { return isInvisible(c) || face.indexOf(c) != 0; };
    if (std::all_of(cluster.begin(), cluster.end(), drawable)) return true;
    const char32_t whole = cluster.size() > 1 ? composed(cluster) : 0;
    return whole != 0 && face.indexOf(whole) != 0;
}

}  // namespace

void FontFaces::Missing::add(char32_t letter, FontStyle style) {
    const auto at = static_cast<std::size_t>(style);
    if (known_[at].insert(letter).second) letters_[at] += letter;
}

void FontFaces::fallBack(FontLibrary& library, int pixels, double pixelAspect) {
    library_ = &library;
    pixels_ = pixels;
    pixelAspect_ = pixelAspect;
}

FontFace* FontFaces::otherWith(std::u32string_view cluster, std::size_t style) {
    auto& others = others_[style];
    const auto found =
        std::find_if(others.begin(), others.end(), [&](const FontFace& face) { return has(face, cluster); });
    return found == others.end() ? nullptr : &*found;
}

FontFace* FontFaces::faceOf(std::u32string_view cluster, FontStyle style) {
    const auto at = static_cast<std::size_t>(style);
    return has(styled_[at], cluster) ? &styled_[at] : otherWith(cluster, at);
}

void FontFaces::collect(std::u32string_view cluster, FontStyle style, Missing& missing) {
    const FontFace& own = styled_[static_cast<std::size_t>(style)];
    // Without a font nothing is drawn.
    if (!library_ || !own.usable() || faceOf(cluster, style)) return;
    for (const char32_t c : cluster)
        if (!isInvisible(c) && own.indexOf(c) == 0 && !absent_.contains(c)) missing.add(c, style);
}

void FontFaces::find(const Missing& missing) {
    for (std::size_t style = 0; style < fontStyles; ++style) {
        const std::u32string& letters = missing.of(style);
        if (letters.empty()) continue;
        for (const QvFontFile& file : qv_platform().fontsWith(letters, likes[style])) {
            FontFace& face = others_[style].emplace_back();
            face.load(*library_, file.name.c_str(), pixels_, pixelAspect_, file.face);
            if (!face.usable()) others_[style].pop_back();
        }
        for (const char32_t c : letters)
            if (!otherWith({&c, 1}, style) && absent_.insert(c).second) absentInOrder_ += c;
    }
}
