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

    void addLog(const Any& filename);
};
