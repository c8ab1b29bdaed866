// The state behind QvTranscoder, shared by its set-up, its runs and the analyze pass.
#pragma once

#include <atomic>
#include <condition_variable>
#include <list>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "core/arch/qvcancel.h"
#include "core/engine/threads/qvthreads.h"
#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/task/qvtranscodetask.h"

class QvMetadataFile;

// What a run tells about its steps; read by other threads without a lock.
struct QvStepTimes {
    std::atomic<int> count{0};
    std::atomic<double> start{0}, last{0}, longest{0};

    void begin(double now);
    void step(double now);
};

struct QvTranscoder::Private {
    explicit Private(QvTask* given);
    ~Private();

    QvTask* task = nullptr;
    std::unique_ptr<QvTask> ownTask;  // set when the transcoder made the task itself
    QvTask* savedTask = nullptr;      // comes back after a run with a borrowed one
    QvDecodePipe* videoDecoder = nullptr;
    QvDecodePipe* audioDecoder = nullptr;

    // Parameters.
    AnyVector chapters, connMatrix;
    AnyDict progress, effects, audioEffects;
    Any metaName{"metadata"};
    int getOut = 0, timecodeOffset = 0, startDelay = 250;
    bool closeEncoder = true, twoPass = false, writeLogfile = false, smartRender = false;

    // The run. `state` is published with release, so that who sees it leave 3 sees the results.
    std::atomic<int> state{QvTranscoder::notConnected};
    // `running` ends with the run, also where a failed start leaves `state` at 3.
    std::atomic<bool> running{false};
    std::atomic<int> runNumber{0};
    std::atomic<bool> stopRequested{false}, firstPassRunning{false};
    std::atomic<bool> synchronous{true};
    std::atomic<bool> inCallback{false};
    bool stopNext = false;  // asked for between two runs; guarded by `lock`
    // Ends the waits of the output's streams, which share it.
    const std::shared_ptr<QvCancel> cancel = std::make_shared<QvCancel>();
    bool checkDiscSpace = false, logProgress = false;
    std::vector<std::unique_ptr<QvMetadataFile>> metadataFiles;
    QvStepTimes times;

    // Guards `paused` and `workers`, and wakes who waits for a pause, a stop or the end of the run.
    mutable std::mutex lock;
    std::condition_variable changed;
    bool paused = false;
    // Not joined yet; several when a callback of one run started the next.
    std::list<std::unique_ptr<QVThreads::QvThread>> workers;

    int errorCode = 0;
    std::string errorText;

    bool connectedNow() const { return task->nrLinks() > 0; }
    void setState(int value);
    void updateState() { setState(connectedNow() ? QvTranscoder::connected : QvTranscoder::notConnected); }
    void assertIdle() const;
    void prepareRun();  // asserts that none is going on, and waits for the end of the worker before
    void beginRun();
    void endRun(int newState);
    void askForStop(bool next);
    void resume();      // clears `paused` and wakes the worker
    void waitForEnd();  // until no run is going on, and joins the worker
    void joinWorkers();
    bool onRunThread() const;  // this thread runs the job, so it can't wait for its end
    void returnTask();         // puts a saved task back
    bool deadLocked() const;
};

// While it lives this thread runs the job of a transcoder. Scopes nest: a callback may run another one.
class QvRunScope {
  public:
    explicit QvRunScope(const void* owner) : owner_(owner), outer_(innermost_) { innermost_ = this; }
    QvRunScope(const QvRunScope&) = delete;
    QvRunScope& operator=(const QvRunScope&) = delete;
    ~QvRunScope() { innermost_ = outer_; }
    static bool contains(const void* owner);

  private:
    static thread_local const QvRunScope* innermost_;
    const void* owner_;
    const QvRunScope* outer_;
};
