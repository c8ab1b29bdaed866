// One video stream of one segment: its frames from the in point to the out point, converted to the output's
// format. Internal to this folder.
//
// Life: prepare, then start, read until the end, stop; start again begins anew. Nothing is held between stop
// and start but the description. Failures are a status with a reason in `why`.
#pragma once

#include <memory>
#include <string>

#include "core/decode/qvinputstream.h"
#include "core/job/jobdescription.h"
#include "core/transcode/batch/segmentspan_p.h"

class QvFrame;
class QvVProcessPipe;

class SegmentVideo {
  public:
    explicit SegmentVideo(const QvIStream& input);
    ~SegmentVideo();

    const QvIStream& input() const { return input_; }
    // At any time, also before prepare.
    SegmentSpan span(const QvFramerate& outRate) const;

    // Takes the format of the input and builds the conversion, to see that it can be built. `like` (may be
    // null) is a prepared stream: where it does the same, that is known already.
    int prepare(const VideoJobDescription& output, const SegmentVideo* like, std::string& why);
    bool converts() const { return converts_; }

    int start(std::string& why);
    // The next frame, valid until the next read or stop. QvStatus::endOfStream at the out point, or where the
    // input ends before it.
    int read(QvFrame*& frame, std::string& why);
    int stop(std::string& why);

    int framesRead() const { return framesRead_; }  // since start
    const SegmentSpan& span() const { return span_; }

  private:
    int build(std::string& why);
    bool filtersTakeUserData() const;
    int readDirect(QvFrame*& frame, std::string& why);
    int readConverted(QvFrame*& frame, std::string& why);
    int readInput(std::string& why);

    QvIStream input_;
    VideoJobDescription job_;
    SegmentSpan span_;
    std::unique_ptr<QvVProcessPipe> pipe_;
    bool converts_ = false;
    bool takesUserData_ = false;  // a filter looks at it
    bool started_ = false;
    bool ended_ = false;
    bool delivered_ = false;  // the pipe's frame has been given out
    long long inputRead_ = 0;
    int framesRead_ = 0;
};
