// Converts the width of samples, to and from the 32-bit values between the stages of a chain.
//
//   "outBitsPerSample"   int      24       8, 16, 20, 24 or 32; 20 bits take 3 bytes like 24
//   "dither"             string   "none"   "none": lower bits are cut off; "triangular": 8 and 16 bits get
//                                          noise of triangular distribution, two steps wide, before they
//                                          are rounded. It is the same in every run
//   "clipWarning"        flag     1        whether clipped values are warned of, once per open
//   "clippedSamples"     int64    0        read-only: how many values were clipped since open
//
// Sound of the same width is copied. Values out of range take the nearest bound.
#pragma once

#include "builtin/sound/storedfilter.h"

struct AquantSettings {
    enum Dither { none, triangular };

    int outBits = 24;
    Dither dither = none;
    bool clipWarning = true;
    long long clipped = 0;  // values
};

class QvAquant : public StoredFilterOf<AquantSettings> {
  public:
    QvAquant();

    int open() override;
    int write(QvPcm& pcm) override;

  private:
    bool narrow(unsigned char* to, const int32_t* from, size_t count, int bytes);

    bool clipReported_ = false;
    uint32_t ditherPlace_ = 0;  // values that were dithered so far, modulo 2^32
};
