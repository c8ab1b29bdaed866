// Smart rendering of one video stream: the encoder takes coded frames from the decoder itself, and no picture
// passes through the link.
#pragma once

#include "core/measure/mediarange.h"

class QvDecodePipe;
class QvEncodePipe;
class QvVProcessPipe;
struct VideoJobDescription;

class SmartRender {
  public:
    // Switches it off on the encoder and, when it is wanted and both sides can, on again for the range.
    // `pipe` (may be null) is the conversion of the link.
    void negotiate(QvDecodePipe& decoder, int decStream, QvEncodePipe& encoder, int encStream,
                   const VideoJobDescription& job, const QvVProcessPipe* pipe, const QvFrameRange& range,
                   bool wanted);
    // Whether this step takes coded data. Video stream 0 of the output answers for all video links. It can
    // change from frame to frame, so it is asked in every step, unless stream 0 has shown in the first step
    // of the run that it knows nothing of smart rendering.
    bool isOn(const QvEncodePipe& encoder);

  private:
    enum class Answer { unknown, mayChange, never };

    Answer answer_ = Answer::unknown;
};
