// Segments of inputs, one after the other: which frames and samples come out, at each seam.
#include <cstdlib>

#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

using Json = nlohmann::json;

using testing::HasSubstr;
using testing::Not;

constexpr int kWidth = 32, kHeight = 32;
constexpr std::size_t kFrameBytes = kWidth * kHeight * 3 / 2;
const Words kRaw = {"--raw", "size=32x32,pixel=I420,rate=30000/1001"};
constexpr long long kFrames = 200, kSamples = 300000;  // of the inputs

// Frame n is filled with a level of its own, and sample n has a value of its own in both channels.
class Join : public Tool {
  protected:
    void SetUp() override {
        Tool::SetUp();
        std::string pictures, sound;
        for (int i = 0; i < kFrames; ++i) pictures += std::string(kFrameBytes, static_cast<char>(20 + i));
        for (int i = 0; i < kSamples; ++i) sound += sample(i);
        folder.write("p.yuv", pictures);
        folder.write("s.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 44100, 16)) + wavChunk("data", sound)));
    }

    static std::string sample(long long number) {
        return leBytes(static_cast<std::uint64_t>(number & 0x7FFF), 2) +
               leBytes(static_cast<std::uint64_t>(number >> 15), 2);
    }

    // The levels of the frames of a raw file; -1 for one that is not even.
    std::vector<int> levels(const std::string& name) const {
        const std::string bytes = contents(name);
        EXPECT_EQ(bytes.size() % kFrameBytes, 0u);
        std::vector<int> found;
        for (std::size_t at = 0; at + kFrameBytes <= bytes.size(); at += kFrameBytes) {
            const std::string frame = bytes.substr(at, kFrameBytes);
            const bool even = frame.find_first_not_of(frame[0]) == frame.npos;
            found.push_back(even ? static_cast<unsigned char>(frame[0]) : -1);
        }
        return found;
    }
    // The numbers of the samples of a WAV file; -1 for silence that follows others.
    std::vector<long long> samples(const std::string& name) const {
        const std::string data = contents(name).substr(80);
        std::vector<long long> found;
        for (std::size_t at = 0; at + 4 <= data.size(); at += 4)
            found.push_back(static_cast<long long>(leNumber(data, at, 2)) +
                            (static_cast<long long>(leNumber(data, at + 2, 2)) << 15));
        return found;
    }
};

// Joins are compared with a model in joinmodel_test.cpp.
TEST_F(Join, CutsOfAPictureWithItsSoundAreExact) {
    works(Words{"transcode", "p.yuv", "s.wav", "--cut", "7f-18f", "--cut", "3f-4f", "--cut", "40f-71f", "-o",
                "o.yuv"} +
          kRaw);
    std::vector<int> pictures;
    std::vector<long long> sound;
    for (const auto& [first, end] : {std::pair{7, 18}, {3, 4}, {40, 71}}) {
        for (int i = first; i < end; ++i) pictures.push_back(20 + i);
        // Sound begins with the sample that the first frame begins in, and lasts until all frames so far are
        // covered. Frame n begins at n * 1001 / 30000 s.
        const std::size_t due = pictures.size() * 1001 * 44100 / 30000;
        for (long long n = first * 1001LL * 44100 / 30000; sound.size() < due; ++n) sound.push_back(n);
    }
    EXPECT_EQ(levels("o.yuv"), pictures);
    EXPECT_TRUE(samples("o.wav") == sound);
}

TEST_F(Join, SoundAloneIsExactToTheSample) {
    works({"transcode", "s.wav", "--cut", "0.5-1", "--cut", "2-2.25", "--cut", "0-0.1", "-o", "o.wav"});
    std::vector<long long> wanted;
    for (const auto& [from, to] : {std::pair{22050, 44100}, {88200, 99225}, {0, 4410}})
        for (int i = from; i < to; ++i) wanted.push_back(i);
    EXPECT_TRUE(samples("o.wav") == wanted);
}

TEST_F(Join, OneCutOfTheGeneratorIsAPlainTask) {
    const std::string generator = "testgen:duration=2";
    works({"transcode", generator, "--cut", "0.2-0.6", "--save-task", "t.xml", "-o", "a.raw"});
    works({"transcode", generator, "--from", "0.2", "--to", "0.6", "-o", "b.raw"});
    EXPECT_EQ(contents("a.raw"), contents("b.raw"));
    EXPECT_EQ(contents("a.wav"), contents("b.wav"));
    works({"run", "t.xml", "-y"});
    EXPECT_EQ(contents("a.raw"), contents("b.raw"));
}

TEST_F(Join, WhatASegmentLacksIsBlackOrSilent) {
    works(Words{"transcode", "--join", "p.yuv@0f-3f", "s.wav@0-0.1", "p.yuv+s.wav@5f-7f", "-o", "o.yuv"} +
          kRaw);
    // A tenth of a second is 2.997 frames, and none of the sound is lost.
    EXPECT_EQ(levels("o.yuv"), (std::vector<int>{20, 21, 22, -1, -1, -1, 25, 26}));
    const std::string black = contents("o.yuv").substr(3 * kFrameBytes, kFrameBytes);
    EXPECT_EQ(black.substr(0, kWidth * kHeight), std::string(kWidth * kHeight, 16));
    EXPECT_EQ(black.substr(kWidth * kHeight), std::string(kFrameBytes - kWidth * kHeight, '\x80'));
    const auto heard = samples("o.wav");
    const auto begin = static_cast<std::size_t>(3 * 1001 * 44100 / 30000);
    ASSERT_GT(heard.size(), begin + 4410);
    for (std::size_t i = 0; i < begin; ++i) EXPECT_EQ(heard[i], 0) << i;
    EXPECT_EQ(heard[begin], 0);
    EXPECT_EQ(heard[begin + 1], 1);
    EXPECT_EQ(heard[begin + 4409], 4409);
    EXPECT_EQ(heard[begin + 4410], 0);
}

TEST_F(Join, ClippingIsCountedOverTheSegments) {
    std::string samples;
    for (int i = 0; i < 48000; ++i) {
        const float value = i % 4 == 0 ? 2.0F : 0.1F;
        samples.append(reinterpret_cast<const char*>(&value), sizeof value);
    }
    folder.write("loud.wav", riff(wavChunk("fmt ", wavFormat(3, 1, 48000, 32)) + wavChunk("data", samples)));
    for (const char* third : {"0-0.25", "0.5-0.75"}) {  // read again, and the rest of what was read before
        const auto result = works({"transcode", "loud.wav", "--cut", "0.25-0.5", "--cut", "0.75-1", "--cut",
                                   third, "-o", "o.wav", "-y"});
        EXPECT_THAT(result.err, HasSubstr("9000 samples of audio stream 0 were clipped"));
    }
}

TEST_F(Join, OthersAreConvertedToTheFirst) {
    const std::string other = "testgen:size=64x48,rate=25,duration=2";
    works(Words{"transcode", "--join", "p.yuv+s.wav@0f-10f", other + "@0.5-1.5", "-o", "o.yuv"} + kRaw);
    // A second of the other is 29 frames at this rate.
    EXPECT_EQ(levels("o.yuv").size(), 10u + 29u);
    EXPECT_EQ(samples("o.wav").size(), 39u * 1001 * 44100 / 30000);
    works({"transcode", "--join", other + "@0-1", "testgen:size=32x64,rate=50,duration=1", "-o", "b.avi"});
    works({"transcode", "--join", other + "@0-1", "s.wav@0-1", "--samplerate", "8000", "--channels", "1",
           "-o", "o2.wav"});
    EXPECT_EQ(size("o2.wav"), 80 + 2 * 16000);
}

TEST_F(Join, FadesTextsAndTimecodesGoOverTheWholeOutput) {
    folder.write("t.srt", "1\n00:00:00,400 --> 00:00:01,000\nHi\n");
    const Words once{"transcode", "--raw", "size=32x32,pixel=I420,rate=25", "p.yuv", "--pixel", "I420"};
    const Words joined{"transcode",     "--raw",       "size=32x32,pixel=I420,rate=25",
                       "--join",        "p.yuv@0f-8f", "p.yuv@8f-21f",
                       "p.yuv@21f-30f", "--pixel",     "I420"};
    for (const Words& options : {Words{"--fade", "4f"}, Words{"--subtitles", "t.srt"},
                                 Words{"--timecode=10:00:00:00"}, Words{"--fade", "3f,5f", "--flip"}}) {
        works(once + Words{"--to", "30f", "-o", "a.yuv", "-y"} + options);
        works(joined + Words{"-o", "b.yuv", "-y"} + options);
        EXPECT_TRUE(contents("a.yuv") == contents("b.yuv")) << testing::PrintToString(options);
    }
    const Words faded{"--fade", "0.5", "--dither", "none", "-o"};
    works(Words{"transcode", "s.wav", "--to", "3"} + faded + Words{"a.wav"});
    works(Words{"transcode", "--join", "s.wav@0-1", "s.wav@1-2", "s.wav@2-3"} + faded + Words{"b.wav"});
    // The curve begins anew in the last segment, so that its points are rounded otherwise.
    const std::string one = contents("a.wav"), other = contents("b.wav");
    ASSERT_EQ(one.size(), other.size());
    for (std::size_t at = 80; at < one.size(); at += 2) {
        const int difference =
            static_cast<int>(leNumber(one, at, 2)) - static_cast<int>(leNumber(other, at, 2));
        ASSERT_LE(std::abs(difference), 1) << at;
    }
}

// Cuts keep what belongs to their input.
TEST_F(Join, CutsKeepTheTimesOfTheirInput) {
    folder.write("t.srt", "1\n00:00:00,400 --> 00:00:00,800\nHi\n");
    const Words raw{"--raw", "size=32x32,pixel=I420,rate=25"};
    for (const Words& options : {Words{"--subtitles", "t.srt"}, Words{"--timecode"}}) {
        works(Words{"transcode", "p.yuv", "-o", "a.yuv", "-y"} + raw + options);
        works(Words{"transcode", "p.yuv", "--cut", "5f-12f", "--cut", "18f-30f", "-o", "b.yuv", "-y"} + raw +
              options);
        const std::string all = contents("a.yuv");
        EXPECT_TRUE(contents("b.yuv") == all.substr(5 * kFrameBytes, 7 * kFrameBytes) +
                                             all.substr(18 * kFrameBytes, 12 * kFrameBytes))
            << options[0];
    }
}

// A gain of its own for each segment would lose how loud they are next to each other.
TEST_F(Join, OneGainBringsAllSegmentsToALevel) {
    const auto tone = [&](const char* name, const Words& options) {
        works(Words{"transcode", "testgen:size=32x32,rate=25,duration=3", "--no-video", "-o", name} +
              options);
    };
    const auto measured = [&](const std::string& name) {
        return Json::parse(works({"loudness", name, "--json"}).out)[0]["streams"][0];
    };
    tone("loud.wav", {"--volume=-20"});
    tone("quiet.wav", {"--volume=-38", "--samplerate", "48000", "--channels", "1", "--bits", "24"});
    const Words join{"transcode",    "--join",   "loud.wav", "quiet.wav@0-1.5",
                     "loud.wav@1-2", "--dither", "none"};
    works(join + Words{"-o", "joined.wav"});
    const struct {
        const char *option, *key;
        double level;
    } rows[] = {{"--normalize", "integrated_lufs", -23},
                {"--normalize=-50", "integrated_lufs", -50},
                {"--normalize=peak:-6", "sample_peak_dbfs", -6},
                {"--normalize=rms:-20", "rms_dbfs", -20}};
    for (const auto& row : rows) {
        works(join + Words{row.option, "-o", "n.wav", "-y", "--save-task", "job.xml"});
        EXPECT_NEAR(measured("n.wav")[row.key].get<double>(), row.level, 0.1) << row.option;
        const std::string made = contents("n.wav");
        EXPECT_THAT(contents("job.xml"), Not(HasSubstr("normalizer"))) << "the task has the gain";
        works({"run", "job.xml", "-y"});
        EXPECT_TRUE(contents("n.wav") == made) << row.option;
        works({"transcode", "joined.wav", row.option, "--dither", "none", "-o", "once.wav", "-y"});
        const std::string once = wavPart(contents("once.wav"), "data"), parts = wavPart(made, "data");
        ASSERT_EQ(once.size(), parts.size());
        for (std::size_t at = 0; at < once.size(); at += 2) {
            const auto value = [&](const std::string& s) {
                return static_cast<std::int16_t>(leNumber(s, at, 2));
            };
            ASSERT_NEAR(value(once), value(parts), 40) << row.option << at;
        }
    }
    const Outcome bound = works(join + Words{"--normalize=0", "-o", "n.wav", "-y", "--progress", "json"});
    EXPECT_THAT(bound.err, HasSubstr("true peak is at the limit"));
    EXPECT_THAT(bound.err, HasSubstr("\"pass\":1,\"passes\":2"));
    EXPECT_THAT(bound.err, HasSubstr("\"pass\":2,\"passes\":2"));
    // The plan needs no measuring, but a task does.
    const Outcome plan = works(join + Words{"--normalize", "-o", "x.wav", "--dry-run"});
    EXPECT_THAT(plan.err, HasSubstr("is measured when the job runs"));
    works(join + Words{"--normalize", "-o", "x.wav", "--dry-run", "--save-task", "dry.xml"});
    EXPECT_THAT(contents("dry.xml"), HasSubstr("avol"));
    EXPECT_EQ(size("x.wav"), -1);
}

// The sound next to the pictures counts as far as they go, and nothing else of its file.
TEST_F(Join, TheLevelIsOfWhatIsHeard) {
    std::string sound;
    for (int i = 0; i < 3 * 44100; ++i)
        sound += leBytes(static_cast<std::uint64_t>(i < 44100 ? i % 100 * 20 : i % 100 * 300), 2);
    folder.write("t.wav", riff(wavChunk("fmt ", wavFormat(1, 1, 44100, 16)) + wavChunk("data", sound)));
    works(Words{"transcode", "--join", "p.yuv+t.wav@0f-10f", "p.yuv@0f-5f", "p.yuv+t.wav@10f-20f", "--pixel",
                "I420", "--normalize=peak:-6", "--dither", "none", "-o", "o.yuv"} +
          kRaw);
    EXPECT_NEAR(Json::parse(works({"loudness", "o.wav", "--json"}).out)[0]["streams"][0]["sample_peak_dbfs"]
                    .get<double>(),
                -6, 0.1);
}

TEST_F(Join, AStopEndsTheMeasuring) {
    std::string out;
    const std::string tone = "testgen:size=32x32,rate=25,duration=40000";
    Process run(words({"transcode", "--join", tone, tone, "--no-video", "--normalize", "-o", "o.wav",
                       "--progress", "json"}),
                here());
    const auto before = listing();
    // The first one comes before anything is read.
    for (int i = 0; i < 3; ++i) ASSERT_TRUE(run.waitFor("\"pass\":1,\"passes\":2"));
    run.signal(SIGTERM);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 143) << o.err;
    EXPECT_THAT(o.err, HasSubstr("\"state\":\"stopped\""));
    EXPECT_EQ(listing(), before);
}

