#include "core/transcode/run/qvtranscoder.h"

#include <cstdarg>
#include <cstdio>
#include <new>
#include <string_view>
#include <utility>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/run/runcontrol_p.h"
#include "core/transcode/run/runerror_p.h"
#include "core/transcode/run/steptimes_p.h"
#include "core/transcode/run/transcodersettings_p.h"
#include "core/transcode/run/transcoderun_p.h"
#include "core/transcode/task/qvtranscodetask.h"

struct QvTranscoder::Private {
    explicit Private(QvTask* given) : task(given) {
        if (!task) {
            ownTask = std::make_unique<QvTask>();
            task = ownTask.get();
        }
        updateState();
    }

    void updateState() {
        control.setState(task->nrLinks() > 0 ? QvTranscoder::connected : QvTranscoder::notConnected);
    }
    void returnTask() {
        if (savedTask) task = std::exchange(savedTask, nullptr);
    }

    QvTask* task = nullptr;
    std::unique_ptr<QvTask> ownTask;  // set when the transcoder made the task itself
    QvTask* savedTask = nullptr;      // comes back after a run with a borrowed one
    QvDecodePipe* videoDecoder = nullptr;
    QvDecodePipe* audioDecoder = nullptr;
    TranscoderSettings settings;
    RunControl control;
    StepTimes times;
    RunError error;
    std::vector<std::unique_ptr<QvMetadataFile>> statistics;
};

// --- Life ------------------------------------------------------------------------------------------

QvTranscoder::QvTranscoder(QvTask* task) : p_(std::make_unique<Private>(task)) {}

QvTranscoder::QvTranscoder(const QvTranscoder& other) : p_(std::make_unique<Private>(other.p_->task)) {}

QvTranscoder& QvTranscoder::operator=(const QvTranscoder& other) {
    if (this == &other) return *this;
    QvTranscoder::stop();
    p_->control.joinWorkers();
    p_ = std::make_unique<Private>(other.p_->task);
    return *this;
}

QvTranscoder::~QvTranscoder() {
    QvTranscoder::stop();
    p_->control.joinWorkers();
}

int QvTranscoder::setError(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    p_->error.set(code, format, args);
    va_end(args);
    return code;
}

int QvTranscoder::errorCode() const { return p_->error.code(); }
const char* QvTranscoder::errorDesc() const { return p_->error.text(); }
int QvTranscoder::getState() const { return p_->control.state(); }

// --- Callbacks -------------------------------------------------------------------------------------

void QvTranscoder::cbDone(int result) { qv_dbg()->debug("Transcoding finished, error code = %d", result); }
int QvTranscoder::cbProgress(double) { return 0; }
void QvTranscoder::cbPaused(bool paused) { qv_dbg()->debug("%s", paused ? "PAUSE" : "RESUME"); }
int QvTranscoder::cbProcess() { return 0; }
int QvTranscoder::cbMuxClose(QvMuxer*) { return 0; }
void QvTranscoder::cbMeasure(double) {}

void QvTranscoder::cbPostprocess(const Any& command) {
    const Any text = command.isWString() ? command.toString() : command;
    qv_dbg()->info("Executing post process command %s", text.isString() ? text.asString() : "");
}

// --- Setting up ------------------------------------------------------------------------------------

void QvTranscoder::setEncoder(QvEncodePipe* pipe) {
    p_->control.assertIdle();
    p_->task->setEncoder(pipe);
    p_->updateState();
}

QvEncodePipe* QvTranscoder::encoder() const { return p_->task->encoder(); }
QvTask* QvTranscoder::task() const { return p_->task; }
QvDecodePipe* QvTranscoder::videoDecoder() const { return p_->videoDecoder; }
QvDecodePipe* QvTranscoder::audioDecoder() const { return p_->audioDecoder; }

void QvTranscoder::setDecoder(QvDecodePipe* decoder) {
    unlinkAll();
    p_->videoDecoder = decoder;
}

void QvTranscoder::setAudioDecoder(QvDecodePipe* decoder) {
    unlinkAll();
    p_->audioDecoder = decoder;
}

