// A line of text without its tags: characters, each with the style and the face that it is drawn in.
#pragma once

#include <span>
#include <string_view>
#include <vector>

#include "core/caption/text/fontfaces_p.h"

struct StyledCharacter {
    char32_t value;
    FontStyle style;
    int index;                 // in the line, tags counted
    FontFace* face = nullptr;  // set by chooseFaces
};

// "<i>", "<b>", "</i>" and "</b>" change `style`; they and what other players take for a tag are left out, as
// controls are.
std::vector<StyledCharacter> withoutTags(std::u32string_view line, FontStyle& style);

// Marks that only steer the layout; no font needs a picture for them.
bool isInvisible(char32_t c);
// Whether a character belongs to the letter before it.
bool extendsCluster(char32_t c);

// Where "{\anN}" in a text places it: N as on the keys of numbers, 1 bottom left to 9 top right; 0 without
// one.
int placeTag(std::u32string_view text);

// Adds the letters that have no face yet.
void collectMissing(std::span<const StyledCharacter> text, FontFaces& faces, FontFaces::Missing& missing);
// A letter and its marks get one face where a font has them all. What no font has stays with the style's.
void chooseFaces(std::span<StyledCharacter> text, FontFaces& faces);
