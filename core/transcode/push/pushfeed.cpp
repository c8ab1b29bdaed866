#include <algorithm>
#include <climits>
#include <cstring>
#include <new>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/rows_p.h"
#include "core/transcode/push/pushfeed_p.h"

void qvCopyPixels(QvFrame& to, const QvFrame& from) {
    if (to.total_bytes() == from.total_bytes()) {
        std::memcpy(to.plane(), from.plane(), static_cast<std::size_t>(from.total_bytes()));
        return;
    }
    for (int p = 0; p < from.planes(); ++p) {
        const int row = std::min(to.stride(p), from.stride(p));
        if (row <= 0) continue;
        const int rows = std::min(to.plane_bytes(p) / to.stride(p), from.plane_bytes(p) / from.stride(p));
        qvrows::copy(to.plane(p), to.stride(p), from.plane(p), from.stride(p), row, rows);
    }
}

// --- FrameBuffer

int FrameBuffer::init(int frames, unsigned fourcc, int width, int height, const QvFramerate& rate) {
    fourcc_ = fourcc;
    width_ = width;
    height_ = height;
    rate_ = rate;
    return grow(frames);
}

int FrameBuffer::grow(int by) {
    std::vector<QvFrame*> longer;
    try {
        longer.reserve(frames_.size() + static_cast<std::size_t>(by));
        for (int i = 0; i < by; ++i) {
            auto frame = std::make_unique<QvFrame>();
            if (const int result = frame->init(fourcc_, width_, height_)) return result;
            frame->framerate = rate_;
            free_.push_back(frame.get());
            frames_.push_back(std::move(frame));
        }
    } catch (const std::bad_alloc&) {
        return QvStatus::outOfMemory;
    }
    for (std::size_t i = 0; i < filled_; ++i) longer.push_back(queue_[(first_ + i) % queue_.size()]);
    longer.resize(frames_.size());
    queue_.swap(longer);
    first_ = 0;
    return QvStatus::ok;
}

bool FrameBuffer::fits(const QvFrame& frame) const {
    return frame.inited() && frame.width() == width_ && frame.height() == height_ &&
           qvEqualFourcc(frame.four_cc(), fourcc_);
}

int FrameBuffer::write(const QvFrame& frame) {
    QV_ASSERT_MSG(!frames_.empty(), "[FrameBuffer] Not initialized");
    if (free_.empty()) {
        const int more = static_cast<int>(std::min<std::size_t>(frames_.size(), INT_MAX / 2));
        qv_dbg()->warning("[FrameBuffer] *** Growing buffer to %d frames", 2 * more);
        if (const int result = grow(more)) return result;
    }
    QvFrame* slot = free_.back();
    free_.pop_back();
    qvCopyPixels(*slot, frame);
    slot->copyMeta(frame);
    slot->framerate = rate_;
    queue_[(first_ + filled_++) % queue_.size()] = slot;
    return QvStatus::ok;
}

void FrameBuffer::read(QvFrame& to) {
    QV_ASSERT_MSG(!frames_.empty() && filled_ > 0, "[FrameBuffer] Not initialized");
    QvFrame* oldest = queue_[first_];
    first_ = (first_ + 1) % queue_.size();
    --filled_;
    qvCopyPixels(to, *oldest);
    to.copyMeta(*oldest);
    free_.push_back(oldest);
}

void FrameBuffer::clear() {
    for (; filled_ > 0; --filled_, first_ = (first_ + 1) % queue_.size()) free_.push_back(queue_[first_]);
}

// --- SampleBuffer

int SampleBuffer::init(int capacity, int sampleBytes) {
    const long long bytes = static_cast<long long>(capacity) * sampleBytes;
    if (bytes > INT_MAX) return QvStatus::outOfMemory;
    try {
        data_.resize(static_cast<std::size_t>(bytes));
    } catch (const std::bad_alloc&) {
        return QvStatus::outOfMemory;
    }
    capacity_ = capacity;
    sampleBytes_ = sampleBytes;
    return QvStatus::ok;
}

int SampleBuffer::write(const unsigned char* samples, int count) {
    const auto bytes = [this](long long n) { return static_cast<std::size_t>(n * sampleBytes_); };
    long long capacity = capacity_;
    while (static_cast<long long>(buffered_) + count > capacity) {
        capacity = count > 2 * capacity ? (count / capacity + 1) * capacity : 2 * capacity;
        qv_dbg()->warning("[SampleBuffer] *** Growing to %lld samples", capacity);
    }
    if (first_ > 0 && static_cast<long long>(first_) + buffered_ + count > capacity_) {
        std::memmove(data_.data(), data_.data() + bytes(first_), bytes(buffered_));
        first_ = 0;
    }
    if (capacity > capacity_) {
        if (capacity > INT_MAX) return QvStatus::outOfMemory;
        try {
            data_.resize(bytes(capacity));
        } catch (const std::exception&) {
            return QvStatus::outOfMemory;
        }
        capacity_ = static_cast<int>(capacity);
    }
    if (count > 0) std::memcpy(data_.data() + bytes(first_ + buffered_), samples, bytes(count));
    buffered_ += count;
    return QvStatus::ok;
}

void SampleBuffer::read(unsigned char* to, int count) {
    QV_ASSERT_MSG(count <= buffered_, "not enough data");
    const auto width = static_cast<std::size_t>(sampleBytes_);
    std::memcpy(to, data_.data() + static_cast<std::size_t>(first_) * width,
                static_cast<std::size_t>(count) * width);
    buffered_ -= count;
    first_ = buffered_ > 0 ? first_ + count : 0;
}
