// Decoder "avdec": films, their pictures and sounds, of the containers and codecs that the libraries have.
//
// Frames and samples are counted before the first is read, from an index of the file's packets. Frame n and
// sample n are the same after any seek as when the stream is read from its start. Streams are read and sought
// independently: each has a demultiplexer of its own. Where packets don't say when their pictures are
// shown (H.264 and H.265 without a container) or how many samples they have, `open` decodes the stream once.
//
// Parameters: "source" (in the place of the file, see QvByteSource; it has to be sought), "threads" (stored;
// of each stream's codec, 0: one a core), "upright" (stored; 1: frames are delivered as the film is to be
// shown, turned and mirrored, and "rotation" and "mirrored" are absent then; 0, as it is at first: as they
// are coded), "exact" (1: packets are counted by reading all of the file, also where a table says how many
// there are), "survey" (1: to look at what the film is; counts are those of its tables where it has them, and
// nothing can be read or sought), "pictures" (stored; N above 0: the file and those that follow it by number,
// N in all, are the frames, a picture each) and "framerate" (stored; theirs, 25 at first), "container"
// (stored; the libraries' name of the format, "": found out), "openParameters" and "settings" (a Dict of
// these).
//
// A stream of pictures has, besides what the contract asks for:
//
// clang-format off
//     "rotation"       Int32   degrees clockwise to be shown upright: 90, 180 or 270; absent for 0
//     "mirrored"       Int32   1: it is to be shown mirrored top to bottom, before it is turned
//     "colourMatrix"   Int32   QvYUVMatrix, where the film states one of these
//     "colourPrimaries", "colourTransfer", "colourSpace"
//                      Int32   code points of ITU-T H.273 (BT.2020 is 9), where stated
//     "variableRate"   Int32   1: "framerate" is the nearest usual rate, frames repeat or skip pictures
//     "conversion"     String  what the pixel format can't hold, or how the frames are made of the pictures
//     "concealed"      Int64   pictures so far that were damaged or did not come
//     "framesLost"     Int64   pictures that are missing between others, where bytes of the file are missing;
//                              "truncated" is set, too
//     "estimated"      Int32   1: of a survey: "frames" and "duration" are what the film's header states;
//                              likewise "samples" of sound. Subtitles have no "count" then
//     "codecProfile"   String  of the codec: "High", "Main 10"
//     "language"       String  where the container has it; so "title"
//     "codecParams"    Dict    "pid", where the container numbers its streams
// clang-format on
//
// A stream of sound has "codecProfile", "language", "title", "channelMask" (Int64), "conversion" (why it ends
// early), "concealed" (packets) and "codecParams". Text subtitles of a film of pictures are subpicture
// streams with the parameters of those of "subimport", "language", "title" and, only when it is asked for by
// its name, "subtitles": a Vector of Dicts of "start" and "end" (MediaTime from the first picture) and "text"
// (lines separated by "|"); after that "lost" (how many of them are no valid text). readMeta gives what is
// shown in the frame that was read last. AC-3 and E-AC-3 have the codec "Dolby", "codecProfile" says which,
// and "dolby" is the Dict of the positions of "L", "R", "C", "Ls", "Rs" and "SUB" among the channels. The
// decoder's "meta" is the Dict of what the film says of itself, see filmfacts.h. A file that is cut or
// damaged delivers what is there, see "truncated" in the contract.
#pragma once

#include <memory>
#include <string>

#include "core/decode/basedecodepipe.h"
#include "core/measure/qvframerate.h"
#include "plugins/av/source/fileextent.h"
#include "plugins/av/source/mediainput.h"

class QvByteSource;

namespace av {

class PacketIndex;

class AvDec : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;
    ~AvDec() override;

    struct Settings {
        QvByteSource* source = nullptr;  // borrowed; null: the file
        int threads = 0;
        int upright = 0;
        int exact = 0, survey = 0;
        int pictures = 0;
        QvFramerate rate{25.0};
        std::string container;
    };

    using BaseDecodePipe::getParam;
    using BaseDecodePipe::getStreamParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    int seekToFrame(long long frame, int stream) override;
    int seekToSample(long long sample, int stream) override;
    int readFrame(int stream) override;
    int readSamples(int count, int stream) override;
    void getStreamParam(int type, int stream, const char* name, Any& value) const override;
    // As "subimport"; of a subpicture stream, in the frame that the video stream of its number, or the last
    // one, delivered.
    int readMeta(int stream, int kind, AnyDict& out) override;
    int seek(const MediaTime& time, int type, int stream) override;
    MediaTime duration(int type, int stream) override;
    QvFrame* getFramePtr(int stream) override;
    QvPcm* getAudioPtr(int stream) override;

  private:
    Settings settings_;
    std::unique_ptr<MediaBytes> bytes_;
    std::shared_ptr<const PacketIndex> index_;
    AnyDict facts_;
    AnyVector inputFiles_;  // of pictures that are files
    long long fileSize_ = -1;
    FileExtent extent_;

    int setAll(const Any& value);
    int refuse(const std::string& reason);
    int refuseSurvey();
    void addStreams(MediaInput& input, std::string& reason);
    int pictureOf(int subpicture) const;
    int openFilm();
    int openPictures();
};

}  // namespace av
