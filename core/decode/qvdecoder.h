// Contract of a decoder: a media source shown as numbered streams of frames and samples.
//
// A stream is addressed by type (QvStreamType) and number; numbers count from 0 within a type. Usual order:
//
//     QvDecodePipe* decoder = ...;                        // QvRegistry::newCodec, state 2
//     decoder->setParam("filename", "a.wav");
//     decoder->open();                                    // state 3, streams exist
//     decoder->select(qvAudioStream, 0);
//     while (int n = decoder->readSamples(1600, 0); n > 0) use(*decoder->getAudioPtr(0));
//     decoder->close();                                   // state 2
//
// Reading a stream that is not selected is not defined. A decoder is used by one thread at a time.
//
// Parameters that every decoder answers. Decoder level: "filename" (text), "filesize" (Int64, bytes),
// "video0", "audio0", "subpic0", ... (Dict, all parameters of a stream), "video0/width" and so on (one of
// them); optional: "store" (Dict, what `store` saves), "isMeta" (the source is generated, there is no file).
// Stream level, in the dictionary of getStreamParams:
//
//     video  "FOURCC" (Int32, the format that readFrame delivers), "width", "height" (Int32), "framerate"
//            (Framerate), "frameAspect", "pixelAspect" (Float), "frames" (Int32), "duration" (Float,
//            seconds), "codec", "videoCodec" (String, for people), "pal" (Int32, 1 for PAL rates);
//            optional "vBitrate" (Float, bits a second), "nrViews" (Int32, 1 when absent)
//     audio  "samplerate", "channels", "bitsPerSample", "bytesPerSample" (Int32, the format of the QvPcm),
//            "samples" (Int64), "duration" (Float, seconds), "codec" (String);
//            optional "aBitrate" (Int32, kilobits a second)
//     both   optional "codecParams" (Dict, codec specifics; its "pid" is the stream's program ID)
//
// A source may end before the length that it announces. "frames" and "samples" count what can be read. Such a
// stream also has "truncated" (Int32, 1) and the announced length, "framesExpected" or "samplesExpected"
// (Int64). These keys are absent otherwise.
#pragma once

#include <functional>
#include <memory>

#include "core/arch/api.h"
#include "core/decode/qvaudiostreamreport.h"
#include "core/engine/modules/qvcodec.h"
#include "core/measure/qvgeometry.h"
#include "core/measure/streamtype.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvFrame;
class QvPcm;

// What a source says about one of its streams.
struct QV_API QvElementaryStream {
    int type = 0;                 // qvVideoStream or qvAudioStream
    Any filename;                 // the decoder's "filename"
    long long filesize = 0;       // bytes
    long long rate = 0;           // bits a second, 0 when not known
    QvFramerate framerate{0.0};   // video only; 0/1 when not known
    Any videoCodec = Any("N/A");  // video only
    int pid = -1;                 // program ID, -1 when the stream has none
};

// Watches an operation that reads a whole stream: gets the part that is done, 0 to 1, after each block of
// some thousand samples; returns false to end it. May be empty.
using QvReadWatch = std::function<bool(double part)>;

class QV_API QvDecodePipe : public QvCodec {
  public:
    static constexpr State stateOpen = static_cast<State>(3);  // streams exist

    explicit QvDecodePipe(const QvModule* module = nullptr);
    QvDecodePipe(const QvDecodePipe&) = delete;
    QvDecodePipe& operator=(const QvDecodePipe&) = delete;
    ~QvDecodePipe() override;

    using QvCodec::getParam;
    // Answers "video0/width" and "video0" (likewise audio and subpic) with the stream operations. So the name
    // of a decoder's own parameter can't begin with one of these words.
    void getParam(const char* name, Any& value) const override;
    // To be called at the end of a subclass's open, when its streams exist: makes room for overrides and
    // reports and sets state 3. An assertion if the last open was not closed.
    int open() override;
    // Forgets overrides and reports, state 2.
    int close() override;
    // This object for 2, else null.
    void* getInterface(int kind) const override;
    // "name", what getParam("store") gives, and overrides as "vidsOverride", "audsOverride", "subsOverride"
    // (a Vector with a Dict for each stream, absent when nothing is overridden).
    void store(AnyDict& dict) const override;

