// The state behind QvTranscoder, shared by its set-up, its runs and the analyze pass.
#pragma once

#include <atomic>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "core/engine/qvthreads.h"
#include "core/transcode/qvtranscoder.h"
#include "core/transcode/qvtranscodetask.h"

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
    std::atomic<bool> stopRequested{false}, firstPassRunning{false};
    std::atomic<bool> synchronous{true};
    QVThreads::QvThread worker;
    std::atomic<std::thread::id> runThread{};  // who runs the job now; none: nobody
    bool inCallback = false;
    bool checkDiscSpace = false, logProgress = false;
    std::vector<std::unique_ptr<QvMetadataFile>> metadataFiles;
    QvStepTimes times;

    // Guards `paused`, and wakes who waits for it or for the end of the run.
    mutable std::mutex lock;
    std::condition_variable changed;
    bool paused = false;

    int errorCode = 0;
    std::string errorText;

    bool connectedNow() const { return task->nrLinks() > 0; }
    void setState(int value);
    void updateState() { setState(connectedNow() ? QvTranscoder::connected : QvTranscoder::notConnected); }
    void assertIdle() const;
    void resume();      // clears `paused` and wakes the worker
    void waitForEnd();  // until no run is going on, and joins the worker
    void returnTask();  // puts a saved task back
    bool deadLocked() const;
};
