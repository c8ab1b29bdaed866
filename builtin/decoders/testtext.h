// The text of the test generator's pictures, in the system's fixed-pitch font.
#pragma once

#include <memory>

#include "builtin/decoders/testcard.h"

// Letters that suit pictures of that height. Null if text can't be drawn at all; a missing font draws
// nothing.
std::unique_ptr<CardText> makeTestText(int height);
// To be called before pictures take their memory: looks for the font while there is enough for it.
void findTestFont();
