// A multiplexer that puts nothing into its sink, since it writes files of its own, or none.
#pragma once

#include "core/encode/basemuxer.h"

// An attached sink is informed that it has nothing to write.
class OwnFilesMuxer : public BaseMuxer {
  public:
    int attachOutStream(QvBufStream* stream) override;
    int detachOutStream() override;
};
