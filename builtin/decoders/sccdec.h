// Decoder "sccdec": the captions of one or two SCC files, one a field, as a stream of caption data.
//
// The one stream is a subpicture stream; readFrame takes the byte pairs of the next frame and readMeta hands
// them out as QvCcData stores them. As the meta source of a video link it puts them into the video's frames:
//
//     decoder->setParam("filename", "field1.scc,field2.scc");
//     decoder->setParam("offset", MediaTime(3600, 1, MediaTime::defaultTimescale));  // the tape began at 1 h
//     decoder->open();
//     task.linkMeta(decoder, qvSubpicStream, 0, 1, 0);
//
// Parameters: "filename" ("FIELD1,FIELD2"; the name of an existing file is never split), "filenames" (a
// Vector of up to two), "filenameField1", "filenameField2"; "source" (field 1 in the place of its file, see
// QvByteSource); "offset" (MediaTime or seconds: the file's time
// of frame 0), read as "timeOffset"; "framerate" (fixes the rate of the timecodes, otherwise it is detected;
// invalid goes back to that); "readRate" (frames a second that readFrame moves by, set by a video link to the
// video's; invalid: the rate of the timecodes); "dropFrameLines" (reads lines with ";" before the frames, off
// at first; the rate found is then drop frame, a rate that was set keeps its df); "openParameters" (a Dict of
// these). Read only: "inOut" (a Dict with first and last time, "inField1", "outField1", "inField2",
// "outField2", of the fields that have data), "filesize".
//
// Stream parameters: "codec", "framerate", "frames" (to the last pair), "duration" (Float, seconds), "pairs",
// "first" and "last" (MediaTime of the stream).
#pragma once

#include <array>

#include "core/caption/cc/qvcc.h"
#include "core/decode/basedecodepipe.h"
#include "core/stream/qvbytesource.h"

class CCStream : public DPipeStream {
  public:
    CCStream();

    static constexpr int fields = 2;

    std::array<QvCcData, fields> data;  // in the order of time
    MediaTime timeOffset;
    QvFramerate framerate;
    std::array<bool, fields> hasData{};

    // The pairs of field 1, then of field 2, within frame n at a rate, in time of the stream.
    void read(long long n, const QvFramerate& rate, QvCcData& result) const;
    MediaTime begin() const;  // of the first pair, in time of the stream
    MediaTime end() const;    // of the last one; 0 if that is before the start of the stream
};

class SccDec : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;

    struct Settings {
        QvByteSource* source = nullptr;  // of field 1, in the place of its file; borrowed
        std::array<Any, CCStream::fields> filenames;
        MediaTime offset;
        Any framerate;  // invalid: detected
        Any readRate;
        bool dropFrameLines = false;
    };

    using BaseDecodePipe::getParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    // -9 without a file that has captions.
    int open() override;
    int close() override;
    int seek(const MediaTime& time, int type, int stream) override;
    // Any frame number can be read: outside the captions there are none.
    int seekToFrame(long long frame, int stream) override;
    // QvStatus::endOfStream after the last pair.
    int readFrame(int stream) override;
    // The pairs of the frame just read; -1 when it has none. `kind` has no meaning.
    int readMeta(int stream, int kind, AnyDict& out) override;
    int nrFrames(int stream) const override;
    MediaTime duration(int type, int stream) override;

  private:
    Settings settings_;
    long long next_ = 0;  // frame, at the reading rate
    QvCcData frame_;
    long long fileSize_ = 0;

    CCStream* captions() const;
    CCStream& requireCaptions(int stream) const;
    const QvFramerate& readRate() const;
    int setFilename(const Any& value);
    int setAll(const Any& value);
    Any shownNames() const;
    AnyDict storedSettings() const;
    AnyDict inOut() const;
    int readField(CCStream& stream, int field, QvFramerate& rate);
    int readPairs(CCStream& stream, int field, bool detect, QvFramerate& rate, const bool* dropFrame);
    long long bytesOf(int field) const;
    int readAtOneRate(CCStream& stream, std::array<QvFramerate, CCStream::fields>& rates);
    void describe(CCStream& stream) const;
    int framesUntilEnd(const QvFramerate& rate) const;
};
