// What joins one decoder stream to one encoder stream: the points of the job, the conversion that the output
// needs, and one step of work at a time. The transcoder calls only the operations of TransLink; all that
// depends on frames, samples, chapters and smart rendering is in the links.
//
// Order of calls: init once, setProcessParams any number of times, then for each run open, processFrame until
// finished(), close. One thread at a time. Decoder and encoder pipe are not owned and must outlive it.
#pragma once

#include <initializer_list>
#include <memory>
#include <utility>

#include "core/arch/api.h"
#include "core/decode/qvdecoder.h"
#include "core/job/processparams.h"
#include "core/measure/qvgeometry.h"
#include "core/measure/streamtype.h"
#include "core/value/any.h"

class QvCancel;
class QvCodec;
class QvEncodePipe;
class QvException;
struct LinkOpen;

class QV_API TransLink {
  public:
    TransLink();
    // A copy is a closed link over the same streams with the same parameters.
    TransLink(const TransLink& other);
    TransLink& operator=(const TransLink& other);
    virtual ~TransLink();

    virtual int type() const = 0;  // qvVideoStream or qvAudioStream
    // -1 for an encoder stream that does not exist (video); misuse asserts.
    virtual int init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream);
    // Reads the formats, takes the points and builds the conversion. `params` (may be null): "inOutPoints",
    // "chapters", "effects", "audioEffects", "connMatrix", "audioConversion", "holdLast", "smartRender",
    // "qualityStats".
    // -1 when open already.
    virtual int open(const AnyDict* params);
    // Ends the run. 0, also for a closed link, or the first failure of a filter since open. No step reports
    // it, because a filter that fails lets its frames pass.
    virtual int close() = 0;
    // One step: a frame for video, exactly n samples for audio. The status of the writer, or of the reader
    // when it failed before the expected end.
    virtual int processFrame(int n) = 0;
    virtual bool finished() const { return finished_; }
    // Whether the sound of a run ended before the length that its source announced, by a fault or a lack of
    // data. The rest is silence, so the count does not show it.
    virtual bool endedEarly() const { return false; }
    virtual int totalOutFrames() const = 0;  // video only
    virtual double samplesPerFrame() const;
    virtual double completed() const = 0;  // percent
    virtual void log() = 0;                // describes the link in the debug log
    // How many samples of this link's output belong to the first n frames at a rate; 0 for video.
    virtual long long outSamplesPerFrames(int n, const QvFramerate& rate) const;
    virtual long long outProcessed() const = 0;  // frames or samples written
    // Takes the points, chapters, filters, channel map and quality log that `params` has; others stay.
    virtual void setProcessParams(const ProcessParams& params);
    // Of this link alone, which setProcessParams leaves as it is; 0 is as the task says.
    void setSmartRender(int mode) { processParams_.setSmartRender(mode); }
    // The index-th filter of that name in the pipe, or null.
    virtual QvCodec* filter(const char* name, int index) const = 0;
    // Captions of another stream for this link's frames; video only. `type` is the stream's type.
    virtual int addMetaSource(QvDecodePipe* decoder, int type, int stream, const MetaProcessParams& params);
    virtual int nrMetaSources() const;
    virtual QvDecodePipe* metaSource(int index) const;
    virtual int metaSourceStreamNr(int index) const;  // -1 out of range
    // Reads the format of the decoder stream; sets the format of the encoder stream.
    virtual void _getInParams(AnyDict& params) const;
    virtual int _setOutParams(const AnyDict& params);
    // The same as open, for callers that have no dictionary.
    virtual int openWith(const LinkOpen& given) = 0;
    // The rate at which the frames of this link count; 24 a second for audio, which has none.
    virtual QvFramerate outFramerate() const;
    virtual long long totalOutSamples() const;  // samples that the output is to get; 0 for video

    QvDecodePipe* decoder() const { return decoder_; }
    QvEncodePipe* encoder() const { return encoder_; }
    int decStreamNr() const { return decStreamNr_; }
    int encStreamNr() const { return encStreamNr_; }
    const ProcessParams& processParams() const { return processParams_; }
    // The points in force since open.
    MediaTime inPoint() const { return inOutPoints_.inPoint(); }
    MediaTime outPoint() const { return inOutPoints_.outPoint(); }
    int errorCode() const { return errorCode_; }
    const char* errorDesc() const;  // never null
    // `cancel` ends the waits of filters that are a QvCancellable, from the next open on. Null: nothing does.
    void setCancel(std::shared_ptr<QvCancel> cancel) { cancel_ = std::move(cancel); }
    // Called while `open` reads the sound for filters that need a report; if it returns false, open fails.
    // May be empty.
    void setReadWatch(QvReadWatch watch) { readWatch_ = std::move(watch); }
    // Makes the encoder stream take the format of the decoder stream. -1 before init.
    int copyFormat();

  protected:
    Any _encPar(const char* name) const;  // "video0/NAME": a parameter of this stream on the encoder pipe
    int setError(int code, const Any& text);
    int pipeFailed(const QvException& failure);  // why a conversion can't be built, as this link's error
    int closePipe(QvCodec& pipe);                // 0, or what failed in it, as this link's error
    void copyError(int code, const Any& text);
    void nameStreams();
    void readLogProgress();
    // Takes the given points, or 0 to `end`; an out point of 0 also means `end`. True if points were given.
    bool takePoints(const LinkOpen& given, const MediaTime& end);
    // The description of encoder and filters that ends the log of a link.
    void logEncoder(const QvCodec& encoder, std::initializer_list<const char*> names) const;
    static void logFilter(int number, const QvCodec& filter);

    QvDecodePipe* decoder_ = nullptr;
    QvEncodePipe* encoder_ = nullptr;
    int decStreamNr_ = -1;
    int encStreamNr_ = -1;
    Any decStreamName_;
    Any encStreamName_;
    bool opened_ = false;
    bool finished_ = false;
    bool worked_ = false;  // an audio step has delivered something
    ProcessParams processParams_;
    InOutPoints inOutPoints_;
    std::shared_ptr<QvCancel> cancel_;
    QvReadWatch readWatch_;
    bool logProgress_ = false;
    Any errorDesc_;
    int errorCode_ = 0;
};
