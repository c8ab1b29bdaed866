#include "core/transcode/run/transcoderun_p.h"

#include <new>

#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/run/firstpass_p.h"
#include "core/transcode/run/mainloop_p.h"
#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/run/runerror_p.h"
#include "core/transcode/run/runlinks_p.h"
#include "core/transcode/run/runopening_p.h"
#include "core/transcode/run/transcodersettings_p.h"
#include "core/transcode/task/qvtranscodetask.h"

namespace {

constexpr int kStopped = 1;  // what cbDone gets for a run that was stopped

}  // namespace

int TranscodeRun::open() { return RunOpening(run_).open(); }

// Runs a part of the work; what it throws ends it as a failure.
template <class Work>
int TranscodeRun::guarded(Work work) {
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

int TranscodeRun::start() {
    try {
        const int result = work();
        return finish(result);
    } catch (...) {
        return breakOff();
    }
}

int TranscodeRun::work() {
    QVThreads::QvLowPriority lowered;
    // Lets the caller finish what it does after transcode() returns; a stop ends the wait.
    if (run_.settings.startDelay > 0) run_.control.waitUnlessStopped(run_.settings.startDelay);
    int result = guarded([this] {
        const bool logProgress = qv_registry()->getDbgOption("log_progress").isTrue();
        const QvMuxer* muxer = run_.task.encoder()->getMuxer();
        MainLoop loop(run_, logProgress, muxer && qvModuleTraits(*muxer).watchDiscSpace);
        return runPasses(loop);
    });
    if (run_.settings.twoPass) {
        const int forgotten = guarded([this] { return forgetStatistics(), QvStatus::ok; });
        if (result == QvStatus::ok) result = forgotten;
    }
    return result;
}

// The last resort where not even the end of a run has the memory that it needs: all is closed, and the
// application learns it.
int TranscodeRun::breakOff() {
    if (isLatest() && run_.control.running()) {
        giveUp();
        run_.control.end(QvTranscoder::connected);
    }
    try {
        run_.transcoder.cbDone(QvStatus::outOfMemory);
    } catch (...) {
        // There is no other way to report it.
    }
    if (isLatest()) returnTask_();
    return QvStatus::outOfMemory;
}

int TranscodeRun::runPasses(MainLoop& loop) {
    int result = run_.settings.twoPass ? FirstPass(run_).run() : QvStatus::ok;
    if (result == QvStatus::ok && !stopping()) result = RunOpening(run_).openEncoder();
    if (result == QvStatus::ok && !stopping()) {
        result = loop.run();
        endOfVideo_ = loop.endOfVideo();
    }
    return result;
}

void TranscodeRun::giveUp() {
    if (run_.settings.closeEncoder) guarded([this] { return run_.task.encoder()->abort(); });
    qvrunlinks::close(run_.task);
    qv_log()->setLogFile(Any());
}

// Closes the output: finished after a good or stopped run, aborted after an error.
int TranscodeRun::closeOutput(int result) {
    QvEncodePipe& pipe = *run_.task.encoder();
    QvDbgLog& log = *qv_dbg();
    if (QvMuxer* muxer = pipe.getMuxer()) {
        log.info("[transcoder] Calling cbMuxClose()");
        const int reported = guarded([&] { return run_.transcoder.cbMuxClose(muxer), QvStatus::ok; });
        if (result == QvStatus::ok) result = reported;
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

int TranscodeRun::finish(int result) {
    // An input that ended early ends the run as a stop does; only cbDone reports it.
    const bool ended = endOfVideo_ && result == QvStatus::endOfStream;
    if (ended) result = QvStatus::ok;
    if (run_.settings.closeEncoder) result = closeOutput(result);
    if (run_.settings.closeEncoder)
        run_.task.encoder()->setCancel(nullptr);  // what follows is the application's
    const int closed = qvrunlinks::close(run_.task);
    if (result == QvStatus::ok) result = closed;
    // A write that a stop has ended is no failure.
    if (run_.control.cancel()->gaveUp()) result = QvStatus::ok;
    run_.statistics.clear();
    int reported = ended ? QvStatus::endOfStream : kStopped;
    if (result != QvStatus::ok) {
        run_.error.set(QvStatus::failed, "Error in processing");
        reported = result;
    }
    Any command;
    const bool complete = result == QvStatus::ok && !stopping();
    if (complete)
        reported = guarded([&] { return command = run_.task.currentPostprocessCommand(), QvStatus::ok; });
    qv_log()->setLogFile(Any());
    run_.control.end(QvTranscoder::connected);
    // From here on the application may change the task.
    if (complete && command.isString()) reported = guarded([&] { return postprocess(command); });
    guarded([&] { return run_.transcoder.cbDone(reported), QvStatus::ok; });
    if (isLatest()) returnTask_();
    return result;
}

int TranscodeRun::postprocess(const Any& command) {
    run_.transcoder.cbPostprocess(command);
    return execute_process(command);
}

// The files of the first pass go with the run, so no encoder may keep pointing at them.
void TranscodeRun::forgetStatistics() {
    const Any nothing(static_cast<const void*>(nullptr));
    for (int i = 0; const TransLink* video = run_.task.getLink(qvVideoStream, i); ++i)
        if (QvVideoEncoder* encoder = run_.task.encoder()->videoEncoder(video->encStreamNr()))
            qvSetOptionalParam(*encoder, "meta", nothing);
}
