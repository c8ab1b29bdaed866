// The command line itself: what is wrong is told with what was meant, and data stays apart from talk.
#include "tests/system/tool.h"

namespace {

using nlohmann::json;
using testing::HasSubstr;

class Command : public Tool {
  protected:
    Command() { makeWav("in.wav", 44100); }
};

TEST_F(Command, WrongUseIsTold) {
    const struct {
        int status;
        std::vector<std::string> words;
        std::vector<std::string> parts;
    } cases[] = {
        {2, {}, {"tarsel --help"}},
        {2, {"transcoed"}, {"'transcoed'", "Did you mean 'transcode'?"}},
        {2, {"transcode"}, {"INPUT", "tarsel transcode --help"}},
        {2, {"transcode", "in.wav", "--ratte", "25", "-o", "x.wav"}, {"'--ratte'", "Did you mean '--rate'?"}},
        {2, {"transcode", "in.wav", "--ratte=25", "-o", "x.wav"}, {"'--ratte", "Did you mean '--rate'?"}},
        {2, {"transcode", "in.wav", "-o"}, {"--output"}},
        {2, {"transcode", "in.wav", "--rate", "0", "-o", "x.wav"}, {"--rate", "'0'"}},
        {2, {"transcode", "in.wav", "--rate", "25/0", "-o", "x.wav"}, {"--rate", "'25/0'"}},
        {2, {"transcode", "in.wav", "--bits", "17", "-o", "x.wav"}, {"--bits", "'17'"}},
        {2, {"transcode", "in.wav", "--channels", "9", "-o", "x.wav"}, {"--channels", "1 to 8"}},
        {2, {"transcode", "in.wav", "--samplerate", "48k", "-o", "x.wav"}, {"--samplerate", "'48k'"}},
        {2, {"transcode", "in.wav", "--progress", "xml", "-o", "x.wav"}, {"--progress", "json"}},
        {5, {"transcode", "in.wav", "--muxer", "rawmx", "-o", "x.wav"}, {"'rawmx'", "'rawmux'"}},
        {5, {"transcode", "in.wav", "--filter", "qqqqqq", "-o", "x.wav"}, {"'qqqqqq'", "tarsel modules"}},
        {5,
         {"transcode", "in.wav", "--filter", "avoll:level=3", "-o", "x.wav"},
         {"'avoll'", "Did you mean 'avol'"}},
        {5, {"transcode", "in.wav", "--filter", "wavdec", "-o", "x.wav"}, {"'wavdec'"}},
        {2, {"transcode", "testgen:sizee=64x64", "-o", "x.raw"}, {"'sizee'", "Did you mean 'size'?"}},
        {2, {"transcode", "testgen:size", "-o", "x.raw"}, {"'size'", "key=value"}},
        {2, {"transcode", "testgen:size=10x10", "-o", "x.raw"}, {"32x32"}},
        {2, {"transcode", "testgen:size=64x64,duration=0", "-o", "x.raw"}, {"duration"}},
        {2,
         {"transcode", "testgen:size=64x64", "--pixel", "I42O", "-o", "x.raw"},
         {"--pixel", "'I42O'", "Did you mean 'I420'"}},
        {2, {"transcode", "testgen:size=64x64", "--raw", "size=1x1", "-o", "x.raw"}, {"--raw"}},
        {2,
         {"transcode", "in.wav", "--raw", "size=64x64,pxel=I420", "-o", "x.raw"},
         {"'pxel'", "Did you mean 'pixel'?"}},
        {2, {"frame", "testgen", "--at", "11", "-o", "x.png"}, {"--at 11", "behind the end"}},
        {2, {"frame", "testgen", "--at", "1", "-o", "x.jpg"}, {"'x.jpg'", "png"}},
        {2,
         {"transcode", "testgen", "--filter", "scaler:outWidht=3", "-o", "x.raw"},
         {"'outWidht'", "no parameter"}},
        {2, {"transcode", "testgen", "--filter", "scaler:outWidth", "-o", "x.raw"}, {"key=value"}},
        {2,
         {"transcode", "testgen", "--filter", "scaler:outWidth=x", "-o", "x.raw"},
         {"'outWidth'", "\"x\""}},
        {2, {"transcode", "in.wav", "--filter", "scaler", "-o", "x.wav"}, {"--filter scaler", "no picture"}},
        {2, {"info"}, {"FILE"}},
        {2, {"modules", "--jsn"}, {"'--jsn'", "Did you mean '--json'?"}},
        {2, {"modules", "more"}, {"'more'"}},
    };
    for (const auto& c : cases) fails(c.status, c.words, c.parts);
}

TEST_F(Command, HelpEverywhere) {
    const Outcome all = tarsel({"--help"});
    for (const char* name : {"transcode", "info", "frame", "captions", "modules", "formats", "presets"}) {
        EXPECT_THAT(all.out, HasSubstr(name));
        const Outcome o = tarsel({name, "--help"});
        EXPECT_EQ(o.status, 0);
        EXPECT_EQ(o.err, "");
        EXPECT_THAT(o.out, HasSubstr(std::string("tarsel ") + name));
    }
    EXPECT_THAT(tarsel({"--version"}).out, testing::MatchesRegex("tarsel [0-9]+\\.[0-9.]+\n"));
}

TEST_F(Command, ListsAreDataInBothForms) {
    const json modules = json::parse(tarsel({"modules", "--json"}).out);
    EXPECT_EQ(modules.size(), 45u) << "44 of the library, and the subtitles";
    const std::string text = tarsel({"modules"}).out;
    for (const auto& m : modules) EXPECT_THAT(text, HasSubstr(m["name"].get<std::string>()));
    const auto usable = [&](const std::string& name) {
        for (const auto& m : modules)
            if (m["name"] == name) return m["usable"].get<bool>();
        return false;
    };
    EXPECT_TRUE(usable("testgen") && usable("wavdec") && usable("rawmux"));
    const json formats = json::parse(tarsel({"formats", "--json"}).out);
    bool wav = false;
    for (const auto& input : formats["inputs"]) wav |= input["decoder"] == "wavdec";
    EXPECT_TRUE(wav);
    // What is listed as an output can be planned.
    for (const auto& output : formats["outputs"]) {
        std::istringstream names(output["extensions"].get<std::string>());
        for (std::string extension; names >> extension;)
            EXPECT_EQ(tarsel({"transcode", "testgen", "-o", "x." + extension, "--dry-run"}).status, 0)
                << extension;
    }
    EXPECT_EQ(json::parse(tarsel({"presets", "--json"}).out)[0]["muxers"][0], "rawmux");
}

TEST_F(Command, InfoTellsWhatIsThere) {
    const json files = json::parse(
        tarsel({"info", "in.wav", "testgen:size=320x180,rate=30000/1001,duration=4", "--json"}).out);
    EXPECT_EQ(files[0]["file"], "in.wav");
    EXPECT_EQ(files[0]["bytes"], size("in.wav"));
    EXPECT_EQ(files[0]["duration_s"], 1.0);
    const json& video = files[1]["streams"][0];
    EXPECT_EQ(video["width"], 320);
    EXPECT_EQ(video["height"], 180);
    EXPECT_EQ(video["rate"], "30000/1001");
    EXPECT_EQ(video["frames"], 119);
    EXPECT_EQ(video["pixel"], "BGR4");
    EXPECT_EQ(files[1]["streams"][1]["type"], "audio");
    const Outcome o = tarsel({"info", "in.wav"});
    EXPECT_EQ(o.err, "");
    EXPECT_THAT(o.out,
                testing::AllOf(HasSubstr("'in.wav'"), HasSubstr("44100 Hz"), HasSubstr("0:00:01.000")));
}

TEST_F(Command, AStandardOutputThatTakesNothing) {
    for (const std::vector<std::string>& job : {std::vector<std::string>{"info", "in.wav", "--json"},
                                                {"modules"},
                                                {"formats", "--json"},
                                                {"--help"},
                                                {"transcode", "in.wav", "-o", "x.wav", "--dry-run"}}) {
        ProcessOptions full = here();
        full.outputTo = "/dev/full";
        failsAs(4, tarsel(job, full), {"standard output", "No space left on device"}, job[0]);
    }
    const Outcome o = runProgram(
        {"bash", "-c", "'" + program() + "' info in.wav --json | head -0; exit ${PIPESTATUS[0]}"}, here());
    EXPECT_EQ(o.status, 4);
    EXPECT_EQ(o.err, "") << "a reader that has seen enough is no news";
}

TEST_F(Command, ThePlanIsToldAndNothingDone) {
    const auto before = listing();
    const Outcome o = tarsel({"transcode", "testgen:size=64x64,rate=25,duration=4", "--from", "1", "--to",
                              "3", "-o", "x.yuv", "--dry-run"});
    EXPECT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(listing(), before);
    for (const char* part : {"testgen", "64x64", "0:00:01.000 to 0:00:03.000", "50 frames", "819200 bytes",
                             "88200 samples", "'x.yuv'", "rawmux"})
        EXPECT_THAT(o.out, HasSubstr(part));
    fails(4, {"transcode", "in.wav", "-o", "in.wav", "--dry-run"}, {"also an input"});
}

TEST_F(Command, ATaskFileHoldsTheJob) {
    works({"transcode", "in.wav", "-o", "out.wav", "--from", "0.25", "--dry-run", "--save-task", "job.xml",
           "--post", "ls %o"});
    EXPECT_EQ(size("out.wav"), -1);
    const std::string task = contents("job.xml");
    for (const char* part : {"<TranscodeTask", "in.wav", "out.wav", "rawaenc", "rawmux", "ls %o"})
        EXPECT_THAT(task, HasSubstr(part));
    EXPECT_THAT(task, testing::Not(HasSubstr(".tarsel-")));
    fails(4, {"transcode", "in.wav", "-o", "out.wav", "--dry-run", "--save-task", "job.xml"},
          {"'job.xml'", "exists"});
}

TEST_F(Command, ProgressAsJson) {
    const Outcome o =
        tarsel({"transcode", "testgen:size=64x64,rate=25,duration=2", "-o", "x.raw", "--progress", "json"});
    EXPECT_EQ(o.status, 0);
    std::vector<json> events;
    std::istringstream lines(o.err);
    for (std::string line; std::getline(lines, line);)
        if (line[0] == '{') events.push_back(json::parse(line));
    ASSERT_GE(events.size(), 2u);
    EXPECT_EQ(events.front()["event"], "start");
    EXPECT_EQ(events.back()["event"], "end");
    EXPECT_EQ(events.back()["percent"], 100);
    EXPECT_EQ(events.back()["frame"], 50);
    EXPECT_EQ(events.back()["out_time_us"], 2000000);
    EXPECT_EQ(events.back()["state"], "done");
    for (const auto& event : events)
        for (const char* key :
             {"event", "percent", "eta_s", "pass", "passes", "frame", "fps", "speed", "out_time_us", "state"})
            EXPECT_TRUE(event.contains(key)) << key;
}

TEST_F(Command, QuietSaysNothingButErrors) {
    for (const auto& more : {std::vector<std::string>{}, {"--to", "99"}}) {
        std::vector<std::string> job = {"transcode", "in.wav", "-q", "-y", "-o", "x.wav"};
        job.insert(job.end(), more.begin(), more.end());
        const Outcome o = tarsel(job);
        EXPECT_EQ(o.status, 0);
        EXPECT_EQ(o.err + o.out, "");
    }
    fails(3, {"transcode", "absent.wav", "-q", "-o", "y.wav"}, {"'absent.wav'"});
}

TEST_F(Command, TheLocaleChangesNoNumber) {
    ProcessOptions german = here();
    german.environment = {"LC_ALL=de_DE.UTF-8", "LANG=de_DE.UTF-8"};
    EXPECT_EQ(tarsel({"info", "in.wav"}, german).out, tarsel({"info", "in.wav"}).out);
}

}  // namespace
