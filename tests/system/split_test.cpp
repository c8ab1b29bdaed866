// One job in parts: the same bytes, whole or absent, and nothing left.
#include <sched.h>

#include <chrono>
#include <fstream>

#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

using Json = nlohmann::json;

class SplitJob : public Tool {
  protected:
    // Writes the job whole and in parts, and compares all files of both.
    void isEqual(const Words& job, const std::string& output, const char* parts = "3") const {
        SCOPED_TRACE(testing::PrintToString(job));
        std::filesystem::create_directories(folder.file("whole"));
        std::filesystem::create_directories(folder.file("split"));
        const Words all = Words{"transcode"} + job + Words{"-y", "--no-sync"};
        const Outcome whole = works(all + Words{"-o", "whole/" + output});
        const Outcome split = works(all + Words{"-o", "split/" + output, "--split", parts});
        const auto files = filesOf("whole");
        EXPECT_EQ(filesOf("split"), files);
        EXPECT_FALSE(files.empty());
        for (const std::string& name : files)
            EXPECT_TRUE(contents("whole/" + name) == contents("split/" + name)) << name;
        std::string said = split.err;
        for (size_t at; (at = said.find("split/")) != std::string::npos;) said.replace(at, 5, "whole");
        EXPECT_EQ(said, whole.err);
        std::filesystem::remove_all(folder.file("whole"));
        std::filesystem::remove_all(folder.file("split"));
    }
    std::set<std::string> filesOf(const std::string& in) const {
        std::set<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(folder.file(in)))
            names.insert(entry.path().filename().string());
        return names;
    }
    // All that is said of a film but its sizes.
    Json factsOf(const std::string& film) const {
        Json facts = Json::parse(works({"info", "--exact", "--json", film}).out).at(0);
        facts.erase("file");
        facts.erase("bytes");
        for (Json& stream : facts["streams"]) stream.erase("bit_rate");
        return facts;
    }
    // The timecodes of an MPEG-2 stream.
    static std::set<std::string> groupTimes(const std::string& film) {
        std::set<std::string> times;
        const std::string mark("\0\0\1\xb8", 4);
        for (size_t at = 0; (at = film.find(mark, at)) != std::string::npos; at += 4)
            times.insert(film.substr(at + 4, 3));
        return times;
    }
    // A job that only a signal ends, once its parts are at work.
    static Words endless() {
        return words({"transcode", "testgen:size=64x64,rate=25,duration=20000", "-o", "out.avi", "--split",
                      "2", "--progress", "json", "--no-sync"});
    }
    // Once they are at work.
    static std::vector<pid_t> partsOf(const Process& job) {
        const std::string id = std::to_string(job.id());
        const auto last = std::chrono::steady_clock::now() + std::chrono::milliseconds(Process::kPatience);
        std::vector<pid_t> all;
        while (all.size() < 2 && std::chrono::steady_clock::now() < last && sched_yield() == 0) {
            std::ifstream list("/proc/" + id + "/task/" + id + "/children");
            all.clear();
            for (pid_t child; list >> child;) all.push_back(child);
        }
        return all;
    }
};