int QvTranscoder::linkAll() {
    unlinkAll();
    QV_ASSERT_MSG(p_->videoDecoder && encoder(), "Transcoder.linkAll: decoder and/or encoder not specified");
    QvTask& task = *p_->task;
    const int result = p_->audioDecoder ? task.link(p_->videoDecoder, qvVideoStream, 0, 0) +
                                              task.link(p_->audioDecoder, qvAudioStream, 0, 0)
                                        : task.link(p_->videoDecoder);
    // Two links in one task have the indices 0 and 1, so a sum of 1 is success.
    const bool good = p_->audioDecoder ? task.nrLinks() == 2 : result == QvStatus::ok;
    if (!good) {
        setError(result ? result : QvStatus::failed, "%s", task.errorDesc());
        task.unlink();
    }
    p_->updateState();
    return good ? QvStatus::ok : p_->error.code();
}

int QvTranscoder::link(QvDecodePipe* decoder, int type, int decStream, int encStream) {
    p_->control.assertIdle();
    const int result = p_->task->link(decoder, type, decStream, encStream);
    if (result < 0) setError(result, "%s", p_->task->errorDesc());
    p_->updateState();
    return result;
}

int QvTranscoder::link(QvDecodePipe* decoder, int type, int decStream, int encStream,
                       const ProcessParams& params) {
    p_->control.assertIdle();
    const int result = p_->task->link(decoder, type, decStream, encStream, params);
    if (result < 0) setError(QvStatus::failed, "%s", p_->task->errorDesc());
    p_->updateState();
    return result;
}

int QvTranscoder::linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream) {
    return linkMeta(decoder, type, decStream, encType, encStream, MetaProcessParams());
}

int QvTranscoder::linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream,
                           const MetaProcessParams& params) {
    p_->control.assertIdle();
    const int result = p_->task->linkMeta(decoder, type, decStream, encType, encStream, params);
    if (result < 0) setError(QvStatus::failed, "%s", p_->task->errorDesc());
    return result;
}

void QvTranscoder::unlink() { unlinkAll(); }

void QvTranscoder::unlinkAll() {
    p_->control.assertIdle();
    p_->task->unlink();
    p_->updateState();
}

int QvTranscoder::nrLinks() const { return p_->task->nrLinks(); }
TransLink* QvTranscoder::getLink(int index) const { return p_->task->getLink(index); }
TransLink* QvTranscoder::getLink(int type, int index) const { return p_->task->getLink(type, index); }

TransLink* QvTranscoder::getLinkForOutput(int type, int encStream) const {
    return p_->task->getLinkForOutput(type, encStream);
}

TransLink* QvTranscoder::getLinkForOutput(QvDecodePipe* decoder, int type, int encStream) const {
    return p_->task->getLinkForOutput(decoder, type, encStream);
}

int QvTranscoder::linkedTo(QvDecodePipe* decoder, int type, int decStream) const {
    return p_->task->linkedTo(decoder, type, decStream);
}

const QvDPipeList& QvTranscoder::decoders() const { return p_->task->decoders(); }
void QvTranscoder::debugOutLinks() const { p_->task->debugOutLinks(); }

// --- Parameters ------------------------------------------------------------------------------------

namespace {

int invalidParam(const char* name) {
    char text[1024];
    std::snprintf(text, sizeof text, "Transcoder.setParam - invalid param '%s'", name ? name : "");
    if (!qv_registry()->throwParamException()) return QvStatus::invalidParam;
    qv_dbg()->debug("Exception: %s", text);
    throw QvParamException(text);
}

}  // namespace

int QvTranscoder::setParam(const char* name, const Any& value) {
    const auto result = p_->settings.setParam(name, value);
    if (!result) return invalidParam(name);
    const bool preview = std::string_view(name) == "getOut" && *result == QvStatus::ok;
    if (QvEncodePipe* pipe = preview && isTranscoding() ? encoder() : nullptr)
        if (QvVideoEncoder* video = pipe->videoEncoder(0)) qvSetOptionalParam(*video, name, value);
    return *result;
}

