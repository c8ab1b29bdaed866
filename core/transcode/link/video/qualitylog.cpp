#include "core/transcode/link/video/qualitylog_p.h"

#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"

namespace {

constexpr char statistics[] = "getQualityStats";

}  // namespace

QualityLog::QualityLog(const AnyVector& logs) : setup_(logs), logger_(std::make_unique<QvPSNRLogger>()) {}

QualityLog::~QualityLog() = default;

std::unique_ptr<QualityLog> QualityLog::start(const AnyVector& logs, QvEncodePipe& pipe, int stream) {
    if (logs.empty()) return nullptr;
    auto& encoder = *pipe.videoEncoder(stream);
    qvSetOptionalParam(encoder, statistics, 1);
    if (!encoder.getParam(statistics).isTrue()) {
        qv_log()->error("Encoder %s does not support PSNR logging.", encoder.name());
        return nullptr;
    }
    std::unique_ptr<QualityLog> log(new QualityLog(logs));
    auto* muxer = pipe.getMuxer();
    const bool hasStream = muxer && stream < muxer->nrStreams(qvVideoStream);
    auto* to = hasStream ? muxer->stream(qvVideoStream, stream) : nullptr;
    if (log->logger_->startLogging(to, log->setup_) == QvStatus::ok) return log;
    qvSetOptionalParam(encoder, statistics, 0);
    qv_log()->error("Can not start logging.");
    return nullptr;
}

void QualityLog::finish(QvEncodePipe& pipe, int stream) {
    if (auto* encoder = pipe.videoEncoder(stream)) qvSetOptionalParam(*encoder, statistics, 0);
    logger_->writeLog();
    logger_->stopLogging();
}
