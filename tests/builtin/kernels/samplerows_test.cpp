// Every vector unit of the machine gives the samples of the plain formulas, and touches nothing else.
#include "builtin/kernels/samplerows.h"

#include <gtest/gtest.h>

#include <vector>

#include "builtin/kernels/deep.h"
#include "builtin/kernels/rgbchroma.h"
#include "builtin/kernels/rows16.h"
#include "builtin/kernels/rows8.h"
#include "builtin/kernels/scale8.h"
#include "builtin/kernels/yuvrgb.h"
#include "tests/support/guarded.h"
#include "tests/support/vector_targets.h"

using namespace srk;

namespace {

uint16_t wordOf(const Byte* row, size_t i) { return static_cast<uint16_t>(row[2 * i] | row[2 * i + 1] << 8); }

// Weights whose sums reach up to the limits of what is allowed.
struct Weights {
    explicit Weights(size_t n) : scale8(n), add8(n), scale16(n), add16(n) {
        for (size_t i = 0; i < n; ++i) {
            scale8[i] = static_cast<uint16_t>(i * 37 % 257);
            add8[i] = static_cast<uint16_t>(65535 - 255 * scale8[i]);
            scale16[i] = i % 5 ? static_cast<uint32_t>(i * 7919 % 65537) : 65536;
            add16[i] = 0xFFFFFFFFu - 65535u * scale16[i];
        }
    }
    std::vector<uint16_t> scale8, add8;
    std::vector<uint32_t> scale16, add16;
};

std::vector<uint16_t> wordTable() {
    std::vector<uint16_t> table(65536);
    for (size_t i = 0; i < table.size(); ++i) table[i] = static_cast<uint16_t>(i * 40503 >> 3);
    return table;
}

// All kernels on rows of n samples, as they stand or in place.
void check(size_t n, bool inPlace, const Weights& w, const std::vector<uint16_t>& table16) {
    Byte table8[256];
    for (int i = 0; i < 256; ++i) table8[i] = static_cast<Byte>(i * 151 + 7);
    Guarded in8(n, 1), in16(2 * n, 2), out8(n), out16(2 * n);
    const auto run = [&](auto kernel, auto expected) {
        in8.fill(1);
        in16.fill(2);
        const std::vector<Byte> was8(in8.data(), in8.data() + n), was16(in16.data(), in16.data() + 2 * n);
        Byte* to8 = inPlace ? in8.data() : out8.data();
        Byte* to16 = inPlace ? in16.data() : out16.data();
        kernel(to8, to16);
        for (size_t i = 0; i < n; ++i) {
            const auto [e8, e16] = expected(was8[i], wordOf(was16.data(), i), i);
            ASSERT_EQ(to8[i], e8) << n << " " << i;
            ASSERT_EQ(wordOf(to16, i), e16) << n << " " << i;
        }
    };
    run(
        [&](Byte* to8, Byte* to16) {
            weighBytes(to8, in8.data(), w.scale8.data(), w.add8.data(), n);
            weighWords(to16, in16.data(), w.scale16.data(), w.add16.data(), n);
        },
        [&](unsigned b, unsigned s, size_t i) {
            return std::pair{(b * w.scale8[i] + w.add8[i]) >> 8, (s * w.scale16[i] + w.add16[i]) >> 16};
        });
    for (const unsigned chosen : {15u, 5u, 10u, 7u, 14u})
        run(
            [&](Byte* to8, Byte* to16) {
                lookUpBytes(to8, in8.data(), table8, chosen, n);
                lookUpWords(to16, in16.data(), table16.data(), chosen, n);
            },
            [&](unsigned b, unsigned s, size_t i) {
                const bool looked = chosen >> i % 4 & 1;
                return looked ? std::pair<unsigned, unsigned>{table8[b], table16[s]} : std::pair{b, s};
            });
    Guarded in10(4 * (n / 3), 3), out10(4 * (n / 3));
    Guarded& to10 = inPlace ? in10 : out10;
    std::vector<uint32_t> add(w.add16);
    for (size_t i = 0; i < n; ++i) add[i] = (1024u << 16) - 1 - 1023 * w.scale16[i];
    const std::vector<Byte> was(in10.data(), in10.data() + 4 * (n / 3));
    weighTens(to10.data(), in10.data(), w.scale16.data(), add.data(), n / 3);
    for (size_t i = 0; i < n / 3 * 3; ++i) {
        const auto tens = [&](const Byte* row) {
            uint32_t word;
            std::memcpy(&word, row + i / 3 * 4, 4);
            return word >> 10 * (i % 3) & 1023;
        };
        ASSERT_EQ(tens(to10.data()), (tens(was.data()) * w.scale16[i] + add[i]) >> 16) << n << " " << i;
    }
    for (const Guarded* row : {&in8, &in16, &out8, &out16, &in10, &out10}) EXPECT_TRUE(row->frontIntact());
}

}  // namespace

TEST(SampleRows, AllUnitsFollowTheFormulas) {
    const auto table16 = wordTable();
    const Weights weights(200);
    for (const int64_t target : machineTargets()) {
        const OnTarget on(target);
        for (size_t n = 0; n < 140; n += n < 70 ? 1 : 13)
            for (const bool inPlace : {false, true}) check(n, inPlace, weights, table16);
    }
}

TEST(Units, OfTheMachineReallyRun) {
    for (const auto target : machineTargets()) {
        const OnTarget only(target);
        for (const auto unit :
             {rows8Unit, rgbChromaUnit, yuvRgbUnit, rows16Unit, deepUnit, scale8Unit, sampleRowsUnit})
            EXPECT_STREQ(unit(), hwy::TargetName(target));
    }
}
