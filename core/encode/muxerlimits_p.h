// How many streams a multiplexer takes, read from its parameter "maxStreams".
#pragma once

class QvMuxer;

struct MuxerLimits {
    int video = 0;
    int audio = 0;
    int subpic = 0;
    int total = 0;

    // A multiplexer that answers no dictionary is an assertion; so is null. `complaint` is logged before it
    // and may print the multiplexer's name with one "%s".
    static MuxerLimits of(const QvMuxer* muxer, const char* complaint);

    // The limit of a type (1, 2 or 4), or the total for 0; an assertion for any other type.
    int ofType(int type) const;
    // How many more streams of a type fit when there are `ofThis` of the type and `inAll` of all types: -1
    // when none is ever taken. Type 0: the room left in total.
    int room(int type, int ofThis, int inAll) const;
};

// The room that is left, as QvEncodePipe::canAddStreams answers it.
int qvStreamRoom(const QvMuxer* muxer, int type, int ofThis, int inAll);
