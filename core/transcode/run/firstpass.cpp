#include "core/transcode/run/firstpass_p.h"

#include <cstdio>
#include <string>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"
#include "core/preset/qvpreset.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/transcode/link/video/transvlink.h"
#include "core/transcode/run/qvprogressreport_p.h"
#include "core/transcode/run/runcontrol_p.h"
#include "core/transcode/run/runlinks_p.h"
#include "core/transcode/run/steptimes_p.h"
#include "core/transcode/run/transcodersettings_p.h"
#include "core/transcode/task/qvtranscodetask.h"

namespace {

// Encoders write their statistics into the record, or take the file's name and write it themselves.
Any statisticsOf(const QvMetadataFile& file) {
    return file.metadata() ? Any(static_cast<const void*>(file.metadata())) : file.filename();
}

Any statisticsName(const Any& base, int index) {
    char number[16];
    std::snprintf(number, sizeof number, "%02d", index);
    const Any text = base.isWString() ? base.toString() : base;
    return Any((std::string(text.isString() ? text.asString() : "") + number).c_str());
}

}  // namespace

FirstPass::FirstPass(const RunContext& run) : run_(run) {}

FirstPass::~FirstPass() = default;

int FirstPass::run() {
    run_.control.firstPass = true;
    qv_dbg()->debug("Transcoder: Starting first (analyze) pass");
    TPtrList<TransLink> wanted;
    if (run_.task.checkMultiPass(&wanted) == 0) {
        qv_dbg()->warning("Transcoder: Two pass encoding not possible, reverting to single pass.");
        return QvStatus::ok;
    }
    QV_ASSERT(run_.statistics.empty());
    if (make(wanted) != QvStatus::ok || pipe_->open() != QvStatus::ok) {
        qv_dbg()->log(QvLogMask::error, "First (analyze) pass error");
        return QvStatus::failed;
    }
    int result = loop();
    const int closed = pipe_->close();  // encoders may write the last of their statistics here
    if (result == QvStatus::ok) result = closed;
    result |= end();
    run_.control.firstPass = false;
    if (result == QvStatus::ok)
        qv_log()->info("First (analyze) pass OK.");
    else
        qv_log()->error("First (analyze) pass error.");
    return result;
}

int FirstPass::make(const TPtrList<TransLink>& wanted) {
    const Any base = run_.settings.metaName.isTrue() ? run_.settings.metaName
                                                     : QvUtil::makeMetaName(qv_registry()->tempDir());
    QvEncodePipe& real = *run_.task.encoder();
    pipe_.reset(QvEncodePipe::create());
    if (!pipe_) return QvStatus::failed;
    QvEncodePipe& pipe = *pipe_;
    if (const QvPreset* preset = real.activePreset()) pipe.applyPreset(preset->profile(), 0);
    pipe.removeStreams(qvAllStreams);
    pipe.setMuxer("nullmux");
    pipe.setFilename(Any(""));

    AnyVector params;
    QvTask::makeOpenParams(run_.task, wanted, params);
    for (int i = 0; i < wanted.size(); ++i) {
        TransLink& link = *wanted.at(i);
        QvVideoEncoder& encoder = *real.videoEncoder(link.encStreamNr());
        AnyDict settings, stream;
        encoder.store(settings);
        run_.statistics.push_back(std::make_unique<QvMetadataFile>());
        QvMetadataFile& file = *run_.statistics.back();
        file.init(statisticsName(base, i), qvModuleTraits(encoder).ownStatistics);
        stream.set("codec", encoder.name());
        QV_ASSERT_MSG(pipe.addVideoStream(stream) >= 0, "Transcoder._analyze: failed to add stream");
        QvVideoEncoder& twin = *pipe.videoEncoder(i);
        twin.restore(settings);
        twin.setParam("meta", statisticsOf(file));
        twin.setParam("firstPass", Any(1));

        links_.push_back({std::make_unique<TransVLink>(), &link});
        TransVLink& made = *links_.back().twin;
        if (made.init(link.decoder(), link.decStreamNr(), &pipe, i) != QvStatus::ok) return QvStatus::failed;
        made.setCancel(run_.control.cancel());
        pipe.videoStream(i)->setEnabled(true);
        if (made.open(&params.at(i).asDict()) != QvStatus::ok) return QvStatus::failed;
    }
    return QvStatus::ok;
}

int FirstPass::loop() {
    double rate = 0;
    const int total = qvrunlinks::totalFrames(run_.task, rate);
    QvProgressReport progress(run_.settings.progress, total, rate);
    progress.setPass(0, 0.5);
    run_.callProgress(0);
    int result = QvStatus::ok;
    run_.times.begin(QvTimer::time());
    for (bool done = false; !done && !run_.control.stopping();) {
        done = true;
        for (Link& link : links_) {
            if (link.twin->finished()) continue;
            result = link.twin->processFrame(0);
            run_.times.step(QvTimer::time());
            if (result != QvStatus::ok) {
                run_.control.stopLoop();
                break;
            }
            done = done && link.twin->finished();
        }
        double part = 0;
        if (progress.due(QvTimer::time(), part) && !run_.control.stopping()) run_.callProgress(part);
        run_.callProcess();
        if (!run_.control.stopping()) run_.waitWhilePaused();
    }
    return result;
}

// The real encoders take the statistics, and the inputs go back to where they were.
int FirstPass::end() {
    int result = QvStatus::ok;
    for (size_t i = 0; i < links_.size(); ++i) {
        TransLink& link = *links_[i].real;
        if (!run_.control.stopping())
            run_.task.encoder()
                ->videoEncoder(link.encStreamNr())
                ->setParam("meta", statisticsOf(*run_.statistics[i]));
        const MediaTime in = link.inPoint();
        qv_dbg()->debug("Analyze, seeking stream %d to %f seconds", link.decStreamNr(), in.seconds());
        result |= link.decoder()->seek(in, qvVideoStream, link.decStreamNr());
    }
    return result;
}
