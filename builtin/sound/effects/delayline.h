// The samples that a delay holds back: what goes in comes out a fixed number of samples later, and silence
// until then.
#pragma once

#include "core/media/qvpcm.h"

class DelayLine {
  public:
    // Forgets all. `length` is in samples, at least 1. Memory is taken as samples come, at most for `length`.
    void start(long long length, const QvPcmFormat& format);
    void destroy() { held_.destroy(); }
    // Takes `count` samples from `from` and writes as many, which entered `length` samples ago, to `to`; the
    // two do not overlap. 0, or -3 before anything has happened.
    int exchange(const unsigned char* from, unsigned char* to, int count);

  private:
    int append(const unsigned char* from, int count);
    void silence(unsigned char* to, int count) const;

    // A ring once it is full: the oldest sample is number next_. Before that it only grows.
    QvPcm held_;
    QvPcmFormat format_;
    long long length_ = 0;
    int next_ = 0;
};
