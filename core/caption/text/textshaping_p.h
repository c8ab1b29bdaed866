// Characters of scripts whose glyphs depend on their neighbours, or that run from right to left.
#pragma once

#include <span>
#include <vector>

#include "core/caption/text/textlayout_p.h"

struct StyledCharacter {
    char32_t value;
    FontStyle style;
    int index;  // in the line, tags counted
};

bool needsShaping(std::span<const StyledCharacter> text);

// Appends the glyphs of a line in the order in which they stand from left to right, from `pen` on (1/64
// pixels). Returns the pen behind the last one.
long long shape(std::span<const StyledCharacter> text, FontFaces& faces, long long pen,
                std::vector<PlacedGlyph>& glyphs);
