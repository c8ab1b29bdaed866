// Calls the callbacks of a batch. An exception from one of them becomes the processor's error and ends the
// run as a stop does; taskFinished and batchFinished are still called.
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
    bool failed() const { return failed_; }  // whether a callback has thrown

    // Calls `call(QvBatchProcessCb&)` if there is a receiver.
    template <class Call>
    void tell(Call call) {
        if (!callback_) return;
        try {
            call(*callback_);
        } catch (...) {
            handleException();
        }
    }
    void taskFinished(int task, int code, const char* message);
    void segmentFinished(int task, int segment, int code, const char* message);

  private:
    void handleException();  // to be called in a catch block

    BatchControl& control_;
    BatchError& error_;
    QvBatchProcessCb* callback_;
    bool failed_ = false;
};