TEST_F(Join, NamesAreReadAsTheyExist) {
    const std::string wav = contents("s.wav");
    for (const char* name : {"a@1-2", "a+b.wav", "c.wav@3-4"}) folder.write(name, wav);
    works({"transcode", "--join", "a+b.wav", "s.wav@0-1", "-o", "o.wav"});
    EXPECT_EQ(size("o.wav"), 80 + 4 * (kSamples + 44100));
    folder.write("q@1-2", contents("p.yuv"));
    works(Words{"transcode", "--join", "s.wav+q@1-2", "-o", "n.yuv"} + kRaw);
    EXPECT_EQ(levels("n.yuv").size(), static_cast<std::size_t>(kFrames)) << "the whole file";
    works({"transcode", "--join", "s.wav@1-", "s.wav@-1", "s.wav@1--0.5", "-o", "p.wav"});
    EXPECT_EQ(size("p.wav"), 80 + 4 * (kSamples + kSamples - 44100 - 22050));
}

TEST_F(Join, WhatCantBeJoinedIsRefusedByName) {
    const Words join{"transcode", "--join", "p.yuv@0f-10f", "p.yuv@20f-30f", "-o", "x.yuv"};
    fails(2, join + kRaw + Words{"--filter", "rawdump:filename=d"}, {"--filter rawdump", "each segment"});
    fails(2, join + kRaw + Words{"--delay", "1"}, {"--delay", "several segments"});
    fails(2, join + kRaw + Words{"--normalize"}, {"--normalize", "no sound"});
    fails(2, join + kRaw + Words{"--from", "1"}, {"--from", "--join"});
    fails(2, join + kRaw + Words{"--cut", "1-2"}, {"--join", "--cut"});
    fails(2, join + kRaw + Words{"--volume", "3"}, {"--volume"});
    fails(3, Words{"transcode", "--join", "p.yuv+no.wav@0f-1f", "-o", "x.yuv"} + kRaw, {"'no.wav'"});
    fails(2, Words{"transcode", "--join", "p.yuv@9f-3f", "-o", "x.yuv"} + kRaw, {"3f"});
    fails(2, Words{"transcode", "--join", "p.yuv@900f-", "-o", "x.yuv"} + kRaw, {"900f", "'p.yuv'"});
    for (const char* cut : {"x", "1", "-", ""})
        fails(2, {"transcode", "s.wav", "--cut", cut, "-o", "x.wav"}, {"--cut", "FROM-TO"});
    fails(2, {"transcode", "s.wav", "--cut", "2-1", "-o", "x.wav"},
          {"--cut 2-1: to 1: it is not after 2; give a later end"});
    fails(2, {"transcode", "--join", "s.wav@50-60", "-o", "x.wav"},
          {"s.wav@50-60: from 50: it is after the end of 's.wav'"});
    fails(2, {"transcode", "--join", "-o", "x.wav"}, {"INPUT"});
    fails(4, {"transcode", "--join", "s.wav@0-1", "s.wav@1-2", "-o", "s.wav", "-y"}, {"'s.wav'", "input"});
}

