#include "core/transcode/run/qvtranscoder.h"

#include <cstdarg>
#include <cstdio>
#include <list>
#include <new>
#include <string_view>
#include <utility>

#include "core/arch/formattext_p.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/run/qvtranscoder_p.h"
#include "core/transcode/run/qvtranscoderun_p.h"

// --- State -----------------------------------------------------------------------------------------

void QvStepTimes::begin(double now) {
    count = 0;
    longest = 0;
    start = now;
    last = now;
}

void QvStepTimes::step(double now) {
    const double took = now - last.load(std::memory_order_relaxed);
    count.fetch_add(1, std::memory_order_relaxed);
    last.store(now, std::memory_order_relaxed);
    if (took > longest.load(std::memory_order_relaxed)) longest.store(took, std::memory_order_relaxed);
}

QvTranscoder::Private::Private(QvTask* given) : task(given) {
    if (!task) {
        ownTask = std::make_unique<QvTask>();
        task = ownTask.get();
    }
    updateState();
}

QvTranscoder::Private::~Private() = default;

void QvTranscoder::Private::setState(int value) {
    {
        std::lock_guard guard(lock);
        state.store(value, std::memory_order_release);
    }
    changed.notify_all();
}

void QvTranscoder::Private::assertIdle() const {
    QV_ASSERT(state.load(std::memory_order_acquire) != QvTranscoder::transcoding);
}

void QvTranscoder::Private::prepareRun() {
    QV_ASSERT(!running);
    if (!onRunThread()) joinWorkers();
}

void QvTranscoder::Private::beginRun() {
    ++runNumber;
    times.begin(0);
    {
        std::lock_guard guard(lock);
        stopRequested = stopNext;
        if (!stopNext) cancel->clear();
        stopNext = false;
        running = true;
    }
    setState(QvTranscoder::transcoding);
}

void QvTranscoder::Private::askForStop(bool next) {
    {
        std::lock_guard guard(lock);
        if (!synchronous) paused = false;
        stopRequested = true;
        if (next && !running) stopNext = true;
        cancel->request();
    }
    changed.notify_all();
}

void QvTranscoder::Private::endRun(int newState) {
    {
        std::lock_guard guard(lock);
        running = false;
        state.store(newState, std::memory_order_release);
    }
    changed.notify_all();
}

void QvTranscoder::Private::resume() {
    {
        std::lock_guard guard(lock);
        paused = false;
    }
    changed.notify_all();
}

void QvTranscoder::Private::waitForEnd() {
    {
        std::unique_lock guard(lock);
        const int number = runNumber;
        changed.wait(guard, [&] { return !running || runNumber != number; });
    }
    joinWorkers();
}

// Joined outside the lock, which the worker needs for its end.
void QvTranscoder::Private::joinWorkers() {
    std::list<std::unique_ptr<QVThreads::QvThread>> ended;
    std::lock_guard guard(lock);
    ended.swap(workers);
}

thread_local const QvRunScope* QvRunScope::innermost_ = nullptr;

bool QvRunScope::contains(const void* owner) {
    for (const QvRunScope* scope = innermost_; scope; scope = scope->outer_)
        if (scope->owner_ == owner) return true;
    return false;
}

bool QvTranscoder::Private::onRunThread() const { return QvRunScope::contains(this); }

void QvTranscoder::Private::returnTask() {
    if (!savedTask) return;
    task = savedTask;
    savedTask = nullptr;
}

// A supervisor tells a hung encoder from a slow one by this.
bool QvTranscoder::Private::deadLocked() const {
    if (state.load(std::memory_order_acquire) != QvTranscoder::transcoding) return false;
    const double last = times.last.load(std::memory_order_relaxed);
    const double idle = last > 0 ? QvTimer::time() - last : 0;
    return idle > 60.0 && idle > 5.0 * times.longest.load(std::memory_order_relaxed);
}

// --- Life ------------------------------------------------------------------------------------------

QvTranscoder::QvTranscoder(QvTask* task) : p_(std::make_unique<Private>(task)) {}

QvTranscoder::QvTranscoder(const QvTranscoder& other) : p_(std::make_unique<Private>(other.p_->task)) {}

QvTranscoder& QvTranscoder::operator=(const QvTranscoder& other) {
    if (this == &other) return *this;
    QvTranscoder::stop();
    p_->joinWorkers();
    p_ = std::make_unique<Private>(other.p_->task);
    return *this;
}

QvTranscoder::~QvTranscoder() {
    QvTranscoder::stop();
    p_->joinWorkers();
}

