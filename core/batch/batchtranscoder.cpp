#include "core/batch/batchtranscoder_p.h"

#include <cstring>

#include "core/arch/qvassert.h"
#include "core/batch/batchcontrol_p.h"
#include "core/batch/batchreport_p.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/transcode/batch/qvbatchtask.h"

BatchTranscoder::BatchTranscoder(QvBatchTask& task, BatchControl& control, BatchReport& report)
    : QvTranscoder(&task), task_(task), control_(control), report_(report) {
    setParam("startDelay", 0);  // nobody waits for transcode() to return
}

int BatchTranscoder::cbProgress(double part) {
    report_.tell([&](QvBatchProcessCb& callback) {
        callback.progress(control_.task, control_.segment, AnyDict("percent", part));
    });
    return 0;
}

int BatchTranscoder::cbProcess() {
    worked_ = true;
    control_.waitWhilePaused([this](bool paused) {
        report_.tell([paused](QvBatchProcessCb& callback) { callback.batchPaused(paused); });
    });
    if (control_.stopping()) return QvStatus::failed;
    if (task_.usesBatchDecoder()) followSegment();
    return 0;
}

void BatchTranscoder::followSegment() {
    const QvCodec& decoder = *decoders().at(0);
    QV_ASSERT(std::strcmp(decoder.name(), "batchdec") == 0);
    Any read;
    decoder.getParam("currentSegment", read);
    openSegment_ = read.asInt32(openSegment_);
    const int actual = task_.indexOfActualSegment(openSegment_), former = control_.segment;
    if (actual == former) return;
    qv_dbg()->debug("[BatchTranscoder] cs=%d, csact=%d", openSegment_, actual);
    report_.segmentFinished(control_.task, former, 0, nullptr);
    control_.segment = actual;
    report_.tell([&](QvBatchProcessCb& callback) { callback.segmentStarted(control_.task, actual); });
}
