// What the numbers of an encoded picture stand for, when a film said it of its own.
#pragma once

#include "tarsel/picture/picture.h"

// High dynamic range or wide primaries: what is no usual television.
bool isWide(const Colours& colours);

// Of pictures that are encoded as `out`; nothing where the encoder is to go by the lines. `converted`: they
// pass the engine's scaler, which knows BT.601 and BT.709: below 720 lines the one, from there on the other.
// A film of another matrix keeps its numbers as long as the scaler goes from one to the same.
Colours coloursOf(const PictureFormat& in, const PictureFormat& out, bool converted);
