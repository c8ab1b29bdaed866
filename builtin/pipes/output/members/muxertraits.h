// What the encode pipe has to know of a multiplexer beyond its interface.
#pragma once

#include <string>

class QvModule;
class QvMuxer;

struct MuxerTraits {
    // The sink of a multiplexer of the engine's own use, which is exchanged while there are no streams; ""
    // for all others, which write into any sink.
    std::string companionSink;
    bool anyCodec = false;         // takes all codecs of the preset
    bool transportStream = false;  // video encoders get "tsAdjust"
    bool manyPrograms = false;     // the encoder "aacaenc" gets "aacTsAdjust"
    bool sizedStreams = false;     // its bitstreams take the size of their buffer as the parameter "size"

    // Those of a module: an attribute of the trait's name (a String, or an Int32 that is not 0), else the
    // engine's table of names, else the defaults. `module` may be null.
    static MuxerTraits of(const char* name, const QvModule* module);
    static MuxerTraits of(const QvMuxer* muxer);  // the defaults for null
};
