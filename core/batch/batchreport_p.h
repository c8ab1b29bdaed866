// The callbacks of a batch, guarded: what one of them throws becomes the processor's error and ends the run
// as a stop does. The calls that end a task and the run are still made.
#pragma once

#include "core/batch/qvbatchprocessor.h"
#include "core/value/anycontainer.h"

class BatchControl;
class BatchError;

class BatchReport {
  public:
    BatchReport(BatchControl& control, BatchError& error, QvBatchProcessCb* callback)
        : control_(control), error_(error), callback_(callback) {}

    bool hasReceiver() const { return callback_ != nullptr; }
    bool broken() const { return broken_; }  // a callback has thrown

    // Calls `call(QvBatchProcessCb&)` if there is a receiver.
    template <class Call>
    void tell(Call call) {
        if (!callback_) return;
        try {
            call(*callback_);
        } catch (...) {
            breakOff();
        }
    }
    void taskFinished(int task, int code, const char* message);
    void segmentFinished(int task, int segment, int code, const char* message);

  private:
    void breakOff();  // within a catch

    BatchControl& control_;
    BatchError& error_;
    QvBatchProcessCb* callback_;
    bool broken_ = false;
};
