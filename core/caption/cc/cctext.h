// What CEA-608 byte pairs say, for people.
#pragma once

#include <span>
#include <string>

#include "core/arch/api.h"

struct QvCcBytePair;

// The characters of one field's pairs as UTF-8: basic, special and extended ones (CEA-608), rows joined by
// "|". `type` is 0 or 1; pairs of other types, null pairs, second copies of control codes, and the data
// services between captions of field 2 are passed over. Positions and colours are not shown; neither is
// whether text is on the screen yet. Parity is not checked.
QV_API std::string qvCcText(std::span<const QvCcBytePair> pairs, int type);
