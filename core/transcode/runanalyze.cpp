// The first pass of a two-pass run: each video encoder that wants statistics encodes into nothing, through
// a private pipe, while a metadata file collects what it learns.
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/qvexception.h"
#include "core/engine/qvlog.h"
#include "core/engine/qvregistry.h"
#include "core/engine/qvtimer.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/preset/qvpreset.h"
#include "core/stream/qvmetadatafile.h"
#include "core/transcode/qvtranscoderun.h"
#include "core/transcode/translink.h"
#include "core/value/qvassert.h"

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

// Links of the first pass, with the real link that each stands for.
struct PassLink {
    std::unique_ptr<TransVLink> link;
    TransLink* real;
};

}  // namespace

int QvTranscodeRun::analyze() {
    p_.firstPassRunning = true;
    qv_dbg()->debug("Transcoder: Starting first (analyze) pass");
    TPtrList<TransLink> wanted;
    if (p_.task->checkMultiPass(&wanted) == 0) {
        qv_dbg()->warning("Transcoder: Two pass encoding not possible, reverting to single pass.");
        return QvStatus::ok;
    }
    QV_ASSERT(p_.metadataFiles.empty());
    const Any base = p_.metaName.isTrue() ? p_.metaName : QvUtil::makeMetaName(qv_registry()->tempDir());

    QvEncodePipe& real = *p_.task->encoder();
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    if (!pipe) return QvStatus::failed;
    if (const QvPreset* preset = real.activePreset()) pipe->applyPreset(preset->profile(), 0);
    pipe->removeStreams(qvAllStreams);
    pipe->setMuxer("nullmux");
    pipe->setFilename(Any(""));

    std::vector<PassLink> links;
    AnyVector params;
    QvTask::makeOpenParams(*p_.task, wanted, params);
    for (int i = 0; i < wanted.size(); ++i) {
        TransLink& link = *wanted.at(i);
        QvVideoEncoder& encoder = *real.videoEncoder(link.encStreamNr());
        AnyDict settings, stream;
        encoder.store(settings);
        auto file = std::make_unique<QvMetadataFile>();
        file->init(statisticsName(base, i), std::string_view(encoder.name()) == "divxvenc");
        stream.set("codec", encoder.name());
        const int added = pipe->addVideoStream(stream);
        QV_ASSERT_MSG(added >= 0, "Transcoder._analyze: failed to add stream");
        QvVideoEncoder& twin = *pipe->videoEncoder(i);
        twin.restore(settings);
        twin.setParam("meta", statisticsOf(*file));
        twin.setParam("firstPass", Any(1));
        p_.metadataFiles.push_back(std::move(file));

        links.push_back({std::make_unique<TransVLink>(), &link});
        TransVLink& pass = *links.back().link;
        if (pass.init(link.decoder(), link.decStreamNr(), pipe.get(), i) != QvStatus::ok)
            return QvStatus::failed;
        pipe->videoStream(i)->setEnabled(true);
        if (pass.open(&params.at(i).asDict()) != QvStatus::ok) return QvStatus::failed;
    }
    if (pipe->open() != QvStatus::ok) {
        qv_dbg()->log(2, "First (analyze) pass error");
        return QvStatus::failed;
    }

    double rate = 0;
    const int total = totalFrames(*p_.task, rate);
    QvProgressReport progress(p_.progress, total, rate);
    progress.setPass(0, 0.5);
    {
        p_.inCallback = true;
        t_.cbProgress(0);
        p_.inCallback = false;
    }
    int result = QvStatus::ok;
    p_.times.begin(QvTimer::time());
    for (bool done = false; !done && !stopping();) {
        done = true;
        for (PassLink& pass : links) {
            if (pass.link->finished()) continue;
            result = pass.link->processFrame(0);
            p_.times.step(QvTimer::time());
            if (result != QvStatus::ok) {
                stopLoop();
                break;
            }
            done = done && pass.link->finished();
        }
        report(progress);
        callProcess();
        if (!stopping()) waitWhilePaused();
    }
    pipe->close();

    const bool stopped = stopping();
    for (size_t i = 0; i < links.size(); ++i) {
        TransLink& link = *links[i].real;
        if (!stopped)
            real.videoEncoder(link.encStreamNr())->setParam("meta", statisticsOf(*p_.metadataFiles[i]));
        const MediaTime in = link.inPoint();
        qv_dbg()->debug("Analyze, seeking stream %d to %f seconds", link.decStreamNr(), in.seconds());
        result |= link.decoder()->seek(in, 1, link.decStreamNr());
    }
    p_.firstPassRunning = false;
    links.clear();
    if (result == QvStatus::ok)
        qv_log()->info("First (analyze) pass OK.");
    else
        qv_log()->error("First (analyze) pass error.");
    return result;
}
