// Profile numbers: what kind of output a preset stands for. The top 16 bits name the family, the low 16
// bits the member. Numbers from 0x2000000 are current; 0x1000000 to 0x1FFFFFF are those of an older scheme,
// and anything below an index into the oldest table. Every stored number goes through qvFixOldProfileNo.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"

namespace QvProfile {
constexpr int notSet = -1;
constexpr int none = 0x2000000;  // "no profile", as against not set
constexpr int raw = 0x216000F;
constexpr int aviRaw = 0x2160010;
constexpr int firstOfPlugins = 0x2800000;  // plug-ins' own presets are numbered from here on
}  // namespace QvProfile

// What the settings of an old DV preset say; a Generic of size 0 points to one (see qvProfile2No).
struct QvDvSettings {
    int kind = 0;  // 1 DV, 2 DVCPRO 25, 3 DVCPRO 50, 4 DVCPRO HD 720p, 5 DVCPRO HD 1080i
};

// The number of a symbol such as "RAW"; -1 for an unknown one. Current symbols come first.
QV_API int qvSymToProfile(const char* symbol);
// The symbol of a number, "" if it has none.
QV_API const char* qvProfileToSym(int profile);
// Lifts a number of the oldest scheme into the second one; others come back unchanged. Oldest numbers that
// never existed give 0x1000064 (NONE).
QV_API int qvFixOldProfileNo(int profile);
// The current number for an old description of a preset: its profile number of any scheme, the type code of
// its encoder, the names of encoder and multiplexer (null: not known) and, for DV alone, a Generic that
// points to QvDvSettings (null: none). QvProfile::notSet if there is none. Without an encoder's name the
// number alone decides, and one that is not known gives H264_MAIN.
QV_API int qvProfile2No(int oldNumber, int type, const char* videoCodec, const char* muxer,
                        const Any* settings);
