// On every vector unit of the machine the kernels give what their formulas say.
#include "core/media/pixelkernels_p.h"

#include "tests/support/line_kernels.h"

namespace {

// Works on the first line with the second one and, of one byte a sample, the third; reference(target, source,
// extra byte) is a sample's result.
template <class Sample, class Kernel, class Reference>
auto checked(Kernel kernel, Reference reference) {
    return [=](const LineCase& l) {
        const auto sample = [](const unsigned char* line, size_t i) {
            Sample value;
            std::memcpy(&value, line + i * sizeof value, sizeof value);
            return int{value};
        };
        std::vector<int> wanted, got;
        for (size_t i = 0; i < l.n; ++i)
            wanted.push_back(reference(sample(l.in[0], i), sample(l.in[1], i), l.in[2] ? l.in[2][i] : 0));
        kernel(l.in[0], l.in[1], l.in[2], l.n);
        for (size_t i = 0; i < l.n; ++i) got.push_back(sample(l.in[0], i));
        EXPECT_EQ(got, wanted);
    };
}

int masked(int target, int source, int mask) {
    const int w = (mask + 1) >> 1;
    return (target * (128 - w) + source * w) >> 7;
}

}  // namespace

TEST(PixelKernels, MaskMixAndAverageInPlace) {
    std::vector<LineKernel> kernels = {
        {"mask bytes", {one, one, one}, {}, checked<uint8_t>(qvpixels::maskBytes, masked)},
        {"mask words", {twoBytes, twoBytes, one}, {}, checked<uint16_t>(qvpixels::maskWords, masked)},
    };
    for (const int alpha : {0, 1, 127, 128, 254, 255}) {
        const auto mixed = [=](int target, int source, int) {
            return (target * (256 - alpha) + source * alpha) >> 8;
        };
        const auto with = [=](auto kernel) {
            return [=](auto* to, auto* from, auto*, size_t n) { kernel(to, from, alpha, n); };
        };
        kernels.push_back({"mix bytes", {one, one}, {}, checked<uint8_t>(with(qvpixels::mixBytes), mixed)});
        kernels.push_back(
            {"mix words", {twoBytes, twoBytes}, {}, checked<uint16_t>(with(qvpixels::mixWords), mixed)});
    }
    const auto inPlace = [](auto kernel) {
        return [=](auto* to, auto* from, auto*, size_t n) { kernel(to, to, from, n); };
    };
    const auto mean = [](int target, int source, int) { return (target + source) / 2; };
    kernels.push_back(
        {"average bytes", {one, one}, {}, checked<uint8_t>(inPlace(qvpixels::averageBytes), mean)});
    kernels.push_back({"average words",
                       {twoBytes, twoBytes},
                       {},
                       checked<uint16_t>(inPlace(qvpixels::averageWords), mean)});
    compareUnits(kernels, hwy::SupportedAndGeneratedTargets());
}

TEST(PixelKernels, SpreadMask) {
    std::vector<LineKernel> kernels;
    for (size_t step : {1u, 2u})
        for (size_t copies = 1; copies <= 4; ++copies)
            kernels.push_back({"spread", {{step}}, {{copies}}, [=](const LineCase& l) {
                                   qvpixels::spreadMask(l.out[0], l.in[0], static_cast<int>(step),
                                                        static_cast<int>(copies), l.n);
                                   for (size_t i = 0; i < copies * l.n; ++i)
                                       ASSERT_EQ(l.out[0][i], l.in[0][i / copies * step]) << copies;
                               }});
    compareUnits(kernels, hwy::SupportedAndGeneratedTargets());
}

TEST(PixelKernels, UnitsOfTheMachineReallyRun) {
    for (const auto target : hwy::SupportedAndGeneratedTargets()) {
        const OnTarget only(target);
        EXPECT_STREQ(qvpixels::vectorUnit(), hwy::TargetName(target));
    }
}
