// Makes channels out of others.
//
//   "connMatrix"   Vector   an entry for each output channel, at most 16:
//                           an integer from 0 on    that input channel
//                           -1 or -2                silence
//                           a Vector of integers    the mean of these, at most 16, where -1 and -2 count as
//                                                   silence; empty: silence
//
// Samples are 32 bits wide. The mean of two rounds down, that of more toward zero; sums are taken modulo
// 2^32.
#pragma once

#include <vector>

#include "builtin/sound/storedfilter.h"

struct ChConvertSettings {
    AnyVector matrix;
};

class ChConvert : public StoredFilterOf<ChConvertSettings> {
  public:
    ChConvert();

    // -1 for a matrix that makes no sense.
    int open() override;
    // -1 for a sound without a channel that the matrix names.
    int write(QvPcm& pcm) override;

  private:
    using Sources = std::vector<int>;  // of an output channel; none: silence

    int readMatrix();

    std::vector<Sources> sources_;
    int highest_ = -1;  // the highest input channel that is named
};
