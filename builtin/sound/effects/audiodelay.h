// Module `adelay`: sound comes later by a number of milliseconds. The output begins with that much silence
// and is as long as the input, so the input's last samples are lost. Samples of any width.
//
// A chain builder uses a delay of 0 or below as an offset into the input and leaves the filter out; written
// to all the same, such a filter hands samples on unchanged.
#pragma once

#include "builtin/sound/effects/delayline.h"
#include "builtin/sound/soundfilter.h"

struct AudioDelaySettings {
    int delay = 0;  // ms
};

class QvADelay : public SoundFilterOf<AudioDelaySettings> {
  public:
    QvADelay();

    int open() override;
    int close() override;
    void store(AnyDict& dict) const override;
    // Takes "delay" only as an Int32.
    int restore(const AnyDict& dict) override;
    int write(QvPcm& pcm) override;

  private:
    int pass(const QvPcm& pcm, unsigned char* room);

    DelayLine line_;
    bool started_ = false;   // something was written since open
    bool delaying_ = false;  // the line is in use
};
