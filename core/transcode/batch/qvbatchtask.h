// A task whose input may be in several segments: with one segment its decoders are linked directly, with
// several a QvBatchDecoder stands in front.
#pragma once

#include <memory>
#include <vector>

#include "core/arch/api.h"
#include "core/decode/qvinputstream.h"
#include "core/transcode/task/qvtranscodetask.h"

class QvBatchDecoder;
class QvTaskState;

// One segment of a task: the decoders that were opened for it, and a stream for each output stream; one
// without a decoder where nothing feeds the output stream.
struct QV_API QvInputSegment {
    enum Status { opened = 0, disabled = 1, failed = -1 };

    QvDPipeList decoders;  // belong to the caller of restore
    std::vector<std::unique_ptr<QvIStream>> streams;
    int status = failed;
};

class QV_API QvBatchTask : public QvTask {
  public:
    // Options of restore and fromState, as bits.
    static constexpr int skipDisabled = 1;       // disabled segments are not opened
    static constexpr int everySegmentOpens = 2;  // a segment that can't be opened fails the whole call

    QvBatchTask();
    ~QvBatchTask() override;

    int nrSegments() const;
    const QvInputSegment& segment(int index) const;  // asserts an index out of range
    bool usesBatchDecoder() const { return batchDecoder_ != nullptr; }
    QvBatchDecoder* batchDecoder() const { return batchDecoder_.get(); }  // null when there is none
    // The place in segment() of the index-th segment that is open, or -1.
    int indexOfActualSegment(int index) const;

    // Lets the streams of each open segment end together: at the end of the shortest video, or of the
    // shortest stream where there is no video. Sound that is shorter stays so.
    int checkDurations() override;

    // Of joined segments the inputs are their files, each once.
    Any currentPostprocessCommand() const override;

    // Makes running objects of a stored task, as QvTask::restore does. A segment that can't be opened, or
    // whose file lacks a stream, is left out, unless the options say otherwise; -15 (QvStatus::noSegment):
    // none could be opened. Decoders and pipe are the caller's after 0 alone; the decoders outlive the task,
    // as the pipe. With several segments the decoders open their files when they are read, and a few at a
    // time are open.
    int restore(const QvTaskState& state, QvDPipeList& decoders, QvEncodePipe** encoderOut, int options,
                QvFileOpenCb* callback = nullptr);
    // A new task by restore, or null with all that was made destroyed.
    static QvBatchTask* fromState(const QvTaskState& state, QvDPipeList& decoders, QvEncodePipe** encoderOut,
                                  int options, QvFileOpenCb* callback = nullptr, Any* error = nullptr);

  private:
    class Attempt;

    void drop();
    int restorePipe(const QvTaskState& state, QvEncodePipe& pipe);
    int openFiles(const QvTaskState& state, int options, QvFileOpenCb* callback, QvDPipeList& opened);
    void logSegments() const;
    void linkJoined();
    void linkSegment(const QvInputSegment& segment);

    std::vector<std::unique_ptr<QvInputSegment>> segments_;
    std::unique_ptr<QvBatchDecoder> batchDecoder_;
};
