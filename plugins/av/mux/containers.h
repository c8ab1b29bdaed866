// What goes into which container: one row a multiplexer.
#pragma once

#include <cstdint>
#include <string>

#include "plugins/av/door/containers.h"
#include "plugins/av/source/avheaders.h"

namespace av {

// The codecs of units, by their FOURCC in a head (plugins/wire.h).
enum class MuxCodec {
    h264,
    hevc,
    av1,
    vp8,
    vp9,
    mpeg1,
    mpeg2,
    mpeg4,
    h263,
    dnxhd,
    dv,
    jpeg2000,
    prores,
    ffv1,
    mjpeg,
    raw,
    aac,
    mp2,
    mp3,
    ac3,
    eac3,
    flac,
    opus,
    vorbis,
    pcm,
    count
};

struct MuxCodecRow {
    MuxCodec codec;
    AVCodecID id;
    const char* name;     // for messages
    const char* fourccs;  // separated by ','
    bool setsInBand;      // its own data are also in the units and can be taken from there
};

// Null for a FOURCC that no codec has.
const MuxCodecRow* muxCodec(std::uint32_t fourcc);
const MuxCodecRow& muxCodecRow(MuxCodec codec);
bool isSound(MuxCodec codec);
std::uint32_t muxFourcc(AVCodecID id);  // for a head; 0 for what no codec is

constexpr std::uint32_t codecBit(MuxCodec codec) { return 1u << static_cast<int>(codec); }
template <class... C>
constexpr std::uint32_t codecBits(C... codecs) {
    return (codecBit(codecs) | ...);
}
static_assert(static_cast<int>(MuxCodec::count) <= 32);

// What is written where nothing can be changed afterwards, as a pipe.
enum class PipeForm {
    same,       // what is written anyway
    fragments,  // of MP4
    live,       // of Matroska: no index, no lengths
    none        // the container is not whole without its corrections
};

// What a container can say about the film.
namespace FilmWord {
enum : unsigned {
    title = 1,
    commonTags = 2,
    allTags = 4,
    chapters = 8,
    timecode = 16,
    language = 32,
    creationTime = 64,
    location = 128
};
}

namespace MuxTrait {
enum : unsigned {
    lengths = 1,       // H.264 and H.265 with lengths, and their parameter sets in the header only
    adts = 2,          // AAC keeps its ADTS headers
    indexInFront = 4,  // room for its index can be kept before the pictures
    counted = 8,       // streams start at 0 and have no times: sound before it is left out
    pixels = 16,       // its header says what the pixels are
    bigPcm = 32,       // PCM has the high byte first
    needsVideo = 64,
    wrapsPictures = 128,  // raw ones go to the libraries as their frames
    soundHeader = 256     // the engine's raw encoder puts one before the first sample
};
}

struct Container {
    const char* format;    // the libraries' name of it
    std::uint32_t codecs;  // bits of codecBit
    int videos, sounds;    // streams at most
    PipeForm pipe;
    unsigned words;                // bits of FilmWord
    unsigned traits;               // bits of MuxTrait
    std::uint32_t inOrder = 0;     // codecs whose pictures it only holds in the order in which they are shown
    const char* silent = nullptr;  // the libraries' format of it without sound, where that is another
    const char* mpeg1 = nullptr;   // the same for pictures and sound of MPEG-1 alone

    bool is(unsigned trait) const { return (traits & trait) != 0; }
    const MuxerModule& module() const;
    bool takes(MuxCodec codec) const { return (codecs & codecBit(codec)) != 0; }
    // "H.264, H.265 and AAC", of one kind.
    std::string takenNames(bool video) const;
};

// Null for a name that no multiplexer has.
const Container* containerOf(const char* module);
// What a file of that extension (without dot) is, where a multiplexer makes several containers.
struct ContainerForm {
    const Container* container;
    const char* format;
};
ContainerForm formFor(const Container& container, const std::string& extension);

}  // namespace av
