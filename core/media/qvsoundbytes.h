// The built-in sounds, for sources that need one: four clips of 16-bit stereo at 44100 Hz.
#pragma once

#include "core/arch/api.h"
#include "core/media/qvpcm.h"

// Sound 0 is a beep, 1 a bell, 2 a sweep, 3 a chord. An index that is not one of them is an assertion.
class QV_API QvSoundBytes {
  public:
    static int nrSounds();
    // Either pointer may be null.
    static void getInfo(int index, long long* samples, QvPcmFormat* format);
    // A new buffer with the whole sound, owned by the caller; null when it can't be unpacked.
    static QvPcm* create(int index);
};
