// What stands between the writers of a push encoder and its worker: queues of frames and of samples.
#pragma once

#include <atomic>
#include <memory>
#include <vector>

#include "core/job/processparams.h"
#include "core/media/qvbuffer.h"

// From where the worker's decoder gets its data.
class IAVFeed {
  public:
    // The number of samples copied to `to`, fewer than `count` only at the end; QvStatus::endOfStream.
    virtual int readSamples(unsigned char* to, int count, int stream) = 0;
    virtual int readFrame(QvFrame& to, int stream) = 0;

  protected:
    ~IAVFeed() = default;
};

// Frames of one format that go round between a stack of free ones and a queue of filled ones.
class FrameBuffer {
  public:
    // 0, or the status of the frame that could not be made.
    int init(int frames, unsigned fourcc, int width, int height, const QvFramerate& rate);
    bool fits(const QvFrame& frame) const;
    int write(const QvFrame& frame);  // doubles the buffer when no frame is free
    void read(QvFrame& to);           // the oldest; there must be one
    bool empty() const { return filled_ == 0; }
    void clear();

  private:
    int grow(int by);

    std::vector<std::unique_ptr<QvFrame>> frames_;
    std::vector<QvFrame*> free_;
    std::vector<QvFrame*> queue_;  // a ring with room for all frames
    std::size_t first_ = 0;
    std::size_t filled_ = 0;
    unsigned fourcc_ = 0;
    int width_ = 0;
    int height_ = 0;
    QvFramerate rate_;
};

// Samples of one format, in the order in which they came.
class SampleBuffer {
  public:
    int init(int capacity, int sampleBytes);
    int write(const unsigned char* samples, int count);  // grows as needed
    void read(unsigned char* to, int count);             // no more than are there
    int buffered() const { return buffered_; }
    void clear() { first_ = buffered_ = 0; }

  private:
    std::vector<unsigned char> data_;
    int sampleBytes_ = 0;
    int capacity_ = 0;  // in samples, as the following
    int first_ = 0;
    int buffered_ = 0;
};

// The part that both kinds of stream have.
struct PushStream {
    ProcessParams process;
    bool end = false;                  // under the lock of its kind
    std::atomic<bool> waiting{false};  // the worker is, for this stream
};

struct VStream : PushStream {
    FrameBuffer buffer;
};

struct AStream : PushStream {
    int channels = 0;
    int bytesPerSample = 0;
    SampleBuffer buffer;
};

// Whole pictures between frames of one format, the chroma of every format included.
void qvCopyPixels(QvFrame& to, const QvFrame& from);
