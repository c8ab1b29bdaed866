// RawMux: gives each stream a file of its own, an elementary stream export. Module "rawmux".
#pragma once

#include <memory>
#include <vector>

#include "builtin/muxers/ownfilesmuxer.h"

struct RawMuxOutput;

// Names: the output's name without its extension, "#00" and so on (the number within the type) when there are
// several streams of any type, and the extension of the encoder. "a.mpg" with one video and two audio streams
// gives a#00.raw, a#00.wav and a#01.wav.
//
// Parameters:
//   "filename"       text    the name that the others are made from
//   "exactName"      bool    the only stream is written to "filename" as it is, nothing appended: for a name
//                            that is a pipe or a device, "/dev/stdout" for one
//   "splitVideo"     bool    one file for each picture of a raw encoder: a#0.raw, a#1.raw ...
//   "splitAudio"     bool    one WAV file for each channel of a raw encoder: a#00.wav, a#01.wav ...
//   "rawAsPng"       bool    with splitVideo, PNG pictures
//   "_totalFrames"   int     pictures to come; gives their numbers a common width
//   "firstPicture"   int     with splitVideo: the number of the first one, for a part of a longer sequence
//   "allPictures"    int     of that sequence, whose numbers have one width; 0: "_totalFrames" has them all.
//                            Both are stored only where they are not 0
//   "filenames"      vector  read only: the names of all streams, enabled or not
//   "filesWritten"   vector  read only: every file that the last run made, pictures and channels one by one.
//                            After close with status 0 they are complete; otherwise they are what is left.
class RawMux : public OwnFilesMuxer {
  public:
    struct Settings {
        Any filename;
        int totalFrames = 0;
        int firstPicture = 0;
        int allPictures = 0;
        bool splitVideo = false;
        bool splitAudio = false;
        bool rawAsPng = false;
        bool exactName = false;
    };

    RawMux();
    ~RawMux() override;

    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;

    QvBufStream* addStream(int type, const AnyDict& params) override;
    // Opens the files of all enabled streams. When one fails, by a status or an exception, all are closed
    // again.
    int open() override;
    // Result and text tell when a file could not be written to its end.
    int close() override;
    int abort() override;
    int muxElementaryStreams(QvFileMuxConfig& config, QvBufStream& output) override;

    // What the read-only parameters of these names answer.
    Any extension() const;
    AnyVector filenames() const;
    AnyVector filesWritten() const;

  private:
    bool hasSeveral() const;
    Any outputName(int type, int nr) const;
    bool makesSeveral() const;
    int checkNames() const;
    int openAll();
    int openAudio(int nr);
    int openVideo(int nr);
    int openStream(int type, int nr, const char* failure);
    int finish(int abort);

    Settings settings_;
    std::vector<std::unique_ptr<RawMuxOutput>> outputs_;  // of the last run
};
