// The buffer in which decoded sound moves.
#pragma once

#include <memory>

#include "core/arch/api.h"

class AnyVector;

// A format of sound, as three plain numbers.
struct QvPcmFormat {
    int samplerate = 0;
    int channels = 0;
    int bitsPerSample = 0;
};

// Interleaved PCM of one format. One sample means one sample of every channel: the value of channel c of
// sample i lies at byte (i * channels + c) * bytesPerSample. One-byte values are unsigned with silence at
// 128; wider ones are signed, little-endian, with silence at 0.
//
// Assigning or copying is shallow: both objects then name one buffer, and what one writes into it the other
// reads. The buffer lives as long as the last of them; one that has to grow while others name its buffer
// moves to a buffer of its own. Operations that need the format assert "QvPcm not inited" on an empty object.
// One thread at a time.
class QV_API QvPcm {
  public:
    QvPcm() = default;
    QvPcm(const QvPcm& other) = default;
    QvPcm& operator=(const QvPcm& other) = default;
    ~QvPcm() = default;

    // Room for `size` samples, zeroed, of which none is filled. 0, or -3 without memory, for a negative size,
    // fewer than one channel or byte, or above 2 GB.
    int init(int size, int channels, int bytesPerSample, int samplerate);
    void destroy();
    bool inited() const { return inited_; }

    int samples() const { return samples_; }  // filled, from the start of the buffer
    void setSamples(int samples);             // 0 to size(), otherwise an assertion
    int size() const { return size_; }        // capacity in samples
    int channels() const { return channels_; }
    int bytesPerSample() const { return bytesPerSample_; }  // of one channel's value
    int samplerate() const { return samplerate_; }
    // Position in the stream, kept by whatever fills the buffer: the sample after the last one in it.
    long long position() const { return position_; }
    void setPosition(long long position) { position_ = position; }
    void copyMeta(const QvPcm& other);  // samplerate and position only

    // Address of a sample of the capacity; "Invalid sample" is the assertion for any other.
    unsigned char* ptr(int sample);
    const unsigned char* ptr(int sample) const;

    // --- Contents. The capacity grows by exactly what is missing.
    int grow(int n);   // capacity plus n; the new size, or -3 above 2 GB. The new samples are not cleared
    int erase(int n);  // drops the first n filled samples. 0
    void clear();      // zeroes the whole capacity; the filled count stays
    int write(int n, const unsigned char* src);  // appends. 0 or -3; none into a full buffer is an assertion
    int addSilence(int n);                       // appends; n below 1 does nothing. 0 or -3
    // Appends from, or copies the first n out to, one buffer per channel: Generic values of size 0, as many
    // as channels, of n values each. 1 to 4 bytes per value. 0 or -3.
    int combineWrite(int n, const AnyVector& channelPointers);
    int combineRead(int n, const AnyVector& channelPointers) const;

    // --- Units.
    int bytes() const;      // filled
    int sizeBytes() const;  // capacity
    int samples2bytes(int samples) const;
    int bytes2samples(int bytes) const;
    int ms2samples(int ms, int rate) const;
    int samples2ms(int samples, int rate) const;

  private:
    struct Block;

    int samples_ = 0;
    int size_ = 0;
    int channels_ = 0;
    int bytesPerSample_ = 0;
    unsigned char* data_ = nullptr;  // the block's memory
    long long position_ = 0;
    bool inited_ = false;
    int samplerate_ = 0;
    std::shared_ptr<Block> block_;

    void checkInited() const;
    bool fits(long long size) const;
    bool resize(int size);
    bool makeRoom(int n);
};
