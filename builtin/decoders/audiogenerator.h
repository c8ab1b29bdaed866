// An audio stream of the test generator: a beep each second, 16-bit stereo at 44100 Hz, or silence in the
// format that the description asks for.
#pragma once

#include "builtin/decoders/generatorstream.h"
#include "core/media/qvpcm.h"

// A sound that is repeated until a total is delivered.
class SoundLoop {
  public:
    // At most `length` samples of the sound, then silence up to `length`; `total` is to be delivered.
    int init(const QvPcm& sound, int length, long long total);

    long long left() const { return total_ - delivered_; }
    long long total() const { return total_; }
    void setTotal(long long total) { total_ = total; }
    void seek(long long sample);
    // The next `count` samples.
    void copy(unsigned char* to, int count);

  private:
    QvPcm sound_;
    int position_ = 0;
    int length_ = 0;
    long long total_ = 0;
    long long delivered_ = 0;
};

class AudioGenerator : public GeneratorStream {
  public:
    int init(const AnyDict& dict) override;
    void close() override;
    void setDuration(const MediaTime& length) override;

    int readSamples(int count);          // as QvDecodePipe::readSamples
    int seekToSample(long long sample);  // asserts that it lies below the total
    long long samples() const { return samples_; }
    QvPcm* output() { return &output_; }

  private:
    SoundLoop loop_;
    QvPcm output_;
    long long samples_ = 0;
    int samplerate_ = 0;
    int channels_ = 0;

    void countSamples();
    int takeFormat(const AnyDict& dict, QvPcmFormat& format);
};
