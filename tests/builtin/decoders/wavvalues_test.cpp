#include "builtin/decoders/wavvalues.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "tests/support/vector_targets.h"
#include "tests/support/wav_bytes.h"

namespace {

// By the definition: the exact value, to the nearest of 24 bits, halves to the even one.
std::string expected(const std::vector<double>& values, std::size_t& clipped) {
    std::string bytes;
    clipped = 0;
    for (const double value : values) {
        clipped += value >= -1 && value <= 1 ? 0 : 1;
        const double scaled = std::isnan(value) ? 0 : std::clamp(value * 8388608, -8388608.0, 8388607.0);
        double below = std::floor(scaled);
        const double rest = scaled - below;
        if (rest > 0.5 || (rest == 0.5 && std::fmod(below, 2) != 0)) below += 1;
        bytes += leBytes(static_cast<std::uint64_t>(static_cast<std::int64_t>(below)), 3);
    }
    return bytes;
}

template <class Value>
std::vector<Value> samples(std::size_t count) {
    std::vector<Value> values(count);
    fillBytes(reinterpret_cast<unsigned char*>(values.data()), count * sizeof(Value), sizeof(Value));
    if constexpr (std::is_floating_point_v<Value>)
        for (std::size_t i = 0; i < count; ++i) {
            const auto random =
                static_cast<Value>(static_cast<double>(i * 2654435761u % 100003) / 80000 - 0.6);
            const Value rare[] = {NAN, INFINITY, -INFINITY, 1, -1, Value(3) / (1 << 24), Value(5) / (1 << 24),
                                  -2};
            values[i] = i % 13 == 5 ? rare[i / 13 % 8] : random;
        }
    return values;
}

// Every count up to 40 and a long one, from and to unaligned places, with guards around the result.
template <class Value>
void check(wav::Convert convert, double scale) {
    for (const std::int64_t target : machineTargets()) {
        const OnTarget on(target);
        for (std::size_t count = 0; count <= 5000; count += count < 40 ? 1 : 1653) {
            const auto values = samples<Value>(count);
            std::string from(count * sizeof(Value) + 1, 'x');
            if (count > 0) std::memcpy(&from[1], values.data(), count * sizeof(Value));
            std::string to(3 * count + 2, 'g');
            std::size_t clipped = 0;
            std::vector<double> exact;
            for (const Value value : values) exact.push_back(static_cast<double>(value) * scale);
            const std::string wanted = expected(exact, clipped);
            EXPECT_EQ(convert(reinterpret_cast<unsigned char*>(&to[1]),
                              reinterpret_cast<const unsigned char*>(&from[1]), count),
                      clipped);
            ASSERT_TRUE(to == "g" + wanted + "g") << count << " on " << hwy::TargetName(target);
        }
    }
}

TEST(WavValues, NarrowToTheNearestOnEveryUnit) {
    check<float>(wav::narrowFloat32, 1);
    check<double>(wav::narrowFloat64, 1);
    check<std::int32_t>(wav::narrowInt32, 1 / 2147483648.0);
}

TEST(WavValues, CodesRiseWithoutGaps) {
    const struct {
        wav::Convert expand;
        unsigned char positive, inverted;  // the sign bit of positive values, the bits that are turned
        int smallest, step, largest;
    } laws[] = {{wav::expandALaw, 0x80, 0x55, 8, 16, 32256}, {wav::expandMuLaw, 0x80, 0x7F, 0, 8, 32124}};
    for (const auto& law : laws) {
        int before = -1, step = 0;
        for (int size = 0; size < 128; ++size) {
            const unsigned char plain[] = {static_cast<unsigned char>((size ^ law.inverted) | law.positive),
                                           static_cast<unsigned char>(size ^ law.inverted)};
            std::int16_t values[2];
            law.expand(reinterpret_cast<unsigned char*>(values), plain, 2);
            EXPECT_EQ(values[0], -values[1]) << size;
            if (size == 0) {
                EXPECT_EQ(values[0], law.smallest);
                step = law.step;
            } else {  // by the step of its segment, or from segment to segment by up to twice that of the
                      // last
                const int rise = values[0] - before;
                EXPECT_GE(rise, step) << size;
                EXPECT_LE(rise, 2 * step) << size;
                step = rise;
            }
            before = values[0];
        }
        EXPECT_EQ(before, law.largest);
    }
}

TEST(WavValues, BytesAreTurnedValueByValue) {
    for (const int width : {1, 2, 3, 4, 8}) {
        std::string values = patternBytes(static_cast<std::size_t>(width) * 7), wanted = values;
        for (auto at = wanted.begin(); at != wanted.end(); at += width) std::reverse(at, at + width);
        wav::swapBytes(reinterpret_cast<unsigned char*>(values.data()), width, 7);
        EXPECT_EQ(values, wanted) << width;
    }
}

}  // namespace
