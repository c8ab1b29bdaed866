// MemMux: hands the access units of its streams to the queue of a memory sink. Module "memmux".
#pragma once

#include "core/encode/basemuxer.h"

// An item of the queue carries its kind (VIDEO_AU_CODE, AUDIO_AU_CODE), not the number of its stream.
class MemMux : public BaseMuxer {
  public:
    QvBufStream* addStream(int type, const AnyDict& params) override;
    // -1 when the attached stream has no queue.
    int open() override;
    int close() override;

  private:
    void end();
};
