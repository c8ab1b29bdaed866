#include "builtin/sound/format/samplefifo.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"

namespace snd {

namespace {

constexpr std::size_t alignment = 64;

std::size_t bytesOf(long long values) { return static_cast<std::size_t>(values) * sizeof(double); }

}  // namespace

SampleFifo::~SampleFifo() { qv_platform().release(memory_); }

bool SampleFifo::reserve(long long samples) {
    if (samples <= capacity_) return true;
    if (samples > std::numeric_limits<int>::max() / channels_) return false;
    const long long capacity = std::max(samples, capacity_ + capacity_ / 2);
    const std::size_t bytes = bytesOf(capacity * channels_ + padding_);
    auto* memory = static_cast<double*>(qv_platform().allocate(bytes, alignment));
    if (!memory) return false;
    if (samples_ > 0) std::memcpy(memory, view(), bytesOf(samples_ * channels_));
    qv_platform().release(memory_);
    memory_ = memory;
    capacity_ = capacity;
    head_ = 0;
    return true;
}

void SampleFifo::append(const int32_t* from, long long samples) {
    QV_ASSERT(samples_ + samples <= capacity_);
    if (head_ + samples_ + samples > capacity_) {
        std::memmove(memory_, view(), bytesOf(samples_ * channels_));
        head_ = 0;
    }
    std::copy_n(from, samples * channels_, memory_ + (head_ + samples_) * channels_);
    samples_ += samples;
}

void SampleFifo::drop(long long samples) {
    QV_ASSERT(samples <= samples_);
    head_ += samples;
    samples_ -= samples;
}

}  // namespace snd
