// Mixes channels of several streams by a matrix of weights in fixed point, 16 bits after the point.
//
//     QvAudioMix mix;
//     mix.init(2, channelsOfEachStream);
//     mix.setWeight(0, 1, 3, 0.5);  // output 0 takes half of channel 3 of stream 1
//     mix.mixChannels(1024, out, inputs);
//
// Indexes out of range are assertions.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/arch/api.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class QvPcm;

class QV_API QvAudioMix {
  public:
    QvAudioMix() = default;

    // No output takes anything at first. `inChannels`: an Int32 for each stream. No outputs, or a count that
    // is negative or not an Int32, is an assertion.
    void init(int nrOut, const AnyVector& inChannels);
    // One output for each channel of each stream, in their order, with weight 1.0.
    void initLinear(const AnyVector& inChannels);

    int nrOutChannels() const { return nrOutChannels_; }
    int nrInStreams() const { return static_cast<int>(usedChannels_.size()); }
    int maxNrInChannels(int stream) const;  // the highest channel with a weight, plus 1

    // 1.0 is the sample as it is. Beyond +-32767 the weight wraps around.
    void setWeight(int out, int stream, int channel, double weight);
    // As it is kept: 65536.0 for a weight of 1.0.
    double weight(int out, int stream, int channel) const;

    // Fills `out` with `samples` samples: samples of 32 bits, of which 24 are used, in the same shape in all
    // (assertions; `in` may have fewer streams than the matrix). Each product is shifted by itself, sums wrap
    // at 32 bits, and only the first `samples` values of `out`, counted without regard to channels, are
    // clamped to 24 bits. 0, or QvStatus::outOfMemory.
    int mixChannels(int samples, QvPcm& out, const TPtrList<QvPcm>& in) const;

    void store(AnyDict& dict) const;
    // -1, and no matrix, if the dictionary is none of a mix, has a weight outside of it, or is too large.
    int restore(const AnyDict& dict);

    // Above this number of elements a stored matrix is refused.
    static constexpr long long maxElements = 16LL << 20;

  private:
    int nrOutChannels_ = 0;
    int maxChannels_ = 0;                // of any stream
    std::vector<int> usedChannels_;      // of each stream
    std::vector<int> firstChannel_;      // [output][stream], the lowest with a weight; 0x7FFFFFFF for none
    std::vector<int64_t> coefficients_;  // [output][stream][channel]

    void _make(int nrOut, int nrIn, int maxChannels);
    std::size_t _pair(int out, int stream) const;
    std::size_t _index(int out, int stream, int channel) const;  // asserts the ranges
    void _setCoefficient(int out, int stream, int channel, int64_t coefficient);
    void _sumOutput(int out, int from, int samples, const TPtrList<QvPcm>& in, int32_t* sums) const;
};