TEST_F(SplitJob, GivesTheBytesOfTheWhole) {
    const std::string small = "testgen:size=64x48,rate=";
    const struct {
        Words job;
        const char* output;
    } rows[] = {
        {{small + "25,duration=2"}, "a.avi"},
        {{small + "25,duration=2"}, "a.i420"},
        {{small + "25,duration=0.52", "--no-audio"}, "a.png"},
        {{small + "25,duration=1"}, "p_%03d.png"},
        {{small + "29.97,duration=12.3", "--fade", "4"}, "a.avi"},
        {{small + "25,duration=3", "--from", "1.013", "--to", "2.777", "--bits", "24"}, "a.avi"},
        {{small + "24,duration=4", "--rate", "30", "--samplerate", "48000"}, "a.avi"},
        {{small + "24,duration=4", "--rate", "24i", "--no-audio"}, "a.i420"},
        {{small + "25i,duration=2", "--deinterlace=double"}, "a.avi"},
        {{small + "25,duration=2", "--normalize", "--delay", "0.3", "--filter", "dynamics"}, "a.avi"},
        {{small + "25,duration=1", "--volume=-3.1234567", "--channels", "1"}, "a.avi"},
        {{small + "25,duration=1", "--longest", "--delay", "1"}, "a.avi"},
        {{"testgen:size=192x96,rate=25,duration=2,audio=0", "--timecode=10:00:00:00", "--subtitles", "s.srt"},
         "a.v210"},
    };
    const Words prores = {"--vcodec", "prores", "--meta", "timecode=10:00:00;00", "--language", "eng"};
    isEqual(Words{small + "29.97,duration=12.3", "--acodec", "aac"} + prores, "a.mov");
    isEqual({small + "25,duration=2", "--no-audio"}, "a.y4m");
    isEqual({small + "25i,duration=2", "--deinterlace=double", "--vcodec", "jpeg2000"}, "a.mov");
    folder.write("s.srt",
                 "1\n00:00:00,300 --> 00:00:01,500\nfirst\n\n2\n00:00:01,600 --> 00:00:01,900\nsecond\n");
    for (const auto& row : rows) isEqual(row.job, row.output);
    isEqual({small + "25,duration=0.2"}, "a.avi", "100");  // more parts than frames
}

// Pictures that depend on each other: the coder begins again in each part, and nothing else differs.
TEST_F(SplitJob, FilmsOfPartsHaveThePicturesAndTimesOfTheWhole) {
    const struct {
        const char* source;
        Words coded;
        const char *whole, *parts;
        const char* leastPsnr;
    } rows[] = {
        {"rate=29.97,duration=12.3", {"--vcodec", "ffv1", "--acodec", "flac"}, "a.mkv", "b.mkv", "100"},
        {"rate=29.97,duration=12.3",
         {"--vcodec", "h264:preset=ultrafast", "--meta", "title=One"},
         "c.mp4",
         "d.mp4",
         "30"},
        {"rate=25,duration=12",
         {"--vcodec", "mpeg2:N=10", "--meta", "timecode=10:00:00:00"},
         "e.mkv",
         "f.mkv",
         "30"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.whole);
        const Words job = Words{"transcode", "testgen:size=96x64,rate=29.97,duration=12.3"} + row.coded +
                          Words{"--no-sync"};
        works(job + Words{"-o", row.whole});
        const Words split = job + Words{"-o", row.parts, "--split", "3"};
        EXPECT_THAT(works(split).err, testing::HasSubstr("each is coded by itself"));
        EXPECT_EQ(factsOf(row.parts), factsOf(row.whole));
        works({"compare", row.whole, row.parts, "--min-psnr", row.leastPsnr});
        works({"transcode", row.whole, "-o", "whole.wav", "--no-video", "-y"});
        works({"transcode", row.parts, "-o", "parts.wav", "--no-video", "-y"});
        EXPECT_TRUE(contents("parts.wav") == contents("whole.wav"));
    }
    EXPECT_EQ(groupTimes(contents("f.mkv")), groupTimes(contents("e.mkv")));
}

