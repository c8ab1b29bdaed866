// What joins one decoder stream to one encoder stream: the points of the job, the conversion that the output
// needs, and one step of work at a time. The transcoder calls the operations of TransLink alone; what it has
// to know of frames, samples, chapters and smart rendering is in the links.
//
// A link goes: init once, setProcessParams any number of times, then for each run open, processFrame until it
// has finished, close. One thread at a time. Decoder and encoder pipe are not owned and must outlive it.
#pragma once

#include <initializer_list>
#include <memory>
#include <utility>
#include <vector>

#include "core/arch/api.h"
#include "core/job/jobdescription.h"
#include "core/job/processparams.h"
#include "core/media/qvbuffer.h"
#include "core/value/any.h"

class QvAProcessPipe;
class QvAudioEncoder;
class QvCodec;
class QvDecodePipe;
class QvEncodePipe;
class QvException;
class QvPSNRLogger;
class QvVProcessPipe;

class QV_API TransLink {
  public:
    TransLink();
    // A copy is a closed link over the same streams with the same parameters.
    TransLink(const TransLink& other);
    TransLink& operator=(const TransLink& other);
    virtual ~TransLink();

    virtual int type() const = 0;  // the stream type: 1 video, 2 audio
    // -1 for an encoder stream that does not exist (video); misuse asserts.
    virtual int init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream);
    // Reads the formats, takes the points and builds the conversion. `params` (may be null): "inOutPoints",
    // "chapters", "effects", "audioEffects", "connMatrix", "smartRender", "qualityStats". -1 when open
    // already.
    virtual int open(const AnyDict* params) = 0;
    // Ends the run. A closed link is left alone: 0. Otherwise 0 or what a filter failed with since open, here
    // or before: filters let frames pass that they could not work on, and no step tells.
    virtual int close() = 0;
    // One step: a frame for video, exactly n samples for audio. The status of the writer, or of the reader
    // when it failed before the expected end.
    virtual int processFrame(int n) = 0;
    virtual bool finished() const { return finished_; }
    virtual int totalOutFrames() const = 0;  // video only
    virtual double samplesPerFrame() const;
    virtual double completed() const = 0;  // percent
    virtual void log() = 0;                // describes the link in the debug log
    // How many samples of this link's output belong to the first n frames at a rate; 0 for video.
    virtual long long outSamplesPerFrames(int n, const QvFramerate& rate) const;
    virtual long long outProcessed() const = 0;  // frames or samples written
    // Takes the points, chapters, filters, channel map and quality log that `params` has; others stay.
    virtual void setProcessParams(const ProcessParams& params);
    // The index-th filter of that name in the pipe, or null.
    virtual QvCodec* filter(const char* name, int index) const = 0;
    // Captions of another stream for this link's frames; video only. `type` is the stream's type.
    virtual int addMetaSource(QvDecodePipe* decoder, int type, int stream, const MetaProcessParams& params);
    virtual int nrMetaSources() const;
    virtual QvDecodePipe* metaSource(int index) const;
    virtual int metaSourceStreamNr(int index) const;  // -1 out of range
    // The format of the decoder stream, and the giving of a format to the encoder stream.
    virtual void _getInParams(AnyDict& params) const;
    virtual int _setOutParams(const AnyDict& params);

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
    // The points of `params`, or 0 to `end`, where also an out point of 0 lies; true if they were given.
    bool takePoints(const AnyDict* params, const MediaTime& end);
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
    bool logProgress_ = false;
    Any errorDesc_;
    int errorCode_ = 0;
};

// Captions that come from a decoder stream of their own.
struct QV_API MetaVHelper {
    QvDecodePipe* decoder = nullptr;  // not owned
    int stream = -1;
    MetaProcessParams params;
};

class QV_API TransVLink : public TransLink {
  public:
    TransVLink();
    TransVLink(const TransVLink& other);
    TransVLink& operator=(const TransVLink& other);
    ~TransVLink() override;

