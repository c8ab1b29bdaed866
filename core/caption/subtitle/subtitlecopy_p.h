// The text of a subtitle file of any origin, ready for the parser.
#pragma once

#include <string_view>

#include "core/caption/subtitle/subtitlenormal_p.h"

struct QvSubtitleFindings;

struct SubtitleCopy {
    // `encoding` as in QvSubtitles::readFile. What is found is set in `findings`, but not what concerns
    // entries.
    SubtitleCopy(std::string_view bytes, int encoding, bool maybeSub, QvSubtitleFindings& findings);

    NormalText normal;
    bool isSub;  // as normalSub makes it, else as normalSrt does
};
