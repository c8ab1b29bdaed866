#include "core/compose/qvaudiomix.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <limits>

#include "core/arch/qvassert.h"
#include "core/compose/mixkernels_p.h"
#include "core/engine/status.h"
#include "core/measure/exactmath_p.h"
#include "core/media/qvpcm.h"
#include "core/value/anytext_p.h"
#include "core/value/numbertext_p.h"

namespace {

constexpr int nothingUsed = 0x7FFFFFFF;
constexpr int valueBytes = 4;
constexpr int peak = 8388607;  // of 24 bits
constexpr double one = 65536.0;
constexpr int block = 256;      // samples that are summed at a time, so that they stay in the cache
constexpr int rowsAtOnce = 16;  // output channels
constexpr const char* className = "QvAudioMix";

const std::int32_t* valuesOf(const QvPcm& pcm, int sample) {
    return reinterpret_cast<const std::int32_t*>(pcm.ptr(sample));
}

std::size_t sizeOf(int count) { return static_cast<std::size_t>(count); }

}  // namespace

std::size_t QvAudioMix::_pair(int out, int stream) const {
    return sizeOf(out) * usedChannels_.size() + sizeOf(stream);
}

void QvAudioMix::_make(int nrOut, int nrIn, int maxChannels) {
    QV_ASSERT(nrOut > 0 && nrIn >= 0 && maxChannels >= 0);
    nrOutChannels_ = nrOut;
    maxChannels_ = maxChannels;
    usedChannels_.assign(sizeOf(nrIn), 0);
    firstChannel_.assign(sizeOf(nrOut) * sizeOf(nrIn), nothingUsed);
    coefficients_.assign(firstChannel_.size() * sizeOf(maxChannels), 0);
}

void QvAudioMix::init(int nrOut, const AnyVector& inChannels) {
    int most = 0;
    for (const Any& count : inChannels) {
        QV_ASSERT(count.isInt32() && count.asInt32() >= 0);
        most = std::max(most, count.asInt32());
    }
    _make(nrOut, inChannels.size(), most);
}

void QvAudioMix::initLinear(const AnyVector& inChannels) {
    int sum = 0;
    for (const Any& count : inChannels) sum = qvmath::wrapAdd(sum, count.asInt32(0));
    init(sum, inChannels);
    int out = 0;
    for (int stream = 0; stream < inChannels.size(); ++stream)
        for (int channel = 0; channel < inChannels.at(stream).asInt32(); ++channel)
            setWeight(out++, stream, channel, 1.0);
}

int QvAudioMix::maxNrInChannels(int stream) const {
    QV_ASSERT(stream >= 0 && stream < nrInStreams());
    return usedChannels_[sizeOf(stream)];
}

std::size_t QvAudioMix::_index(int out, int stream, int channel) const {
    QV_ASSERT(out >= 0 && out < nrOutChannels_);
    QV_ASSERT(stream >= 0 && stream < nrInStreams());
    QV_ASSERT(channel >= 0 && channel < maxChannels_);
    return _pair(out, stream) * sizeOf(maxChannels_) + sizeOf(channel);
}

void QvAudioMix::_setCoefficient(int out, int stream, int channel, std::int64_t coefficient) {
    coefficients_[_index(out, stream, channel)] = coefficient;
    int& first = firstChannel_[_pair(out, stream)];
    first = std::min(first, channel);
    int& used = usedChannels_[sizeOf(stream)];
    used = std::max(used, channel + 1);
}

void QvAudioMix::setWeight(int out, int stream, int channel, double weight) {
    const auto wide = qvmath::truncTo<std::int64_t>(weight * one + 0.5);
    _setCoefficient(out, stream, channel, static_cast<std::int32_t>(wide));
}

double QvAudioMix::weight(int out, int stream, int channel) const {
    return static_cast<double>(coefficients_[_index(out, stream, channel)]);
}

// The sums of one output channel, of samples `from` on.
void QvAudioMix::_sumOutput(int out, int from, int samples, const TPtrList<QvPcm>& in,
                            std::int32_t* sums) const {
    bool started = false;
    for (int stream = 0; stream < in.size(); ++stream) {
        const int first = firstChannel_[_pair(out, stream)];
        if (first == nothingUsed) continue;
        const QvPcm& pcm = *in.at(stream);
        const std::int64_t* weights = &coefficients_[_pair(out, stream) * sizeOf(maxChannels_)];
        // A weight of 0 adds nothing.
        for (int channel = first; channel < usedChannels_[sizeOf(stream)]; ++channel)
            if (weights[channel] != 0) {
                const auto add = started ? qvmix::addWeighted : qvmix::setWeighted;
                add(sums, valuesOf(pcm, from) + channel, sizeOf(pcm.channels()), sizeOf(samples),
                    weights[channel]);
                started = true;
            }
    }
    if (!started) std::fill_n(sums, samples, 0);
}

