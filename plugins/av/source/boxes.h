// The outermost boxes of an ISO base media file (MP4, MOV, 3GP).
#pragma once

#include <cstdint>

class QvByteSource;

namespace av {

// Whether the file is one table of samples ("moov") and their bytes, with no fragments that have tables of
// their own. Leaves the source anywhere.
bool isOneTable(QvByteSource& source);

// Packets that the tables of all tracks ask for. A few bytes can ask for millions, and the libraries make
// room for them before they look whether the file is as long. 0 for other files. Leaves the source anywhere.
std::uint64_t packetsOfTables(QvByteSource& source);

}  // namespace av