TEST_F(SplitJob, AStoredTaskAndThePlan) {
    works({"transcode", "testgen:size=64x48,rate=29.97,duration=12", "-o", "a.avi", "--save-task", "t.xml"});
    works({"run", "t.xml", "-o", "b.avi", "--split", "4"});
    EXPECT_TRUE(contents("a.avi") == contents("b.avi"));
    const Outcome plan = works({"run", "t.xml", "-o", "c.avi", "--split", "4", "--dry-run"});
    EXPECT_THAT(plan.out, testing::HasSubstr("part    1: frames 0 to 99\npart    2: frames 100 to 199\n"
                                             "part    3: frames 200 to 299\npart    4: frames 300 to 358\n"
                                             "part    5: the sound\n"));
    EXPECT_EQ(size("c.avi"), -1);

    // A task of a batch keeps the number of parts, and its parts do not.
    works({"batch", "l.xml", "new"});
    const std::string clip = "testgen:size=64x48,rate=25,duration=1";
    works({"batch", "l.xml", "add", clip, "-o", "d.avi", "--split", "2"});
    works({"transcode", clip, "-o", "e.avi", "--split", "2", "--save-task", "e.xml"});
    EXPECT_THAT(works({"run", "e.xml", "--dry-run", "-y"}).out,
                testing::HasSubstr("part    2: frames 12 to 24\n"));
    works({"batch", "l.xml", "run"});
    EXPECT_TRUE(contents("d.avi") == contents("e.avi"));
}

TEST_F(SplitJob, WhatCanNotBeDividedIsRefused) {
    const std::string clip = "testgen:size=64x48,rate=25,duration=1";
    refuses({"transcode", clip},
            {{{"-o", "a.avi", "--split", "1"}, {"--split", "2 to 10000"}},
             {{"-o", "a.wav", "--no-video", "--split", "2"}, {"'a.wav'", "no picture"}},
             {{"-o", "a.avi", "--cut", "0-0.2", "--cut", "0.4-0.6", "--split", "2"},
              {"'a.avi'", "several segments"}},
             {{"-o", "/dev/null", "--format", "i420", "--no-audio", "--split", "2"}, {"--split"}}});
    fails(2, {"transcode", "testgen:size=720x576,rate=25i,duration=1", "-o", "a.dv", "--split", "2"},
          {"'a.dv'"});
    fails(2,
          {"transcode", "testgen:size=64x48,rate=25i,duration=1", "-o", "a.mp4", "--deinterlace=double",
           "--split", "2"},
          {"bobber"});
    fails(2, {"transcode", "-", "--input-format", "wav", "-o", "a.avi", "--split", "2"}, {"--split"});
}

TEST_F(SplitJob, IsWholeOrAbsent) {
    for (const int signal : {SIGTERM, SIGINT}) {
        Process run(endless(), here());
        ASSERT_EQ(partsOf(run).size(), 2u);
        run.signal(signal);
        EXPECT_EQ(run.finish().status, 128 + signal);
        EXPECT_TRUE(listing().empty());
    }
    {
        Process run(endless(), here());
        const std::vector<pid_t> parts = partsOf(run);
        ASSERT_EQ(parts.size(), 2u);
        kill(parts.front(), SIGKILL);
        const Outcome o = run.finish();
        EXPECT_EQ(o.status, 1);
        EXPECT_THAT(o.err, testing::HasSubstr("was ended by signal 9"));
        EXPECT_TRUE(listing().empty());
    }
    std::vector<pid_t> parts;
    {
        Process run(endless(), here());
        parts = partsOf(run);
        run.signal(SIGKILL);
        run.finish();
    }
    EXPECT_EQ(parts.size(), 2u);
    works({"transcode", "testgen:size=64x48,rate=25,duration=1", "-o", "next.avi"});
    EXPECT_EQ(listing(), std::set<std::string>{"next.avi"});
}

// A part says what stopped it, with the status of a job of one piece.
TEST_F(SplitJob, APartThatFailsEndsTheJob) {
    makeYuv("clip.yuv", 20.5);
    fails(3, asYuv({"transcode", "clip.yuv", "-o", "out.avi", "--split", "2"}), {"clip.yuv"});
    const Outcome o =
        works(asYuv({"transcode", "clip.yuv", "-o", "out.i420", "--split", "2", "--accept-partial"}));
    EXPECT_TRUE(contents("clip.yuv").substr(0, 20 * kFrame) == contents("out.i420"));
    EXPECT_THAT(o.err, testing::HasSubstr("20 frames"));
}

}  // namespace
