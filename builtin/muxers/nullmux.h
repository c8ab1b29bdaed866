// NullMux: swallows everything; for analysis passes. Module "nullmux".
#pragma once

#include "core/encode/basemuxer.h"

class NullMux : public BaseMuxer {
  public:
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    // The sink has nothing to write; it is told so.
    int attachOutStream(QvBufStream* stream) override;
    int detachOutStream() override;
    QvBufStream* addStream(int type, const AnyDict& params) override;
    int open() override;
    int close() override;
};
