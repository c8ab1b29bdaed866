// NullMux: swallows everything; for analysis passes. Module "nullmux".
#pragma once

#include "builtin/muxers/ownfilesmuxer.h"

class NullMux : public OwnFilesMuxer {
  public:
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    QvBufStream* addStream(int type, const AnyDict& params) override;
    int open() override;
    int close() override;
};