void QvTranscoder::getParam(const char* name, Any& value) const {
    p_->settings.getParam(name, value);
    const std::string_view key = name ? name : "";
    const bool secondPass = p_->settings.twoPass && !p_->control.firstPass;
    if (key == "secondPass") value = secondPass ? 1 : 0;
    if (key == "srPossible") value = p_->task->checkSmartRender(nullptr);
    if (key == "deadLock") value = isTranscoding() && p_->times.stuck(QvTimer::time()) ? 1 : 0;
}

// --- Running ---------------------------------------------------------------------------------------

int QvTranscoder::transcode(QvTask* task, bool synchronous) {
    p_->control.prepare();
    if (task && task != p_->task) {
        p_->returnTask();  // of a run whose cbDone starts this one
        if (task != p_->task) p_->savedTask = std::exchange(p_->task, task);
    }
    int result = QvStatus::failed;
    try {
        result = transcode(synchronous);
    } catch (...) {
        p_->returnTask();
        throw;
    }
    // After a start that went well the worker puts the task back at its end.
    if (synchronous || (result != QvStatus::ok && result != QvStatus::warning)) p_->returnTask();
    return result;
}

int QvTranscoder::transcode(bool synchronous) {
    RunControl& control = p_->control;
    control.prepare();
    p_->times.begin(0);
    control.begin();
    const RunScope scope(control);
    TranscodeRun run({*this, *p_->task, p_->settings, control, p_->times, p_->error, p_->statistics},
                     [p = p_.get()] { p->returnTask(); });
    try {
        const int opened = run.open();
        if (opened != QvStatus::ok && opened != QvStatus::warning) {
            control.end(connected);
            return opened;
        }
        control.synchronous = synchronous;
        if (!synchronous) return startWorker(run) ? opened : QvStatus::failed;
    } catch (...) {
        control.end(connected);
        qv_log()->setLogFile(Any());
        throw;
    }
    return run.start();
}

// The worker takes the run with it: it outlives this call.
bool QvTranscoder::startWorker(TranscodeRun& run) {
    RunControl& control = p_->control;
    RunControl::Worker worker;
    bool started = false;
    try {
        worker.push_back(std::make_unique<QVThreads::QvThread>());
        started = worker.back()->start([&control, run]() mutable {
            const RunScope onWorker(control);
            qv_dbg()->debug("Transcoder thread started");
            run.start();
            qv_dbg()->debug("Transcoder thread exiting");
        }) == QvStatus::ok;
    } catch (const std::bad_alloc&) {
        // No memory for a thread is no thread.
    }
    if (started) {
        control.addWorker(worker);
        return true;
    }
    run.giveUp();
    setError(QvStatus::failed, "Failed to spawn processing thread");
    control.end(transcoding);
    return false;
}

int QvTranscoder::stop() {
    if (getState() == notConnected) return QvStatus::ok;
    p_->control.askForStop(false);
    // A callback that stops its own run can't wait for its end.
    if (p_->control.onRunThread()) return QvStatus::ok;
    p_->control.waitForEnd();
    if (isTranscoding() && !p_->control.running())
        p_->control.setState(connected);  // the worker could not be started
    return QvStatus::ok;
}

void QvTranscoder::requestStop() { p_->control.askForStop(true); }

int QvTranscoder::pause() {
    QV_ASSERT_MSG(!p_->control.synchronous, "Transcoder: must not call pause/unpause() in synchronous mode.");
    p_->control.pause();
    return QvStatus::ok;
}

int QvTranscoder::unpause() {
    QV_ASSERT_MSG(!p_->control.synchronous, "Transcoder: must not call pause/unpause() in synchronous mode.");
    if (isTranscoding()) p_->control.resume();
    return QvStatus::ok;
}

bool QvTranscoder::isPaused() const { return !p_->control.synchronous && p_->control.paused(); }

QvCodec* QvTranscoder::filter(int type, int stream, const char* name, int index) const {
    QV_ASSERT_MSG(p_->control.inCallback,
                  "QvTranscoder::filter has to be called from the cbProgress() or cbProcess()");
    TransLink* link = getLinkForOutput(type, stream);
    return link ? link->filter(name, index) : nullptr;
}
