// Lines of text as glyphs in their places.
#pragma once

#include <string_view>
#include <vector>

#include "core/caption/text/fontfaces_p.h"

struct PlacedGlyph {
    FontFace* face;
    unsigned glyph;
    long long pen;  // 1/64 pixels from the start of the line's band
    int rise;       // 1/64 pixels above the baseline
    int character;  // index of its character in the line
    int advance;    // 1/64 pixels to the pen of the next one
};

struct TextLine {
    std::vector<PlacedGlyph> glyphs;  // from left to right
    long long width = 0;              // pixels that the pen moved
};

// Lays out a line. Tags change `style`, which continues on the next line, and are not drawn.
TextLine layOutLine(std::u32string_view line, FontFaces& faces, FontStyle& style);
// As several lines if it is wider than `widest` pixels; 0: as one.
std::vector<TextLine> layOutLines(std::u32string_view line, FontFaces& faces, FontStyle& style,
                                  long long widest);
