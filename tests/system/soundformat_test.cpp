// Sound whose format changes from file to file: widths, rates, levels.
#include "tests/system/tool.h"

namespace {

class SoundFormat : public Tool {
  protected:
    // The values of a WAV file; 8 bits about zero.
    std::vector<int> values(const std::string& file, int bytes) const {
        const std::string data = wavPart(contents(file), "data");
        std::vector<int> list;
        for (size_t at = 0; at < data.size(); at += static_cast<size_t>(bytes)) {
            const auto raw = static_cast<uint32_t>(leNumber(data, at, bytes));
            const int shift = 32 - 8 * bytes;
            list.push_back(bytes == 1 ? static_cast<int>(raw) - 128
                                      : static_cast<int>(raw << shift) >> shift);
        }
        return list;
    }
    template <class Formula>
    void expectEach(int inBytes, int outBytes, Formula formula) const {
        std::vector<int> wanted;
        for (const int value : values("take.wav", inBytes)) wanted.push_back(formula(value));
        EXPECT_TRUE(values("out.wav", outBytes) == wanted);
    }
};

TEST_F(SoundFormat, WidthsChangeWithoutLoss) {
    for (const int in : {1, 2, 3})
        for (const int out : {1, 2, 3}) {
            SCOPED_TRACE(std::to_string(in) + " to " + std::to_string(out) + " bytes");
            makeWav("take.wav", 12345, 2, 8 * static_cast<unsigned>(in), 48000);
            works({"transcode", "take.wav", "--bits", std::to_string(8 * out), "--dither", "none", "-o",
                   "out.wav", "-y"});
            expectEach(in, out, [=](int value) {
                return in < out ? value * (1 << 8 * (out - in)) : value >> 8 * (in - out);
            });
        }
}

TEST_F(SoundFormat, RatesKeepTheLength) {
    const struct {
        unsigned in, out, samples, wanted;
    } cases[] = {{44100, 48000, 44100, 48000}, {48000, 44100, 96000, 88200}, {8000, 192000, 801, 19224},
                 {192000, 8000, 48000, 2000},  {44100, 48000, 44101, 48001}, {48000, 44100, 48021, 44119},
                 {22050, 11025, 7, 3}};
    for (const auto& c : cases) {
        makeWav("take.wav", c.samples, 3, 16, c.in);
        works({"transcode", "take.wav", "--samplerate", std::to_string(c.out), "-o", "out.wav", "-y"});
        EXPECT_EQ(values("out.wav", 2).size(), 3 * c.wanted) << c.in << " to " << c.out;
    }
}

TEST_F(SoundFormat, LevelsFollowTheFilter) {
    makeWav("take.wav", 5000, 2, 16, 48000);
    works({"transcode", "take.wav", "--filter", "avol:volume=-6.1", "--dither", "none", "-o", "out.wav"});
    expectEach(2, 2, [](int value) { return (value * 256 * 15 >> 5) >> 8; });
    const Outcome o = works({"transcode", "take.wav", "--filter", "avol:volume=20,precision=16", "--dither",
                             "none", "-o", "out.wav", "-y"});
    EXPECT_THAT(o.err, testing::HasSubstr("audio stream 0 of 'out.wav' is clipped"));
    expectEach(2, 2, [](int value) { return std::clamp(value * 10, -32768, 32767); });
    fails(2, {"transcode", "take.wav", "--filter", "avol:precision=8", "-o", "no.wav"},
          {"'precision' takes 5 (gains up to 6 dB"});
    fails(2, {"transcode", "take.wav", "--filter", "aquant:dither=some", "-o", "no.wav"},
          {"'dither' takes none or triangular"});
}

TEST_F(SoundFormat, ListsAreGivenInJson) {
    makeWav("take.wav", 4800, 2, 16, 48000);
    const std::vector<int> in = values("take.wav", 2);
    const auto run = [&](const std::string& filter) {
        works({"transcode", "take.wav", "--filter", filter, "--dither", "none", "-o", "out.wav", "-y"});
        return values("out.wav", 2);
    };
    std::vector<int> wanted = in;
    for (size_t i = 0; i < wanted.size(); i += 2) {
        const double level = 100 - 50.0 * static_cast<double>(i / 2) / 4800;
        wanted[i] = static_cast<int>(wanted[i] * 256 * (level / 100)) >> 8;
        wanted[i + 1] = 0;
    }
    EXPECT_EQ(run(R"(audiolevel:volume_list_0=[{"time": 0, "volume":100},{"time":0.1,"volume":50}],)"
                  R"(volume_list_1=[{"time":0,"volume":0}])"),
              wanted);
    for (size_t i = 0; i < wanted.size(); ++i) wanted[i] = in[i ^ 1];
    EXPECT_EQ(run("chconvert:connMatrix=[1,[0]],_front=1"), wanted);
    for (const auto& [value, says] : {std::pair{"5", "'5' is no list; give a JSON array"},
                                      {"[1,2", "is not of the form key=value"},
                                      {"[1", "'[1' is no list"},
                                      {"{}", "'{}' is no list"},
                                      {"[7]", R"(a point has a "time" in seconds)"}})
        fails(2,
              {"transcode", "take.wav", "--filter", std::string("audiolevel:volume_list_0=") + value, "-o",
               "no.wav"},
              {says});
    fails(3, {"transcode", "testgen:duration=0.1", "--filter", "logo:filename=[a\\,b].png", "-o", "no.yuv"},
          {"[a,b].png"});
    const std::string deep = std::string(40, '[') + std::string(40, ']');
    fails(2, {"transcode", "take.wav", "--filter", "chconvert:connMatrix=" + deep, "-o", "no.wav"},
          {"is no list"});
}

// The sound is read twice, and the progress counts both.
TEST_F(SoundFormat, MeasuringIsAPass) {
    makeWav("take.wav", 480000, 2, 16, 48000);
    const Outcome o =
        works({"transcode", "take.wav", "--filter", "normalizer", "--progress", "json", "-o", "out.wav"});
    EXPECT_THAT(o.err, testing::HasSubstr("\"passes\":2"));
    const Outcome plain = works({"transcode", "take.wav", "--progress", "json", "-o", "plain.wav"});
    EXPECT_THAT(plain.err, testing::Not(testing::HasSubstr("\"passes\":2")));
}

}  // namespace
