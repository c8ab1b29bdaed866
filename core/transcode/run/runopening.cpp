#include "core/transcode/run/runopening_p.h"

#include <string>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/preset/qvpreset.h"
#include "core/preset/qvpresetmgr.h"
#include "core/transcode/link/translink.h"
#include "core/transcode/run/runcontrol_p.h"
#include "core/transcode/run/runerror_p.h"
#include "core/transcode/run/runlinks_p.h"
#include "core/transcode/run/transcodersettings_p.h"
#include "core/transcode/task/qvtranscodetask.h"

namespace {

std::string narrow(const Any& value) {
    const Any text = value.isWString() ? value.toString() : value;
    return text.isString() ? text.asString() : "";
}

// What a link reads ahead is watched while this lives.
class Watching {
  public:
    Watching(TransLink& link, QvReadWatch watch) : link_(link) { link_.setReadWatch(std::move(watch)); }
    Watching(const Watching&) = delete;
    Watching& operator=(const Watching&) = delete;
    ~Watching() { link_.setReadWatch({}); }

  private:
    TransLink& link_;
};

}  // namespace

int RunOpening::open() {
    QvEncodePipe* pipe = run_.task.encoder();
    QV_ASSERT_MSG(pipe, "Transcoder.transcode: Encoder not set!");
    run_.error.clear();
    collectParams();
    beginLogFile();
    int warning = QvStatus::ok;
    int result = checkTask(warning);
    if (result == QvStatus::ok) result = openLinks();
    if (result == QvStatus::ok) result = seekInputs();
    if (result == QvStatus::ok) {
        setMuxerLength();
        copyMeta();
        if (!run_.settings.twoPass) result = openEncoder();
        logSettings();
        if (result != QvStatus::ok) copyPipeError(result);
    }
    if (result != QvStatus::ok) qv_log()->setLogFile(Any());
    return result != QvStatus::ok ? result : warning;
}

// The transcoder's global parameters become those of the task.
void RunOpening::collectParams() {
    ProcessParams audio, video;
    if (run_.settings.smartRender) {
        audio.setSmartRender(1);
        if (!run_.settings.twoPass) video.setSmartRender(1);
    }
    if (!run_.settings.connMatrix.empty()) audio.setAudioChannelMap(run_.settings.connMatrix);
    if (!run_.settings.audioEffects.empty()) audio.setFilters(run_.settings.audioEffects);
    if (!run_.settings.effects.empty()) video.setFilters(run_.settings.effects);
    if (!run_.settings.chapters.empty()) video.setChapterPoints(run_.settings.chapters);
    run_.task.setProcessParams(audio, qvAudioStream);
    run_.task.setProcessParams(video, qvVideoStream);
}

void RunOpening::beginLogFile() {
    Any name;
    if (run_.settings.writeLogfile) {
        const std::string file = narrow(run_.task.encoder()->getFilename());
        if (!file.empty()) name = Any((file + ".log").c_str());
    }
    if (name.isTrue()) qv_dbg()->debug("Transcoder: Logging to %s", name.asString());
    qv_log()->setLogFile(name);
}

int RunOpening::checkTask(int& warning) {
    AnyVector messages;
    const int legal = run_.task.checkLegal(messages);
    if (legal == QvStatus::notLegal || legal == QvStatus::warning) {
        const Any text = messages.join(Any("\n"));
        run_.error.set(legal, "%s", text.isString() ? text.asString() : "");
        if (legal == QvStatus::notLegal) return legal;
        warning = legal;
    }
    if (run_.task.checkStreams() != QvStatus::ok)
        return run_.error.set(QvStatus::failed, "%s", run_.task.errorDesc());
    return QvStatus::ok;
}

int RunOpening::openLinks() {
    AnyVector params;
    const auto links = run_.task.links();
    QvTask::makeOpenParams(run_.task, links, params);
    qvrunlinks::close(run_.task);  // a run that could not start leaves some open
    for (int i = 0; i < links.size(); ++i) {
        TransLink& link = *links.at(i);
        int result = QvStatus::failed;
        link.setCancel(run_.control.cancel());
        const Watching watching(link, [this](double part) { return run_.callMeasure(part); });
        try {
            result = link.open(&params.at(i).asDict());
        } catch (const QvAssertFailure&) {
            run_.error.set(QvStatus::failed, "Can not open transcode link");
            throw;
        }
        if (result == QvStatus::ok) continue;
        const std::string cause = link.errorDesc();
        // The links before it stay open until the next run.
        return run_.error.set(QvStatus::failed, "Can not open transcode link%s%s", cause.empty() ? "" : ": ",
                              cause.c_str());
    }
    return QvStatus::ok;
}

