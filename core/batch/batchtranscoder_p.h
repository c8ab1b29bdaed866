// The transcoder of a batch: it reports progress and the change of segments, and carries out the wishes to
// stop and to pause.
#pragma once

#include "core/transcode/run/qvtranscoder.h"

class BatchControl;
class BatchReport;
class QvBatchTask;

class BatchTranscoder : public QvTranscoder {
  public:
    // The task, and what the control names as the current task and segment, are those that are reported.
    BatchTranscoder(QvBatchTask& task, BatchControl& control, BatchReport& report);
    ~BatchTranscoder() override { stop(); }

    int cbProgress(double part) override;
    int cbProcess() override;

    // Whether the run came to a first round of work, or ended while it was opened.
    bool worked() const { return worked_; }

  private:
    void followSegment();

    QvBatchTask& task_;
    BatchControl& control_;
    BatchReport& report_;
    int openSegment_ = 0;  // among those that are open, as last read
    bool worked_ = false;
};
