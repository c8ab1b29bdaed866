// What encoders and multiplexers of plug-ins exchange through bufstream::auxinfo, so that those of one maker
// fit those of another. The engine carries these records and reads none of them but the first word of a unit.
//
// Order of a stream's side information:
//     VIDEO_STREAM_INFO or AUDIO_STREAM_INFO     from the encoder's open: the multiplexer is open by then;
//                                                from close again, if the codec's own data have changed
//                                                (FLAC)
//     bytes of a unit, VIDEO_AU_CODE or AUDIO_AU_CODE, bytes of the next unit, ...
//
// The bytes of a unit may come in several blocks, no one longer than the stream's chunk size; its side
// information comes after the last of them. Units come in decoding order. Bytes are in the elementary form
// of the codec where it has one (Annex B with the parameter sets at each IDR picture, ADTS, MPEG, AC-3, DV),
// so that the stream is a file that plays; a container converts them.
//
// All records are in the machine's byte order and have no padding. A reader accepts a longer record than it
// knows (`size`), and treats what is missing from a shorter one as 0.
#pragma once

#include <cstddef>
#include <cstdint>

namespace QvWire {

inline constexpr std::uint32_t version = 1;

// --- Units.

// Flags of a unit of video.
inline constexpr std::uint32_t unitKey = 1;      // decoding can start here
inline constexpr std::uint32_t unitLeading = 2;  // can't be decoded when decoding starts at the key before it
inline constexpr std::uint32_t unitTimed =
    0x8000'0000u;  // pts and dts are set; without it the multiplexer counts

// With VIDEO_AU_CODE. Times are in frames of the encoder's rate, from the first frame of the job: the
// stream's time base is the length of one frame.
struct VideoUnit {
    std::uint32_t bytes;     // of the unit
    std::uint32_t flags;     // see above
    std::int64_t pts;        // when it is shown
    std::int64_t dts;        // when it is decoded; below 0 before the first frame is shown
    std::uint32_t duration;  // frames, 1 or more
    std::uint32_t reserved;  // 0
};
static_assert(sizeof(VideoUnit) == 32 && offsetof(VideoUnit, pts) == 8 &&
              offsetof(VideoUnit, duration) == 24);

// With AUDIO_AU_CODE. `samples` holds unitTimed, too.
struct AudioUnit {
    std::uint32_t bytes;    // of the unit
    std::uint32_t samples;  // a channel, in the lower 31 bits
    std::int64_t pts;       // of its first sample, in samples; below 0: priming, which is not heard

    std::uint32_t sampleCount() const { return samples & ~unitTimed; }
    bool timed() const { return (samples & unitTimed) != 0; }
};
static_assert(sizeof(AudioUnit) == 16 && offsetof(AudioUnit, pts) == 8);

// --- Heads.

enum class FieldOrder : std::uint32_t { progressive = 0, topFirst = 1, bottomFirst = 2 };

// With VIDEO_STREAM_INFO.
struct VideoHead {
    std::uint32_t size;     // of this record, in bytes
    std::uint32_t version;  // QvWire::version
    std::uint32_t codec;    // FOURCC, the first letter in the lowest byte: "H264", "HEVC", "AV01"
    FieldOrder fieldOrder;
    std::int32_t rateNum, rateDen;              // frames a second, both above 0; 1/rate is the time base
    std::int32_t width, height;                 // of the picture that is shown
    std::int32_t aspectNum, aspectDen;          // of a pixel; 0/1: not known
    std::uint16_t primaries, transfer, matrix;  // code points of ITU-T H.273; 2: not known
    std::uint16_t fullRange;                    // 1: levels are those of the whole range
    std::int32_t delay;                         // frames by which decoding precedes showing, 0 or more
    std::int32_t profile, level;                // the codec's own numbers; -1: not known
    std::uint32_t reserved;                     // 0
    const void* extradata;                      // the codec's own data; valid during the call. May be null
    std::uint64_t extradataBytes;
};
static_assert(sizeof(VideoHead) == 80 && offsetof(VideoHead, primaries) == 40 &&
              offsetof(VideoHead, extradata) == 64);

// With AUDIO_STREAM_INFO.
struct AudioHead {
    std::uint32_t size;     // of this record, in bytes
    std::uint32_t version;  // QvWire::version
    std::uint32_t codec;    // FOURCC: "AAC ", "MP3 ", "AC-3", "FLAC", "OPUS", "PCM "
    std::int32_t rate;      // samples a second; 1/rate is the time base
    std::int32_t channels;
    std::int32_t bits;             // of a sample before it was encoded, or of PCM
    std::uint64_t mask;            // places of the channels as in WAVE_FORMAT_EXTENSIBLE; 0: not known
    std::int32_t frameSize;        // samples of a unit; 0: it varies
    std::int32_t initialPadding;   // samples of priming
    std::int32_t trailingPadding;  // samples that are not heard at the end, known at close
    std::int32_t bitrate;          // bits a second; 0: not known
    std::int32_t profile;          // the codec's own number; -1: not known
    std::uint32_t reserved;        // 0
    const void* extradata;         // the codec's own data; valid during the call. May be null
    std::uint64_t extradataBytes;
};
static_assert(sizeof(AudioHead) == 72 && offsetof(AudioHead, mask) == 24 &&
              offsetof(AudioHead, extradata) == 56);

static_assert(sizeof(void*) == 8, "the heads hold a pointer; both sides run in one process of 64 bits");

}  // namespace QvWire
