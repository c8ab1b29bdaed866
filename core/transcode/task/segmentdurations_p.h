// Where the streams of one segment end.
#pragma once

#include <string>

#include "core/decode/qvinputstream.h"

// Changes the points of the streams so that all end together. The shortest video decides, or the shortest
// stream where there is no video. Sound of the file that decides also begins where that stream does; sound of
// another file keeps its beginning, and what is too long of it is cut. Sound that is too short stays so.
// Subpicture streams are left alone. The index of the stream that decides; an assertion when none is shorter
// than 30 days.
int qvAdjustSegmentDurations(const QvIStreamList& streams);

// "FILE TYPE#NUMBER", for the log.
std::string qvStreamLabel(const QvIStream& stream);
