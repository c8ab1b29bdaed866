// How the levels of pictures are spread, and where they leave the range that is meant for them.
//
//     QvHistogram levels;
//     while (next(frame)) levels.add(frame);
//     double clipped = levels.channel(0).share(levels.channel(0).above);
//
// Formats are those of QvQualityMeter; 16-bit samples count by their upper 10 bits. One thread at a time.
#pragma once

#include <array>
#include <vector>

#include "core/arch/api.h"

class QvFrame;

class QV_API QvHistogram {
  public:
    struct QV_API Channel {
        char name = 'Y';  // Y, U, V, R, G, B
        // The levels that are meant for pictures: luma 16 to 235, chroma 16 to 240, RGB all of them; of 1024
        // levels four times that.
        int lowest = 0, highest = 255;
        std::vector<long long> counts;  // samples at each level: 256 or 1024
        long long samples = 0;
        long long below = 0;  // the levels that are meant
        long long above = 0;
        long long atFloor = 0;  // at the first and at the last level that there is
        long long atCeiling = 0;

        int min() const;  // the first level with a sample, -1 without any
        int max() const;
        double mean() const;  // level; 0 without samples
        // The level below which `part` (0 to 1) of the samples lie; -1 without any.
        int percentile(double part) const;
        double share(long long count) const;  // of all samples, 0 to 1
    };

    // All samples of a picture. 0; QvStatus::invalidArgument for an empty one and for one of other channels
    // than those before, QvStatus::notSupported for a format that has none.
    int add(const QvFrame& frame);
    void clear();
    int channels() const { return count_; }
    const Channel& channel(int index) const;  // an assertion out of range

    // The waveform of a picture: for each column how often each level occurs in it, from black at 0 to full
    // at `full` samples (0: a tenth of the rows). Channels stand side by side, each 256 rows high with level
    // 0 at the bottom, in its own colour; the lowest and the highest level that are meant are lines. `out`
    // becomes BGR3. Statuses as of add, and QvStatus::outOfMemory.
    static int waveform(const QvFrame& frame, QvFrame& out, int full = 0);

  private:
    int count_ = 0;
    std::array<Channel, 3> channels_;
};
