#include "core/caption/text/textshaping_p.h"

#include <algorithm>
#include <iterator>
#include <memory>

#include <fribidi.h>
#include <hb.h>

namespace {

// A stretch of one direction, face and script: what can be shaped at once.
struct Run {
    int begin;
    int end;
    FriBidiLevel level;  // odd: right to left
    FontFace* face;
    hb_script_t script;

    bool rightToLeft() const { return level % 2 != 0; }
};

std::vector<FriBidiChar> valuesOf(std::span<const StyledCharacter> text) {
    std::vector<FriBidiChar> characters;
    for (const StyledCharacter& c : text) characters.push_back(c.value);
    return characters;
}

// That of the first letter.
FriBidiParType directionOf(std::span<const StyledCharacter> paragraph) {
    const auto text = valuesOf(paragraph);
    std::vector<FriBidiCharType> types(text.size());
    const auto length = static_cast<FriBidiStrIndex>(text.size());
    fribidi_get_bidi_types(text.data(), length, types.data());
    return fribidi_get_par_direction(types.data(), length);
}

std::vector<FriBidiLevel> levelsOf(const std::vector<FriBidiChar>& text, FriBidiParType direction) {
    const auto length = static_cast<FriBidiStrIndex>(text.size());
    std::vector<FriBidiCharType> types(text.size());
    std::vector<FriBidiBracketType> brackets(text.size());
    std::vector<FriBidiLevel> levels(text.size());
    fribidi_get_bidi_types(text.data(), length, types.data());
    fribidi_get_bracket_types(text.data(), length, types.data(), brackets.data());
    if (fribidi_get_par_embedding_levels_ex(types.data(), brackets.data(), length, &direction,
                                            levels.data()) == 0)
        std::fill(levels.begin(), levels.end(), FriBidiLevel{0});
    return levels;
}

// Punctuation and accents take the script of the text before them, at the start that of the first letter.
std::vector<hb_script_t> scriptsOf(const std::vector<FriBidiChar>& text) {
    std::vector<hb_script_t> scripts;
    const auto isOwn = [](hb_script_t s) { return s != HB_SCRIPT_COMMON && s != HB_SCRIPT_INHERITED; };
    hb_script_t current = HB_SCRIPT_COMMON;
    for (const FriBidiChar c : text) {
        const hb_script_t own = hb_unicode_script(hb_unicode_funcs_get_default(), c);
        if (isOwn(own)) current = own;
        scripts.push_back(current);
    }
    const auto first = std::find_if(scripts.begin(), scripts.end(), isOwn);
    if (first != scripts.end()) std::fill(scripts.begin(), first, *first);
    return scripts;
}

std::vector<Run> runsOf(std::span<const StyledCharacter> text, FriBidiParType direction) {
    const auto characters = valuesOf(text);
    const auto levels = levelsOf(characters, direction);
    const auto scripts = scriptsOf(characters);
    std::vector<Run> runs;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const int at = static_cast<int>(i);
        const Run next{at, at + 1, levels[i], text[i].face, scripts[i]};
        const bool goesOn = !runs.empty() && runs.back().level == next.level &&
                            runs.back().face == next.face && runs.back().script == next.script;
        if (goesOn)
            runs.back().end = next.end;
        else
            runs.push_back(next);
    }
    return runs;
}

// From the highest level down to the lowest odd one, each stretch of that level or above is turned round.
void putInVisualOrder(std::vector<Run>& runs) {
    int highest = 0;
    for (const Run& run : runs) highest = std::max<int>(highest, run.level);
    for (int level = highest; level > 0; --level) {
        const auto belongs = [level](const Run& run) { return run.level >= level; };
        for (auto at = runs.begin(); at != runs.end();) {
            const auto begin = std::find_if(at, runs.end(), belongs);
            at = std::find_if_not(begin, runs.end(), belongs);
            std::reverse(begin, at);
        }
    }
}

