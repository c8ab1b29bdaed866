// Elementary streams of files through a multiplexer that takes encoders' data as it comes.
#pragma once

#include <string>

class QvBufStream;
class QvFileMuxConfig;
class QvMuxer;

// The whole of QvMuxer::muxElementaryStreams: adds the streams, opens, feeds every stream by its time,
// closes, and removes the streams. 0 when all bytes are written, QvFileMux::cancelled, or a status with
// `error`; the multiplexer was then aborted. Uncompressed streams have to end with a whole picture or sample;
// those that are not go through in their units, or where these are not known in blocks without announcements.
int qvMuxFiles(QvMuxer& muxer, QvFileMuxConfig& config, QvBufStream& output, std::string& error);
