// Every vector unit of the machine gives the samples of the plain formulas, and touches nothing else.
#include "builtin/kernels/lines/samplerows.h"

#include "builtin/kernels/lines/packedchroma.h"
#include "builtin/kernels/lines/rgbchroma.h"
#include "builtin/kernels/lines/rows16.h"
#include "builtin/kernels/lines/rows8.h"
#include "builtin/kernels/lines/yuvrgb.h"
#include "builtin/kernels/scale/deep.h"
#include "builtin/kernels/scale/scale8.h"
#include "tests/support/line_kernels.h"

using namespace srk;

namespace {

// Weights whose sums reach up to the limits of what is allowed.
struct Weights {
    explicit Weights(size_t n) : scale8(n), add8(n), scale16(n), add16(n), add10(n) {
        for (size_t i = 0; i < n; ++i) {
            scale8[i] = static_cast<uint16_t>(i * 37 % 257);
            add8[i] = static_cast<uint16_t>(65535 - 255 * scale8[i]);
            scale16[i] = i % 5 ? static_cast<uint32_t>(i * 7919 % 65537) : 65536;
            add16[i] = 0xFFFFFFFFu - 65535u * scale16[i];
            add10[i] = (1024u << 16) - 1 - 1023 * scale16[i];
        }
    }
    std::vector<uint16_t> scale8, add8;
    std::vector<uint32_t> scale16, add16, add10;
};

std::vector<uint16_t> wordTable() {
    std::vector<uint16_t> table(65536);
    for (size_t i = 0; i < table.size(); ++i) table[i] = static_cast<uint16_t>(i * 40503 >> 3);
    return table;
}

const Weights weights(3 * 129);
const std::vector<uint16_t> table16 = wordTable();

unsigned tens(const Byte* row, size_t i) { return sampleAt<uint32_t>(row, i / 3) >> 10 * (i % 3) & 1023; }

}  // namespace

TEST(SampleRows, AllUnitsFollowTheFormulas) {
    const auto bytes = checked<Byte>(
        [](auto& l) { weighBytes(l.out[0], l.in[0], weights.scale8.data(), weights.add8.data(), l.n); },
        [](auto& l, size_t i) { return (l.in[0][i] * weights.scale8[i] + weights.add8[i]) >> 8; });
    const auto words = checked<uint16_t>(
        [](auto& l) { weighWords(l.out[0], l.in[0], weights.scale16.data(), weights.add16.data(), l.n); },
        [](auto& l, size_t i) {
            return (sampleAt<uint16_t>(l.in[0], i) * weights.scale16[i] + weights.add16[i]) >> 16;
        });
    const auto packed = [](const LineCase& l) {
        std::vector<unsigned> wanted;
        for (size_t i = 0; i < 3 * l.n; ++i)
            wanted.push_back((tens(l.in[0], i) * weights.scale16[i] + weights.add10[i]) >> 16);
        weighTens(l.out[0], l.in[0], weights.scale16.data(), weights.add10.data(), l.n);
        for (size_t i = 0; i < 3 * l.n; ++i) ASSERT_EQ(tens(l.out[0], i), wanted[i]) << i;
    };
    std::vector<LineKernel> rows = {{"weigh bytes", {one}, {one}, bytes, true},
                                    {"weigh words", {twoBytes}, {twoBytes}, words, true},
                                    {"weigh tens", {four}, {four}, packed, true}};
    Byte table8[256];
    for (int i = 0; i < 256; ++i) table8[i] = static_cast<Byte>(i * 151 + 7);
    for (const unsigned chosen : {15u, 5u, 10u, 7u, 14u}) {
        const auto isChosen = [=](size_t i) { return (chosen >> i % 4 & 1) != 0; };
        const auto found8 = checked<Byte>(
            [&table8, chosen](auto& l) { lookUpBytes(l.out[0], l.in[0], table8, chosen, l.n); },
            [&table8, isChosen](auto& l, size_t i) { return isChosen(i) ? table8[l.in[0][i]] : l.in[0][i]; });
        const auto found16 =
            checked<uint16_t>([=](auto& l) { lookUpWords(l.out[0], l.in[0], table16.data(), chosen, l.n); },
                              [=](auto& l, size_t i) {
                                  const auto sample = sampleAt<uint16_t>(l.in[0], i);
                                  return isChosen(i) ? table16[sample] : sample;
                              });
        rows.push_back({"look up bytes", {one}, {one}, found8, true});
        rows.push_back({"look up words", {twoBytes}, {twoBytes}, found16, true});
    }
    compareUnits(rows);
}

TEST(Units, OfTheMachineReallyRun) {
    for (const auto target : machineTargets()) {
        const OnTarget only(target);
        for (const auto unit : {rows8Unit, rgbChromaUnit, packedChromaUnit, yuvRgbUnit, rows16Unit, deepUnit,
                                scale8Unit, sampleRowsUnit})
            EXPECT_STREQ(unit(), hwy::TargetName(target));
    }
}