    virtual int nrStreams(int type) const = 0;
    // Asserts a null `out`, a type that is neither video nor audio, and a bad number.
    virtual void elementaryStream(int type, int stream, QvElementaryStream* out) const;
    virtual void getStreamParam(int type, int stream, const char* name, Any& value) const;
    virtual void getStreamParams(int type, int stream, AnyDict& params) const;
    virtual int setStreamParam(int type, int stream, const char* name, const Any& value);

    // After it the next read starts at that sample (frame), counted from 0.
    virtual int seekToSample(long long sample, int stream) = 0;
    virtual int seekToFrame(long long frame, int stream) = 0;
    // 0: getFramePtr holds the next frame. QvStatus::endOfStream, or another negative status.
    virtual int readFrame(int stream) = 0;
    // Number of samples now in getAudioPtr, `count` except at the end of the stream. QvStatus::endOfStream
    // when nothing is left, or another negative status.
    virtual int readSamples(int count, int stream) = 0;
    virtual int nrFrames(int stream) const = 0;
    virtual long long nrSamples(int stream) const = 0;
    // Asserted to be overridden by a decoder with metadata streams.
    virtual int readMeta(int stream, int kind, AnyDict& out);

    // Position by time. A subpicture stream follows the video stream of its number, or has frames of its own
    // at the decoder's "framerate".
    virtual int seek(const MediaTime& time, int type, int stream);
    // All video and audio streams. 0, or QvStatus::failed.
    virtual int seekAll(const MediaTime& time);
    // At the default timescale. Asserts types other than video and audio.
    virtual MediaTime duration(int type, int stream);

    // The decoder's own buffers, valid until the next read on that stream.
    virtual QvFrame* getFramePtr(int stream) = 0;
    virtual QvPcm* getAudioPtr(int stream) = 0;

    virtual int select(int type, int stream) = 0;
    virtual int deselect(int type, int stream) = 0;
    // "video" and "audio" become Vectors of stream numbers.
    virtual int selected(AnyDict& dict) const = 0;
    virtual bool isSelected(int type, int stream) const = 0;

    // Overrides correct what a source states, such as a wrong aspect ratio; they last from open to close.
    // Names that a user may override.
    virtual AnyVector overridableParams(int type, int stream);
    // Remembers the value; an invalid `value` goes back to the one before the first override. A subclass
    // calls this first, returns its failure unchanged, and then applies the value. QvStatus::failed: the
    // name may not be overridden. An assertion: no such stream.
    virtual int setOverride(int type, int stream, const char* name, const Any& value);
    // Invalid when not overridden. Asserts a bad number of a known type.
    virtual const Any& override(int type, int stream, const char* name);
    // A Dict for each stream; it also holds "NAME_orig" for each overridden NAME.
    virtual const AnyVector& overrides(int type) const;

    // For decoders that give coded frames; others assert.
    virtual int encodedFrameSize(int stream);
    virtual int readEncodedFrame(int stream, unsigned char* to);
    virtual int setReadUserData(int type, int stream, bool on);
    virtual bool readUserData(int type, int stream) const;

    Any getStreamParam(int type, int stream, const char* name) const;
    Any getVideoParam(int stream, const char* name) const;
    Any getAudioParam(int stream, const char* name) const;
    Any getSubpicParam(int stream, const char* name) const;
    int nrVideoStreams() const { return nrStreams(qvVideoStream); }
    int nrAudioStreams() const { return nrStreams(qvAudioStream); }
    int nrSubpicStreams() const { return nrStreams(qvSubpicStream); }

    // Peak levels of a stream, made by reading it once from start to end on the first call; the stream is at
    // sample 0 afterwards. Owned by the decoder, valid until close. Null: no such stream, it can't be read,
    // or `watch` ended it; the next call then reads it again.
    QvAudioStreamReport* getAudioStreamReport(int stream, const QvReadWatch& watch = {});

  private:
    struct Private;
    std::unique_ptr<Private> p_;

    std::unique_ptr<QvAudioStreamReport> makeReport(int stream, const QvReadWatch& watch);
    AnyVector* overrideList(int type) const;
};
