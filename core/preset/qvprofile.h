// Profile numbers: what kind of output a preset stands for. The top 16 bits name the family, the low 16
// bits the member. Numbers from 0x2000000 are current; 0x1000000 to 0x1FFFFFF are those of an older scheme,
// and anything below an index into the oldest table. Every stored number goes through qvFixOldProfileNo.
#pragma once

#include "core/arch/api.h"

namespace QvProfile {
constexpr int notSet = -1;
constexpr int none = 0x2000000;  // "no profile", as against not set
constexpr int raw = 0x216000F;
constexpr int aviRaw = 0x2160010;
}  // namespace QvProfile

// The number of a symbol such as "RAW"; -1 for an unknown one. Current symbols come first.
QV_API int qvSymToProfile(const char* symbol);
// The symbol of a number, "" if it has none.
QV_API const char* qvProfileToSym(int profile);
// Lifts a number of the oldest scheme into the second one; others come back unchanged. Oldest numbers that
// never existed give 0x1000064 (NONE).
QV_API int qvFixOldProfileNo(int profile);
