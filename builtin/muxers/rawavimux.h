// RawAviMux: uncompressed pictures and PCM in one AVI file. Module "rawavimux".
#pragma once

#include "builtin/muxers/rawavimuxstream.h"
#include "core/encode/basemuxer.h"

// Writes through the output that is attached, front to back, and corrects the headers when it is closed; the
// output has to take BUF_SEEK_INFO. Beyond a limit the file continues in further RIFF segments (OpenDML), up
// to 2 TiB with the defaults; readers that know the first segment only still play that. A run that is aborted
// leaves a file without index.
//
// Video types of the encoders: BGR3, BGR4 (BGRA), I420, YV12, YUYV (YUY2), UYVY, v210. Each stream has
// its own size and rate. Sound is integer PCM; one that is neither of one or two channels with 8 or 16 bits
// has the extensible format.
//
// Parameters:
//   "riffBytes"   1024 to 1 GiB, 1 GiB  a segment ends before it gets longer
//   "segments"    1 to 65536, 2048      room for the places of their indexes; a file that needs more fails
class RawAviMux : public BaseMuxer {
  public:
    struct Settings {
        int riffBytes = static_cast<int>(AviFile::Limits().segmentBytes);
        int segments = AviFile::Limits().segments;
    };

    RawAviMux() = default;
    ~RawAviMux() override;

    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;

    // Null beyond the 99 streams that a file holds.
    QvBufStream* addStream(int type, const AnyDict& params) override;
    // QvStatus::failed for a format that AVI does not hold, and when the headers can't be written.
    int open() override;
    // Result and text tell when something of the file could not be written.
    int close() override;
    int abort() override;
    int muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output) override;

  private:
    int describe(int type, int nr, std::vector<AviInterleaver::Source>& sources);
    int describeVideo(const QvCodec& encoder, AviInterleaver::Source& source);
    int describeAudio(const QvCodec& encoder, AviInterleaver::Source& source);
    int fail();
    void end();

    Settings settings_;
    AviInterleaver interleaver_;
};