int QvAudioMix::mixChannels(int samples, QvPcm& out, const TPtrList<QvPcm>& in) const {
    QV_ASSERT(samples >= 0);
    if (out.size() < samples && out.grow(samples - out.size()) < 0) return QvStatus::outOfMemory;
    QV_ASSERT(out.channels() == nrOutChannels_ && out.bytesPerSample() == valueBytes);
    QV_ASSERT(in.size() <= nrInStreams());
    for (int stream = 0; stream < in.size(); ++stream) {
        const QvPcm& pcm = *in.at(stream);
        QV_ASSERT(pcm.samples() >= samples && pcm.bytesPerSample() == valueBytes);
        QV_ASSERT(pcm.channels() >= usedChannels_[sizeOf(stream)]);
    }
    out.setSamples(samples);
    std::int32_t rows[rowsAtOnce * block];
    for (int from = 0; from < samples; from += block) {
        const int count = std::min(block, samples - from);
        auto* to = reinterpret_cast<std::int32_t*>(out.ptr(from));
        for (int first = 0; first < nrOutChannels_; first += rowsAtOnce) {
            const int channels = std::min(rowsAtOnce, nrOutChannels_ - first);
            for (int channel = 0; channel < channels; ++channel)
                _sumOutput(first + channel, from, count, in, rows + channel * block);
            qvmix::interleave(to + first, sizeOf(nrOutChannels_), rows, block, channels, sizeOf(count));
        }
    }
    if (samples == 0) return QvStatus::ok;
    auto* values = reinterpret_cast<std::int32_t*>(out.ptr(0));
    for (int i = 0; i < samples; ++i) values[i] = std::clamp(values[i], -peak - 1, peak);
    return QvStatus::ok;
}

void QvAudioMix::store(AnyDict& dict) const {
    dict.set("name", className);
    dict.set("nrOutChannels", nrOutChannels_);
    dict.set("nrInStreams", nrInStreams());
    dict.set("maxNrInChannels", maxChannels_);
    AnyDict weights;
    for (int out = 0; out < nrOutChannels_; ++out)
        for (int stream = 0; stream < nrInStreams(); ++stream)
            for (int channel = 0; channel < maxChannels_; ++channel) {
                const std::int64_t coefficient = coefficients_[_index(out, stream, channel)];
                if (coefficient == 0) continue;
                weights.set(Any::sprintf("%d_%d_%d", out, stream, channel).asString(),
                            Any(static_cast<long long>(coefficient)));
            }
    dict.set("weights", std::move(weights));
}

int QvAudioMix::restore(const AnyDict& dict) {
    *this = QvAudioMix();
    const Any &outs = dict.get("nrOutChannels"), &ins = dict.get("nrInStreams"),
              &channels = dict.get("maxNrInChannels");
    if (dict.get("name") != className || !outs.isInt() || !ins.isInt() || !channels.isInt() ||
        !dict.get("weights").isDict())
        return QvStatus::failed;
    const long long sizes[] = {outs.toInt64(), ins.toInt64(), channels.toInt64()};
    QV_ASSERT(sizes[0] != 0);
    for (const long long size : sizes)
        if (size < 0 || size > maxElements) return QvStatus::failed;
    if (qvmath::Wide(sizes[0]) * sizes[1] * std::max(sizes[2], 1LL) > maxElements) return QvStatus::failed;
    _make(static_cast<int>(sizes[0]), static_cast<int>(sizes[1]), static_cast<int>(sizes[2]));
    for (const auto [key, value] : dict.getDict("weights")) {
        const AnyVector parts = Any(key).split("_");
        if (parts.size() != 3 || !value->isInt()) continue;
        const int out = qvParseInt32(qvNarrowView(parts.at(0)));
        const int stream = qvParseInt32(qvNarrowView(parts.at(1)));
        const int channel = qvParseInt32(qvNarrowView(parts.at(2)));
        if (out < 0 || out >= nrOutChannels_ || stream < 0 || stream >= nrInStreams() || channel < 0 ||
            channel >= maxChannels_) {
            *this = QvAudioMix();
            return QvStatus::failed;
        }
        _setCoefficient(out, stream, channel, value->toInt64());
    }
    return QvStatus::ok;
}
