// The video link: frames of one decoder stream, converted where the encoder needs it.
#pragma once

#include <memory>
#include <vector>

#include "core/arch/api.h"
#include "core/job/jobdescription.h"
#include "core/transcode/link/translink.h"

class QualityLog;
class QvFrame;
class QvVProcessPipe;
class SmartRender;
struct QvFrameRange;
struct VideoFormat;

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

    int type() const override { return qvVideoStream; }
    int init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) override;
    int openWith(const LinkOpen& given) override;
    int close() override;
    int processFrame(int n) override;
    int totalOutFrames() const override;
    double completed() const override;
    void log() override;
    long long outProcessed() const override { return framesWritten_; }
    QvCodec* filter(const char* name, int index) const override;
    int addMetaSource(QvDecodePipe* decoder, int type, int stream, const MetaProcessParams& params) override;
    int nrMetaSources() const override;
    QvDecodePipe* metaSource(int index) const override;
    int metaSourceStreamNr(int index) const override;

    QvFramerate outFramerate() const override { return outFramerate_; }
    int nrFramesIn() const;  // from in to out point
    int startFrame() const;  // at the input rate
    int stopFrame() const;   // inclusive

  private:
    struct Step;

    int readRates(const VideoFormat& in);
    int takeRange(const LinkOpen& given, const VideoFormat& in);
    bool applyChapters(const LinkOpen& given);
    void describeJob(const LinkOpen& given, const VideoFormat& in);
    int buildPipe();
    void _setTotalVDuration();
    void prepareMetaSources();
    void requestUserData();

    void smartStep(Step& step);
    void pipeStep(Step& step);
    void directStep(Step& step);
    void writeStep(Step& step);
    void endStep(Step& step);
    void repeatLast(Step& step);
    int _processOneFrame();
    bool losesAll() const;
    int readFrame();
    QvFrame* completePair();
    void feedMetaSources(QvFrame* frame);
    int writeFrame(QvFrame* frame);

    QvFramerate outFramerate_;
    std::unique_ptr<QvFrameRange> range_;        // never null
    int lastFrame_ = -1;                         // of the input, where it is held; otherwise -1
    int held_ = 0;                               // how often it was read again
    std::unique_ptr<SmartRender> smartRender_;   // never null
    std::unique_ptr<QualityLog> qualityLog_;     // null unless logging
    std::unique_ptr<QvVProcessPipe> videoPipe_;  // null when no processing is needed
    int framesWritten_ = 0;                      // -1 after close
    int decViews_ = 1;
    int encViews_ = 1;
    std::vector<std::unique_ptr<MetaVHelper>> metaSources_;
    VideoJobDescription job_;  // of the pipe, which may keep a pointer to it
};
