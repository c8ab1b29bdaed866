#include "core/filter/qvprocessutil.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/job/jobdescription.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/qvbufstrm.h"

namespace {

bool hasDeinterlacer(const QvVProcessPipe* pipe) {
    return pipe && (pipe->filter("deinterlace", 0) || pipe->filter("bobber", 0));
}

const char* cropModeName(int mode) {
    if (mode == 5) return "pad_16_9_to_4_3";
    if (mode == 4) return "crop_16_9_to_4_3";
    return "scale";
}

std::vector<QvAudioFilter*> filtersThatNeedReport(const QvAProcessPipe& pipe) {
    std::vector<QvAudioFilter*> filters;
    for (int i = 0; i < pipe.nrFilters(); ++i)
        if (pipe.filter(i)->getParam("_needsReport").isTrue()) filters.push_back(pipe.filter(i));
    return filters;
}

}  // namespace

void QvProcessUtil::adjustVideoEncoder(const VideoJobDescription& job, QvVProcessPipe* pipe,
                                       QvEncodePipe* encoderPipe, int encoderStream) {
    auto* encoder = encoderPipe->videoEncoder(encoderStream);
    if (!encoder) return;
    const bool remainsInterlaced =
        job.outFramerate.interlaced() == 0 && job.inFramerate.interlaced() != 0 && !hasDeinterlacer(pipe);
    if (encoder->getParam("canDeinterlace").isTrue()) {
        if (remainsInterlaced) qv_dbg()->debug("video encoder %s will deinterlace video", encoder->name());
        encoder->setParam("deinterlaceVideo", remainsInterlaced ? 1 : 0);
    } else if (remainsInterlaced) {
        qv_log()->warning(
            "Input video is interlaced, while output is progressive. Suggesting usage of deinterlace filter");
    }
    auto* cropper = pipe ? pipe->filter("cropper", 0) : nullptr;
    if (!cropper) return;
    qvSetOptionalParam(*encoder, "cropMode", cropModeName(cropper->getParam("mode").asInt32(0)));
}

void QvProcessUtil::applyStreamReport(QvAProcessPipe* pipe, QvDecodePipe* decoder, int decoderStream,
                                      long long from, long long to) {
    const auto filters = filtersThatNeedReport(*pipe);
    if (filters.empty()) return;
    qv_log()->info("Obtaining input stream report, needed by some of the audio filters");
    const auto* report = decoder->getAudioStreamReport(decoderStream);
    if (!report) {
        qv_log()->error("Can not get audio stream report");
        return;
    }
    AnyDict levels;
    levels.set("peakLeveldB", report->peakdB(from, to));
    for (auto* filter : filters) {
        try {
            filter->setParam("_streamReport", levels);
        } catch (const QvParamException&) {
            qv_log()->error(
                "Filter %s claimed that it needs stream report by '_needsReport' getParam() but does not "
                "accept '_streamReport' setParam()",
                filter->name());
        }
    }
}

void QvProcessUtil::rescaleTimePoints(const AnyVector& in, const QvFramerate& fromRate,
                                      const QvFramerate& toRate, AnyVector* out) {
    QV_ASSERT(out);
    if (in.empty()) return;
    QV_ASSERT(in.at(0).isInt());
    const bool narrow = in.at(0).isInt32();
    const AnyVector points = in;  // `out` may be the same vector
    out->clear();
    for (int i = 0; i < points.size(); ++i) {
        const long long point =
            QvRatio::multyplyByRatio(points.at(i).toInt64(), toRate.rate(), fromRate.rate());
        out->append(narrow ? Any(static_cast<int>(point)) : Any(point));
    }
}

void QvProcessUtil::calculateSRAudioDelayCorrections(QvMuxer* muxer, AnyDict& dict) {
    dict.clear();
    if (!muxer) return;
    const int videoStreams = muxer->nrStreams(qvVideoStream);
    const int audioStreams = muxer->nrStreams(qvAudioStream);
    if (videoStreams == 0 || audioStreams == 0) return;

    std::vector<long long> delays;
    for (int i = 0; i < audioStreams; ++i) {
        auto* stream = muxer->stream(qvAudioStream, i);
        auto* encoder = stream ? stream->atachee() : nullptr;
        const Any delay = encoder ? encoder->getParam("smartRenderDelay") : Any();
        delays.push_back(delay.isMediaTime() ? -delay.asMediaTime().value() : 0);
    }
    const auto [lowest, highest] = std::minmax_element(delays.begin(), delays.end());
    const long long smallest = std::min(0LL, *lowest);
    if (smallest == 0 && *highest <= 0) return;

    AnyVector video;
    for (int i = 0; i < videoStreams; ++i) video.append(Any(-smallest));
    AnyVector audio;
    for (const long long delay : delays) audio.append(Any(delay - smallest));
    dict.set("video", video);
    dict.set("audio", audio);
}
