#include "core/transcode/link/video/smartrender_p.h"

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/job/jobdescription.h"

namespace {

// Widths of pictures that a family stores narrower than they are shown.
constexpr struct { int stored, shown; } narrowWidths[] = {{960, 1280}, {1440, 1920}};

bool isStoredNarrow(const VideoJobDescription& job) {
    for (const auto& row : narrowWidths)
        if (job.inWidth == row.stored && job.outWidth == row.shown) return true;
    return false;
}

// A pipe rules smart rendering out unless it only makes room for what the encoder lays out differently.
bool pipeAllows(const VideoJobDescription& job, const QvVProcessPipe* pipe, const QvCodec& decoder,
                const QvCodec& encoder) {
    if (!pipe) return true;
    if (pipe->nrFilters() != 1 || !qvModuleTraits(*pipe->filter(0)).onlyScales) return false;
    const bool onlyBlanks =
        job.topBlankingLines != 0 && job.inWidth == job.outWidth &&
        (job.outHeight - job.topBlankingLines == job.inHeight || job.outHeight == job.inHeight);
    const bool sameFamily = qvModuleTraits(decoder).family == CodecFamily::dv &&
                            qvModuleTraits(encoder).family == CodecFamily::dv;
    return onlyBlanks || (sameFamily && isStoredNarrow(job));
}

}  // namespace

void SmartRender::negotiate(QvDecodePipe& decoder, int decStream, QvEncodePipe& encoder, int encStream,
                            const VideoJobDescription& job, const QvVProcessPipe* pipe,
                            const QvFrameRange& range, bool wanted) {
    answer_ = Answer::unknown;
    auto* video = encoder.videoEncoder(encStream);
    QV_ASSERT(video);
    qvSetOptionalParam(*video, "smartRender", 0);
    if (!wanted || !pipeAllows(job, pipe, decoder, *video)) return;
    Any source = Pair(qvVideoStream, decStream);
    decoder.getParam("srParams", source);
    if (!source.isDict() || source.asDict().empty()) return;
    source.asDict().set("frame0", range.start);
    source.asDict().set("nrFrames", range.stop - range.start + 1);
    Any possible = source;
    video->getParam("srPossible", possible);
    // An encoder that doesn't know the question leaves it as it was.
    if (possible.isDict() || !possible.isTrue()) return;
    video->setParam("smartRender", 1);
    video->setParam("decoderStruct", source);
    // A decoder that is several others takes note of it and refuses the name.
    qvSetOptionalParam(decoder, "smartRenderingOn", Pair(qvVideoStream, decStream));
}

bool SmartRender::isOn(const QvEncodePipe& encoder) {
    if (answer_ == Answer::never) return false;
    const Any on = encoder.getParam("video0/smartRenderingOn");
    if (answer_ == Answer::unknown) {
        const bool knows = on.isValid() || encoder.getParam("video0/smartRender").isTrue();
        answer_ = knows ? Answer::mayChange : Answer::never;
    }
    return on.isTrue();
}