    int type() const override { return 1; }
    int init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) override;
    int open(const AnyDict* params) override;
    int close() override;
    int processFrame(int n) override;
    int totalOutFrames() const override { return nrFramesOut_; }
    double completed() const override;
    void log() override;
    long long outProcessed() const override { return framesWritten_; }
    QvCodec* filter(const char* name, int index) const override;
    int addMetaSource(QvDecodePipe* decoder, int type, int stream, const MetaProcessParams& params) override;
    int nrMetaSources() const override;
    QvDecodePipe* metaSource(int index) const override;
    int metaSourceStreamNr(int index) const override;

    // Ends the waits of filters that are a QvCancellable; in force from the next open on. Null: nothing does.
    void setCancel(std::shared_ptr<QvCancel> cancel) { cancel_ = std::move(cancel); }

    const QvFramerate& outFramerate() const { return outFramerate_; }
    int nrFramesIn() const { return nrFramesIn_; }
    int startFrame() const { return startFrame_; }
    int stopFrame() const { return stopFrame_; }

  private:
    struct Step;

    int views(const Any& value) const;
    unsigned chooseFOURCC(unsigned inFOURCC) const;
    int takeFrameRange(const AnyDict* params, const AnyDict& stream);
    bool applyChapters(const AnyDict* params);
    void describeJob(const AnyDict* params, const AnyDict& stream);
    int buildPipe();
    void _setTotalVDuration();
    bool pipeAllowsSmartRender() const;
    void setupSmartRender(bool wanted);
    void setupLogger(const AnyDict* params);
    void writeLog();
    void releasePipe();

    void smartStep(Step& step);
    void pipeStep(Step& step);
    void directStep(Step& step);
    void writeStep(Step& step);
    void endStep(Step& step);
    void repeatLast(Step& step);
    int _processOneFrame();
    QvFrame* completePair();
    void feedMetaSources(QvFrame* frame);
    void makeIcon(QvFrame* frame) const;
    int writeFrame(QvFrame* frame);

    QvEncodingQualityStatsSetup qualitySetup_;
    std::unique_ptr<QvPSNRLogger> psnrLogger_;
    QvFramerate outFramerate_;
    std::unique_ptr<QvVProcessPipe> videoPipe_;  // null when no processing is needed
    int nrFramesIn_ = 0;                         // frames to read, from in to out point
    int nrFramesOut_ = 0;                        // frames that the encoder is to get
    bool pairCompleted_ = false;                 // nrFramesIn_ is one more than the range has
    int framesWritten_ = 0;                      // -1 after close
    int startFrame_ = 0;                         // at the input rate
    int stopFrame_ = 0;                          // inclusive
    int decViews_ = 1;
    int encViews_ = 1;
    std::vector<std::unique_ptr<MetaVHelper>> metaSources_;
    VideoJobDescription job_;  // of the pipe, which may keep a pointer to it
    std::shared_ptr<QvCancel> cancel_;
};

class QV_API TransALink : public TransLink {
  public:
    TransALink();
    ~TransALink() override;

    int type() const override { return 2; }
    int init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) override;
    int open(const AnyDict* params) override;
    int close() override;
    int processFrame(int n) override;
    int totalOutFrames() const override;
    double samplesPerFrame() const override;
    double completed() const override;
    void log() override;
    long long outSamplesPerFrames(int n, const QvFramerate& rate) const override;
    long long outProcessed() const override { return processed_ + 1; }
    QvCodec* filter(const char* name, int index) const override;

    // Writes n samples of silence. 0, whatever the writer says.
    virtual int _insertSilence(int n);

    long long totalOutSamples() const { return totalOutSamples_; }

    // For mixing several input streams into one link.
    // The streams that a matrix names, in rising order; with `select` those not selected yet are, and stand
    // in `newlySelected` after it.
    AnyVector _getNeededInputStreams(const AnyVector& matrix, AnyVector& newlySelected, bool select);
    // A matrix in the numbering of a channel converter: a channel counts from all channels of the streams
    // before its own; -1 for silence and for a stream that takes no part.
    AnyVector _connMatrixToFilter(const AnyVector& matrix) const;
    int _filterChannelNr(const AnyVector& streams, int stream, int channel) const;
    // Interleaves the current buffers of the streams of the mix into one buffer, owned by the link. Null
    // without a stream.
    QvPcm* _muxStreams();

  private:
    struct Source;

    int readFormat(const AnyDict& stream);
    bool _verifyConnMatrix() const;
    bool verifySource(const Any& source, int channel, int index) const;
    void logMatrix() const;
    void takeMatrix(const AnyDict* params);
    int buildPipe(const AnyDict* params, MediaTime& delay);
    void shiftPoints(const MediaTime& delay, const MediaTime& end);
    void computeRange();
    void setupSmartRender(const AnyDict* params);
    Source sourceOf(const Any& source) const;
    QvAudioEncoder* audioEncoder() const;

    int smartStep(int n);
    int directStep(int n);
    int pipeStep(int n);
    int endStep(int result);
    int readFailed();
    void logDone(const char* what) const;
    bool prepareSilence(int n);

    long long totalInSamples_ = 0;
    long long totalOutSamples_ = 0;
    long long processed_ = -1;  // index of the last sample written
    int inSamplerate_ = 0;
    int outSamplerate_ = 0;
    int steps_ = 0;
    int outChannels_ = 0;
    QvPcm silence_;
    AnyVector connMatrix_;
    AnyVector selectedStreams_;
    AnyVector muxStreams_;
    AnyVector muxChannels_;
    QvPcm muxBuffer_;
    int outBytesPerSample_ = 0;
    int inBytesPerSample_ = 0;
    bool silenceLogged_ = false;
    std::unique_ptr<QvAProcessPipe> audioPipe_;
    bool smartRendering_ = false;
    int inBits_ = 0;
    int outBits_ = 0;
    int inChannels_ = 0;
    long long inStart_ = 0;  // samples of the input, from in to out point
    long long inEnd_ = 0;
};
