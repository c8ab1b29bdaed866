// What the pixels of a stream are, from its first unit.
#pragma once

struct AVCodecParameters;
struct AVPacket;

namespace av {

// Sets `format` of the parameters, and the profile if that is not known. Left alone for a unit that can't be
// decoded.
void probePixels(AVCodecParameters& parameters, const AVPacket& unit);

}  // namespace av
