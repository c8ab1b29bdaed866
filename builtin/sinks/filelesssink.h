// A sink without a file.
#pragma once

#include "core/encode/qvsink.h"

// One can take the place of a file sink, so that one's parameters are accepted, without effect.
class FilelessSink : public QvSink {
  public:
    int setParam(const char* name, const Any& value) override;
};
