#include "core/batch/batchreport_p.h"

#include <new>

#include "core/arch/qvexception.h"
#include "core/batch/batchcontrol_p.h"
#include "core/batch/batcherror_p.h"
#include "core/batch/failuretext_p.h"

namespace {

// Empty without a message, and if there is no memory for it.
AnyDict infoOf(const char* message) {
    try {
        if (message && *message) return AnyDict("msg", message);
    } catch (const std::bad_alloc&) {
        return {};
    } catch (const QvMemoryFailure&) {
        return {};
    }
    return {};
}

}  // namespace

void BatchReport::taskFinished(int task, int code, const char* message) {
    tell([&](QvBatchProcessCb& callback) { callback.taskFinished(task, code, infoOf(message)); });
}

void BatchReport::segmentFinished(int task, int segment, int code, const char* message) {
    tell([&](QvBatchProcessCb& callback) { callback.segmentFinished(task, segment, code, infoOf(message)); });
}

void BatchReport::handleException() {
    const FailureText failure = qvCurrentFailure();
    if (!failed_) error_.set(failure.code, "A callback failed: %s", failure.text);
    failed_ = true;
    control_.requestStop();
}
