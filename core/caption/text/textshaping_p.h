// Characters of scripts whose glyphs depend on their neighbours, or that run from right to left.
#pragma once

#include <span>
#include <vector>

#include "core/caption/text/styledtext_p.h"
#include "core/caption/text/textlayout_p.h"

// What the parts of a line have in common.
struct Paragraph {
    bool shaped;         // has characters that need it
    unsigned direction;  // FriBidi's, from the first letter: from which side it is read
};
Paragraph paragraphOf(std::span<const StyledCharacter> text);

// Appends the glyphs of a part of a line in the order in which they stand from left to right, from `pen` on
// (1/64 pixels). Returns the pen after the last one.
long long shape(std::span<const StyledCharacter> text, const Paragraph& paragraph, long long pen,
                std::vector<PlacedGlyph>& glyphs);