int QvTranscoder::setError(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<1023> formatted(format, args);
    va_end(args);
    const char* const text = formatted.text();
    p_->errorCode = code;
    try {
        p_->errorText = text;
    } catch (const std::bad_alloc&) {
        p_->errorText.clear();  // a failure is never told by throwing
    }
    qv_dbg()->log(2, "Transcoder: %s (%d)", text, code);
    return code;
}

int QvTranscoder::errorCode() const { return p_->errorCode; }
const char* QvTranscoder::errorDesc() const { return p_->errorText.c_str(); }
int QvTranscoder::getState() const { return p_->state.load(std::memory_order_acquire); }

// --- Callbacks -------------------------------------------------------------------------------------

void QvTranscoder::cbDone(int result) { qv_dbg()->debug("Transcoding finished, error code = %d", result); }
int QvTranscoder::cbProgress(double) { return 0; }
void QvTranscoder::cbPaused(bool paused) { qv_dbg()->debug("%s", paused ? "PAUSE" : "RESUME"); }
int QvTranscoder::cbProcess() { return 0; }
int QvTranscoder::cbMuxClose(QvMuxer*) { return 0; }

void QvTranscoder::cbPostprocess(const Any& command) {
    const Any text = command.isWString() ? command.toString() : command;
    qv_dbg()->info("Executing post process command %s", text.isString() ? text.asString() : "");
}

// --- Setting up ------------------------------------------------------------------------------------

void QvTranscoder::setEncoder(QvEncodePipe* pipe) {
    p_->assertIdle();
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
    const int result = p_->audioDecoder
                           ? task.link(p_->videoDecoder, 1, 0, 0) + task.link(p_->audioDecoder, 2, 0, 0)
                           : task.link(p_->videoDecoder);
    // Two links in one task have the indices 0 and 1, so a sum of 1 is success.
    const bool good = p_->audioDecoder ? task.nrLinks() == 2 : result == QvStatus::ok;
    if (!good) {
        setError(result ? result : QvStatus::failed, "%s", task.errorDesc());
        task.unlink();
    }
    p_->updateState();
    return good ? QvStatus::ok : p_->errorCode;
}

int QvTranscoder::link(QvDecodePipe* decoder, int type, int decStream, int encStream) {
    p_->assertIdle();
    const int result = p_->task->link(decoder, type, decStream, encStream);
    if (result < 0) setError(result, "%s", p_->task->errorDesc());
    p_->updateState();
    return result;
}

int QvTranscoder::link(QvDecodePipe* decoder, int type, int decStream, int encStream,
                       const ProcessParams& params) {
    p_->assertIdle();
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
    p_->assertIdle();
    const int result = p_->task->linkMeta(decoder, type, decStream, encType, encStream, params);
    if (result < 0) setError(QvStatus::failed, "%s", p_->task->errorDesc());
    return result;
}

void QvTranscoder::unlink() { unlinkAll(); }

void QvTranscoder::unlinkAll() {
    p_->assertIdle();
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

const char* kUseProcessParams = "Transcoder: Setting global %s, using ProcessParams is recommended.";

void take(AnyDict& to, const Any& from) { to = from.isDict() ? from.asDict() : AnyDict(); }
void take(AnyVector& to, const Any& from) { to = from.isVector() ? from.asVector() : AnyVector(); }

int invalidParam(const char* name) {
    char text[1024];
    std::snprintf(text, sizeof text, "Transcoder.setParam - invalid param '%s'", name ? name : "");
    if (!qv_registry()->throwParamException()) return QvStatus::invalidParam;
    qv_dbg()->debug("Exception: %s", text);
    throw QvParamException(text);
}

}  // namespace

int QvTranscoder::setParam(const char* name, const Any& value) {
    using Row = QvParamRow<Private>;
    static constexpr Row rows[] = {
        {"twoPass", &Private::twoPass},
        {"metaName", &Private::metaName},
        {"writeLogfile", &Private::writeLogfile},
        {"closeEncoder", &Private::closeEncoder},
        {"smartRender", &Private::smartRender},
        {"timecodeOffset", &Private::timecodeOffset},
        {"getOut", &Private::getOut},
        {"startDelay", &Private::startDelay, qvParamPlain, 0, 10000},
    };
    const std::string_view key = name ? name : "";
    if (const auto result = qvSetParamRow<Private>(rows, *p_, name, value)) {
        if (key == "getOut" && *result == QvStatus::ok && isTranscoding() && encoder()) {
            if (QvVideoEncoder* video = encoder()->videoEncoder(0)) {
                try {
                    video->setParam("getOut", value);
                } catch (const QvParamException&) {
                    // An encoder without a preview has nothing to switch.
                }
            }
        }
        return *result;
    }
    if (key == "progress") {
        take(p_->progress, value);
    } else if (key == "effects") {
        qv_dbg()->warning(kUseProcessParams, "video 'effects'");
        take(p_->effects, value);
    } else if (key == "audioEffects") {
        qv_dbg()->warning(kUseProcessParams, "'audioEffects'");
        take(p_->audioEffects, value);
    } else if (key == "chapters") {
        qv_dbg()->warning(kUseProcessParams, "'chapterPoints'");
        take(p_->chapters, value);
    } else if (key == "connMatrix") {
        qv_dbg()->warning(kUseProcessParams, "'connMatrix' parameter");
        take(p_->connMatrix, value);
    } else {
        return invalidParam(name);
    }
    return QvStatus::ok;
}

