// Texts that have been drawn already, ready to be blended.
#pragma once

#include <deque>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/caption/text/textlayout_p.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvframe.h"
#include "core/value/anycontainer.h"

// A line in its band. Coordinates count from the top left corner of the band.
struct DrawnLine {
    TextLine line;
    QvRect covered;   // all that the line covers
    QvRect drawn;     // the part that the pictures hold, with even coordinates; empty before they are made
    QvFrame colours;  // in the format of the target
    QvFrame mask;     // GRAY
};

// What a text looks like depends on these.
struct DrawnTextKey {
    std::string_view text;
    int encoding;  // of QvText
    const AnyVector& fieldMasks;
    unsigned rgb;  // 0xRRGGBB
    unsigned fourcc;
    QvYUVMatrix matrix;
    int widest = 0;  // pixels of a line; 0: any width
};

struct DrawnText {
    std::string text;
    int encoding = 0;
    AnyVector fieldMasks;
    unsigned rgb = 0;
    unsigned fourcc = 0;
    QvYUVMatrix matrix = qvMatrixNotSet;
    int widest = 0;
    int align = 0;  // of a tag in the text
    std::deque<DrawnLine> lines;

    bool is(const DrawnTextKey& key) const;
};

// The last few texts, the newest first.
class DrawnTexts {
  public:
    DrawnText* find(const DrawnTextKey& key);  // null if it is not there
    // A text of this key without a layout, in the memory of the one that has not been asked for longest.
    DrawnText& renew(const DrawnTextKey& key);
    void clear() { texts_.clear(); }

  private:
    static constexpr std::size_t most = 16;  // a test picture of ten views has twelve
    std::vector<std::unique_ptr<DrawnText>> texts_;
};
