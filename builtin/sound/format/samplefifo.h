// Samples on their way into a rate converter. They lie together, whatever is added and dropped, as doubles:
// the sums that are made of them are the fastest that way, and exact.
#pragma once

#include <cstdint>

namespace snd {

class SampleFifo {
  public:
    // `padding`: values after the last one that a reader may read, but whose contents mean nothing.
    SampleFifo(int channels, int padding) : channels_(channels), padding_(padding) {}
    ~SampleFifo();
    SampleFifo(const SampleFifo&) = delete;
    SampleFifo& operator=(const SampleFifo&) = delete;

    // Room for so many samples in all. False without memory: nothing has changed then.
    bool reserve(long long samples);
    // The room must be there.
    void append(const int32_t* from, long long samples);
    void drop(long long samples);  // from the front, at most all

    const double* view() const { return memory_ + head_ * channels_; }
    long long samples() const { return samples_; }

  private:
    int channels_, padding_;
    double* memory_ = nullptr;
    long long capacity_ = 0, head_ = 0, samples_ = 0;  // in samples
};

}  // namespace snd