TEST_F(Join, ThePlanShowsTheSegments) {
    const std::string plan =
        works(Words{"transcode", "--join", "p.yuv@0f-10f", "s.wav@0-1", "-o", "x.yuv", "--dry-run"} + kRaw)
            .out;
    for (const char* part : {"segment  1\n", "video 0 of 'p.yuv', from 0:00:00.000", "segment  2\n",
                             "'s.wav'", "expect  40 frames"})
        EXPECT_THAT(plan, HasSubstr(part));
}

TEST_F(Join, ATaskShowsItsSegmentsBriefly) {
    Words job{"transcode", "--join", "-o", "x.wav", "--dry-run", "--save-task", "job.xml"};
    for (int i = 0; i < 23; ++i) job.push_back("s.wav@" + std::to_string(i * 0.01) + "-1");
    works(job);
    const std::string text = works({"info", "job.xml"}).out;
    EXPECT_THAT(text, HasSubstr("  segment 20  audio 0 of '" + folder.file("s.wav") +
                                "', from 0:00:00.190 to 0:00:01.000\n"));
    EXPECT_THAT(text, Not(HasSubstr("segment 21")));
    EXPECT_THAT(text, HasSubstr("  and 3 segments more\n  output "));
    const Json all = Json::parse(works({"info", "job.xml", "--json"}).out);
    EXPECT_EQ(all[0]["segments"].size(), 23u);
    EXPECT_EQ(all[0]["segments"][0]["sources"][0]["to_s"], 1.0);
}

// A task of more inputs than a process may have open files.
TEST_F(Join, ThousandsOfSegmentsNeedFewDescriptors) {
    Words job{"-c", "ulimit -n 64; exec \"$@\"", "sh", program(), "transcode", "-o", "o.wav", "--join"};
    const std::string wav =
        riff(wavChunk("fmt ", wavFormat(1, 2, 44100, 16)) + wavChunk("data", patternBytes(400)));
    for (int i = 0; i < 300; ++i) {
        const std::string name = "w" + std::to_string(i) + ".wav";
        folder.write(name, wav);
        job.push_back(name);
    }
    const Outcome o = runProgram(Words{"sh"} + job, here());
    EXPECT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(size("o.wav"), 80 + 300 * 400);
}

}  // namespace
