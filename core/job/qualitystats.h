// The logs of encoding quality that a video link writes.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/value/anycontainer.h"

class QvBufStream;

// The logs to write, one dictionary each: "filename" (text).
class QV_API QvEncodingQualityStatsSetup : public AnyVector {
  public:
    QvEncodingQualityStatsSetup() = default;
    QvEncodingQualityStatsSetup(const AnyVector& logs) : AnyVector(logs) {}

    void addLog(const Any& filename) { append(AnyDict("filename", filename)); }
};

// Collects what an encoder reports of its frames on its bitstream, and writes it by the extension of the
// log's name: "csv"; "json", with the mean of all frames; any other, a line a frame with tabs. Each frame has
// its number, its size in bytes, and the statistics (doubles) in the order in which the encoder gives them:
// PSNR in dB of up to three planes, then as many SSIM. An odd number of them is PSNR alone.
class QV_API QvPSNRLogger {
  public:
    QvPSNRLogger();
    QvPSNRLogger(const QvPSNRLogger&) = delete;
    QvPSNRLogger& operator=(const QvPSNRLogger&) = delete;
    ~QvPSNRLogger();

    // Listens to `stream` (borrowed, to stopLogging at the latest). -1 without a stream, or one that can't be
    // listened to.
    int startLogging(QvBufStream* stream, const QvEncodingQualityStatsSetup& setup);
    // Writes every log of the setup; -1, with an error in the log, if one of them can't be written.
    int writeLog() const;
    void stopLogging();

  private:
    struct Private;
    std::unique_ptr<Private> p_;
};
