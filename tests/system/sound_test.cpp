// Sound from file to file: every sample arrives.
#include "tests/system/tool.h"

namespace {

class Sound : public Tool {};

TEST_F(Sound, EverySampleArrives) {
    const struct {
        unsigned bits, channels, rate, samples;
    } cases[] = {
        {8, 1, 8000, 1},      {16, 2, 48000, 100003}, {16, 6, 96000, 9999},
        {24, 8, 48000, 3001}, {24, 3, 22050, 12345},  {16, 2, 44100, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::to_string(c.bits) + " bits, " + std::to_string(c.channels) + " channels");
        makeWav("take.wav", c.samples, c.channels, c.bits, c.rate);
        works({"transcode", "take.wav", "-o", "out.wav", "-y"});
        const std::string in = contents("take.wav"), out = contents("out.wav");
        EXPECT_TRUE(wavPart(in, "data") == wavPart(out, "data"));
        EXPECT_EQ(wavPart(in, "fmt ").substr(2, 6), wavPart(out, "fmt ").substr(2, 6));
    }
}

TEST_F(Sound, SplitChannelsGiveAFileEach) {
    makeWav("take.wav", 1001, 3, 24, 48000);
    works({"transcode", "take.wav", "--split-channels", "-o", "part.wav"});
    EXPECT_EQ(listing(), (std::set<std::string>{"take.wav", "part#00.wav", "part#01.wav", "part#02.wav"}));
    const std::string in = wavPart(contents("take.wav"), "data");
    for (size_t channel = 0; channel < 3; ++channel) {
        std::string wanted;
        for (size_t i = channel * 3; i < in.size(); i += 9) wanted += in.substr(i, 3);
        EXPECT_TRUE(wanted == wavPart(contents("part#0" + std::to_string(channel) + ".wav"), "data"));
    }
}

TEST_F(Sound, PointsAreSamples) {
    makeWav("take.wav", 48000, 2, 16, 48000);
    const std::string in = wavPart(contents("take.wav"), "data");
    const struct {
        const char *from, *to;
        size_t first, end;
    } cases[] = {{"0.25", "0.75", 12000, 36000}, {"0", "0.001", 0, 48}, {"0.5", "00:00:01", 24000, 48000}};
    for (const auto& c : cases) {
        works({"transcode", "take.wav", "--from", c.from, "--to", c.to, "-o", "part.wav", "-y"});
        EXPECT_TRUE(in.substr(c.first * 4, (c.end - c.first) * 4) == wavPart(contents("part.wav"), "data"))
            << c.from;
    }
}

// Next to a picture a sound that ends early is followed by silence, to the sample, however short it is.
TEST_F(Sound, ShorterThanThePicture) {
    makeYuv("clip.yuv", 25);
    for (const unsigned samples : {0u, 1u, 1763u, 1764u, 22050u, 43000u}) {
        const std::string own = wavPart(contents(makeWav("short.wav", samples)), "data");
        const Outcome o = works(asYuv({"transcode", "clip.yuv", "short.wav", "-o", "long.yuv", "-y"}));
        EXPECT_TRUE(wavPart(contents("long.wav"), "data") == own + std::string((44100 - samples) * 4, '\0'));
        EXPECT_THAT(o.err, testing::HasSubstr("the sound of 'short.wav' is followed by silence: it lasts"));
        EXPECT_THAT(o.err, testing::HasSubstr("and the picture 0:00:01.000; --shortest"));
        works(asYuv({"transcode", "clip.yuv", "short.wav", "-o", "rate.yuv", "-y", "--samplerate", "48000"}));
        EXPECT_EQ(wavPart(contents("rate.wav"), "data").size(), 48000u * 4);
    }
}

TEST_F(Sound, ALengthThatIsNotThere) {
    const std::string data = patternBytes(4000);
    folder.write("cut.wav", "RIFF" + leBytes(36u + 8000, 4) + "WAVE" +
                                wavChunk("fmt ", wavFormat(1, 2, 44100, 16)) + "data" + leBytes(8000, 4) +
                                data);
    fails(3, {"transcode", "cut.wav", "-o", "out.wav"},
          {"'cut.wav'", "1000 of 2000 samples", "--accept-partial"});
    const Outcome o = works({"transcode", "cut.wav", "-o", "out.wav", "--accept-partial"});
    EXPECT_THAT(o.err, testing::HasSubstr("warning: 'cut.wav' is damaged"));
    EXPECT_THAT(o.err, testing::HasSubstr("(1 warning)"));
    EXPECT_TRUE(data == wavPart(contents("out.wav"), "data"));
}

}  // namespace
