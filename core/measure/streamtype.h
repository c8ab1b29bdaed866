// Types of elementary streams.
#pragma once

// Bits. Where a mask is taken, 0 and 255 mean all.
enum QvStreamType : int { qvVideoStream = 1, qvAudioStream = 2, qvSubpicStream = 4, qvAllStreams = 255 };

constexpr bool qvStreamTypeMatches(int type, int mask) { return mask == 0 || (type & mask) != 0; }
