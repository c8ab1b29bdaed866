// What options do to a sound, read back from the files.
#include <cmath>
#include <functional>

#include "tests/system/tool.h"

namespace {

constexpr double kTurn = 6.283185307179586;

class SoundOptions : public Tool {
  protected:
    // A 16-bit tone of `amplitude` (1: full scale) in each channel, 440 Hz higher from channel to channel.
    void makeTone(const std::string& name, unsigned samples, double amplitude, unsigned channels = 2,
                  unsigned rate = 48000) const {
        std::string data;
        for (unsigned i = 0; i < samples; ++i)
            for (unsigned channel = 0; channel < channels; ++channel) {
                const double value = amplitude * std::sin(kTurn * 440 * (channel + 1) * i / rate);
                data += leBytes(static_cast<uint16_t>(std::lround(value * 32767)), 2);
            }
        folder.write(name, riff(wavChunk("fmt ", wavFormat(1, channels, rate, 16)) + wavChunk("data", data)));
    }
    std::vector<int> values(const std::string& file) const {
        const std::string data = wavPart(contents(file), "data");
        std::vector<int> list;
        for (size_t at = 0; at < data.size(); at += 2)
            list.push_back(static_cast<int16_t>(leNumber(data, at, 2)));
        return list;
    }
    // The number after a key in what `loudness --json` prints.
    double level(const std::string& file, const std::string& key) const {
        const std::string json = works({"loudness", file, "--json"}).out;
        const size_t at = json.find("\"" + key + "\": ");
        return at == std::string::npos ? NAN : std::atof(json.c_str() + at + key.size() + 4);
    }
};

TEST_F(SoundOptions, ChannelsAreMapped) {
    makeWav("take.wav", 2000, 3);
    const std::vector<int> in = values("take.wav");
    const struct {
        const char* map;
        size_t channels;
        std::function<int(const int* sample, size_t channel)> wanted;
    } rows[] = {
        {"2,1,0", 3, [](const int* s, size_t c) { return s[2 - c]; }},
        {"1", 1, [](const int* s, size_t) { return s[1]; }},
        {"-,0,0,-", 4, [](const int* s, size_t c) { return c == 1 || c == 2 ? s[0] : 0; }},
        {"0+1", 1, [](const int* s, size_t) { return (s[0] + s[1]) >> 1; }},
        {"0+1+2,2", 2,
         [](const int* s, size_t c) { return c == 1 ? s[2] : (s[0] + s[1] + s[2]) * 256 / 3 >> 8; }},
        {"a:0.0,a:0.1,a:0.2", 3, [](const int* s, size_t c) { return s[c]; }},
    };
    for (const auto& row : rows) {
        works({"transcode", "take.wav", "--map", row.map, "--dither", "none", "-o", "out.wav", "-y"});
        std::vector<int> wanted;
        for (size_t i = 0; i < in.size(); i += 3)
            for (size_t c = 0; c < row.channels; ++c) wanted.push_back(row.wanted(&in[i], c));
        EXPECT_TRUE(values("out.wav") == wanted) << row.map;
    }
    makeWav("other.wav", 500, 2);
    works({"transcode", "take.wav", "other.wav", "--map", "a:1.1,a:1.0", "-o", "out.wav", "-y"});
    std::vector<int> swapped = values("other.wav");
    for (size_t i = 0; i < swapped.size(); i += 2) std::swap(swapped[i], swapped[i + 1]);
    EXPECT_TRUE(values("out.wav") == swapped);
}

// Channels of several sounds go into one, whatever their lengths and widths.
TEST_F(SoundOptions, SoundsAreJoinedByTheMap) {
    makeWav("left.wav", 70000, 1, 16, 48000);
    makeWav("right.wav", 5000, 2, 24, 48000);
    makeWav("old.wav", 300, 1, 8, 48000);
    makeWav("slow.wav", 300, 1, 16, 44100);
    const Words job{"transcode", "left.wav", "right.wav", "old.wav", "--dither",
                    "none",      "-y",       "-o",        "out.wav"};
    works(job + Words{"--map", "a:0.0,a:1.1,a:2.0"});
    const std::string left = wavPart(contents("left.wav"), "data"),
                      out = wavPart(contents("out.wav"), "data"),
                      right = wavPart(contents("right.wav"), "data"),
                      old = wavPart(contents("old.wav"), "data");
    std::string wanted;
    for (size_t i = 0; i < 70000; ++i) {
        wanted += std::string(1, '\0') + left.substr(2 * i, 2);
        wanted += i < 5000 ? right.substr(6 * i + 3, 3) : std::string(3, '\0');
        wanted += std::string(2, '\0') + (i < 300 ? static_cast<char>(old[i] ^ 0x80) : '\0');
    }
    EXPECT_TRUE(out == wanted);
    works(job + Words{"--map", "a:0.0+a:2.0", "--bits", "16", "--from", "0.001"});
    const std::string mean = wavPart(contents("out.wav"), "data");
    ASSERT_EQ(mean.size(), (70000u - 48) * 2);
    for (size_t i = 48; i < 1000; ++i) {
        const int a = static_cast<int16_t>(leNumber(left, 2 * i, 2));
        const int b = i < 300 ? (static_cast<int>(leNumber(old, i, 1)) - 128) * 256 : 0;
        ASSERT_EQ(static_cast<int16_t>(leNumber(mean, 2 * (i - 48), 2)), (a + b) >> 1) << i;
    }
    makeYuv("clip.yuv", 25);
    works(asYuv({"transcode", "clip.yuv", "left.wav", "old.wav", "--map", "a:1.0,a:0.0", "-o", "film.yuv"}));
    EXPECT_EQ(wavPart(contents("film.wav"), "data").size(), 48000u * 4);
    fails(2, {"transcode", "left.wav", "slow.wav", "--map", "0,a:1.0", "-o", "no.wav"},
          {"--map: sound 1 has another rate (44100 Hz) than sound 0 (48000 Hz)"});
    fails(2,
          {"transcode", "left.wav", "old.wav", "--map", "0,a:1.0", "-o", "no.wav", "--save-task", "no.xml"},
          {"--save-task: a task has no place for --map"});
}

// All of the sound is there, later or earlier, with and without a picture.
TEST_F(SoundOptions, DelaysMoveTheSound) {
    makeWav("take.wav", 24000, 2, 16, 48000);
    makeYuv("clip.yuv", 25);
    const std::string in = wavPart(contents("take.wav"), "data");
    const std::string late = std::string(12000 * 4, '\0') + in, early = in.substr(12000 * 4);
    const auto out = [&](const Words& options) {
        works(options + Words{"-o", "out.wav", "-y"});
        return wavPart(contents("out.wav"), "data");
    };
    EXPECT_TRUE(out({"transcode", "take.wav", "--delay", "0.25"}) == late);
    EXPECT_TRUE(out({"transcode", "take.wav", "--delay=-0.25"}) == early);
    makeWav("empty.wav", 0);
    EXPECT_TRUE(out({"transcode", "empty.wav", "--delay", "0.25"}).empty());
    EXPECT_TRUE(out({"transcode", "take.wav", "--delay", "0.25", "--to", "0.25"}) ==
                late.substr(0, 24000 * 4));
    const auto delayed = [&](const char* delay) {
        works(asYuv({"transcode", "clip.yuv", "take.wav", "--delay", delay, "-o", "film.yuv", "-y"}));
        return wavPart(contents("film.wav"), "data");
    };
    EXPECT_TRUE(delayed("0.25") == late + std::string(12000 * 4, '\0'));
    EXPECT_TRUE(delayed("-0.25") == early + std::string(36000 * 4, '\0'));
    EXPECT_TRUE(delayed("0.75") == std::string(36000 * 4, '\0') + in.substr(0, 12000 * 4));
    EXPECT_TRUE(delayed("5f") == std::string(9600 * 4, '\0') + in + std::string(14400 * 4, '\0'));
}

TEST_F(SoundOptions, GainsAndTargetsAreReached) {
    makeTone("take.wav", 96000, 0.1);
    makeTone("other.wav", 96000, 0.2);
    const struct {
        Words options;
        const char* key;
        double level, within;
    } rows[] = {
        {{"--volume", "-6"}, "sample_peak_dbfs", -26, 0.02},
        {{"--volume", "+12.5"}, "sample_peak_dbfs", -7.5, 0.02},
        {{"--volume", "-6", "--volume", "a:0=6"}, "sample_peak_dbfs", -14, 0.02},
        {{"--normalize"}, "integrated_lufs", -23, 0.1},
        {{"--normalize=-16"}, "integrated_lufs", -16, 0.1},
        {{"--normalize=-16", "--fade", "0.5"}, "integrated_lufs", -16, 0.1},
        {{"--normalize=-30", "--samplerate", "44100", "--channels", "1"}, "integrated_lufs", -30, 0.1},
        {{"--normalize=peak"}, "sample_peak_dbfs", -1, 0.05},
        {{"--normalize=rms:-20"}, "rms_dbfs", -20, 0.05},
    };
    for (const auto& row : rows) {
        works(Words{"transcode", "take.wav", "-o", "out.wav", "-y"} + row.options);
        EXPECT_NEAR(level("out.wav", row.key), row.level, row.within) << testing::PrintToString(row.options);
    }
    works({"transcode", "take.wav", "other.wav", "--volume", "a:1=-6", "-o", "c_%d.wav"});
    EXPECT_TRUE(wavPart(contents("c_0.wav"), "data") == wavPart(contents("take.wav"), "data"));
    EXPECT_NEAR(level("c_1.wav", "sample_peak_dbfs"), -20, 0.03);
    const Outcome bound = works({"transcode", "take.wav", "--normalize=0", "-o", "out.wav", "-y"});
    EXPECT_THAT(bound.err, testing::HasSubstr("its true peak is at the limit of -1.0 dBTP"));
    EXPECT_NEAR(level("out.wav", "true_peak_dbtp"), -1, 0.05);
}

TEST_F(SoundOptions, ClippingNamesTheStreamAndItsSamples) {
    makeTone("take.wav", 4800, 0.5, 1);
    makeTone("other.wav", 4800, 0.9, 1);
    const std::vector<int> in = values("other.wav");
    const long long beyond = std::count_if(in.begin(), in.end(), [](int v) { return std::abs(v) > 16383; });
    const Outcome o = works({"transcode", "take.wav", "other.wav", "--volume", "a:1=6.0206", "--dither",
                             "none", "-o", "o_%d.wav"});
    EXPECT_THAT(o.err, testing::HasSubstr("warning: audio stream 1 of 'o_%d.wav' is clipped: "));
    EXPECT_THAT(o.err, testing::Not(testing::HasSubstr("audio stream 0")));
    EXPECT_THAT(o.err, testing::Not(testing::HasSubstr("clipping detected")));
    const size_t at = o.err.find("is clipped: ");
    ASSERT_NE(at, std::string::npos);
    EXPECT_NEAR(static_cast<double>(std::atoll(o.err.c_str() + at + 12)), static_cast<double>(beyond), 4);
    fails(1, {"transcode", "take.wav", "--volume", "12", "--strict", "-q", "-o", "no.wav"},
          {"the job had 1;"});
}

// The sound fades with the frames of its picture, or by itself.
TEST_F(SoundOptions, FadesFollowThePicture) {
    folder.write("take.wav", riff(wavChunk("fmt ", wavFormat(1, 1, 48000, 16)) + wavChunk("data", [] {
                                      std::string data;
                                      for (int i = 0; i < 48000; ++i) data += leBytes(10000, 2);
                                      return data;
                                  }())));
    makeYuv("clip.yuv", 25);
    works({"transcode", "take.wav", "--fade", "0.2,0.4", "--dither", "none", "-o", "out.wav"});
    works(
        asYuv({"transcode", "clip.yuv", "take.wav", "--fade", "5f,10f", "--dither", "none", "-o", "o.yuv"}));
    for (const char* file : {"out.wav", "o.wav"}) {
        const std::vector<int> out = values(file);
        ASSERT_EQ(out.size(), 48000u);
        EXPECT_EQ(out[0], 0);
        EXPECT_NEAR(out[4800], 5000, 2);
        EXPECT_EQ(out[9600], 10000);
        EXPECT_EQ(out[28799], 10000);
        EXPECT_NEAR(out[38400], 5000, 2);
        EXPECT_NEAR(out[47999], 0, 2);
    }
}

// The picture ends with its sound, or its last frame stays until the sound has ended.
TEST_F(SoundOptions, PictureAndSoundEndTogether) {
    makeYuv("clip.yuv", 10);
    makeWav("take.wav", 24001, 2, 16, 48000);
    const std::string clip = contents("clip.yuv"), in = wavPart(contents("take.wav"), "data");
    works(asYuv({"transcode", "clip.yuv", "take.wav", "--longest", "-o", "long.yuv"}));
    std::string wanted = clip;
    for (int i = 10; i < 13; ++i) wanted += clip.substr(9 * kFrame);
    EXPECT_TRUE(contents("long.yuv") == wanted);
    EXPECT_TRUE(wavPart(contents("long.wav"), "data") == in + std::string((24960 - 24001) * 4, '\0'));
    works(asYuv({"transcode", "clip.yuv", "take.wav", "--longest", "--flip", "-o", "flip.yuv"}));
    const std::string flipped = contents("flip.yuv");
    EXPECT_EQ(flipped.size(), 13 * kFrame);
    EXPECT_TRUE(flipped.substr(9 * kFrame, kFrame) == flipped.substr(12 * kFrame)) << "not flipped again";
    makeWav("short.wav", 9700, 2, 16, 48000);
    works(asYuv({"transcode", "clip.yuv", "short.wav", "--shortest", "-o", "end.yuv"}));
    EXPECT_TRUE(contents("end.yuv") == clip.substr(0, 5 * kFrame));
    makeWav("tiny.wav", 100, 2, 16, 48000);
    fails(2, asYuv({"transcode", "clip.yuv", "tiny.wav", "--shortest", "-o", "no.yuv"}),
          {"--shortest: the sound of 'tiny.wav' ends within the first frame"});
    refuses({"transcode", "take.wav", "-o", "no.wav"}, {{{"--longest"}, {"--longest: this job has not both"}},
                                                        {{"--longest", "--shortest"}, {"contradicts"}}});
}

TEST_F(SoundOptions, WhatCanNotBeDoneIsRefused) {
    makeWav("many.wav", 100, 10);
    makeWav("crowd.wav", 100, 40);
    makeYuv("clip.yuv", 2);
    refuses({"transcode", "many.wav", "-o", "no.wav"},
            {{{"--volume", "3"}, {"the sound of 'many.wav' has 10 channels, and this works on 8", "--map"}},
             {{"--filter", "audiolevel"}, {"has 10 channels, and it works on 8"}},
             {{"--volume", "3", "--normalize"}, {"--normalize contradicts it"}},
             {{"--dither", "some"}, {"--dither: 'some' is none of its values"}},
             {{"--delay", "3f"}, {"'3f' counts frames, but the input has no frame rate"}}});
    makeWav("eight.wav", 100, 8);
    works({"transcode", "eight.wav", "--filter", "avol:volume=-3,_front=1", "-o", "eight_out.wav",
           "--save-task", "eight.xml"});
    makeWav("eight.wav", 100, 10);
    fails(2, {"run", "eight.xml", "-o", "no.wav"},
          {"--filter avol: the sound has 10 channels, and it works on 8"});
    fails(2, asYuv({"transcode", "clip.yuv", "--volume", "3", "-o", "no.yuv"}),
          {"--volume: this job has no sound"});
    works({"transcode", "crowd.wav", "--map", "39,0", "-o", "two.wav"});
    const std::string in = wavPart(contents("crowd.wav"), "data"), out = wavPart(contents("two.wav"), "data");
    EXPECT_EQ(out.substr(0, 4), in.substr(78, 2) + in.substr(0, 2));
    works({"transcode", "many.wav", "--normalize", "--samplerate", "48000", "-o", "ten.wav"});
}

// RF64 has no room for it in its header.
TEST_F(SoundOptions, AChannelMaskThatIsLostIsNamed) {
    for (const auto& [megabytes, lost] : {std::pair{6, false}, {36, true}}) {  // 0.9 and 5.4 GB of output
        folder.write("take.wav", riff(wavChunk("fmt ", wavExtensible(1, 3, 8000, 16, 0xB)) +
                                      wavChunk("data", std::string(size_t(megabytes) << 20, '\0'))));
        const Outcome o = works({"transcode", "take.wav", "-o", "out.wav", "--dry-run", "--bits", "24",
                                 "--samplerate", "768000"});
        EXPECT_EQ(o.err.find("the output can't keep the places of its channels") != std::string::npos, lost);
    }
}

TEST_F(SoundOptions, LoudnessMeasuresEveryFileThatItCan) {
    makeTone("tone.wav", 96000, 0.5);
    makeWav("empty.wav", 0);
    makeYuv("clip.yuv", 1);
    folder.write("quiet.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) +
                                   wavChunk("data", std::string(192000, '\0'))));
    const Outcome o = works({"loudness", "tone.wav", "quiet.wav", "empty.wav"});
    EXPECT_THAT(o.out, testing::HasSubstr("true peak -6.0 dBTP, peak -6.0 dBFS, RMS -9.0 dBFS"));
    EXPECT_THAT(o.out, testing::HasSubstr("-inf LUFS, range 0.0 LU, true peak -inf dBTP"));
    EXPECT_THAT(works({"loudness", "--json", "quiet.wav"}).out,
                testing::HasSubstr("\"integrated_lufs\": null"));
    // Channel 2 is one of low frequency effects, which does not count.
    const std::string tones = wavPart(contents("tone.wav"), "data");
    std::string data;
    for (size_t i = 0; i < tones.size(); i += 4) data += std::string(4, '\0') + tones.substr(i, 2);
    for (const unsigned mask : {0x7u, 0xBu})
        folder.write("low" + std::to_string(mask) + ".wav",
                     riff(wavChunk("fmt ", wavExtensible(1, 3, 48000, 16, mask)) + wavChunk("data", data)));
    EXPECT_NEAR(level("low7.wav", "integrated_lufs"), -9.8, 0.3);
    EXPECT_THAT(works({"loudness", "low11.wav"}).out, testing::HasSubstr("-inf LUFS"));
    EXPECT_THAT(works({"transcode", "low11.wav", "--normalize", "-o", "n.wav"}).err,
                testing::HasSubstr("it is too short or too quiet for a loudness"));
    const Outcome some = tarsel({"loudness", "none.wav", "testgen:audio=0,duration=1", "tone.wav"});
    EXPECT_EQ(some.status, 3);
    EXPECT_THAT(some.out, testing::HasSubstr("'tone.wav'\n  audio 0"));
    EXPECT_THAT(some.err, testing::HasSubstr("can't open 'none.wav'"));
    EXPECT_THAT(some.err, testing::HasSubstr("has no sound"));
}

}  // namespace
