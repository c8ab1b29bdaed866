#include "core/media/qvpcm.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <limits>
#include <new>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/value/anycontainer.h"

namespace {

using Byte = unsigned char;

constexpr int silence8 = 128;

std::size_t byteCount(long long size, int channels, int bytesPerSample) {
    return static_cast<std::size_t>(size) * static_cast<std::size_t>(channels) *
           static_cast<std::size_t>(bytesPerSample);
}

// Copies n values of `width` bytes; distances in bytes.
template <int width>
void copyValues(Byte* to, std::size_t toStep, const Byte* from, std::size_t fromStep, int n) {
    for (int i = 0; i < n; ++i, to += toStep, from += fromStep) std::memcpy(to, from, width);
}

using CopyValues = void (*)(Byte*, std::size_t, const Byte*, std::size_t, int);

CopyValues copyOfWidth(int bytesPerSample) {
    constexpr CopyValues copies[] = {copyValues<1>, copyValues<2>, copyValues<3>, copyValues<4>};
    QV_ASSERT(bytesPerSample >= 1 && bytesPerSample <= 4);
    return copies[bytesPerSample - 1];
}

Byte* channelPointer(const AnyVector& pointers, int channel) {
    const Any& value = pointers.at(channel);
    QV_ASSERT(value.isGeneric() && value.asGeneric() != nullptr);
    return static_cast<Byte*>(value.asGeneric());
}

}  // namespace

// Memory of the C heap, so that it can be resized in place.
struct QvPcm::Block {
    Byte* memory = nullptr;

    Block() = default;
    Block(const Block&) = delete;
    Block& operator=(const Block&) = delete;
    ~Block() { std::free(memory); }

    bool resize(std::size_t bytes) {
        auto* moved = static_cast<Byte*>(std::realloc(memory, std::max<std::size_t>(bytes, 1)));
        if (moved) memory = moved;
        return moved != nullptr;
    }
    bool zeroed(std::size_t bytes) {
        memory = static_cast<Byte*>(std::calloc(std::max<std::size_t>(bytes, 1), 1));
        return memory != nullptr;
    }
};

int QvPcm::init(int size, int channels, int bytesPerSample, int samplerate) {
    destroy();
    if (size < 0 || channels < 1 || bytesPerSample < 1) return QvStatus::outOfMemory;
    channels_ = channels;
    bytesPerSample_ = bytesPerSample;
    auto block = fits(size) ? std::make_shared<Block>() : nullptr;
    if (!block || !block->zeroed(byteCount(size, channels, bytesPerSample))) {
        destroy();
        return QvStatus::outOfMemory;
    }
    block_ = std::move(block);
    data_ = block_->memory;
    size_ = size;
    samplerate_ = samplerate;
    inited_ = true;
    return QvStatus::ok;
}

void QvPcm::destroy() { *this = QvPcm(); }

void QvPcm::checkInited() const { QV_ASSERT_MSG(inited_, "QvPcm not inited"); }

// Whether the bytes of so many samples can be counted in an int.
bool QvPcm::fits(long long size) const {
    constexpr long long maxBytes = std::numeric_limits<int>::max();
    return size >= 0 && size <= maxBytes / channels_ / bytesPerSample_;
}

// Other objects that name the old block keep it.
bool QvPcm::resize(int size) {
    const std::size_t bytes = byteCount(size, channels_, bytesPerSample_);
    if (block_.use_count() == 1) {
        if (!block_->resize(bytes)) return false;
    } else {
        auto own = std::make_shared<Block>();
        if (!own->resize(bytes)) return false;
        std::memcpy(own->memory, data_, byteCount(std::min(size, size_), channels_, bytesPerSample_));
        block_ = std::move(own);
    }
    data_ = block_->memory;
    size_ = size;
    samples_ = std::min(samples_, size);
    return true;
}

bool QvPcm::makeRoom(int n) {
    checkInited();
    QV_ASSERT(n >= 0);
    const long long needed = static_cast<long long>(samples_) + n;
    return needed <= size_ || (fits(needed) && resize(static_cast<int>(needed)));
}

int QvPcm::grow(int n) {
    checkInited();
    const long long size = static_cast<long long>(size_) + n;
    if (!fits(size)) return QvStatus::outOfMemory;
    QV_ASSERT_MEMORY(resize(static_cast<int>(size)), nullptr);
    return size_;
}

