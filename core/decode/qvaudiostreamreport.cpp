#include "core/decode/qvaudiostreamreport.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdlib>
#include <limits>
#include <new>

#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"

namespace {

// Each gives 0 .. 32768 for `count` values of all channels.
int peakOfBytes(const unsigned char* from, std::size_t count) {
    int peak = 0;
    for (std::size_t i = 0; i < count; ++i) peak = std::max(peak, std::abs(from[i] - 128));
    return peak << 8;
}

int peakOfWords(const unsigned char* from, std::size_t count) {
    int peak = 0;
    for (std::size_t i = 0; i < count; ++i) {
        const auto value = static_cast<std::int16_t>(from[2 * i] | from[2 * i + 1] << 8);
        peak = std::max(peak, std::abs(static_cast<int>(value)));
    }
    return peak;
}

int peakOfTriples(const unsigned char* from, std::size_t count) {
    int peak = 0;
    for (std::size_t i = 0; i < count; ++i, from += 3) {
        const int value = static_cast<std::int8_t>(from[2]) * 65536 + (from[1] << 8 | from[0]);
        peak = std::max(peak, std::abs(value));
    }
    return peak >> 8;
}

int peakOf(const QvPcm& pcm) {
    const unsigned char* from = pcm.ptr(0);
    const auto count = static_cast<std::size_t>(pcm.samples()) * static_cast<std::size_t>(pcm.channels());
    switch (pcm.bytesPerSample()) {
        case 1: return peakOfBytes(from, count);
        case 2: return peakOfWords(from, count);
        case 3: return peakOfTriples(from, count);
        default: QV_FAIL_PLAIN();
    }
}

}  // namespace

int QvAudioStreamReport::init(long long total, int channels, int samplerate, int bitsPerSample) {
    *this = QvAudioStreamReport();
    const long long groups = std::max(total, 0LL) / groupSamples + 1;
    if (groups > std::numeric_limits<int>::max()) return QvStatus::outOfMemory;
    try {
        peaks_.assign(static_cast<std::size_t>(groups), 0);
    } catch (const std::bad_alloc&) {
        return QvStatus::outOfMemory;
    }
    totalSamples_ = total;
    channels_ = channels;
    samplerate_ = samplerate;
    bitsPerSample_ = bitsPerSample;
    inited_ = true;
    return QvStatus::ok;
}

int QvAudioStreamReport::processGroup(const QvPcm& pcm) {
    const long long group = samplesProcessed_ / groupSamples;
    if (group >= nrGroups()) return QvStatus::failed;
    const int peak = pcm.samples() > 0 ? peakOf(pcm) : 0;
    peaks_[static_cast<std::size_t>(group)] = static_cast<std::uint16_t>(peak);
    samplesProcessed_ += pcm.samples();
    return QvStatus::ok;
}

double QvAudioStreamReport::peakdB(long long from, long long to) const {
    const long long first = std::max(from / groupSamples, 0LL);
    const long long last = std::min<long long>(to / groupSamples, nrGroups() - 1);
    int peak = 0;
    for (long long group = first; group <= last; ++group)
        peak = std::max<int>(peak, peaks_[static_cast<std::size_t>(group)]);
    constexpr double fullScale = 1.0 / 32768;
    return peak == 0 ? silence : 20 * std::log10(peak * fullScale);
}
