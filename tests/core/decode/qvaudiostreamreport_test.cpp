#include "core/decode/qvaudiostreamreport.h"

#include <cmath>
#include <limits>

#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "tests/support/checks.h"

namespace {

QvPcm pcmOf(int width, const std::string& bytes) {
    QvPcm pcm;
    pcm.init(static_cast<int>(bytes.size()) / width / 2, 2, width, 48000);
    std::memcpy(pcm.ptr(0), bytes.data(), bytes.size());
    pcm.setSamples(pcm.size());
    return pcm;
}

TEST(AudioStreamReport, PeaksOfEachWidthHaveOneScale) {
    using namespace std::string_literals;
    const struct {
        int width;
        std::string bytes;
        int peak;
    } cases[] = {
        {1, "\x80\x80\x81\x80"s, 1 << 8},      {1, "\x80\x80\x00\xFF"s, 32768},
        {2, "\0\0\x01\0\xFE\xFF\0\0"s, 2},     {2, "\0\x80\xFF\x7F"s, 32768},
        {3, "\0\0\0\0\x05\0\0\0\0\0\0\0"s, 5}, {3, "\0\0\x80\xFF\xFF\x7F"s, 32768},
        {3, "\xFF\xFF\xFF\0\0\0"s, 0},         {3, "\0\0\0\0\0\x60"s, 0x6000},
    };
    for (const auto& c : cases) {
        QvAudioStreamReport report;
        ASSERT_EQ(report.init(100, 2, 48000, c.width * 8), 0);
        EXPECT_EQ(report.processGroup(pcmOf(c.width, c.bytes)), 0);
        EXPECT_EQ(report.peak(0), c.peak) << c.width;
    }
}

TEST(AudioStreamReport, RangesAreOfSamplesAndClamped) {
    QvAudioStreamReport report;
    report.init(4000, 2, 48000, 16);
    for (const char* level : {"\x64\0", "\0\x40", "\x0A\0"})
        EXPECT_EQ(report.processGroup(pcmOf(2, repeated({level, 2}, 3200))), 0);
    EXPECT_EQ(report.processGroup(pcmOf(2, std::string(4, 0))), -1) << "after the last group";
    EXPECT_NEAR(report.peakdB(0, 1599), 20 * std::log10(100 / 32768.0), 1e-9);
    EXPECT_NEAR(report.peakdB(0, 1600), -6.0206, 1e-4);
    EXPECT_NEAR(report.peakdB(-100000, 1LL << 60), -6.0206, 1e-4);
    EXPECT_EQ(report.peakdB(100000, 200000), -91.0);
    EXPECT_EQ(report.init(std::numeric_limits<long long>::max(), 2, 48000, 16), QvStatus::outOfMemory);
}

}  // namespace
