// The first pass of a two-pass run: each video encoder that wants statistics encodes into nothing, through
// a private pipe, while a metadata file collects what it learns.
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"
#include "core/preset/qvpreset.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/transcode/link/transvlink.h"
#include "core/transcode/run/qvtranscoderun_p.h"

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

// The private pipe, and its links with the real link that each stands for.
struct QvTranscodeRun::FirstPass {
    struct Link {
        std::unique_ptr<TransVLink> twin;
        TransLink* real;
    };
    std::unique_ptr<QvEncodePipe> pipe;
    std::vector<Link> links;
};

int QvTranscodeRun::analyze() {
    p_.firstPassRunning = true;
    qv_dbg()->debug("Transcoder: Starting first (analyze) pass");
    TPtrList<TransLink> wanted;
    if (p_.task->checkMultiPass(&wanted) == 0) {
        qv_dbg()->warning("Transcoder: Two pass encoding not possible, reverting to single pass.");
        return QvStatus::ok;
    }
    QV_ASSERT(p_.metadataFiles.empty());
    FirstPass pass;
    if (makeFirstPass(wanted, pass) != QvStatus::ok || pass.pipe->open() != QvStatus::ok) {
        qv_dbg()->log(2, "First (analyze) pass error");
        return QvStatus::failed;
    }
    int result = runFirstPass(pass);
    const int closed = pass.pipe->close();  // encoders may write the last of their statistics here
    if (result == QvStatus::ok) result = closed;
    result |= endFirstPass(pass);
    p_.firstPassRunning = false;
    if (result == QvStatus::ok)
        qv_log()->info("First (analyze) pass OK.");
    else
        qv_log()->error("First (analyze) pass error.");
    return result;
}

int QvTranscodeRun::makeFirstPass(const TPtrList<TransLink>& wanted, FirstPass& pass) {
    const Any base = p_.metaName.isTrue() ? p_.metaName : QvUtil::makeMetaName(qv_registry()->tempDir());
    QvEncodePipe& real = *p_.task->encoder();
    pass.pipe.reset(QvEncodePipe::create());
    if (!pass.pipe) return QvStatus::failed;
    QvEncodePipe& pipe = *pass.pipe;
    if (const QvPreset* preset = real.activePreset()) pipe.applyPreset(preset->profile(), 0);
    pipe.removeStreams(qvAllStreams);
    pipe.setMuxer("nullmux");
    pipe.setFilename(Any(""));

    AnyVector params;
    QvTask::makeOpenParams(*p_.task, wanted, params);
    for (int i = 0; i < wanted.size(); ++i) {
        TransLink& link = *wanted.at(i);
        QvVideoEncoder& encoder = *real.videoEncoder(link.encStreamNr());
        AnyDict settings, stream;
        encoder.store(settings);
        p_.metadataFiles.push_back(std::make_unique<QvMetadataFile>());
        QvMetadataFile& file = *p_.metadataFiles.back();
        file.init(statisticsName(base, i), std::string_view(encoder.name()) == "divxvenc");
        stream.set("codec", encoder.name());
        QV_ASSERT_MSG(pipe.addVideoStream(stream) >= 0, "Transcoder._analyze: failed to add stream");
        QvVideoEncoder& twin = *pipe.videoEncoder(i);
        twin.restore(settings);
        twin.setParam("meta", statisticsOf(file));
        twin.setParam("firstPass", Any(1));

        pass.links.push_back({std::make_unique<TransVLink>(), &link});
        TransVLink& made = *pass.links.back().twin;
        if (made.init(link.decoder(), link.decStreamNr(), &pipe, i) != QvStatus::ok) return QvStatus::failed;
        pipe.videoStream(i)->setEnabled(true);
        if (made.open(&params.at(i).asDict()) != QvStatus::ok) return QvStatus::failed;
    }
    return QvStatus::ok;
}

int QvTranscodeRun::runFirstPass(FirstPass& pass) {
    double rate = 0;
    const int total = totalFrames(*p_.task, rate);
    QvProgressReport progress(p_.progress, total, rate);
    progress.setPass(0, 0.5);
    callProgress(0);
    int result = QvStatus::ok;
    p_.times.begin(QvTimer::time());
    for (bool done = false; !done && !stopping();) {
        done = true;
        for (FirstPass::Link& link : pass.links) {
            if (link.twin->finished()) continue;
            result = link.twin->processFrame(0);
            p_.times.step(QvTimer::time());
            if (result != QvStatus::ok) {
                stopLoop();
                break;
            }
            done = done && link.twin->finished();
        }
        double part = 0;
        if (progress.due(QvTimer::time(), part) && !stopping()) callProgress(part);
        callProcess();
        if (!stopping()) waitWhilePaused();
    }
    return result;
}

// The real encoders take the statistics, and the inputs go back to where they were.
int QvTranscodeRun::endFirstPass(const FirstPass& pass) {
    int result = QvStatus::ok;
    for (size_t i = 0; i < pass.links.size(); ++i) {
        TransLink& link = *pass.links[i].real;
        if (!stopping())
            p_.task->encoder()
                ->videoEncoder(link.encStreamNr())
                ->setParam("meta", statisticsOf(*p_.metadataFiles[i]));
        const MediaTime in = link.inPoint();
        qv_dbg()->debug("Analyze, seeking stream %d to %f seconds", link.decStreamNr(), in.seconds());
        result |= link.decoder()->seek(in, 1, link.decStreamNr());
    }
    return result;
}
