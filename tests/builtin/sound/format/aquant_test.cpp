// Widths of samples: every rule, its bounds, and that blocks and vector units make no difference.
#include "builtin/sound/format/aquant.h"

#include <cmath>

#include "tests/builtin/sound/sounds.h"
#include "tests/support/log_capture.h"
#include "tests/support/vector_targets.h"

namespace {

using Opened = OpenedSound<QvAquant>;

constexpr const char* clipWarning = "Audio clipping detected. Please reduce audio processing gain";

int32_t valueAt(const Bytes& bytes, size_t i, int width) {
    const unsigned char* b = &bytes[i * static_cast<size_t>(width)];
    if (width == 1) return b[0];
    uint32_t value = 0;
    for (int k = 0; k < width; ++k) value |= static_cast<uint32_t>(b[k]) << (8 * k + 32 - 8 * width);
    return static_cast<int32_t>(value) >> (32 - 8 * width);
}

int32_t widened(int32_t value, int width) {
    return width == 1 ? (value - 128) * 65536 : width == 2 ? value * 256 : value;
}

int32_t narrowed(int32_t value, int width) {
    if (width == 1) return std::clamp((value >> 16) + 128, 0, 255);
    return width == 2 ? std::clamp(value >> 8, -32768, 32767) : std::clamp(value, -8388608, 8388607);
}

int widthOf(int bits) { return bits == 20 ? 3 : bits / 8; }

}  // namespace

TEST(Aquant, ConvertsAllWidths) {
    for (const int64_t target : machineTargets()) {
        const OnTarget only(target);
        for (const int bits : {8, 16, 20, 24, 32})
            for (const int in : {1, 2, 3, 4}) {
                const int out = widthOf(bits);
                if (in != out && in != 4 && out != 4) continue;
                SCOPED_TRACE(testing::Message() << in << " bytes to " << bits << " bits");
                Bytes from =
                    in == 4 ? bytesOf(noise(3 * 501)) : noiseBytes(static_cast<size_t>(3 * 501 * in));
                Opened filter{{"outBitsPerSample", bits}};
                const Bytes to = throughFilter(filter, from, 3, in, {1, 2, 3, 5, 70, 9});
                ASSERT_EQ(to.size(), static_cast<size_t>(3 * 501 * out));
                for (size_t i = 0; i < 3 * 501; ++i) {
                    const int32_t value = valueAt(from, i, in);
                    const int32_t wanted = in == out  ? value
                                           : out == 4 ? widened(value, in)
                                                      : narrowed(value, out);
                    ASSERT_EQ(valueAt(to, i, out), wanted) << i << " was " << value;
                }
            }
    }
}

TEST(Aquant, WarnsOnceOfClipping) {
    const int32_t top = (1 << 23) - 1, bottom = -(1 << 23);
    const struct {
        int bits;
        Values values;
        int warnings;
        int32_t last;
    } rows[] = {
        {16, {0x7FFFFFFF}, 1, 32767},
        {16, {INT32_MIN}, 1, -32768},
        {24, {0, 0, 0, 0, 0, 0, 0, 0, 0, top + 1}, 1, top},
        {24, {bottom - 1, 0, 0, 0, 0, 0, 0, 0, 0, bottom}, 1, bottom},
        {8, {1 << 23}, 1, 255},
        {16, {top, bottom}, 0, -32768},
        {24, {top, bottom}, 0, bottom},
        {8, {bottom, top}, 0, 255},
        {32, {0x7FFFFFFF}, 0, 0x7FFFFFFF},
    };
    for (const auto& row : rows)
        for (const char* dither : {"none", "triangular"}) {
            LogCapture log;
            Opened filter{{"outBitsPerSample", row.bits}, {"dither", dither}};
            Bytes out;
            for (int i = 0; i < 3; ++i) out = throughFilter(filter, bytesOf(row.values), 1, 4);
            EXPECT_EQ(log.count(clipWarning, QvLogMask::warning), row.warnings) << row.bits << dither;
            if (Any(dither) == "none") {
                EXPECT_EQ(valueAt(out, row.values.size() - 1, widthOf(row.bits)), row.last) << row.bits;
            }
            filter.close();
            filter.open();
            throughFilter(filter, bytesOf(row.values), 1, 4);
            EXPECT_EQ(log.count(clipWarning, QvLogMask::warning), 2 * row.warnings) << "again after open";
            EXPECT_EQ(filter.getParam("clippedSamples").toInt64(), row.warnings) << "from open on";
            filter.setParam("clipWarning", 0);
            for (int i = 0; i < 2; ++i) throughFilter(filter, bytesOf(row.values), 1, 4);
            EXPECT_EQ(filter.getParam("clippedSamples").toInt64(), 3 * row.warnings);
            EXPECT_EQ(log.count(clipWarning, QvLogMask::warning), 2 * row.warnings) << "switched off";
        }
}

