// Names of parameters that address one member of a pipe.
#pragma once

#include <optional>

class MuxerPlace;
class OutputStreams;
class QvCodec;

struct MemberAddress {
    enum class Member { muxer, sink, video, audio };
    Member member;
    int nr = 0;                  // of the stream within its type
    const char* rest = nullptr;  // what follows the slash; null without one

    // "muxer/NAME", "sink/NAME", "videoN/NAME", "audioN/NAME", "videoN", "audioN", with N of 1 to 4 digits.
    // `rest` points into `name`.
    static std::optional<MemberAddress> parse(const char* name);
    // Null when there is no such member.
    QvCodec* find(const OutputStreams& streams, const MuxerPlace& end) const;
};
