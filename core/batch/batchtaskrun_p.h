// One task of a batch, from its stored state to its end.
#pragma once

#include <atomic>

#include "core/transcode/task/qvtaskstate.h"
#include "core/value/any.h"

class BatchControl;
class BatchError;
class BatchReport;
class BatchTranscoder;
class QvBatchTask;

struct BatchContext {
    BatchControl& control;
    BatchError& error;
    BatchReport& report;
    int options;                           // bits of QvBatchTask
    const std::atomic<bool>& smartRender;  // read when a task begins
};

class BatchTaskRun {
  public:
    BatchTaskRun(BatchContext& batch, int index) : batch_(batch), index_(index) {}

    // 0 if the task was begun or skipped; otherwise why it could not be begun. The result of its run is
    // reported by taskFinished alone. Does not throw.
    int run(const Any& stored);

  private:
    struct Segments {
        int open = 0, failed = 0, first = -1, last = -1;
    };

    int restoreAndRun(const Any& stored);
    int failRestore(int code, const char* text);
    Segments reportSegments(const QvBatchTask& task);
    int failWithoutSegments(const Segments& segments);
    void transcode(QvBatchTask& task, const Segments& segments);
    int resultCode(const BatchTranscoder& transcoder, int result);
    void finish(int code, const char* message);

    BatchContext& batch_;
    const int index_;
    bool finished_ = false;
};