int QvPcm::erase(int n) {
    if (n <= 0) return QvStatus::ok;
    if (n < samples_) std::memmove(ptr(0), ptr(n), static_cast<std::size_t>(samples2bytes(samples_ - n)));
    samples_ = std::max(samples_ - n, 0);
    return QvStatus::ok;
}

void QvPcm::clear() { std::memset(data_, 0, static_cast<std::size_t>(sizeBytes())); }

int QvPcm::write(int n, const unsigned char* src) {
    checkInited();
    // The source may lie in this buffer, which may move.
    const bool own = std::greater_equal<>()(src, static_cast<const Byte*>(data_)) &&
                     std::less<>()(src, static_cast<const Byte*>(data_) + sizeBytes());
    const std::ptrdiff_t offset = own ? src - data_ : 0;
    if (!makeRoom(n)) {
        qv_log()->error("[QvPcm] Out of memory");
        return QvStatus::outOfMemory;
    }
    Byte* to = ptr(samples_);
    if (n > 0) std::memmove(to, own ? data_ + offset : src, static_cast<std::size_t>(samples2bytes(n)));
    samples_ += n;
    return QvStatus::ok;
}

int QvPcm::addSilence(int n) {
    if (n < 1) return QvStatus::ok;
    if (!makeRoom(n)) return QvStatus::outOfMemory;
    std::memset(ptr(samples_), bytesPerSample_ == 1 ? silence8 : 0,
                static_cast<std::size_t>(samples2bytes(n)));
    samples_ += n;
    return QvStatus::ok;
}

int QvPcm::combineWrite(int n, const AnyVector& channelPointers) {
    if (!makeRoom(n)) {
        qv_log()->error("[QvPcm] Out of memory");
        return QvStatus::outOfMemory;
    }
    const auto copy = copyOfWidth(bytesPerSample_);
    QV_ASSERT(channelPointers.size() >= channels_);
    if (n == 0) return QvStatus::ok;
    const auto value = static_cast<std::size_t>(bytesPerSample_);
    const std::size_t sample = value * static_cast<std::size_t>(channels_);
    Byte* to = ptr(samples_);
    for (int c = 0; c < channels_; ++c, to += value)
        copy(to, sample, channelPointer(channelPointers, c), value, n);
    samples_ += n;
    return QvStatus::ok;
}

int QvPcm::combineRead(int n, const AnyVector& channelPointers) const {
    checkInited();
    QV_ASSERT(n <= samples_);
    QV_ASSERT(channelPointers.size() == channels_);
    const auto copy = copyOfWidth(bytesPerSample_);
    if (n <= 0) return QvStatus::ok;
    const auto value = static_cast<std::size_t>(bytesPerSample_);
    const std::size_t sample = value * static_cast<std::size_t>(channels_);
    const Byte* from = ptr(0);
    for (int c = 0; c < channels_; ++c, from += value)
        copy(channelPointer(channelPointers, c), value, from, sample, n);
    return QvStatus::ok;
}

void QvPcm::setSamples(int samples) {
    QV_ASSERT(samples >= 0 && samples <= size_);
    samples_ = samples;
}

void QvPcm::copyMeta(const QvPcm& other) {
    samplerate_ = other.samplerate_;
    position_ = other.position_;
}

const unsigned char* QvPcm::ptr(int sample) const {
    checkInited();
    QV_ASSERT_MSG(sample >= 0 && sample < size_, "Invalid sample");
    return data_ + byteCount(sample, channels_, bytesPerSample_);
}

unsigned char* QvPcm::ptr(int sample) { return const_cast<Byte*>(std::as_const(*this).ptr(sample)); }

int QvPcm::bytes() const { return samples2bytes(samples_); }

int QvPcm::sizeBytes() const { return samples2bytes(size_); }

int QvPcm::samples2bytes(int samples) const {
    checkInited();
    return static_cast<int>(static_cast<long long>(samples) * channels_ * bytesPerSample_);
}

int QvPcm::bytes2samples(int bytes) const {
    checkInited();
    return bytes / bytesPerSample_ / channels_;
}

int QvPcm::ms2samples(int ms, int rate) const {
    checkInited();
    return static_cast<int>(static_cast<long long>(ms) * rate / 1000);
}

int QvPcm::samples2ms(int samples, int rate) const {
    checkInited();
    QV_ASSERT(rate != 0);
    return static_cast<int>(static_cast<long long>(samples) * 1000 / rate);
}
