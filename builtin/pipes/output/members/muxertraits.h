// What the encode pipe has to know of some multiplexers beyond their interface.
#pragma once

struct MuxerTraits {
    const char* module = "";
    // A multiplexer of the engine's own use works with this sink and without streams of before; null for
    // others.
    const char* companionSink = nullptr;
    bool anyCodec = false;         // takes all codecs of the preset
    bool transportStream = false;  // video encoders get "tsAdjust"
    bool manyPrograms = false;     // "aacaenc" gets "aacTsAdjust"
    bool sizedStreams = false;     // its bitstreams take the buffer of an encoder as their parameter "size"
};

// By module name; the defaults for a module that is not in the table, and for null.
const MuxerTraits& muxerTraits(const char* module);