int RunOpening::seekInputs() {
    const auto links = run_.task.links();
    for (int i = 0; i < links.size(); ++i) {
        TransLink& link = *links.at(i);
        const MediaTime in = link.inPoint();
        if (link.decoder()->seek(in, link.type(), link.decStreamNr()) != QvStatus::ok) {
            qvrunlinks::close(run_.task);
            return run_.error.set(QvStatus::failed, "Seek input %s #%d to %f failed, aborting",
                                  QvTask::typeName(link.type()), link.decStreamNr(), in.seconds());
        }
        for (int k = 0; link.type() == qvVideoStream && k < link.nrMetaSources(); ++k) {
            QvDecodePipe* meta = link.metaSource(k);
            if (meta != link.decoder())
                meta->seek(in, meta->nrStreams(qvVideoStream) > 0 ? qvVideoStream : qvSubpicStream,
                           link.metaSourceStreamNr(k));
        }
    }
    return QvStatus::ok;
}

// A multiplexer that numbers its files has to know how many digits they need.
void RunOpening::setMuxerLength() {
    double rate = 0;
    const int total = qvrunlinks::totalFrames(run_.task, rate);
    if (QvMuxer* muxer = run_.task.encoder()->getMuxer(); muxer && total > 0)
        qvSetOptionalParam(*muxer, "_totalFrames", Any(total));
}

void RunOpening::copyMeta() {
    const TransLink* video = run_.task.getLink(qvVideoStream, 0);
    if (!video) return;
    const Any meta = video->decoder()->QvCodec::getParam("meta");
    if (!meta.isDict()) return;
    QvMuxer* muxer = run_.task.encoder()->getMuxer();
    QvVideoEncoder* encoder = run_.task.encoder()->videoEncoder(video->encStreamNr());
    if (muxer) qvSetOptionalParam(*muxer, "meta", meta);
    const Any start = meta.asDict().get("startTimecode");
    const Any rate = encoder ? encoder->QvCodec::getParam("framerate") : Any();
    if (!start.isString() || !rate.isFramerate()) return;
    const Any offset(QvTimecode(start.asString()).frameNr(rate.asFramerate(), false));
    qvSetOptionalParam(*encoder, "timecodeOffset", offset);
    if (muxer) qvSetOptionalParam(*muxer, "timecodeOffset", offset);
}

int RunOpening::openEncoder() {
    QvEncodePipe& pipe = *run_.task.encoder();
    if (pipe.getState() == QvDecodePipe::stateOpen) return QvStatus::ok;
    pipe.setCancel(run_.control.cancel());
    const int result = pipe.open();
    if (result == QvStatus::ok) return result;
    pipe.setCancel(nullptr);
    qvrunlinks::close(run_.task);
    return pipe.errorCode() ? pipe.errorCode() : result;
}

// The pipe has logged it.
void RunOpening::copyPipeError(int code) { run_.error.copy(code, run_.task.encoder()->errorDesc()); }

void RunOpening::logSettings() const {
    QvDbgLog& log = *qv_dbg();
    const QvEncodePipe* pipe = run_.task.encoder();
    if (!pipe) {
        log.debug("No encoder?");
        log.debug("================");
        return;
    }
    for (const char* line : {"================", "Transcoding", "-------", "Summary", "-------"})
        log.debug("%s", line);
    if (const Any name = pipe->QvCodec::getParam("filename"); name.isString())
        log.debug("Output file: %s", name.asString());
    if (const QvPreset* preset = pipe->activePreset())
        log.debug("Profile #%02d: '%s', %s (%d)",
                  qv_registry()->presetMgr()->findByProfile(preset->profile()), preset->name(),
                  preset->symbol(), preset->profile());
    else
        log.debug("Profile: n/a");
    const QvMuxer* muxer = pipe->getMuxer();
    if (muxer)
        log.debug("Muxer: %s (%s)", muxer->displayName(), muxer->name());
    else
        log.debug("Muxer: n/a");
    log.debug("Stream map:");
    run_.task.debugOutLinks();
    for (const char* line : {"--------", "Settings", "--------"}) log.debug("%s", line);
    if (muxer) {
        AnyDict settings;
        muxer->store(settings);
        log.debug("Muxer:");
        QvUtil::debugOutDict(settings);
    }
    const auto links = run_.task.links();
    for (int i = 0; i < links.size(); ++i) links.at(i)->log();
    log.debug("================");
}
