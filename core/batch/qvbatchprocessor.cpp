#include "core/batch/qvbatchprocessor.h"

#include <atomic>
#include <cstdarg>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/batch/batchcontrol_p.h"
#include "core/batch/batcherror_p.h"
#include "core/batch/batchreport_p.h"
#include "core/batch/batchtaskrun_p.h"
#include "core/batch/failuretext_p.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"
#include "core/transcode/batch/qvbatchtask.h"

// --- Callbacks.

int QvBatchProcessCb::taskStarted(int) { return 0; }
int QvBatchProcessCb::taskFinished(int, int, const AnyDict&) { return 0; }
int QvBatchProcessCb::taskSkipped(int) { return 0; }
int QvBatchProcessCb::segmentInitStatus(int, int, int) { return 0; }
int QvBatchProcessCb::segmentStarted(int, int) { return 0; }
int QvBatchProcessCb::segmentFinished(int, int, int, const AnyDict&) { return 0; }
int QvBatchProcessCb::progress(int, int, const AnyDict&) { return 0; }
int QvBatchProcessCb::batchPaused(bool) { return 0; }

// --- The processor.

struct QvBatchProcessor::Private {
    int runBatch();
    void runTasks(BatchContext& batch);
    void runTask(BatchContext& batch, int index);
    void work(QvBatchProcessor& owner);

    std::vector<const Any*> tasks;  // the caller's
    bool initialized = false;
    QvBatchProcessCb* callback = nullptr;
    int options = QvBatchTask::skipDisabled | QvBatchTask::everySegmentOpens;
    std::atomic<bool> smartRender{false};
    BatchControl control;
    BatchError error;
    QVThreads::QvThread thread;
};

QvBatchProcessor::QvBatchProcessor() : p_(std::make_unique<Private>()) {}

QvBatchProcessor::~QvBatchProcessor() {
    QvBatchProcessor::stop();
    p_->thread.wait();
}

int QvBatchProcessor::init(QvBatchList& list) {
    QV_ASSERT_MSG(!isRunning(), "BatchProcessor: must not call init() while running");
    p_->tasks.clear();
    for (const Any& task : list) p_->tasks.push_back(&task);
    p_->initialized = true;
    return QvStatus::ok;
}

int QvBatchProcessor::start(bool synchronous, QvBatchProcessCb* callback) {
    if (!synchronous && !callback) {
        constexpr const char* text = "BatchProcessor: Must specify callback interface in asynchronous mode.";
        QV_ASSERT_MSG(!isRunning(), "BatchProcessor: must not call start() while running()");
        qv_dbg()->error("%s", text);
        QV_FAIL(text);
    }
    p_->control.begin(synchronous);
    p_->callback = callback;
    if (synchronous) {
        try {
            const int result = run();
            p_->control.end();
            return result;
        } catch (...) {
            p_->control.end();
            throw;
        }
    }
    p_->thread.wait();  // of the run before
    int result = QvStatus::failed;
    try {
        result = p_->thread.start([this] { p_->work(*this); });
    } catch (const std::bad_alloc&) {
        // No memory for a thread is no thread.
    }
    if (result == QvStatus::ok) return result;
    p_->control.end();
    qv_dbg()->error("[BatchProcessor] *** Failed to spawn processing thread");
    return result;
}

// On the worker.
void QvBatchProcessor::Private::work(QvBatchProcessor& owner) {
    qv_dbg()->debug("Batch Transcoder thread started");
    try {
        owner.run();
    } catch (...) {  // only a derived class lets something through
        const FailureText failure = qvCurrentFailure();
        error.set(failure.code, "%s", failure.text);
    }
    qv_dbg()->debug("Batch Transcoder thread exited");
    control.end();
}

int QvBatchProcessor::run() {
    const bool own = p_->control.enter();
    if (own) p_->callback = nullptr;
    const int result = p_->runBatch();
    if (own) p_->control.end();
    return result;
}

// Does not throw: control.end() has to follow in any case.
int QvBatchProcessor::Private::runBatch() {
    BatchReport report(control, error, callback);
    BatchContext batch{control, error, report, options, smartRender};
    int result = QvStatus::ok;
    try {
        report.tell([](QvBatchProcessCb& cb) { cb.batchStarted(); });
        runTasks(batch);
    } catch (...) {
        const FailureText failure = qvCurrentFailure();
        error.copy(result = failure.code, failure.text);
    }
    control.leave();
    report.tell([](QvBatchProcessCb& cb) { cb.batchFinished(); });
    return report.failed() ? QvStatus::failed : result;
}

void QvBatchProcessor::Private::runTasks(BatchContext& batch) {
    for (int i = 0; i < static_cast<int>(tasks.size()); ++i) {
        // After a pause between two tasks the next one is skipped.
        if (control.waitWhilePaused([&](bool paused) {
                batch.report.tell([&](QvBatchProcessCb& cb) { cb.batchPaused(paused); });
            }))
            continue;
        if (control.stopping()) break;
        runTask(batch, i);
    }
}

void QvBatchProcessor::Private::runTask(BatchContext& batch, int index) {
    qv_dbg()->info("[BatchProcessor] Processing task #%d...", index);
    control.task = index;
    if (BatchTaskRun(batch, index).run(*tasks[static_cast<std::size_t>(index)]) != QvStatus::ok)
        qv_dbg()->error("[BatchProcessor] Task #%d failed.", index);
    else
        qv_dbg()->info("[BatchProcessor] Task #%d done.", index);
}

int QvBatchProcessor::stop() {
    BatchControl& control = p_->control;
    control.requestStop();
    // A callback can't wait for the end of its own run.
    if (!control.synchronous() && !control.onRunThread()) control.waitForEnd();
    control.dropRequests();
    return QvStatus::ok;
}

int QvBatchProcessor::pause() {
    p_->control.pause(true);
    return QvStatus::ok;
}

int QvBatchProcessor::unpause() {
    p_->control.pause(false);
    return QvStatus::ok;
}

void QvBatchProcessor::setSmartRender(bool on) { p_->smartRender = on; }
bool QvBatchProcessor::smartRender() const { return p_->smartRender; }

void QvBatchProcessor::setOptions(int options) {
    QV_ASSERT(!isRunning());
    p_->options = options;
}

int QvBatchProcessor::options() const { return p_->options; }
bool QvBatchProcessor::isInitialized() const { return p_->initialized; }
bool QvBatchProcessor::isRunning() const { return p_->control.running(); }
bool QvBatchProcessor::isPaused() const { return p_->control.paused(); }
int QvBatchProcessor::currentTask() const { return p_->control.task; }
int QvBatchProcessor::currentSegment() const { return p_->control.segment; }
int QvBatchProcessor::errorCode() const { return p_->error.code(); }
Any QvBatchProcessor::errorDesc() const { return Any(p_->error.text().c_str()); }

void QvBatchProcessor::setError(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    p_->error.set(code, format, args);
    va_end(args);
}
