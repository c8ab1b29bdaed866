// A small map of peak levels over a whole audio stream: one peak for each group of 1600 samples.
#pragma once

#include <cstdint>
#include <vector>

#include "core/arch/api.h"

class QvPcm;

class QV_API QvAudioStreamReport {
  public:
    static constexpr int groupSamples = 1600;
    static constexpr double silence = -91.0;  // dB, for a peak of 0

    // Drops what was there. `total` is in samples; one group more than `total` fills is made. 0, or
    // QvStatus::outOfMemory.
    int init(long long total, int channels, int samplerate, int bitsPerSample);

    // Enters the peak over all channels of the filled samples, at most one group, and moves on by them.
    // QvStatus::failed after the last group. Asserts values wider than three bytes.
    int processGroup(const QvPcm& pcm);

    // Highest peak of the groups in which the samples `from` to `to` lie, in dB below full scale (0 dB).
    double peakdB(long long from, long long to) const;

    bool inited() const { return inited_; }
    long long totalSamples() const { return totalSamples_; }
    int channels() const { return channels_; }
    int samplerate() const { return samplerate_; }
    int bitsPerSample() const { return bitsPerSample_; }
    long long samplesProcessed() const { return samplesProcessed_; }
    int nrGroups() const { return static_cast<int>(peaks_.size()); }
    // 0 .. 32768, whatever the width of the values.
    int peak(int group) const { return peaks_.at(static_cast<std::size_t>(group)); }

  private:
    bool inited_ = false;
    long long totalSamples_ = 0;
    int channels_ = 0;
    int samplerate_ = 0;
    int bitsPerSample_ = 0;
    long long samplesProcessed_ = 0;
    std::vector<std::uint16_t> peaks_;
};
