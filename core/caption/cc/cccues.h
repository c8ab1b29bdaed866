// Captions as a viewer sees them: what stands on the screen, from when to when.
#pragma once

#include <span>
#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/measure/mediatime.h"

struct QvCcBytePair;
class QvCcData;

// A row of text on the screen of 15 rows and 32 columns.
struct QV_API QvCcRow {
    int row = 15;        // 1 to 15, from the top
    int column = 0;      // 0 to 31, of the first character
    std::string text;    // UTF-8, without blanks at its ends
    std::string markup;  // the same with "<i>" and "</i>" around what is in italics
};

struct QV_API QvCcCue {
    MediaTime start, end;       // the end is the first instant at which it is not shown
    std::vector<QvCcRow> rows;  // from the top
    bool open = false;          // nothing removes it from the screen: the end is a guess

    // The rows, joined by "\n".
    std::string text() const;
    std::string markup() const;
};

// The captions of one field's first channel (CC1 of field 1, CC3 of field 2), in the order of time. `type` is
// 0 or 1; pairs of other types, of other channels, text mode and data services are passed over. `pairs` are
// in the order of the stream; those of one time follow each other, one in each frame of 1001/30000 s, as in
// the lines of an SCC file. A caption that nothing ends lasts four seconds.
//
// A pop-on caption is one cue. Of roll-up and paint-on captions each line makes a cue of what is on the
// screen then, so a line that rolls up is in several.
QV_API std::vector<QvCcCue> qvCcCues(std::span<const QvCcBytePair> pairs, int type);

// What qvCcEncode could not do.
struct QV_API QvCcLosses {
    std::string characters;  // those that captions can't show, each once, as UTF-8; "?" replaces them
    int late = 0;            // captions that begin late because their bytes do not fit in the time before
    double latest = 0;       // seconds by which the worst does
    int cut = 0;             // captions with more rows than the four that receivers must show
};

// The captions as byte pairs of field 1, channel 1, pop-on, centred at the bottom. Rows of more than 32
// characters are broken into rows of similar length. The pairs of one time are a line of an SCC file. Cues
// need not be sorted; one that overlaps the next ends when that begins. Of rows only the texts are used.
QV_API QvCcData qvCcEncode(std::vector<QvCcCue> cues, QvCcLosses& losses);
