// Decoder "subimport": a text subtitle file, "srt" or "sub", as a subpicture stream.
//
//     decoder->setParam("filename", "film.srt");
//     decoder->setParam("framerate", QvFramerate(25.0));  // of the frame numbers in a "sub" file
//     decoder->open();
//     while (decoder->readFrame(0) == 0) show(importer->subtitle());
//
// readFrame moves on by a frame; subtitle() and readMeta then tell what is shown in it. Parameters:
// "filename"; "source" (in the place of the file, see QvByteSource; "filename" then says "srt" or "sub" by
// its extension); "framerate" (Framerate or frames a second); "readRate" (the rate at which frames are read,
// set by a video link to the video's; invalid: "framerate"). Read only: "filesize".
//
// Stream parameters: "type" (1), "format" (QvSubtitles::Format), "count" (entries), "encoding" (0),
// "codec" ("SubRip", "SubViewer" or "MicroDVD"), "textEncoding" (QvSubtitles::encodingName); with entries
// "first", "last" (their start times), "duration" (between these), "end" (of all; each a MediaTime) and
// "framerate"; where text could not be read "truncated" (1) and "unread" (its bytes).
#pragma once

#include <optional>

#include "core/caption/subtitle/qvsubtitles.h"
#include "core/decode/basedecodepipe.h"
#include "core/stream/qvbytesource.h"

class SubImporter : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;

    struct Settings {
        QvByteSource* source = nullptr;  // borrowed; null: the file
        QvFramerate framerate;
        Any readRate;
    };

    using BaseDecodePipe::getParam;
    using BaseDecodePipe::getStreamParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    // -9 for a file that is not there or is no subtitle file.
    int open() override;
    int close() override;

    // All of these assert before open.
    int nrStreams(int type) const override;
    void getStreamParam(int type, int stream, const char* name, Any& value) const override;
    void getStreamParams(int type, int stream, AnyDict& params) const override;
    int select(int type, int stream) override;
    int deselect(int type, int stream) override;
    int seek(const MediaTime& time, int type, int stream) override;
    int seekToFrame(long long frame, int stream) override;
    // 0, or QvStatus::endOfStream after the end of the last entry.
    int readFrame(int stream) override;
    // Sets "name" ("subtitle"), "text", "rows", "start", "end" of what is shown in the frame that was read,
    // and "format". -1 if nothing is.
    int readMeta(int stream, int kind, AnyDict& out) override;
    int nrFrames(int stream) const override;  // up to the last entry's end
    MediaTime duration(int type, int stream) override;

    // What is shown in the frame that was read; null if nothing is. Valid until close.
    QvSubtitle* subtitle() const { return shown_; }

  private:
    Settings settings_;
    std::optional<QvSubtitles> subtitles_;  // from open to close
    MediaTime end_;                         // of all entries
    long long next_ = 0;                    // frame
    QvSubtitle* shown_ = nullptr;
    long long fileSize_ = 0;

    int parse();
    const QvSubtitles& opened() const;
    const QvSubtitles& opened(int stream) const;
    const QvFramerate& readRate() const;
    void warn() const;
    AnyDict description() const;
};
