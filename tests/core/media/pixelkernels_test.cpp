#include "core/media/pixelkernels_p.h"

#include <hwy/targets.h>

#include <cstring>
#include <random>
#include <set>

#include "tests/support/checks.h"

namespace {

using Bytes = std::vector<unsigned char>;

constexpr std::size_t guard = 80;
constexpr std::size_t lengths[] = {0, 1, 2, 15, 16, 17, 31, 63, 64, 65, 127, 200, 1021};

Bytes noise(std::size_t count, unsigned seed) {
    std::minstd_rand random(seed);
    Bytes bytes(count);
    for (auto& byte : bytes) {
        const auto value = random() >> 8;
        byte = static_cast<unsigned char>(value % 5 == 0 ? 255 : value % 5 == 1 ? 0 : value);
    }
    return bytes;
}

int wordAt(const Bytes& bytes, std::size_t at) { return bytes[at] | bytes[at + 1] << 8; }

// Runs `check` on every vector unit of this machine and makes sure that it is the one that runs.
template <class Check>
void onAllUnits(Check check) {
    std::set<std::string> seen;
    for (const auto target : hwy::SupportedAndGeneratedTargets()) {
        hwy::SetSupportedTargetsForTest(target);
        hwy::GetChosenTarget().Update(hwy::SupportedTargets());
        const std::string unit = qvpixels::vectorUnit();
        EXPECT_EQ(unit, hwy::TargetName(target));
        SCOPED_TRACE(unit);
        seen.insert(unit);
        check();
    }
    hwy::SetSupportedTargetsForTest(0);
    hwy::GetChosenTarget().Update(hwy::SupportedTargets());
    EXPECT_FALSE(seen.empty());
}

// One kernel over samples of `unit` bytes: reference(target, source, extra byte) is a sample's result.
template <class Kernel, class Reference>
void checkKernel(std::size_t unit, Kernel kernel, Reference reference) {
    onAllUnits([&] {
        for (const std::size_t count : lengths)
            for (const std::size_t start : {0, 1, 3}) {
                const std::size_t bytes = count * unit;
                const Bytes before = noise(start + bytes + guard, 1 + static_cast<unsigned>(count));
                const Bytes source = noise(start + bytes + guard, 2);
                const Bytes extra = noise(start + bytes + guard, 3);
                Bytes got = before;
                kernel(got.data() + start, source.data() + start, extra.data() + start, count);
                Bytes wanted = before;
                for (std::size_t i = 0; i < count; ++i) {
                    const std::size_t at = start + i * unit;
                    const int value =
                        unit == 1 ? reference(before[at], source[at], extra[start + i])
                                  : reference(wordAt(before, at), wordAt(source, at), extra[start + i]);
                    wanted[at] = static_cast<unsigned char>(value);
                    if (unit == 2) wanted[at + 1] = static_cast<unsigned char>(value >> 8);
                }
                ASSERT_EQ(got, wanted) << count << " from " << start;
            }
    });
}

int masked(int target, int source, int mask) {
    const int w = (mask + 1) >> 1;
    return (target * (128 - w) + source * w) >> 7;
}

TEST(PixelKernels, MaskMixAndAverageInPlace) {
    checkKernel(1, qvpixels::maskBytes, masked);
    checkKernel(2, qvpixels::maskWords, masked);
    for (const int alpha : {0, 1, 127, 128, 254, 255}) {
        const auto reference = [alpha](int target, int source, int) {
            return (target * (256 - alpha) + source * alpha) >> 8;
        };
        const auto with = [alpha](auto kernel) {
            return [=](auto* to, auto* from, auto*, std::size_t count) { kernel(to, from, alpha, count); };
        };
        checkKernel(1, with(qvpixels::mixBytes), reference);
        checkKernel(2, with(qvpixels::mixWords), reference);
    }
    const auto inPlace = [](auto kernel) {
        return [=](auto* to, auto* from, auto*, std::size_t count) { kernel(to, to, from, count); };
    };
    const auto average = [](int target, int source, int) { return (target + source) / 2; };
    checkKernel(1, inPlace(qvpixels::averageBytes), average);
    checkKernel(2, inPlace(qvpixels::averageWords), average);
}

TEST(PixelKernels, SpreadMask) {
    onAllUnits([] {
        for (const std::size_t pixels : lengths)
            for (int step = 1; step <= 2; ++step)
                for (int copies = 1; copies <= 4; ++copies) {
                    const auto each = static_cast<std::size_t>(copies);
                    const Bytes mask = noise(static_cast<std::size_t>(step) * pixels, 4);
                    Bytes got = noise(each * pixels + guard, 5), wanted = got;
                    qvpixels::spreadMask(got.data(), mask.data(), step, copies, pixels);
                    for (std::size_t i = 0; i < each * pixels; ++i)
                        wanted[i] = mask[i / each * static_cast<std::size_t>(step)];
                    ASSERT_EQ(got, wanted) << pixels << " " << step << " " << copies;
                }
    });
}

}  // namespace
