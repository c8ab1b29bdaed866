// The start of a run: from a task with links to open inputs, links and output.
#include <new>
#include <string>

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
#include "core/transcode/run/qvtranscoderun_p.h"

namespace {

constexpr double kFilmRate = 24.0;

std::string narrow(const Any& value) {
    const Any text = value.isWString() ? value.toString() : value;
    return text.isString() ? text.asString() : "";
}

}  // namespace

int QvTranscodeRun::open() {
    QvEncodePipe* pipe = p_.task->encoder();
    QV_ASSERT_MSG(pipe, "Transcoder.transcode: Encoder not set!");
    p_.errorCode = QvStatus::ok;
    p_.errorText.clear();
    collectParams();
    beginLogFile();
    int warning = QvStatus::ok;
    int result = checkTask(warning);
    if (result == QvStatus::ok) result = openLinks();
    if (result == QvStatus::ok) result = seekInputs();
    if (result == QvStatus::ok) {
        setMuxerLength();
        copyMeta();
        if (!p_.twoPass) result = openEncoder();
        logSettings();
        if (result != QvStatus::ok) copyPipeError(result);
    }
    if (result != QvStatus::ok) qv_log()->setLogFile(Any());
    return result != QvStatus::ok ? result : warning;
}

// The transcoder's global parameters become those of the task.
void QvTranscodeRun::collectParams() {
    ProcessParams audio, video;
    if (p_.smartRender) {
        audio.setSmartRender(1);
        if (!p_.twoPass) video.setSmartRender(1);
    }
    if (!p_.connMatrix.empty()) audio.set("audioChannelMap", p_.connMatrix);
    if (!p_.audioEffects.empty()) audio.set("filters", p_.audioEffects);
    if (!p_.effects.empty()) video.set("filters", p_.effects);
    if (!p_.chapters.empty()) video.set("chapters", p_.chapters);
    p_.task->setProcessParams(audio, 2);
    p_.task->setProcessParams(video, 1);
}

void QvTranscodeRun::beginLogFile() {
    Any name;
    if (p_.writeLogfile) {
        const std::string file = narrow(p_.task->encoder()->getFilename());
        if (!file.empty()) name = Any((file + ".log").c_str());
    }
    if (name.isTrue()) qv_dbg()->debug("Transcoder: Logging to %s", name.asString());
    qv_log()->setLogFile(name);
}

int QvTranscodeRun::checkTask(int& warning) {
    AnyVector messages;
    const int legal = p_.task->checkLegal(messages);
    if (legal == QvStatus::notLegal || legal == QvStatus::warning) {
        const Any text = messages.join(Any("\n"));
        t_.setError(legal, "%s", text.isString() ? text.asString() : "");
        if (legal == QvStatus::notLegal) return legal;
        warning = legal;
    }
    if (p_.task->checkStreams() != QvStatus::ok)
        return t_.setError(QvStatus::failed, "%s", p_.task->errorDesc());
    return QvStatus::ok;
}

int QvTranscodeRun::openLinks() {
    AnyVector params;
    const auto links = p_.task->links();
    QvTask::makeOpenParams(*p_.task, links, params);
    closeLinks(*p_.task);  // a run that could not start leaves some open
    for (int i = 0; i < links.size(); ++i) {
        TransLink& link = *links.at(i);
        int result = QvStatus::failed;
        if (auto* video = dynamic_cast<TransVLink*>(&link)) video->setCancel(p_.cancel);
        try {
            result = link.open(&params.at(i).asDict());
        } catch (const QvAssertFailure&) {
            t_.setError(QvStatus::failed, "Can not open transcode link");
            throw;
        }
        if (result == QvStatus::ok) continue;
        const std::string cause = link.errorDesc();
        // The failed link is closed once for each one before it; those stay open until the next run.
        for (int k = 0; k < i; ++k) link.close();
        return t_.setError(QvStatus::failed, "Can not open transcode link%s%s", cause.empty() ? "" : ": ",
                           cause.c_str());
    }
    return QvStatus::ok;
}

