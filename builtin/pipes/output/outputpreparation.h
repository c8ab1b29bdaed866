// What the members of an output take from each other before it is opened.
#pragma once

#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"

class OutputPreparation {
  public:
    // Both are borrowed for the life of the object.
    OutputPreparation(const OutputStreams& streams, const MuxerPlace& end) : streams_(streams), end_(end) {}

    // Sizes of buffers, the frame rate, the limit of bit rates, and what audio encoders need in a
    // multiplexer of many programs. Members that lack a parameter are passed over.
    void run() const;

  private:
    void sizeBuffers() const;
    void spreadFramerate() const;
    void limitBitrate() const;
    void adjustAudio() const;

    const OutputStreams& streams_;
    const MuxerPlace& end_;
};
