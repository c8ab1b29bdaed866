// On every vector unit of the machine the kernels give what their formulas say.
#include "core/media/pixelkernels_p.h"

#include "tests/support/line_kernels.h"

namespace {

using qvpixels::Byte;

template <class Sample>
int weighed(const unsigned char* first, int a, const unsigned char* second, int b, size_t i) {
    return sampleAt<Sample>(first, i) * a + sampleAt<Sample>(second, i) * b;
}

template <class Sample>
void addRows(std::vector<LineKernel>& rows, LineSize size,
             void (*average)(Byte*, const Byte*, const Byte*, size_t),
             void (*mask)(Byte*, const Byte*, const Byte*, size_t),
             void (*mix)(Byte*, const Byte*, int, size_t)) {
    const auto mean = [](auto& l, size_t i) { return weighed<Sample>(l.in[0], 1, l.in[1], 1, i) >> 1; };
    const auto masked = [](auto& l, size_t i) {
        const int weight = (l.in[1][i] + 1) >> 1;
        return weighed<Sample>(l.out[0], 128 - weight, l.in[0], weight, i) >> 7;
    };
    rows.push_back({"average", {size, size}, {size}, checked<Sample>(onLines(average), mean), true});
    rows.push_back({"mask", {size, one}, {size}, checked<Sample>(onLines(mask), masked)});
    for (const int alpha : {0, 1, 127, 128, 254, 255}) {
        const auto mixed = [=](auto& l, size_t i) {
            return weighed<Sample>(l.out[0], 256 - alpha, l.in[0], alpha, i) >> 8;
        };
        rows.push_back({"mix", {size}, {size}, checked<Sample>(onLines(mix, alpha), mixed)});
    }
}

}  // namespace

TEST(PixelKernels, FollowTheirFormulas) {
    std::vector<LineKernel> rows;
    addRows<uint8_t>(rows, one, qvpixels::averageBytes, qvpixels::maskBytes, qvpixels::mixBytes);
    addRows<uint16_t>(rows, twoBytes, qvpixels::averageWords, qvpixels::maskWords, qvpixels::mixWords);
    for (size_t step : {1u, 2u})
        for (size_t copies = 1; copies <= 4; ++copies)
            rows.push_back({"spread", {{step}}, {{copies}}, [=](const LineCase& l) {
                                qvpixels::spreadMask(l.out[0], l.in[0], static_cast<int>(step),
                                                     static_cast<int>(copies), l.n);
                                for (size_t i = 0; i < copies * l.n; ++i)
                                    ASSERT_EQ(l.out[0][i], l.in[0][i / copies * step]) << copies;
                            }});
    const auto targets = hwy::SupportedAndGeneratedTargets();
    compareUnits(rows, targets);
    for (const auto target : targets) {
        const OnTarget only(target);
        EXPECT_STREQ(qvpixels::vectorUnit(), hwy::TargetName(target));
    }
}
