// Runs the tasks of a list one after the other, on a thread of its own or on the caller's. A task that fails
// does not end the run.
//
//     QvBatchProcessor processor;
//     processor.init(list);               // the list stays the caller's and outlives the run
//     processor.start(false, &callback);  // returns when the worker has begun
//     ...
//     processor.stop();                   // returns when it has ended
//
// stop, pause, unpause and the queries may be called from any thread, init and start from any but that of the
// callbacks.
//
// Tasks may be of any origin. One that is damaged, or no task at all, counts as failed, with a text that
// names the place: "streams/2/type: it is no type of stream". So does one in which an assertion fails or
// memory runs out.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/batch/qvbatchlist.h"

// All calls come from the thread that runs the tasks. Results are not used. An exception from a call ends the
// run as stop() does, and becomes the processor's error; taskFinished of the current task and batchFinished
// are still called.
class QV_API QvBatchProcessCb {
  public:
    enum TaskCode { taskDone = 0, nothingToDo = 1, taskAborted = 2, taskFailed = -1 };
    enum SegmentStatus { segmentOpened = 0, segmentDisabled = 1, segmentFailed = -1 };

    virtual ~QvBatchProcessCb() = default;
    virtual int reserved1() { return 0; }
    virtual int reserved2() { return 0; }
    virtual int reserved3() { return 0; }

    virtual int batchStarted() { return 0; }
    virtual int batchFinished() { return 0; }
    virtual int taskStarted(int task);
    // Once for each task that was started. `info` may hold "msg", a text: why it failed, or with `taskDone` a
    // warning.
    virtual int taskFinished(int task, int code, const AnyDict& info);
    virtual int taskSkipped(int task);  // it is disabled
    // After a task was restored, for each of its segments.
    virtual int segmentInitStatus(int task, int segment, int status);
    virtual int segmentStarted(int task, int segment);
    // For the last segment also at the end of its task, even if the run ended before that segment did.
    virtual int segmentFinished(int task, int segment, int code, const AnyDict& info);
    virtual int progress(int task, int segment, const AnyDict& info);  // "percent", 0.0 to 1.0 of the task
    virtual int batchPaused(bool paused);                              // a pause took effect, or has ended
};

class QV_API QvBatchProcessor {
  public:
    QvBatchProcessor();
    QvBatchProcessor(const QvBatchProcessor&) = delete;
    QvBatchProcessor& operator=(const QvBatchProcessor&) = delete;
    virtual ~QvBatchProcessor();  // ends a run first

    // Takes the tasks of a list. The list is not copied: until the run has ended it must exist, and its tasks
    // must keep their places. An assertion while running.
    virtual int init(QvBatchList& list);
    // synchronous: runs on this thread and returns when all is done. Otherwise a callback is required
    // (assertion) and the result says whether the thread began. An assertion while running.
    virtual int start(bool synchronous, QvBatchProcessCb* callback);
    // Ends the run after the round of work that is under way; the task gets QvBatchProcessCb::taskAborted.
    // Returns when the run has ended, batchFinished() included; at once if the run is synchronous, and in a
    // callback.
    virtual int stop();
    // Take effect at the next round of work of a task, or between two tasks; a pause there leaves out the
    // task that was due. Assertions in a synchronous run.
    virtual int pause();
    virtual int unpause();
    // What start() runs: 0, or -1 if a callback threw. On its own it is a synchronous run without callbacks.
    virtual int run();

    void setSmartRender(bool on);
    bool smartRender() const;
    // Bits of QvBatchTask; 3 at first, which leaves out disabled and failed segments. Bit 0 also leaves out
    // disabled tasks. Not while running (assertion).
    void setOptions(int options);
    int options() const;

    bool isInitialized() const;
    bool isRunning() const;
    bool isPaused() const;  // a pause has taken effect
    int currentTask() const;
    int currentSegment() const;  // with disabled segments counted
    // Of the last failure; the text is a copy, so that it may be asked for during a run.
    int errorCode() const;
    int getErrorCode() const { return errorCode(); }
    Any errorDesc() const;
    Any getErrorDesc() const { return errorDesc(); }
    void setError(int code, const char* format, ...) __attribute__((format(printf, 3, 4)));

  private:
    struct Private;
    std::unique_ptr<Private> p_;
};
