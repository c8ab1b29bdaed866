#include "core/batch/batchtaskrun_p.h"

#include <memory>
#include <string>

#include "core/batch/batchcontrol_p.h"
#include "core/batch/batcherror_p.h"
#include "core/batch/batchreport_p.h"
#include "core/batch/batchtranscoder_p.h"
#include "core/batch/failuretext_p.h"
#include "core/batch/taskstatecheck_p.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/measure/streamtype.h"
#include "core/transcode/batch/qvbatchtask.h"
#include "core/transcode/link/translink.h"

namespace {

// The objects of a running task. The task refers to the pipe and the decoders, so it is destroyed first.
struct Parts {
    Parts() = default;
    Parts(const Parts&) = delete;
    Parts& operator=(const Parts&) = delete;
    ~Parts() {
        task.reset();
        pipe.reset();
        decoders.deleteAll();
    }

    QvDPipeList decoders;
    std::unique_ptr<QvEncodePipe> pipe;
    std::unique_ptr<QvBatchTask> task = std::make_unique<QvBatchTask>();
};

bool isDisabled(const Any& stored) {
    return stored.isDict() && !QvTaskState(AnyDict("enabled", stored.asDict().get("enabled"))).isEnabled();
}

// The setting "progress" of the transcoder: a long video reports every 100 frames, everything else every
// percent.
AnyDict progressOf(const QvBatchTask& task) {
    constexpr int longVideo = 1000, interval = 100;  // frames
    const TransLink* video = task.getLink(qvVideoStream, 0);
    if (!video) return {};
    QvIStream input(video->decoder(), qvVideoStream, video->decStreamNr());
    input.params = video->processParams();
    Any rate;
    video->decoder()->getStreamParam(qvVideoStream, video->decStreamNr(), "framerate", rate);
    if (!rate.isFramerate() || input.effectiveDuration().position(rate.asFramerate()) <= longVideo) return {};
    return AnyDict("frames", interval);
}

}  // namespace

int BatchTaskRun::run(const Any& stored) {
    try {
        if ((batch_.options & QvBatchTask::skipDisabled) && isDisabled(stored)) {
            qv_dbg()->debug("BatchProcessor: Task #%d disabled, skipping.", index_);
            batch_.report.tell([this](QvBatchProcessCb& callback) { callback.taskSkipped(index_); });
            return QvStatus::ok;
        }
        batch_.report.tell([this](QvBatchProcessCb& callback) { callback.taskStarted(index_); });
        return restoreAndRun(stored);
    } catch (...) {
        const FailureText failure = qvCurrentFailure();
        batch_.error.set(failure.code, "%s", failure.text);
        finish(QvBatchProcessCb::taskFailed, failure.text);
        return failure.code;
    }
}

void BatchTaskRun::finish(int code, const char* message) {
    if (finished_) return;
    finished_ = true;
    batch_.report.taskFinished(index_, code, message);
}

int BatchTaskRun::failRestore(int code, const char* text) {
    qv_dbg()->error("BatchProcessor: Failed to restore task #%d from state.", index_);
    batch_.error.copy(code, text);
    finish(QvBatchProcessCb::taskFailed, text);
    return code;
}

int BatchTaskRun::restoreAndRun(const Any& stored) {
    qv_dbg()->debug("BatchProcessor: Restoring task #%d from state...", index_);
    if (const std::string fault = qvTaskStateFault(stored); !fault.empty()) {
        qv_dbg()->error("%s", fault.c_str());
        return failRestore(QvStatus::invalidStructure, fault.c_str());
    }
    Parts parts;
    QvEncodePipe* pipe = nullptr;
    int result = QvStatus::failed;
    try {
        result = parts.task->restore(QvTaskState(stored.asDict()), parts.decoders, &pipe, batch_.options);
        parts.pipe.reset(pipe);
        if (result != QvStatus::ok && result != QvStatus::warning)
            return failRestore(result, parts.task->errorDesc());
    } catch (...) {
        const FailureText failure = qvCurrentFailure();
        return failRestore(failure.code, failure.text);
    }
    const Segments segments = reportSegments(*parts.task);
    if (segments.open == 0) return failWithoutSegments(segments);
    transcode(*parts.task, segments);
    return QvStatus::ok;
}

BatchTaskRun::Segments BatchTaskRun::reportSegments(const QvBatchTask& task) {
    Segments segments;
    for (int i = 0; i < task.nrSegments(); ++i) {
        const int status = task.segment(i).status;
        batch_.report.tell(
            [&](QvBatchProcessCb& callback) { callback.segmentInitStatus(index_, i, status); });
        if (status == QvInputSegment::failed) ++segments.failed;
        if (status != QvInputSegment::opened) continue;
        if (segments.open++ == 0) segments.first = i;
        segments.last = i;
    }
    return segments;
}

int BatchTaskRun::failWithoutSegments(const Segments& segments) {
    if (segments.failed > 0)
        batch_.error.set(QvStatus::failed, "Failed to open required input file(s)");
    else
        batch_.error.set(QvStatus::failed, "Skipping task #%d, no enabled input(s)?", index_);
    finish(segments.failed > 0 ? QvBatchProcessCb::taskFailed : QvBatchProcessCb::nothingToDo,
           batch_.error.text().c_str());
    return QvStatus::failed;
}

void BatchTaskRun::transcode(QvBatchTask& task, const Segments& segments) {
    BatchTranscoder transcoder(task, batch_.control, batch_.report);
    transcoder.setParam("smartRender", batch_.smartRender ? 1 : 0);
    transcoder.setParam("progress", progressOf(task));
    qv_dbg()->debug("[BatchProcessor] Task #%d: transcoding started...", index_);
    batch_.control.segment = segments.first;
    batch_.report.tell([&](QvBatchProcessCb& callback) { callback.segmentStarted(index_, segments.first); });
    int result = QvStatus::failed;
    std::string message;
    try {
        const BatchControl::StopTarget target(batch_.control, transcoder);
        result = transcoder.transcode(true);
        if (transcoder.errorCode() != QvStatus::ok) message = transcoder.errorDesc();
    } catch (...) {
        const FailureText failure = qvCurrentFailure();
        batch_.error.set(failure.code, "%s", failure.text);
        message = failure.text;
    }
    const int code = resultCode(transcoder, result);
    if (code == QvBatchProcessCb::taskAborted) message.clear();
    batch_.report.segmentFinished(index_, segments.last, code, message.c_str());
    finish(code, message.c_str());
}

int BatchTaskRun::resultCode(const BatchTranscoder& transcoder, int result) {
    // A stop also ends steps before the first round of work that can take long: reading sound ahead, waiting
    // for the reader of the output. If the run could not be opened because of that, it is no failure.
    const bool stopped = batch_.control.stopping();
    if (result == QvStatus::ok || result == QvStatus::warning) {
        // After a successful run this is a warning.
        if (transcoder.errorCode() != QvStatus::ok) qv_dbg()->warning("%s", transcoder.errorDesc());
    } else if (!stopped || transcoder.hasWorked()) {
        qv_dbg()->error("[BatchProcessor] Task #%d: transcoding failed.", index_);
        if (transcoder.errorCode() != QvStatus::ok) batch_.error.copy(result, transcoder.errorDesc());
        return QvBatchProcessCb::taskFailed;
    }
    if (stopped) {
        qv_dbg()->info("[BatchProcessor] Task #%d: transcoding aborted.", index_);
        return QvBatchProcessCb::taskAborted;
    }
    qv_dbg()->info("[BatchProcessor] Task #%d: transcoding done.", index_);
    return QvBatchProcessCb::taskDone;
}