// A constant between two steps of the output comes out as their mix: its mean is the constant, and the error
// has the variance of triangular noise and of rounding, a quarter of a step squared, whatever the constant.
TEST(Aquant, TriangularDitherKeepsMeanAndPower) {
    for (const int bits : {8, 16})
        for (const double fraction : {0.0, 0.25, 0.5, 0.9}) {
            const int step = bits == 8 ? 65536 : 256;
            const size_t n = 200000;
            const Values constant(n, 10 * step + static_cast<int>(fraction * step));
            Opened filter{{"outBitsPerSample", bits}, {"dither", "triangular"}};
            const Bytes out = throughFilter(filter, bytesOf(constant), 2, 4, {777});
            double mean = 0, power = 0, neighbours = 0, before = 0;
            for (size_t i = 0; i < n; ++i) {
                const double error = valueAt(out, i, bits / 8) - (bits == 8 ? 128 : 0) - 10 - fraction;
                mean += error / static_cast<double>(n);
                power += error * error / static_cast<double>(n);
                neighbours += error * before / static_cast<double>(n);
                before = error;
            }
            EXPECT_NEAR(mean, 0, 0.006) << bits << " bits, " << fraction;
            EXPECT_NEAR(power, 0.25, 0.01) << bits << " bits, " << fraction;
            EXPECT_NEAR(neighbours, 0, 0.006) << bits << " bits, " << fraction;
        }
}

TEST(Aquant, DitherDependsOnThePlaceAlone) {
    const Values in = noise(6 * 1000);
    for (const int bits : {8, 16, 24}) {
        Bytes expected;
        for (const int64_t target : machineTargets())
            for (const Blocks& blocks : {Blocks{}, Blocks{1, 17, 4}}) {
                const OnTarget only(target);
                Opened filter{{"outBitsPerSample", bits}, {"dither", "triangular"}};
                const Bytes out = throughFilter(filter, bytesOf(in), 6, 4, blocks);
                if (expected.empty()) expected = out;
                ASSERT_TRUE(out == expected) << bits << " bits on " << hwy::TargetName(target);
            }
        Opened plain{{"outBitsPerSample", bits}};
        const Bytes cut = throughFilter(plain, bytesOf(in), 6, 4);
        EXPECT_EQ(cut == expected, bits == 24) << "24 bits lose nothing";
        for (size_t i = 0; i < in.size(); ++i)
            ASSERT_LE(std::abs(valueAt(cut, i, bits / 8) - valueAt(expected, i, bits / 8)), 2) << i;
    }
}

TEST(Aquant, RefusesOtherWidths) {
    for (const int bits : {0, -8, 12, 33, 64}) {
        QvAquant filter;
        ASSERT_EQ(filter.init(), 0);
        filter.setParam("outBitsPerSample", bits);
        EXPECT_EQ(filter.open(), QvStatus::failed);
        const std::string text = filter.errorDesc();
        EXPECT_EQ(text, "Error Opening audio quantization converter, invalid out bits per sample (" +
                            std::to_string(bits) + ")");
    }
    for (const auto& [bits, in] : {std::pair(16, 3), {24, 2}, {8, 2}}) {
        Opened filter{{"outBitsPerSample", bits}};
        QvPcm pcm = pcmOf(noiseBytes(static_cast<size_t>(10 * in)), 1, in);
        EXPECT_THROW(filter.write(pcm), QvAssertFailure);
        EXPECT_EQ(filter.samples(), 0);
    }
    Opened filter{{"outBitsPerSample", 16}};
    filter.setParam("outBitsPerSample", 64);
    QvPcm pcm = pcmOf(bytesOf(noise(10)), 2, 4), mono = pcmOf(bytesOf(noise(10)), 1, 4);
    EXPECT_THROW(filter.write(pcm), QvAssertFailure);
    filter.setParam("outBitsPerSample", 16);
    ASSERT_EQ(filter.write(pcm), 0);
    EXPECT_EQ(filter.write(mono), QvStatus::failed);
    EXPECT_STREQ(filter.errorDesc(), "the format of the sound changed from 2 channels of 16 bits to 1 of 16");
    EXPECT_EQ(filter.samples(), 5);
}

TEST(Aquant, KeepsPositionAndRate) {
    Opened filter{{"outBitsPerSample", 16}};
    QvPcm pcm = pcmOf(bytesOf(noise(10)), 2, 4, 44100);
    pcm.setPosition(1234567890123);
    ASSERT_EQ(filter.write(pcm), 0);
    EXPECT_EQ(filter.pcm()->position(), 1234567890123);
    EXPECT_EQ(filter.pcm()->samplerate(), 44100);
    filter.erase(3);
    EXPECT_EQ(filter.samples(), 2);
}
