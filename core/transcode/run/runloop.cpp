// The main loop of a run: one frame of every video link a turn, then exactly the samples that belong to the
// frames written so far.
#include <algorithm>
#include <chrono>
#include <new>
#include <string_view>

#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"
#include "core/engine/threads/qvtimer.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/run/qvtranscoderun_p.h"

namespace {

constexpr int kStopped = 1;  // what cbDone gets for a run that was stopped

// Set while a callback runs, also when it throws.
struct CallbackScope {
    explicit CallbackScope(std::atomic<bool>& flag) : flag_(flag) { flag_ = true; }
    ~CallbackScope() { flag_ = false; }
    std::atomic<bool>& flag_;
};

}  // namespace

// Runs a part of the work; what it throws ends it as a failure.
template <class Work>
int QvTranscodeRun::guarded(Work work) {
    try {
        return work();
    } catch (const QvMemoryFailure& failure) {
        qv_dbg()->error("Transcoder: %s", failure.what());
        return QvStatus::outOfMemory;
    } catch (const QvException& failure) {
        qv_dbg()->error("Transcoder: %s", failure.what());
    } catch (const std::bad_alloc&) {
        qv_dbg()->error("Transcoder: out of memory");
        return QvStatus::outOfMemory;
    } catch (const std::exception& failure) {
        qv_dbg()->error("Transcoder: %s", failure.what());
    } catch (...) {
        qv_dbg()->error("Transcoder: a callback ended with an unknown exception");
    }
    return QvStatus::failed;
}

int QvTranscodeRun::start() {
    try {
        const int result = work();
        return finish(result);
    } catch (...) {
        return breakOff();
    }
}

int QvTranscodeRun::work() {
    QVThreads::QvLowPriority lowered;
    // Lets the caller finish what it does after transcode() returns; a stop ends the wait.
    if (p_.startDelay > 0) {
        std::unique_lock guard(p_.lock);
        p_.changed.wait_for(guard, std::chrono::milliseconds(p_.startDelay), [this] { return stopping(); });
    }
    int result = guarded([this] {
        p_.logProgress = qv_registry()->getDbgOption("log_progress").isTrue();
        const QvMuxer* muxer = p_.task->encoder()->getMuxer();
        p_.checkDiscSpace = muxer && std::string_view(muxer->name()) == "asfmux";
        return runPasses();
    });
    if (p_.twoPass) {
        const int forgotten = guarded([this] { return forgetStatistics(), QvStatus::ok; });
        if (result == QvStatus::ok) result = forgotten;
    }
    return result;
}

// The last resort where not even the end of a run has the memory that it needs: all is closed, and the
// application learns it.
int QvTranscodeRun::breakOff() {
    if (number_ == p_.runNumber && p_.running) {
        giveUp();
        p_.endRun(QvTranscoder::connected);
    }
    try {
        t_.cbDone(QvStatus::outOfMemory);
    } catch (...) {
        // There is nobody left to tell.
    }
    if (number_ == p_.runNumber) p_.returnTask();
    return QvStatus::outOfMemory;
}

int QvTranscodeRun::runPasses() {
    int result = p_.twoPass ? analyze() : QvStatus::ok;
    if (result == QvStatus::ok && !stopping()) result = openEncoder();
    if (result == QvStatus::ok && !stopping()) result = mainLoop();
    return result;
}

void QvTranscodeRun::giveUp() {
    if (p_.closeEncoder) guarded([this] { return p_.task->encoder()->abort(); });
    closeLinks(*p_.task);
    qv_log()->setLogFile(Any());
}

// Closes the output: finished after a good or stopped run, aborted after an error.
int QvTranscodeRun::closeOutput(int result) {
    QvEncodePipe& pipe = *p_.task->encoder();
    QvDbgLog& log = *qv_dbg();
    if (QvMuxer* muxer = pipe.getMuxer()) {
        log.info("[transcoder] Calling cbMuxClose()");
        const int told = guarded([&] { return t_.cbMuxClose(muxer), QvStatus::ok; });
        if (result == QvStatus::ok) result = told;
        log.info("[transcoder] cbMuxClose() returned");
    }
    log.info("[transcoder] closing encoding pipe");
    if (result != QvStatus::ok)
        guarded([&] { return pipe.abort(); });
    else
        result = guarded([&] { return pipe.close(); });
    log.info("[transcoder] encoding pipe closed");
    return result;
}

int QvTranscodeRun::finish(int result) {
    // An input that ended early ends the run as a stop does; only cbDone tells.
    const bool ended = endOfVideo_ && result == QvStatus::endOfStream;
    if (ended) result = QvStatus::ok;
    if (p_.closeEncoder) result = closeOutput(result);
    if (p_.closeEncoder) p_.task->encoder()->setCancel(nullptr);  // what follows is the application's
    const int closed = closeLinks(*p_.task);
    if (result == QvStatus::ok) result = closed;
    // A write that a stop has ended is no failure.
    if (p_.cancel->gaveUp()) result = QvStatus::ok;
    p_.metadataFiles.clear();
    int told = ended ? QvStatus::endOfStream : kStopped;
    if (result != QvStatus::ok) {
        t_.setError(QvStatus::failed, "Error in processing");
        told = result;
    }
    Any command;
    const bool complete = result == QvStatus::ok && !stopping();
    if (complete)
        told = guarded([&] { return command = p_.task->currentPostprocessCommand(), QvStatus::ok; });
    qv_log()->setLogFile(Any());
    p_.endRun(QvTranscoder::connected);
    // From here on the application may change the task.
    if (complete && command.isString()) told = guarded([&] { return postprocess(command); });
    guarded([&] { return t_.cbDone(told), QvStatus::ok; });
    if (number_ == p_.runNumber) p_.returnTask();
    return result;
}

