#include "builtin/sound/effects/delayline.h"

#include <algorithm>
#include <climits>
#include <cstring>

#include "core/engine/status.h"

namespace {

constexpr int bitsPerByte = 8;
constexpr int byteSilence = 128;  // one-byte samples are unsigned

std::size_t bytesOf(const QvPcm& pcm, int samples) {
    return static_cast<std::size_t>(pcm.samples2bytes(samples));
}

}  // namespace

void DelayLine::start(long long length, const QvPcmFormat& format) {
    held_.destroy();
    format_ = format;
    length_ = length;
    next_ = 0;
}

int DelayLine::exchange(const unsigned char* from, unsigned char* to, int count) {
    if (count < 1) return QvStatus::ok;
    if (!held_.inited()) {
        const int bytes = (format_.bitsPerSample + bitsPerByte - 1) / bitsPerByte;
        if (const int result = held_.init(0, format_.channels, bytes, format_.samplerate)) return result;
    }
    const int filling = static_cast<int>(std::min<long long>(count, length_ - held_.samples()));
    if (filling > 0) {
        if (const int result = append(from, filling)) return result;
        silence(to, filling);
        from += bytesOf(held_, filling);
        to += bytesOf(held_, filling);
        count -= filling;
    }
    // From here on the ring is full, or nothing is left to do.
    const int length = held_.samples();
    if (count > length) {
        // The ring in order, then what passes it at once; the last `length` samples replace it.
        const int tail = length - next_;
        std::memcpy(to, held_.ptr(0) + bytesOf(held_, next_), bytesOf(held_, tail));
        std::memcpy(to + bytesOf(held_, tail), held_.ptr(0), bytesOf(held_, next_));
        std::memcpy(to + bytesOf(held_, length), from, bytesOf(held_, count - length));
        std::memcpy(held_.ptr(0), from + bytesOf(held_, count - length), bytesOf(held_, length));
        next_ = 0;
        return QvStatus::ok;
    }
    while (count > 0) {
        const int part = std::min(count, length - next_);
        std::memcpy(to, held_.ptr(next_), bytesOf(held_, part));
        std::memcpy(held_.ptr(next_), from, bytesOf(held_, part));
        from += bytesOf(held_, part);
        to += bytesOf(held_, part);
        count -= part;
        next_ = next_ + part == length ? 0 : next_ + part;
    }
    return QvStatus::ok;
}

// The capacity doubles, so that a long delay is not copied at each write.
int DelayLine::append(const unsigned char* from, int count) {
    const int missing = held_.samples() - held_.size() + count;
    if (missing > 0) {
        const long long most = std::min<long long>(length_, INT_MAX) - held_.size();
        const int more = static_cast<int>(
            std::clamp<long long>(held_.size(), missing, std::max<long long>(most, missing)));
        if (held_.grow(more) < 0 && held_.grow(missing) < 0) return QvStatus::outOfMemory;
    }
    return held_.write(count, from);
}

void DelayLine::silence(unsigned char* to, int count) const {
    std::memset(to, held_.bytesPerSample() == 1 ? byteSilence : 0, bytesOf(held_, count));
}