void QvTranscoder::getParam(const char* name, Any& value) const {
    const std::string_view key = name ? name : "";
    if (key == "twoPass") value = p_->twoPass ? 1 : 0;
    if (key == "secondPass") value = p_->twoPass && !p_->firstPassRunning ? 1 : 0;
    if (key == "connMatrix") value = p_->connMatrix;
    if (key == "progress") value = p_->progress;
    if (key == "writeLogfile") value = p_->writeLogfile ? 1 : 0;
    if (key == "startDelay") value = p_->startDelay;
    if (key == "srPossible") value = p_->task->checkSmartRender(nullptr);
    if (key == "deadLock") value = p_->deadLocked() ? 1 : 0;
}

// --- Running ---------------------------------------------------------------------------------------

int QvTranscoder::transcode(QvTask* task, bool synchronous) {
    p_->prepareRun();
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
    p_->prepareRun();
    p_->beginRun();
    const QvRunScope scope(p_.get());
    QvTranscodeRun run(*this, *p_);
    try {
        const int opened = run.open();
        if (opened != QvStatus::ok && opened != QvStatus::warning) {
            p_->endRun(connected);
            return opened;
        }
        p_->synchronous = synchronous;
        if (!synchronous) return startWorker(run) ? opened : QvStatus::failed;
    } catch (...) {
        p_->endRun(connected);
        qv_log()->setLogFile(Any());
        throw;
    }
    return run.start();
}

// The worker takes the run with it: it outlives this call.
bool QvTranscoder::startWorker(QvTranscodeRun& run) {
    std::list<std::unique_ptr<QVThreads::QvThread>> worker;
    bool started = false;
    try {
        worker.push_back(std::make_unique<QVThreads::QvThread>());
        started = worker.back()->start([this, run]() mutable {
            const QvRunScope onWorker(p_.get());
            qv_dbg()->debug("Transcoder thread started");
            run.start();
            qv_dbg()->debug("Transcoder thread exiting");
        }) == QvStatus::ok;
    } catch (const std::bad_alloc&) {
        // No memory for a thread is no thread.
    }
    if (started) {
        std::lock_guard guard(p_->lock);
        p_->workers.splice(p_->workers.end(), worker);
        return true;
    }
    run.giveUp();
    setError(QvStatus::failed, "Failed to spawn processing thread");
    p_->endRun(transcoding);
    return false;
}

int QvTranscoder::stop() {
    if (getState() == notConnected) return QvStatus::ok;
    p_->askForStop(false);
    // A callback that stops its own run can't wait for its end.
    if (p_->onRunThread()) return QvStatus::ok;
    p_->waitForEnd();
    if (isTranscoding() && !p_->running) p_->setState(connected);  // the worker could not be started
    return QvStatus::ok;
}

void QvTranscoder::requestStop() { p_->askForStop(true); }

int QvTranscoder::pause() {
    QV_ASSERT_MSG(!p_->synchronous, "Transcoder: must not call pause/unpause() in synchronous mode.");
    std::lock_guard guard(p_->lock);
    p_->paused = true;
    return QvStatus::ok;
}

int QvTranscoder::unpause() {
    QV_ASSERT_MSG(!p_->synchronous, "Transcoder: must not call pause/unpause() in synchronous mode.");
    if (isTranscoding()) p_->resume();
    return QvStatus::ok;
}

bool QvTranscoder::isPaused() const {
    if (p_->synchronous) return false;
    std::lock_guard guard(p_->lock);
    return p_->paused;
}

QvCodec* QvTranscoder::filter(int type, int stream, const char* name, int index) const {
    QV_ASSERT_MSG(p_->inCallback,
                  "QvTranscoder::filter has to be called from the cbProgress() or cbProcess()");
    TransLink* link = getLinkForOutput(type, stream);
    return link ? link->filter(name, index) : nullptr;
}
