// The multiplexers of the plug-in: films of one container, written through the output that is attached.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/encode/basemuxer.h"
#include "plugins/av/mux/containers.h"

namespace av {

class FilmWriter;

// Streams come from encoders as plugins/wire.h says, and from the engine's encoders of raw data. A run that
// is aborted leaves a file without index.
//
// Parameters:
//   "seekable"   -1 to 1, -1  1: headers are corrected when the film is complete, so the output has to take
//                             BUF_SEEK_INFO; 0: what is written stays, as in a pipe; -1: 1 for a file
//   "fastStart"  1            MP4: the index is at the front, if the number of frames is known before
//   "avOptions"  ""           options of the libraries' container, "name=value:name=value"
//   "samplerate", "channels", "bitsPerSample"
//                48000, 2, 16 what "dummyaenc" passes on: the form of samples that come without an encoder
//   "language"   ""           of all streams of sound that have none, ISO 639-2
//   "meta"       Dict         see setFilmWords; the engine sets what the input of the first picture has
//   "tags"       -            Dict in the place of "meta", even an empty one. It stays, and is stored
//
// addStream takes "language" and "title" of a stream, too, and so does setStreamParam.
class Multiplexer : public BaseMuxer {
  public:
    struct Settings {
        int seekable = -1;
        bool fastStart = true;
        int totalFrames = 0;
        int samplerate = 48000, channels = 2, bitsPerSample = 16;  // of sound that has no encoder of its own
        std::string avOptions, language;
        Any filename;
        AnyDict meta;
        Any tags;
    };

    explicit Multiplexer(const Container& container);
    ~Multiplexer() override;

    const Container& container() const { return container_; }
    // What its encoders estimate, in kilobytes a second.
    double secondKilobytes() const;
    // Makes that its error, for a stream that failed.
    void refuse(const std::string& problem);

    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;
    // "language" and "title" of the `stream`-th of a type, as the encode pipe addresses them.
    int setStreamParam(int type, int stream, const char* name, const Any& value) override;
    void getStreamParams(int type, int stream, AnyDict& params) const override;

    // Null beyond the streams that the container holds.
    QvBufStream* addStream(int type, const AnyDict& params) override;
    // QvStatus::failed for raw data that the container does not hold. What encoders describe is judged when
    // they do.
    int open() override;
    int close() override;
    int abort() override;
    int muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output) override;

  private:
    const Container& container_;
    Settings settings_;
    std::unique_ptr<FilmWriter> film_;
    mutable bool asking_ = false;  // its encoders for their rates
    bool file_ = false;            // the output is one whose contents can be read again

    std::string extension() const;
    bool regularFile() const;
    int checkOptions(const Any& value);
    int fail();
    int describe(int type, int nr, const Container& container, std::vector<class MuxTrack>& tracks);
    int check();
    bool encoderFailed() const;
    void end();
    QvBufStream* streamAt(int type, int number) const;
};

// A new multiplexer, owned by the caller; null where no multiplexer has that name.
QvCodec* newMultiplexer(const char* module);

}  // namespace av
