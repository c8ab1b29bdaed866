// Sound filters under test: interleaved values go through in blocks of any sizes.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <random>
#include <vector>

#include "core/filter/qvfilter.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvpcm.h"
#include "tests/support/checks.h"

using Values = std::vector<int32_t>;
using Bytes = std::vector<unsigned char>;

struct Param {
    const char* name;
    Any value;
};

template <class Filter>
struct OpenedSound : Filter {
    explicit OpenedSound(const AnyDict& params) {
        EXPECT_EQ(this->init(), 0);
        EXPECT_EQ(this->setParamDict(params), 0) << this->errorDesc();
        EXPECT_EQ(this->open(), 0) << this->errorDesc();
    }
    OpenedSound(std::initializer_list<Param> params = {}) {
        EXPECT_EQ(this->init(), 0);
        for (const Param& param : params) EXPECT_EQ(this->setParam(param.name, param.value), 0) << param.name;
        EXPECT_EQ(this->open(), 0) << this->errorDesc();
    }
};

// Sizes of blocks in samples; from its end the list starts again. None: all in one block.
using Blocks = std::vector<int>;

inline QvPcm pcmOf(const Bytes& bytes, int channels, int width, int rate = 48000) {
    QvPcm pcm;
    const int samples = static_cast<int>(bytes.size()) / channels / width;
    EXPECT_EQ(pcm.init(samples, channels, width, rate), 0);
    if (samples > 0) std::memcpy(pcm.ptr(0), bytes.data(), bytes.size());
    pcm.setSamples(samples);
    return pcm;
}

inline Bytes bytesOf(const Values& values) {
    Bytes bytes(values.size() * 4);
    if (!values.empty()) std::memcpy(bytes.data(), values.data(), bytes.size());
    return bytes;
}

inline Values valuesOf(const Bytes& bytes) {
    Values values(bytes.size() / 4);
    if (!values.empty()) std::memcpy(values.data(), bytes.data(), bytes.size());
    return values;
}

// Wide values.
inline QvPcm soundOf(const Values& values, int channels, int rate = 48000) {
    return pcmOf(bytesOf(values), channels, 4, rate);
}

// Takes all that is ready.
inline void take(QvAudioFilter& filter, Bytes& to) {
    const int n = filter.samples();
    if (n > 0)
        to.insert(to.end(), filter.pcm()->ptr(0), filter.pcm()->ptr(0) + filter.pcm()->samples2bytes(n));
    filter.erase(n);
}

inline Bytes throughFilter(QvAudioFilter& filter, const Bytes& in, int channels, int width,
                           const Blocks& blocks = {}, int rate = 48000) {
    Bytes out;
    const size_t sample = static_cast<size_t>(channels * width);
    size_t at = 0;
    for (size_t k = 0; at < in.size(); ++k) {
        const size_t wanted =
            blocks.empty() ? in.size() : static_cast<size_t>(blocks[k % blocks.size()]) * sample;
        const size_t size = std::min(wanted, in.size() - at);
        QvPcm pcm = pcmOf(
            Bytes(in.begin() + static_cast<ptrdiff_t>(at), in.begin() + static_cast<ptrdiff_t>(at + size)),
            channels, width, rate);
        EXPECT_EQ(filter.write(pcm), 0) << filter.errorDesc();
        take(filter, out);
        at += size;
    }
    return out;
}

inline Values throughFilter(QvAudioFilter& filter, const Values& in, int channels, const Blocks& blocks = {},
                            int rate = 48000) {
    return valuesOf(throughFilter(filter, bytesOf(in), channels, 4, blocks, rate));
}

// The same output for blocks of any size.
template <class Filter>
Values throughBlocks(const AnyDict& params, const Values& in, int channels, int rate = 48000) {
    const auto through = [&](const Blocks& blocks) {
        OpenedSound<Filter> filter(params);
        return throughFilter(filter, in, channels, blocks, rate);
    };
    const Values whole = through({});
    for (const Blocks& blocks : {Blocks{0, 37, 74, 1000}, Blocks{1}, Blocks{64}, Blocks{4096}})
        EXPECT_TRUE(through(blocks) == whole) << blocks.front();
    return whole;
}

// Values of 24 bits and, among them, the bounds of 24 and 32 bits.
inline Values noise(size_t count, unsigned seed = 1) {
    constexpr int32_t extremes[] = {INT32_MIN, INT32_MAX,      -(1 << 23), (1 << 23) - 1,
                                    (1 << 23), -(1 << 23) - 1, 0,          -1};
    std::mt19937 random(seed);
    Values values(count);
    for (auto& value : values) {
        const auto r = random();
        value = r % 16 == 0 ? extremes[r / 16 % 8] : static_cast<int32_t>(r) >> 8;
    }
    return values;
}

inline Bytes noiseBytes(size_t count, unsigned seed = 1) {
    std::mt19937 random(seed);
    Bytes bytes(count);
    for (auto& byte : bytes) byte = static_cast<unsigned char>(random());
    return bytes;
}
