// QvFileMux: multiplexes elementary streams that lie in files.
//
//     QvFileMux mux;
//     QvFileMuxStream& video = mux.config().addStream(qvVideoStream, Any("clip.i420"), Any("rawvenc"));
//     video.framerate = QvFramerate::f25p();
//     video.params = AnyDict("type", static_cast<int>(QvFourcc::I420), "width", 640, "height", 480);
//     QvFileMuxStream& sound = mux.config().addStream(qvAudioStream, Any("clip.pcm"), Any("rawaenc"));
//     sound.samplerate = 48000, sound.channels = 2, sound.bitsPerSample = 16;
//     if (mux.run("rawavimux", Any("clip.avi")) != 0) puts(mux.errorDesc());
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/measure/qvgeometry.h"
#include "core/measure/streamtype.h"
#include "core/stream/qvfileparts.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvBufStream;
class QvCancel;
class QvMuxer;

// One stream, as coded data from the first to the last byte of a file.
struct QV_API QvFileMuxStream {
    int type = 0;  // qvVideoStream, qvAudioStream or qvSubpicStream
    Any file;      // the name of a regular file that is not empty
    // If there are any, the data are these, one after the other, and `file` is their name in messages.
    std::vector<QvFilePart> parts;
    // Files of the module that the attribute "recorder" of the multiplexer names, each with a stream of this
    // number within the type: pictures of one part begin where those of the part before it end. `first` of a
    // part is then the number of units at its beginning that are left out.
    bool recorded = false;
    Any codec;                   // name of the encoder that makes such data: "rawvenc"
    Any extension;               // without the dot; not set: the encoder's, else that of the file
    QvFramerate framerate{0.0};  // of video
    int samplerate = 0;          // of sound, Hz
    int channels = 0;            // of sound
    int bitsPerSample = 0;       // of sound
    // Bytes of the access units in their order, each above 0, the whole file in sum. Empty where they are not
    // known, and for uncompressed data, whose pictures and samples have one size.
    std::vector<long long> units;
    // What else the multiplexer may ask of the encoder: of raw video "type" (FOURCC, Int32), "width" and
    // "height" (pixels).
    AnyDict params;

    // Bytes of a picture, or of one sample of all channels, if the encoder writes them unchanged. 0 for coded
    // data; 0 with a text in `problem` for an invalid format.
    long long wholeBytes(std::string& problem) const;
    // Of the data; below 0 if a file can't be opened or is no regular file.
    long long length() const;
    // Whether it is read from that file.
    bool reads(const Any& name) const;
};

// What a multiplexer gets by QvMuxer::muxElementaryStreams, checked by QvFileMux::check.
class QV_API QvFileMuxConfig {
  public:
    QvFileMuxStream& addStream(int type, const Any& file, const Any& codec);

    std::vector<QvFileMuxStream> streams;
    AnyDict output;  // parameters of the multiplexer, by name; all have to be taken
    // Gets the part of all bytes that is done, 0 to 1, after each unit; returns false to stop. May be empty.
    std::function<bool(double part)> watch;
    std::shared_ptr<QvCancel> cancel;  // its request stops the run; set by QvFileMux

    // "Video stream #1, 'clip.i420'", for messages. `index` is a place in `streams`.
    std::string place(std::size_t index) const;
    bool stopped() const;
};

class QV_API QvFileMux {
  public:
    static constexpr int cancelled = 1;

    QvFileMux();
    ~QvFileMux();
    QvFileMux(const QvFileMux&) = delete;
    QvFileMux& operator=(const QvFileMux&) = delete;

    QvFileMuxConfig& config() { return config_; }

    // Checks the configuration before anything is written: 0, or QvStatus::invalidArgument with a text that
    // names the stream and its file.
    int check();
    // Multiplexes into a file, in the caller's thread. `muxer` is a module whose multiplexer answers
    // muxElementaryStreams, as "rawmux" and "rawavimux" do. 0 when all of it is written; `cancelled`; or a
    // status, with errorDesc(). After anything but 0 the files of filesWritten() are parts: remove them.
    int run(const char* muxer, const Any& output);
    // Ends a run as soon as a unit is written; from any thread. It also ends a wait for the reader of a pipe.
    // Without a run it has no effect on the next one.
    void requestStop();

    // The files that the last run made, finished or not: a Vector of names.
    const AnyVector& filesWritten() const { return written_; }
    const char* errorDesc() const { return error_.c_str(); }
    int errorCode() const { return code_; }

  private:
    QvFileMuxConfig config_;
    std::shared_ptr<QvCancel> cancel_;
    AnyVector written_;
    std::string error_;
    int code_ = 0;

    int fail(int code, const std::string& text);
    int checkStream(std::size_t index);
    int checkOutput(const Any& output);
    int setUp(QvMuxer& muxer, const Any& output);
    int checkMuxer(QvMuxer& muxer, QvBufStream& output);
    int multiplex(QvMuxer& muxer, const Any& output);
};
