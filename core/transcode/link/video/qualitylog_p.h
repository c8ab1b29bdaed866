// The quality log of one video stream: the encoder measures, the logger writes to the stream of the
// multiplexer.
#pragma once

#include <memory>

#include "core/job/qualitystats.h"

class AnyVector;
class QvEncodePipe;
class QvPSNRLogger;

class QualityLog {
  public:
    // Switches the statistics of the encoder on. Null without logs, and, with an error for the user, where
    // the encoder has no statistics or the log can't start.
    static std::unique_ptr<QualityLog> start(const AnyVector& logs, QvEncodePipe& pipe, int stream);
    ~QualityLog();
    // Switches the statistics off and writes what was measured.
    void finish(QvEncodePipe& pipe, int stream);

  private:
    explicit QualityLog(const AnyVector& logs);

    QvEncodingQualityStatsSetup setup_;
    std::unique_ptr<QvPSNRLogger> logger_;
};
