// WAV files as people have them: other values, other headers, words and marks around the samples.
#include <nlohmann/json.hpp>

#include <bit>

#include "tests/system/tool.h"

namespace {

class WavFiles : public Tool {
  protected:
    void write(const std::string& name, const std::string& format, const std::string& data,
               const std::string& after = "") const {
        folder.write(name, riff(wavChunk("fmt ", format) + wavChunk("data", data) + after));
    }
    std::string out() const { return contents("out.wav"); }
};

std::string floats(const std::vector<float>& values) {
    std::string bytes;
    for (const float value : values) bytes += leBytes(std::bit_cast<std::uint32_t>(value), 4);
    return bytes;
}
std::string bext(std::uint64_t reference) {
    const auto text = [](const std::string& words, std::size_t bytes) {
        return words + std::string(bytes - words.size(), '\0');
    };
    return text("A boat", 256) + text("Recorder", 32) + text("", 32) + "2024-02-2923:59:58" +
           leBytes(reference, 8) + leBytes(1, 2) + std::string(254, '\0');
}
std::string repeatedLoudness(int value) {
    std::string bytes;
    for (int i = 0; i < 5; ++i) bytes += leBytes(static_cast<std::uint16_t>(value), 2);
    return bytes;
}
std::string cue(const std::vector<unsigned>& samples) {
    std::string data = leBytes(samples.size(), 4);
    for (std::size_t i = 0; i < samples.size(); ++i)
        data += leBytes(i + 1, 4) + leBytes(samples[i], 4) + "data" + leBytes(0, 8) + leBytes(samples[i], 4);
    return data;
}

// What the decoder reads when asked to is in wavdec_test.cpp; the tool asks it.
TEST_F(WavFiles, OtherValuesAreRead) {
    const std::string upper = leBytes(0x123456, 3) + leBytes(0x800000, 3);
    write("int.wav", wavFormat(1, 1, 8000, 32), leBytes(0x12345678, 4) + leBytes(0x80000000, 4));
    write("float.wav", wavFormat(3, 1, 8000, 32), floats({0x123456 / 8388608.0F, -1}));
    for (const char* name : {"int.wav", "float.wav"}) {
        const Outcome o = works({"transcode", name, "-o", "out.wav", "-y"});
        EXPECT_THAT(o.err, testing::Not(testing::HasSubstr("warning"))) << name;
        EXPECT_EQ(wavPart(out(), "data"), upper) << name;
    }
    write("alaw.wav", wavFormat(6, 1, 8000, 8), "\xD5\x2A");
    works({"transcode", "alaw.wav", "-o", "out.wav", "-y"});
    EXPECT_EQ(wavPart(out(), "data"), leBytes(8, 2) + leBytes(0x8200, 2));
}

TEST_F(WavFiles, ManyChannelsKeepTheirPlaces) {
    const std::string data = patternBytes(12 * 2 * 500);
    write("many.wav", wavExtensible(1, 12, 48000, 16, 0xFFF), data);
    const Outcome o = works({"transcode", "many.wav", "-o", "out.wav"});
    EXPECT_THAT(o.err, testing::Not(testing::HasSubstr("warning")));
    EXPECT_TRUE(wavPart(out(), "data") == data);
    EXPECT_EQ(leNumber(out(), 40, 4), 0xFFFu);
    write("stereo.wav", wavExtensible(1, 2, 48000, 16, 3), data);
    works({"transcode", "stereo.wav", "-o", "out.wav", "-y"});
    EXPECT_EQ(leNumber(out(), 40, 4), 0u) << "what two channels are anyhow is not said";
    write("most.wav", wavFormat(3, 40, 48000, 32), std::string(40 * 4 * 10, '\0'));
    fails(4, {"transcode", "most.wav", "-o", "no.wav"}, {"'no.wav': it takes 32 channels, the input has 40"});
    EXPECT_THAT(works({"info", "many.wav"}).out, testing::HasSubstr("12 ch, 16 bit, mask 0xfff"));
}

TEST_F(WavFiles, ClippedSamplesAreCountedOnce) {
    std::vector<float> values(20000, 0.5F);
    for (std::size_t i = 0; i < values.size(); i += 100) values[i] = -1.5F;
    write("loud.wav", wavFormat(3, 2, 8000, 32), floats(values));
    const std::string line = "'loud.wav' goes beyond full scale: 200 samples of audio stream 0 were clipped";
    EXPECT_THAT(works({"transcode", "loud.wav", "-o", "out.wav"}).err, testing::HasSubstr(line));
    EXPECT_THAT(
        works({"transcode", "loud.wav", "--filter", "normalizer:mode=peak,target=-3", "-o", "out.wav", "-y"})
            .err,
        testing::HasSubstr(line));
    EXPECT_EQ(tarsel({"transcode", "loud.wav", "-o", "no.wav", "--strict"}).status, 1);
    // Of a part those in it, however far a conversion reads on.
    const std::string part = "'loud.wav' goes beyond full scale: 40 samples";
    for (const Words& options : {Words{}, {"--samplerate", "48000"}, {"--normalize"}, {"--map", "1,0"}})
        EXPECT_THAT(
            works(Words{"transcode", "loud.wav", "--from", "0.5", "--to", "0.75", "-o", "out.wav", "-y"} +
                  options)
                .err,
            testing::HasSubstr(part))
            << testing::PrintToString(options);
}

// Loudness in "bext", of the second version on, is that of the samples.
TEST_F(WavFiles, WhatWasMeasuredIsLostWithItsSound) {
    constexpr size_t version = 346, loudness = 412;
    std::string measured = bext(1000);
    measured.replace(version, 2, leBytes(2, 2)).replace(loudness, 10, repeatedLoudness(-2300));
    write("take.wav", wavFormat(1, 1, 8000, 16), patternBytes(2 * 800), wavChunk("bext", measured));
    const struct {
        Words options;
        bool kept;
    } rows[] = {{{}, true},
                {{"--bits", "24"}, true},
                {{"--filter", "normalizer:mode=peak,target=-3"}, false},
                {{"--map", "a:0.0,a:0.0"}, false},
                {{"--channels", "2"}, false}};
    for (const auto& row : rows) {
        works(Words{"transcode", "take.wav", "-o", "out.wav", "-y"} + row.options);
        EXPECT_EQ(wavPart(out(), "bext").substr(loudness, 10), repeatedLoudness(row.kept ? -2300 : 0x7FFF))
            << testing::PrintToString(row.options);
    }
}

TEST_F(WavFiles, WordsAndMarksFollowTheCut) {
    const std::string info = "INFO" + wavChunk("INAM", "A name");
    write("take.wav", wavFormat(1, 1, 8000, 16), patternBytes(2 * 24000),
          wavChunk("bext", bext(1000000)) + wavChunk("LIST", info) +
              wavChunk("cue ", cue({100, 8000, 12000})) + wavChunk("smpl", "abcd") +
              wavChunk("id3 ", "efgh"));
    const Outcome whole = works({"transcode", "take.wav", "-o", "out.wav"});
    EXPECT_THAT(whole.err, testing::HasSubstr("'take.wav': the output can't keep smpl and id3 of it"));
    EXPECT_EQ(wavPart(out(), "bext"), bext(1000000));
    EXPECT_EQ(wavPart(out(), "LIST"), info);
    EXPECT_EQ(wavPart(out(), "cue "), cue({100, 8000, 12000}));
    EXPECT_EQ(leNumber(out(), 4, 4), out().size() - 8);

    works({"transcode", "take.wav", "--from", "1", "--to", "2", "-o", "out.wav", "-y"});
    EXPECT_EQ(wavPart(out(), "bext"), bext(1008000));
    EXPECT_EQ(leNumber(wavPart(out(), "cue "), 0, 4), 2u);
    EXPECT_EQ(leNumber(wavPart(out(), "cue "), 4 + 24 + 20, 4), 4000u);

    works({"transcode", "take.wav", "--from", "1", "--samplerate", "16000", "-o", "out.wav", "-y"});
    EXPECT_EQ(wavPart(out(), "bext"), bext(2016000));

    // A delay moves the sound, and with it what is said of its samples.
    works({"transcode", "take.wav", "--delay", "0.5", "--to", "1.5", "-o", "late.wav"});
    const std::string late = contents("late.wav");
    EXPECT_EQ(wavPart(late, "bext"), bext(996000));
    EXPECT_EQ(wavPart(late, "cue "), cue({4100, 12000, 16000}));
    works({"transcode", "take.wav", "--delay=-1.2", "-o", "early.wav"});
    EXPECT_EQ(wavPart(contents("early.wav"), "bext"), bext(1009600));
    EXPECT_EQ(leNumber(wavPart(contents("early.wav"), "cue "), 0, 4), 1u);
    EXPECT_EQ(leNumber(wavPart(contents("early.wav"), "cue "), 4 + 20, 4), 2400u);
    const Outcome joined = works({"transcode", "take.wav", "late.wav", "--map", "0,a:1.0", "-o", "two.wav"});
    EXPECT_THAT(joined.err,
                testing::HasSubstr("'take.wav': the output can't keep bext, LIST, cue, smpl and id3"));
    EXPECT_THAT(joined.err, testing::HasSubstr("'late.wav': the output can't keep bext, LIST and cue of it"));

    const Outcome o = works({"info", "out.wav"});
    for (const char* part :
         {"A boat", "Recorder", "2024-02-29 23:59:58", "sample 2016000", "A name", "sample 8000"})
        EXPECT_THAT(o.out, testing::HasSubstr(part));
    const auto file = nlohmann::json::parse(works({"info", "take.wav", "--json"}).out).at(0);
    EXPECT_EQ(file["bext"]["timeReference"], 1000000);
    EXPECT_EQ(file["info"][0]["text"], "A name");
    EXPECT_EQ(file["cues"].size(), 3u);
    EXPECT_EQ(file["other_chunks"], nlohmann::json::parse(R"(["smpl", "id3 "])"));

    const Outcome stream = works({"transcode", "take.wav", "-o", "-", "--format", "wav"});
    EXPECT_EQ(stream.out.size(), 80u + 2 * 24000);
    EXPECT_THAT(stream.err, testing::HasSubstr("can't keep bext, LIST, cue, smpl and id3 of it"));
}

}  // namespace
