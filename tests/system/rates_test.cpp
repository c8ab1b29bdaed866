// Changes of the frame rate, from a file to a file: which frames come out, and the sound that goes with them.
#include "tests/system/tool.h"

namespace {

class Rates : public Tool {
  protected:
    // `count` frames, all bytes of the i-th being i.
    void makeCounted(const std::string& name, int count) const {
        std::string bytes;
        for (int i = 0; i < count; ++i) bytes.append(kFrame, static_cast<char>(i));
        folder.write(name, bytes);
    }
    // What rows 0 and 1 of each frame show: "3" when they agree, else "3/4". The first `most` of them.
    std::string shown(const std::string& name, std::size_t most) const {
        const std::string bytes = contents(name);
        std::string text;
        for (std::size_t n = 0; n < most && (n + 1) * kFrame <= bytes.size(); ++n) {
            const int even = static_cast<unsigned char>(bytes[n * kFrame]);
            const int odd = static_cast<unsigned char>(bytes[n * kFrame + 64]);
            text += (n ? " " : "") + std::to_string(even) + (even == odd ? "" : "/" + std::to_string(odd));
        }
        return text;
    }
};

TEST_F(Rates, FramesAndSamplesAreCountedAndRight) {
    const struct {
        int frames;
        const char *raw, *out;
        Words more;
        unsigned inSamples;
        long long written, samples;
        const char* first;
    } rows[] = {
        {100, "rate=25", "50", {}, 176400, 200, 176400, "0 0 1 1 2 2"},
        {100, "rate=50", "25", {}, 88200, 50, 88200, "0 2 4 6 8 10"},
        {100, "rate=50", "25", {"--from", "10f", "--to", "50f"}, 88200, 20, 35280, "10 12 14 16 18 20"},
        {99, "rate=50", "25i", {}, 87318, 50, 88200, "0/1 2/3 4/5 6/7 8/9 10/11"},
        {96, "rate=24", "30i", {}, 176400, 120, 176400, "0 0/1 1/2 2 3 4 4/5"},
        {96, "rate=24000/1001", "30000/1001i", {}, 176576, 120, 176576, "0 0/1 1/2 2 3 4 4/5"},
        {100, "rate=25", "30000/1001", {}, 176400, 119, 175104, "0 0 1 2 3 4"},
        {100,
         "rate=25,interlaced=1",
         "25",
         {"--filter", "bobber:_front=1"},
         176400,
         100,
         176400,
         "0 1 2 3 4"},
        {100, "rate=25,interlaced=1", "50", {"--filter", "bobber"}, 176400, 200, 176400, "0 0 1 1 2 2"},
    };
    for (const auto& row : rows) {
        makeCounted("in.yuv", row.frames);
        const std::string sound = contents(makeWav("in.wav", row.inSamples));
        const std::string format = std::string("size=64x48,pixel=I420,") + row.raw;
        const std::string what = std::string(row.raw) + " to " + row.out;
        works(
            Words{"transcode", "in.yuv", "in.wav", "--raw", format, "-o", "o.raw", "-y", "--rate", row.out} +
            row.more);
        EXPECT_EQ(size("o.raw"), row.written * static_cast<long long>(kFrame)) << what;
        const auto seen =
            static_cast<std::size_t>(std::count(row.first, row.first + std::strlen(row.first), ' '));
        EXPECT_EQ(shown("o.raw", seen + 1), row.first) << what;
        const std::string out = wavPart(contents("o.wav"), "data");
        EXPECT_EQ(static_cast<long long>(out.size()), row.samples * 4) << what;
        std::string all = wavPart(sound, "data");
        all.resize(std::max(all.size(), out.size()));  // silence up to the end of the last frame
        EXPECT_TRUE(row.more.empty() || row.more[0] != "--from" ? all.compare(0, out.size(), out) == 0
                                                                : all.find(out) != std::string::npos)
            << what;
    }
}

}  // namespace
