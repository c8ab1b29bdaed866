// The transcoder of a batch: it reports progress and changes of the segment, and obeys requests to stop and
// to pause.
#pragma once

#include "core/transcode/run/qvtranscoder.h"

class BatchControl;
class BatchReport;
class QvBatchTask;

class BatchTranscoder : public QvTranscoder {
  public:
    // Reports carry the numbers of task and segment that `control` has.
    BatchTranscoder(QvBatchTask& task, BatchControl& control, BatchReport& report);
    ~BatchTranscoder() override { stop(); }

    int cbProgress(double part) override;
    int cbProcess() override;

    // False if the run ended before its first round of work.
    bool hasWorked() const { return worked_; }

  private:
    void followSegment();

    QvBatchTask& task_;
    BatchControl& control_;
    BatchReport& report_;
    int openSegment_ = 0;  // index among the open segments
    bool worked_ = false;
};
