// Elementary streams in files, in the place of the encoders of a multiplexer.
#pragma once

#include <string>

class QvBufStream;
class QvFileMuxConfig;
class QvMuxer;

namespace av {

// The whole of QvMuxer::muxElementaryStreams for a multiplexer of this plug-in: 0, QvFileMux::cancelled, or a
// status with `error`; the multiplexer was then aborted. Coded streams are cut into units by the libraries,
// and their pictures are shown at the frame rate of the configuration. Raw ones are cut into pictures, and
// into blocks of sound.
int muxFiles(QvMuxer& muxer, QvFileMuxConfig& config, QvBufStream& output, std::string& error);

}  // namespace av