int QvTranscodeRun::seekInputs() {
    const auto links = p_.task->links();
    for (int i = 0; i < links.size(); ++i) {
        TransLink& link = *links.at(i);
        const MediaTime in = link.inPoint();
        if (link.decoder()->seek(in, link.type(), link.decStreamNr()) != QvStatus::ok) {
            closeLinks(*p_.task);
            return t_.setError(QvStatus::failed, "Seek input %s #%d to %f failed, aborting",
                               QvTask::typeName(link.type()), link.decStreamNr(), in.seconds());
        }
        for (int k = 0; link.type() == 1 && k < link.nrMetaSources(); ++k) {
            QvDecodePipe* meta = link.metaSource(k);
            if (meta != link.decoder())
                meta->seek(in, meta->nrStreams(1) > 0 ? 1 : 4, link.metaSourceStreamNr(k));
        }
    }
    return QvStatus::ok;
}

int QvTranscodeRun::closeLinks(const QvTask& task) {
    int result = QvStatus::ok;
    for (int i = 0; i < task.nrLinks(); ++i) {
        try {
            result |= task.getLink(i)->close();
        } catch (const std::bad_alloc&) {
            result |= QvStatus::outOfMemory;
        } catch (const QvException& failure) {
            qv_dbg()->error("Transcoder: %s", failure.what());
            result |= QvStatus::failed;
        }
    }
    return result;
}

int QvTranscodeRun::totalFrames(const QvTask& task, double& rate) {
    rate = kFilmRate;
    QvEncodePipe* pipe = task.encoder();
    if (pipe && pipe->nrStreams(1) > 0) {
        const Any value = pipe->QvCodec::getParam("video0/framerate");
        if (value.isFramerate()) rate = value.asFramerate().rate();
    }
    const auto links = task.links();
    int total = 0;
    if (!links.empty() && links.at(0)->type() == 1) total = links.at(0)->totalOutFrames();
    if (total != 0) return total;
    for (int i = 0; i < links.size(); ++i) {
        const MediaTime length = links.at(i)->outPoint() - links.at(i)->inPoint();
        total = std::max(total, static_cast<int>(length.position(24)));
    }
    return total;
}

// A multiplexer that numbers its files has to know how many digits they need.
void QvTranscodeRun::setMuxerLength() {
    double rate = 0;
    const int total = totalFrames(*p_.task, rate);
    if (QvMuxer* muxer = p_.task->encoder()->getMuxer(); muxer && total > 0)
        qvSetOptionalParam(*muxer, "_totalFrames", Any(total));
}

void QvTranscodeRun::copyMeta() {
    const TransLink* video = p_.task->getLink(1, 0);
    if (!video) return;
    const Any meta = video->decoder()->QvCodec::getParam("meta");
    if (!meta.isDict()) return;
    QvMuxer* muxer = p_.task->encoder()->getMuxer();
    QvVideoEncoder* encoder = p_.task->encoder()->videoEncoder(video->encStreamNr());
    if (muxer) qvSetOptionalParam(*muxer, "meta", meta);
    const Any start = meta.asDict().get("startTimecode");
    const Any rate = encoder ? encoder->QvCodec::getParam("framerate") : Any();
    if (!start.isString() || !rate.isFramerate()) return;
    const Any offset(QvTimecode(start.asString()).frameNr(rate.asFramerate(), false));
    qvSetOptionalParam(*encoder, "timecodeOffset", offset);
    if (muxer) qvSetOptionalParam(*muxer, "timecodeOffset", offset);
}

int QvTranscodeRun::openEncoder() {
    QvEncodePipe& pipe = *p_.task->encoder();
    if (pipe.getState() == 3) return QvStatus::ok;
    pipe.setCancel(p_.cancel);
    const int result = pipe.open();
    if (result == QvStatus::ok) return result;
    pipe.setCancel(nullptr);
    closeLinks(*p_.task);
    return pipe.errorCode() ? pipe.errorCode() : result;
}

// The pipe has logged it.
void QvTranscodeRun::copyPipeError(int code) {
    p_.errorCode = code;
    p_.errorText = p_.task->encoder()->errorDesc();
}

void QvTranscodeRun::logSettings() const {
    QvDbgLog& log = *qv_dbg();
    const QvEncodePipe* pipe = p_.task->encoder();
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
    p_.task->debugOutLinks();
    for (const char* line : {"--------", "Settings", "--------"}) log.debug("%s", line);
    if (muxer) {
        AnyDict settings;
        muxer->store(settings);
        log.debug("Muxer:");
        QvUtil::debugOutDict(settings);
    }
    const auto links = p_.task->links();
    for (int i = 0; i < links.size(); ++i) links.at(i)->log();
    log.debug("================");
}