int QvTranscodeRun::postprocess(const Any& command) {
    t_.cbPostprocess(command);
    return execute_process(command);
}

// --- Main loop -------------------------------------------------------------------------------------

int QvTranscodeRun::mainLoop() {
    const auto links = p_.task->links();
    for (int i = 0; i < links.size(); ++i)
        (links.at(i)->type() == qvVideoStream ? video_ : audio_).push_back(links.at(i));
    rate_ = video_.empty() ? QvFramerate::f24p() : video_.front()->outFramerate();
    double reportRate = 0;
    const int total = totalFrames(*p_.task, reportRate);
    QvProgressReport progress(p_.progress, total, reportRate);
    if (p_.twoPass && !p_.firstPassRunning) progress.setPass(0.5, 0.5);
    p_.times.begin(QvTimer::time());
    lastTurn_ = QvTimer::time();
    do {
        if (stopping()) break;
        allDone_ = true;
        if (p_.logProgress) logTurn();
        videoTurn();
        if (p_.logProgress) logTurn();
        audioTurn();
        if (!stopping() && !allDone_) waitWhilePaused();
        report(progress);
        callProcess();
        ++rounds_;
    } while (!allDone_);
    if (result_ == QvStatus::ok) checkDisc();
    return result_;
}

// The files of the first pass go with the run, so no encoder may keep pointing at them.
void QvTranscodeRun::forgetStatistics() {
    const Any nothing(static_cast<const void*>(nullptr));
    for (int i = 0; const TransLink* video = p_.task->getLink(1, i); ++i)
        if (QvVideoEncoder* encoder = p_.task->encoder()->videoEncoder(video->encStreamNr()))
            qvSetOptionalParam(*encoder, "meta", nothing);
}

void QvTranscodeRun::link(TransLink& link, int n) {
    result_ = link.processFrame(n);
    p_.times.step(QvTimer::time());
    if (result_ != QvStatus::ok) stopLoop();
}

void QvTranscodeRun::videoTurn() {
    for (TransLink* video : video_) {
        if (stopping()) return;
        if (!video->finished()) {
            link(*video, 0);
            if (result_ != QvStatus::ok) endOfVideo_ = result_ == QvStatus::endOfStream;
            framesDone_ = video->outProcessed();
        }
        allDone_ = allDone_ && video->finished();
    }
}

void QvTranscodeRun::audioTurn() {
    for (TransLink* audio : audio_) {
        // The end of the video does not keep the last frames from getting their sound.
        if (stopping() && !endOfVideo_) return;
        const int before = result_;
        link(*audio, audioDue(*audio));
        if (result_ == QvStatus::ok && before != QvStatus::ok) result_ = before;
        // Sound of no length is never asked for anything, so it can't tell that it has finished.
        const bool complete = audio->finished() || audio->outProcessed() >= audio->totalOutSamples();
        if (video_.empty()) allDone_ = allDone_ && complete;
    }
}

// The synchronisation rule: the samples of all frames written so far, less those that are written.
int QvTranscodeRun::audioDue(const TransLink& audio) const {
    const long long frames = video_.empty() ? rounds_ + 1 : framesDone_;
    long long due = 0;
    if (frames != 0) due = audio.outSamplesPerFrames(static_cast<int>(frames), rate_) - audio.outProcessed();
    if (video_.empty()) due = std::min(due, audio.totalOutSamples() - audio.outProcessed());
    if (due < 0) {
        qv_dbg()->debug("Transcoder._transcode, audio ahead of video %d samples", static_cast<int>(-due));
        due = 0;
    }
    return static_cast<int>(due);
}

void QvTranscodeRun::waitWhilePaused() {
    if (p_.synchronous) return;
    std::unique_lock guard(p_.lock);
    if (!p_.paused) return;
    // The callback may ask for the state of the pause, so it runs outside the lock.
    guard.unlock();
    t_.cbPaused(true);
    guard.lock();
    p_.changed.wait(guard, [this] { return !p_.paused || stopping(); });
    guard.unlock();
    t_.cbPaused(false);
}

void QvTranscodeRun::report(QvProgressReport& progress) {
    double part = 0;
    if (!progress.due(QvTimer::time(), part) || stopping()) return;
    if (p_.checkDiscSpace && checkDisc() != QvStatus::ok) {
        result_ = QvStatus::failed;
        stopLoop();
        return;
    }
    callProgress(part);
}

void QvTranscodeRun::callProgress(double part) {
    CallbackScope inside(p_.inCallback);
    t_.cbProgress(part);
}

void QvTranscodeRun::callProcess() {
    CallbackScope inside(p_.inCallback);
    if (t_.cbProcess() != 0) stopLoop();
}

// -1 when the disc of the output is full. A disc that does not tell counts as having space.
int QvTranscodeRun::checkDisc() {
    const Any name = p_.task->encoder()->getFilename();
    if (!name.isText()) return QvStatus::ok;
    const long long space = QvFile::freeSpace(name);
    if (space == 0) {
        qv_log()->error("Encode Error. Target disk full.");
        return QvStatus::failed;
    }
    if (space < 0) qv_dbg()->info("Encode Error. Target disk inaccessible.");
    return QvStatus::ok;
}

void QvTranscodeRun::logTurn() {
    const double now = QvTimer::time();
    char clock[QvTimer::strtimeSize];
    QvTimer::strtime(clock, now - p_.times.start, QvTimer::hmsm);
    qv_dbg()->progress("-- %s (tp + %.3f) --", clock, now - lastTurn_);
    lastTurn_ = now;
}
