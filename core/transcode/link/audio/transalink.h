// The audio link: exactly the samples that are due, and silence after the end of the input.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/job/streamformat.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/link/translink.h"

class ChannelMatrix;
class QvAProcessPipe;
class QvAudioEncoder;
class SampleClock;
class StreamMix;

class QV_API TransALink : public TransLink {
  public:
    TransALink();
    ~TransALink() override;

    int type() const override { return qvAudioStream; }
    int init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) override;
    int openWith(const LinkOpen& given) override;
    int close() override;
    int processFrame(int n) override;
    int totalOutFrames() const override;
    double samplesPerFrame() const override;
    double completed() const override;
    void log() override;
    long long outSamplesPerFrames(int n, const QvFramerate& rate) const override;
    long long outProcessed() const override;
    QvCodec* filter(const char* name, int index) const override;

    long long totalOutSamples() const override;
    bool endedEarly() const override { return endedEarly_; }

    // Writes n samples of silence. 0, whatever the writer says.
    virtual int _insertSilence(int n);

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
    int readFormats(const AnyDict& stream);
    void takeMatrix(const AnyVector& given);
    bool takesMatrix(const AnyVector& given);
    int buildPipe(const LinkOpen& given, MediaTime& delay);
    MediaTime endOfInput() const;
    int takeRange(const LinkOpen& given);
    void shiftPoints(const MediaTime& delay);
    void computeRange();
    void setupSmartRender(int mode);
    int openPipe();
    QvAudioEncoder* audioEncoder() const;

    bool isEmpty() const;

    int smartStep(int n);
    int directStep(int n);
    int pipeStep(int n);
    int endStep(int result);
    int fillStep(int count);
    int readFailed();
    void logDone(const char* what) const;
    bool prepareSilence(int n);

    AudioFormat in_;                             // of the decoder stream
    AudioFormat out_;                            // of the encoder stream
    std::unique_ptr<SampleClock> clock_;         // never null
    std::unique_ptr<ChannelMatrix> matrix_;      // in force; never null
    std::unique_ptr<StreamMix> mix_;             // never null
    AnyVector selectedStreams_;                  // of the decoder, deselected at close
    std::unique_ptr<QvAProcessPipe> audioPipe_;  // null when no processing is needed
    QvPcm silence_;
    int steps_ = 0;  // that did work
    bool smartRendering_ = false;
    bool endedEarly_ = false;
    bool padsEnd_ = false;      // AudioConversion::padEnd
    bool wasFinished_ = false;  // before the last step
};