struct Range {
    char32_t begin;
    char32_t end;
};
constexpr Range shapedRanges[] = {
    {0x300, 0x370},      // combining accents
    {0x590, 0x1200},     // Hebrew and Arabic to Myanmar, Georgian, the parts of Hangul
    {0x1700, 0x18B0},    // scripts of the Philippines, Khmer, Mongolian
    {0x1900, 0x1D00},    // Limbu to Balinese, Lepcha and the signs of Vedic
    {0x1DC0, 0x1E00},    // more accents
    {0x20D0, 0x2100},    // accents of symbols
    {0xA800, 0xAC00},    // Syloti Nagri to Meetei Mayek
    {0xD7B0, 0xD800},    // more parts of Hangul
    {0xFB1D, 0xFE00},    // Hebrew and Arabic presentation forms
    {0xFE20, 0xFE30},    // half accents
    {0xFE70, 0xFEFF},    // Arabic presentation forms
    {0x10800, 0x12000},  // historic scripts from right to left, scripts of India
    {0x16B00, 0x16B90},  // Pahawh Hmong
    {0x1E800, 0x1F000},  // Adlam and others from right to left
};

struct BufferDone {
    void operator()(hb_buffer_t* buffer) const { hb_buffer_destroy(buffer); }
};
using Buffer = std::unique_ptr<hb_buffer_t, BufferDone>;

long long placeRun(const Run& run, std::span<const StyledCharacter> text, hb_buffer_t* buffer, long long pen,
                   std::vector<PlacedGlyph>& glyphs) {
    hb_buffer_clear_contents(buffer);
    for (int i = run.begin; i < run.end; ++i) {
        const StyledCharacter& c = text[static_cast<std::size_t>(i)];
        hb_buffer_add(buffer, c.value, static_cast<unsigned>(c.index));
    }
    hb_buffer_set_content_type(buffer, HB_BUFFER_CONTENT_TYPE_UNICODE);
    hb_buffer_set_direction(buffer, run.rightToLeft() ? HB_DIRECTION_RTL : HB_DIRECTION_LTR);
    hb_buffer_set_script(buffer, run.script);
    hb_buffer_guess_segment_properties(buffer);
    hb_shape(run.face->shaper(), buffer, nullptr, 0);
    unsigned count = 0;
    const hb_glyph_info_t* infos = hb_buffer_get_glyph_infos(buffer, &count);
    const hb_glyph_position_t* places = hb_buffer_get_glyph_positions(buffer, &count);
    for (unsigned i = 0; i < count; ++i) {
        glyphs.push_back({run.face, infos[i].codepoint, pen + places[i].x_offset, places[i].y_offset,
                          static_cast<int>(infos[i].cluster), places[i].x_advance});
        pen += places[i].x_advance;
    }
    return pen;
}

bool needsShaping(std::span<const StyledCharacter> text) {
    return std::any_of(text.begin(), text.end(), [](const StyledCharacter& c) {
        const auto* const row =
            std::upper_bound(std::begin(shapedRanges), std::end(shapedRanges), c.value,
                             [](char32_t value, const Range& range) { return value < range.end; });
        return row != std::end(shapedRanges) && c.value >= row->begin;
    });
}

}  // namespace

Paragraph paragraphOf(std::span<const StyledCharacter> text) {
    const bool shaped = needsShaping(text);
    return {shaped, static_cast<unsigned>(shaped ? directionOf(text) : FRIBIDI_PAR_ON)};
}

long long shape(std::span<const StyledCharacter> text, const Paragraph& paragraph, long long pen,
                std::vector<PlacedGlyph>& glyphs) {
    auto runs = runsOf(text, static_cast<FriBidiParType>(paragraph.direction));
    putInVisualOrder(runs);
    const Buffer buffer(hb_buffer_create());
    for (const Run& run : runs)
        if (run.face->usable()) pen = placeRun(run, text, buffer.get(), pen, glyphs);
    return pen;
}
