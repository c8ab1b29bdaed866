#include "core/transcode/run/mainloop_p.h"

#include <algorithm>

#include "core/encode/qvencodepipe.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/run/qvprogressreport_p.h"
#include "core/transcode/run/runlinks_p.h"
#include "core/transcode/run/steptimes_p.h"
#include "core/transcode/run/transcodersettings_p.h"
#include "core/transcode/task/qvtranscodetask.h"

int MainLoop::run() {
    const auto links = run_.task.links();
    for (int i = 0; i < links.size(); ++i)
        (links.at(i)->type() == qvVideoStream ? video_ : audio_).push_back(links.at(i));
    rate_ = video_.empty() ? QvFramerate::f24p() : video_.front()->outFramerate();
    double reportRate = 0;
    const int total = qvrunlinks::totalFrames(run_.task, reportRate);
    QvProgressReport progress(run_.settings.progress, total, reportRate);
    if (run_.settings.twoPass && !run_.control.firstPass) progress.setPass(0.5, 0.5);
    run_.times.begin(QvTimer::time());
    lastTurn_ = QvTimer::time();
    do {
        if (stopping()) break;
        allDone_ = true;
        if (logProgress_) logTurn();
        videoTurn();
        if (logProgress_) logTurn();
        audioTurn();
        if (!stopping() && !allDone_) run_.waitWhilePaused();
        report(progress);
        run_.callProcess();
        ++rounds_;
    } while (!allDone_);
    if (result_ == QvStatus::ok) checkDisc();
    return result_;
}

void MainLoop::link(TransLink& link, int n) {
    result_ = link.processFrame(n);
    run_.times.step(QvTimer::time());
    if (result_ != QvStatus::ok) run_.control.stopLoop();
}

void MainLoop::videoTurn() {
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

void MainLoop::audioTurn() {
    for (TransLink* audio : audio_) {
        // The end of the video does not keep the last frames from getting their sound.
        if (stopping() && !endOfVideo_) return;
        const int before = result_;
        link(*audio, audioDue(*audio));
        if (result_ == QvStatus::ok && before != QvStatus::ok) result_ = before;
        // An audio link without samples is never asked for any, so it never reports that it has finished.
        const bool complete = audio->finished() || audio->outProcessed() >= audio->totalOutSamples();
        if (video_.empty()) allDone_ = allDone_ && complete;
    }
}

// The synchronisation rule: the samples of all frames written so far, less those that are written.
int MainLoop::audioDue(const TransLink& audio) const {
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

void MainLoop::report(QvProgressReport& progress) {
    double part = 0;
    if (!progress.due(QvTimer::time(), part) || stopping()) return;
    if (checkDiscSpace_ && checkDisc() != QvStatus::ok) {
        result_ = QvStatus::failed;
        run_.control.stopLoop();
        return;
    }
    run_.callProgress(part);
}

// -1 when the disc of the output is full. A disc of unknown space counts as having some.
int MainLoop::checkDisc() {
    const Any name = run_.task.encoder()->getFilename();
    if (!name.isText()) return QvStatus::ok;
    const long long space = QvFile::freeSpace(name);
    if (space == 0) {
        qv_log()->error("Encode Error. Target disk full.");
        return QvStatus::failed;
    }
    if (space < 0) qv_dbg()->info("Encode Error. Target disk inaccessible.");
    return QvStatus::ok;
}

void MainLoop::logTurn() {
    const double now = QvTimer::time();
    char clock[QvTimer::strtimeSize];
    QvTimer::strtime(clock, now - run_.times.start(), QvTimer::hmsm);
    qv_dbg()->progress("-- %s (tp + %.3f) --", clock, now - lastTurn_);
    lastTurn_ = now;
}
