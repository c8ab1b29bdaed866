// The outermost boxes of an ISO base media file (MP4, MOV, 3GP).
#pragma once

class QvByteSource;

namespace av {

// Whether the file is one table of samples ("moov") and their bytes, with no fragments that have tables of
// their own. Leaves the source anywhere.
bool isOneTable(QvByteSource& source);

}  // namespace av
