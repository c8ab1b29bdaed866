// Chunks of WAV files that hold words and marks about the sound: what they say, and what becomes of them
// when a part of the sound goes into another file.
//
//     "bext"  description, originator, date and time, and the time reference: the first sample's number since
//             midnight
//     "iXML"  production data as XML, with time stamps of its own
//     "LIST"  "INFO": title, artist and so on; "adtl": labels of cue points
//     "cue "  points in the sound, by the number of their sample
//
// They travel as a Vector of Dict with "id" (String of four bytes) and "data" (Generic, without padding),
// little-endian: "chunks" of the decoder "wavdec" gives them, "chunks" of QvBsSplitAudio writes them.
#pragma once

#include "core/arch/api.h"
#include "core/value/anycontainer.h"

class QV_API QvWavChunks {
  public:
    // What is taken of a source.
    struct Part {
        long long first = 0;     // sample of the source; below 0: that many of silence come before it
        long long samples = -1;  // of the source; negative: all that follow
        int fromRate = 0;        // samples a second of the source, above 0
        int toRate = 0;          // and of the result, above 0
        int bits = 0;            // of a value of the result; 0: not known
        bool changed = false;    // the sound itself is another, so what was measured of it is void
    };
    // The chunks for a file with that part: time references and cue points move, points outside it go, and
    // their labels with them. Loudness in "bext" is void for less than the whole. Others are unchanged, as
    // does what is damaged.
    static AnyVector ofPart(const AnyVector& chunks, const Part& part);

    // What the chunks say; keys are absent without such a chunk. Texts are as in the file, up to the first
    // NUL, without blanks at the end.
    //     "bext"  Dict: "description", "originator", "originatorReference", "originationDate",
    //             "originationTime", "codingHistory" (String), "timeReference" (Int64), "version" (Int32)
    //     "info"  Vector of Dict: "id", "text" (String)
    //     "iXML"  Dict: "xml" (String, all of it); "project", "scene", "take", "tape", "note" (String) where
    //             they are there
    //     "cues"  Vector of Dict: "id", "position" (Int64), "label" (String, absent without one)
    static AnyDict describe(const AnyVector& chunks);
};
