// Characters of scripts whose glyphs depend on their neighbours, or that run from right to left.
#pragma once

#include <span>
#include <vector>

#include "core/caption/text/styledtext_p.h"
#include "core/caption/text/textlayout_p.h"

bool needsShaping(std::span<const StyledCharacter> text);

// Appends the glyphs of a line in the order in which they stand from left to right, from `pen` on (1/64
// pixels). The first letter of `paragraph`, of which the line is a part, says from which side it is read.
// Returns the pen behind the last one.
long long shape(std::span<const StyledCharacter> text, std::span<const StyledCharacter> paragraph,
                long long pen, std::vector<PlacedGlyph>& glyphs);
