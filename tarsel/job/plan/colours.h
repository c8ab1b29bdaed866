// The colour description (primaries, transfer, matrix) that an output takes over from a film.
#pragma once

#include "tarsel/picture/picture.h"

// Whether the colours are high dynamic range or wide gamut, beyond standard television.
bool isWide(const Colours& colours);

// The description of pictures that are encoded as `out`; empty where the encoder's default for their height
// is right. `converted`: they pass the engine's scaler, which knows BT.601 (below 720 lines) and BT.709 only.
// If it converts from one to the other, the film's description no longer holds; otherwise it does, whatever
// the film's matrix.
Colours coloursOf(const PictureFormat& in, const PictureFormat& out, bool converted);
