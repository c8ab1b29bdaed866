// What a film may ask of this program before anything of it is believed.
#pragma once

#include <cstddef>
#include <cstdint>

namespace av::limits {

inline constexpr std::int64_t probeBytes = 8 << 20;            // read to find out what the streams are
inline constexpr std::int64_t probeMicroseconds = 10'000'000;  // of the film, likewise
inline constexpr int probePackets = 5000;                      // of a stream, likewise
inline constexpr int silentPackets = 5000;  // without a first picture: then the stream is given up
inline constexpr unsigned streams = 256;
inline constexpr int side = 16384;                      // of a picture, in pixels
inline constexpr std::int64_t pixels = 16384LL * 8640;  // of a picture
inline constexpr double widestPixel = 100;              // and highest: width to height
inline constexpr int channels = 64;
inline constexpr int samplerate = 768'000;                           // Hz
inline constexpr std::size_t allocation = std::size_t{1} << 30;      // one block of the libraries
inline constexpr std::size_t packets = std::size_t{16} << 20;        // of a file
inline constexpr std::size_t subtitleBytes = std::size_t{64} << 20;  // of a stream
// Time on any clock, either way, whatever its unit is: sums of some of these fit into 64 bits.
inline constexpr std::int64_t farthest = std::int64_t{1} << 60;
inline constexpr int frames = 0x3fffffff;        // of a stream
inline constexpr int variableFrames = 64 << 20;  // of a stream of variable rate, which needs a table

}  // namespace av::limits
