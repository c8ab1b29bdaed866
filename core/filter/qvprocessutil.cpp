#include "core/filter/qvprocessutil.h"

#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/status.h"
#include "core/filter/audiochain_p.h"
#include "core/filter/chainloudness_p.h"
#include "core/filter/paramdesc_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/videochain_p.h"
#include "core/job/jobdescription.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/qvbufstrm.h"

namespace {

bool hasDeinterlacer(const QvVProcessPipe* pipe) {
    for (int i = 0; pipe && i < pipe->nrFilters(); ++i)
        if (qvModuleTraits(*pipe->filter(i)).deinterlaces) return true;
    return false;
}

const char* cropModeName(int mode) {
    if (mode == 5) return "pad_16_9_to_4_3";
    if (mode == 4) return "crop_16_9_to_4_3";
    return "scale";
}

int reportNeed(const QvAudioFilter& filter) {
    const Any need = filter.getParam("_needsReport");
    if (!need.isTrue()) return QvReportNeed::none;
    return need == Any(QvReportNeed::loudness) ? QvReportNeed::loudness : QvReportNeed::peak;
}

// A report is of samples of up to three bytes; those of a mixed input have four.
const QvAudioStreamReport* levelReport(QvDecodePipe& decoder, int stream, const QvReadWatch& watch) {
    constexpr int widest = 3;
    const bool measurable = stream >= 0 && stream < decoder.nrAudioStreams() &&
                            decoder.getAudioParam(stream, "bytesPerSample").asInt32(0) <= widest;
    return measurable ? decoder.getAudioStreamReport(stream, watch) : nullptr;
}

// Several readings in a row, shown to a watcher as one.
class ReadingSteps {
  public:
    ReadingSteps(const QvReadWatch& watch, std::ptrdiff_t count)
        : watch_(watch), count_(static_cast<double>(count)) {}

    QvReadWatch next() {
        if (!watch_) return {};
        return [this, before = done_++](double part) {
            ended_ = !watch_((before + part) / count_);
            return !ended_;
        };
    }
    bool ended() const { return ended_; }

  private:
    const QvReadWatch& watch_;
    const double count_;
    double done_ = 0;
    bool ended_ = false;
};

void giveReport(QvAudioFilter& filter, const AnyDict& levels) {
    try {
        filter.setParam("_streamReport", levels);
    } catch (const QvParamException&) {
        qv_log()->error(
            "Filter %s claimed that it needs stream report by '_needsReport' getParam() but does not "
            "accept '_streamReport' setParam()",
            filter.name());
    }
}

}  // namespace

QvVProcessPipe* QvProcessUtil::createVideoPipe(const VideoJobDescription& job) {
    return createVideoPipeAux(job, nullptr, false);
}

QvVProcessPipe* QvProcessUtil::createVideoPipeMV(const VideoJobDescription& job, int nrViews) {
    if (nrViews < 2) return createVideoPipe(job);
    std::unique_ptr<QvVProcessPipe> pipe(createVideoPipeAux(job, "mvprocess", true));
    if (!pipe) return nullptr;
    pipe->setParam("nrViews", nrViews);
    pipe->setParam("jobDescription", Any(static_cast<const void*>(&job)));
    if (pipe->open() == QvStatus::ok) return pipe.release();
    qv_dbg()->error("Can not open the video pipe for %d views: %s", nrViews, pipe->errorDesc());
    return nullptr;
}

QvVProcessPipe* QvProcessUtil::createVideoPipeAux(const VideoJobDescription& job, const char* moduleName,
                                                  bool deferOpen) {
    return qvchain::createVideoPipe(job, moduleName ? moduleName : "vprocess", deferOpen).release();
}

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

QvAProcessPipe* QvProcessUtil::createAudioPipe(const AudioJobDescription& job, MediaTime& delayOut) {
    return qvchain::createAudioPipe(job, delayOut).release();
}

bool QvProcessUtil::applyStreamReport(QvAProcessPipe* pipe, QvDecodePipe* decoder, int decoderStream,
                                      long long from, long long to, const QvReadWatch& watch) {
    std::vector<int> needs;
    for (int i = 0; i < pipe->nrFilters(); ++i) needs.push_back(reportNeed(*pipe->filter(i)));
    const int most = needs.empty() ? QvReportNeed::none : *std::max_element(needs.begin(), needs.end());
    if (most == QvReportNeed::none) return true;
    qv_log()->info("Obtaining input stream report, needed by some of the audio filters");
    ReadingSteps steps(watch, 1 + std::count(needs.begin(), needs.end(), QvReportNeed::loudness));
    const auto* report = levelReport(*decoder, decoderStream, steps.next());
    if (steps.ended()) return false;
    if (!report) qv_log()->error("Can not get audio stream report");
    if (!report && most < QvReportNeed::loudness) return true;
    const qvchain::SoundRange range{decoder, decoderStream, from, to};
    std::vector<AnyDict> reports(needs.size());
    for (std::size_t i = 0; i < needs.size(); ++i) {
        AnyDict& levels = reports[i];
        if (needs[i] != QvReportNeed::none && report) levels.set("peakLeveldB", report->peakdB(from, to));
        // The filters before this one work with their reports already.
        std::string why;
        const bool measured = needs[i] != QvReportNeed::loudness ||
                              qvchain::measureBefore(*pipe, static_cast<int>(i), reports, {&range, 1},
                                                     steps.next(), levels, why);
        if (steps.ended()) return false;
        if (!measured)
            qv_log()->error("Can not measure the loudness for filter %s: %s",
                            pipe->filter(static_cast<int>(i))->name(), why.c_str());
        if (!levels.empty()) giveReport(*pipe->filter(static_cast<int>(i)), levels);
    }
    return true;
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

AnyDict QvProcessUtil::createParamDesc(const char* name, int type, int guiControl, const char* description,
                                       const Any& min, const Any& max, const Any& step) {
    return qvCreateParamDesc(name, type, guiControl, description, min, max, step);
}
AnyDict QvProcessUtil::createParamDesc(const char* name, int type, int guiControl, const char* description,
                                       const AnyVector& allowed) {
    return qvCreateParamDesc(name, type, guiControl, description, allowed);
}
bool QvProcessUtil::checkParamDesc(const AnyDict& desc, Any* error) { return qvCheckParamDesc(desc, error); }
