#include "core/job/qualitystats.h"

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/job/qualitytext_p.h"
#include "core/stream/qvbufstrm.h"

namespace {

std::string textFor(const Any& name, const std::vector<QualityFrame>& frames) {
    const Any extension = QvFile::getExt(name, true).toString();
    if (extension == "csv") return qvQualityCsv(frames);
    return extension == "json" ? qvQualityJson(frames) : qvQualityLines(frames);
}

bool writeFile(const Any& name, const std::vector<QualityFrame>& frames) {
    auto* file = static_cast<std::FILE*>(qvfopen(name, "w"));
    if (!file) return false;
    const std::string text = textFor(name, frames);
    const bool failed = std::fwrite(text.data(), 1, text.size(), file) != text.size();
    return std::fclose(file) == 0 && !failed;
}

}  // namespace

// Statistics of a frame come before the item that completes its access unit.
struct QvPSNRLogger::Private : QvAuxInfoObserver {
    QvBufStream* stream = nullptr;
    QvEncodingQualityStatsSetup setup;
    std::vector<double> pending;
    std::vector<QualityFrame> frames;

    void auxInfo(unsigned, unsigned id, void* info, unsigned size) override {
        if (id == QvAuxId::STATISTIC_INFO && info) {
            pending.resize(size / sizeof(double));
            std::memcpy(pending.data(), info, pending.size() * sizeof(double));
        } else if (id == QvAuxId::VIDEO_AU_CODE) {
            unsigned bytes = 0;
            if (info && size >= sizeof bytes) std::memcpy(&bytes, info, sizeof bytes);
            frames.push_back({bytes, std::move(pending)});
            pending.clear();
        }
    }
};

QvPSNRLogger::QvPSNRLogger() : p_(std::make_unique<Private>()) {}

QvPSNRLogger::~QvPSNRLogger() { stopLogging(); }

int QvPSNRLogger::startLogging(QvBufStream* stream, const QvEncodingQualityStatsSetup& setup) {
    stopLogging();
    if (!stream || stream->registerObserver(p_.get()) != QvStatus::ok) return QvStatus::failed;
    p_->stream = stream;
    p_->setup = setup;
    p_->frames.clear();
    return QvStatus::ok;
}

int QvPSNRLogger::writeLog() const {
    int result = QvStatus::ok;
    for (const Any& log : p_->setup) {
        const Any name = log.isDict() ? log.asDict().get("filename") : Any();
        if (writeFile(name, p_->frames)) continue;
        qv_log()->error("Can not write quality log %s", name.toString().asString("n/a"));
        result = QvStatus::failed;
    }
    return result;
}

void QvPSNRLogger::stopLogging() {
    if (p_->stream) p_->stream->unregisterObserver(p_.get());
    p_->stream = nullptr;
}
