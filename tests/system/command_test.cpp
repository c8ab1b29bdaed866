// The command line itself: an error names what was probably meant, and data stays apart from messages.
#include <nlohmann/json.hpp>

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
        Words words;
        Words parts;
    } cases[] = {
        {2, {}, {"tarsel --help"}},
        {2, {"transcoed"}, {"'transcoed'", "did you mean 'transcode'?"}},
        {2, {"transcode", "in.wav", "--ratte", "25", "-o", "x.wav"}, {"'--ratte'", "did you mean '--rate'?"}},
        {2, {"transcode", "in.wav", "--rate", "0", "-o", "x.wav"}, {"--rate", "'0'"}},
        {2,
         {"transcode", "testgen:rate=240", "--rate", "60", "-o", "x.raw"},
         {"--rate: 240 to 60", "up to 120"}},
        {5, {"transcode", "in.wav", "--muxer", "rawmx", "-o", "x.wav"}, {"'rawmx'", "'rawmux'"}},
        {2, {"transcode", "in.wav", "--muxer", "rawavimux", "-o", "x.wav"}, {"'x.wav'", "by rawmux"}},
        {2, {"transcode", "testgen", "--muxer", "rawmux", "-o", "x.avi"}, {"'x.avi'", "by rawavimux"}},
        {4, {"transcode", "in.wav", "-o", "."}, {"'.'", "this is a folder", "'./NAME.avi'"}},
        {4, {"transcode", "in.wav", "-o", "new/"}, {"'new/'", "'new/NAME.avi'"}},
        {4, {"frame", "testgen", "-o", "."}, {"this is a folder", "'./NAME.png'"}},
        {2, {"transcode", "in.wav", "-o", "x.mpp"}, {"'mpp'", ".avi, .png, .wav"}},
        {2, {"transcode", "in.wav", "-o", "x.wav", "--bits", "32"}, {"--bits: '32'", "8, 16 or 24"}},
        {2, {"transcode", "--deinterlace", "bob", "testgen", "-o", "x.raw"}, {"'bob'", "--deinterlace=bob"}},
        {2, {"frame", "testgen", "-o", "x.png", "--at", "1", "--sheet", "2x2"}, {"--at", "--sheet"}},
        {5, {"transcode", "in.wav", "--filter", "qqqqqq", "-o", "x.wav"}, {"'qqqqqq'", "tarsel modules"}},
        {2, {"transcode", "testgen:sizee=64x64", "-o", "x.raw"}, {"'sizee'", "did you mean 'size'?"}},
        {2, {"transcode", "testgen:size=10x10", "-o", "x.raw"}, {"32x32"}},
        {2, {"transcode", "testgen", "--pixel", "I42O", "-o", "x.raw"}, {"'I42O'", "did you mean 'I420'"}},
        {2,
         {"transcode", "testgen", "--filter", "flipper:flop=3", "-o", "x.raw"},
         {"'flop'", "no parameter"}},
    };
    for (const auto& c : cases) fails(c.status, c.words, c.parts);
}

// What the argument parser would take, or report in words of its own.
TEST_F(Command, TheWholeLine) {
    const std::string help = "; see 'tarsel transcode --help'", twice =
                                                                    ": it is given twice, and only one value "
                                                                    "counts; leave one out";
    const struct {
        Words words;
        std::string line;
    } cases[] = {
        {{}, "no command: there is nothing to do; 'tarsel --help' lists all commands"},
        {{"transcode"}, "INPUT is missing: the command needs it" + help},
        {{"frame", "testgen"}, "--output is missing: the command needs it; see 'tarsel frame --help'"},
        {{"transcode", "--foo"}, "unknown option '--foo': the command has none of this name" + help},
        {{"presets", "x"},
         "ACTION: 'x' is none of its values; use list, show, save, remove, rename, export, import, check"},
        {{"transcode", "in.wav", "--from"}, "--from: it needs a value; give --from=TIME"},
        {{"transcode", "in.wav", "--from=", "-o", "x.wav"}, "--from: it needs a value; give --from=TIME"},
        {{"transcode", "in.wav", "-o", ""}, "--output: it needs a value; give --output=FILE"},
        {{"transcode", "in.wav", "--timecode="},
         "--timecode: it needs a value; give --timecode=START|K=V,..."},
        {{"transcode", "in.wav", "--flip=3"}, "--flip: it takes no value, but has '3'; leave out the value"},
        {{"transcode", "in.wav", "--to", "1", "--to=2"}, "--to" + twice},
        {{"transcode", "in.wav", "-oa.wav", "-qyo", "b.wav"}, "--output" + twice},
        {{"transcode", "in.wav", "--progress", "jsn"},
         "--progress: 'jsn' is none of its values; did you mean 'json'? use auto, json, json:FD, json:FILE, "
         "log, log:SECONDS, none"},
        {{"transcode", "testgen:size=64x64,size=32x32", "-o", "x.raw"},
         "testgen: the key 'size' is given twice, and only one value counts; leave one out"},
        {{"frame", "testgen", "-o", "x.png", "--sheet", "0x0"},
         "--sheet: '0x0' is not a sheet of pictures; use COLUMNSxROWS from 1x1 to 32x32"},
        {{"transcode", "in.wav", "-o", "x.wav", "--from", "0.9", "--to", "0.1"},
         "--to 0.1: it is not after --from 0.9; give a later end"},
        {{"transcode", "testgen", "--size", "20000x20000", "-o", "x.raw"},
         "--size: a frame of 20000x20000 is too large for the memory or this format; give a smaller size"},
        {{"transcode", "testgen", "--size", "65535x65535", "-o", "x.raw"},
         "--size: a frame of 65535x65535 is too large for the memory or this format; give a smaller size"},
    };
    for (const auto& c : cases) {
        const Outcome o = tarsel(c.words);
        EXPECT_EQ(o.status, 2) << c.line;
        EXPECT_EQ(o.err, "tarsel: " + c.line + "\n");
    }
    works({"transcode", "in.wav", "-qyoshort.wav"});
    works({"transcode", "in.wav", "-o", "Upper.WAV"});
    EXPECT_GE(size("Upper.WAV"), size("in.wav"));
    EXPECT_EQ(size("Upper.wav"), -1);
    EXPECT_GE(size("short.wav"), size("in.wav"));
}

TEST_F(Command, HelpEverywhere) {
    const Outcome all = tarsel({"--help"});
    for (const char* name : {"transcode", "info", "frame", "captions", "modules", "formats", "presets"}) {
        EXPECT_THAT(all.out, HasSubstr(name));
        const Outcome o = works({name, "--help"});
        EXPECT_EQ(o.err, "");
        EXPECT_THAT(o.out, HasSubstr(std::string("tarsel ") + name));
    }
    EXPECT_THAT(tarsel({"--version"}).out, testing::MatchesRegex("tarsel [0-9]+\\.[0-9.]+\n"));
}

TEST_F(Command, ListsAreDataInBothForms) {
    const json modules = json::parse(tarsel({"modules", "--json"}).out);
    std::set<std::string> decoders;
    for (const json& module : modules)
        if (module["kind"] == "decoder" && module["usable"].get<bool>()) decoders.insert(module["name"]);
    const json formats = json::parse(tarsel({"formats", "--json"}).out);
    EXPECT_GE(formats["inputs"].size(), 4u);
    for (const json& input : formats["inputs"]) EXPECT_EQ(decoders.count(input["decoder"]), 1u) << input;
    // What is listed as an output can be planned.
    for (const auto& output : formats["outputs"]) {
        std::istringstream names(output["extensions"].get<std::string>());
        for (std::string extension; names >> extension;)
            EXPECT_EQ(tarsel({"transcode", "testgen", "-o", "x." + extension, "--dry-run"}).status, 0)
                << extension;
    }
}

TEST_F(Command, InfoTellsWhatIsThere) {
    const json files = json::parse(
        tarsel({"info", "in.wav", "testgen:size=320x180,rate=30000/1001,duration=4", "--json"}).out);
    EXPECT_EQ(files[0]["bytes"], size("in.wav"));
    EXPECT_EQ(files[0]["duration_s"], 1.0);
    const json& video = files[1]["streams"][0];
    EXPECT_EQ(video["width"], 320);
    EXPECT_EQ(video["rate"], "30000/1001");
    const Outcome o = tarsel({"info", "in.wav"});
    EXPECT_EQ(o.err, "");
    EXPECT_THAT(o.out,
                testing::AllOf(HasSubstr("'in.wav'"), HasSubstr("44100 Hz"), HasSubstr("0:00:01.000")));
}

TEST_F(Command, AStandardOutputThatTakesNothing) {
    for (const Words& job : {Words{"info", "in.wav", "--json"},
                             {"modules"},
                             {"formats", "--json"},
                             {"--help"},
                             {"transcode", "in.wav", "-o", "x.wav", "--dry-run"}}) {
        ProcessOptions full = here();
        full.outputTo = "/dev/full";
        failsAs(4, tarsel(job, full), {"standard output", "the disk is full"}, job[0]);
    }
    const Outcome o = runProgram(
        {"bash", "-c", "'" + program() + "' info in.wav --json | head -0; exit ${PIPESTATUS[0]}"}, here());
    EXPECT_EQ(o.status, 4);
    EXPECT_EQ(o.err, "") << "a reader that has seen enough is no news";
}

TEST_F(Command, ATaskFileHoldsTheJob) {
    works({"transcode", "in.wav", "-o", "out.wav", "--from", "0.25", "--dry-run", "--save-task", "job.xml",
           "--post", "ls %o"});
    EXPECT_EQ(size("out.wav"), -1);
    const std::string task = contents("job.xml");
    for (const char* part : {"<TranscodeTask", "in.wav", "out.wav", "rawaenc", "rawmux", "ls %o"})
        EXPECT_THAT(task, HasSubstr(part));
    EXPECT_THAT(task, testing::Not(HasSubstr(".tarsel-")));
    EXPECT_EQ(works({"info", "job.xml"}).out, "'job.xml'\n  a sound task\n  segment 1  audio 0 of '" +
                                                  folder.file("in.wav") +
                                                  "', from 0:00:00.250 to 0:00:01.000\n  output     '" +
                                                  folder.file("out.wav") + "' by rawmux\n");
    folder.write("bad.xml",
                 task.substr(0, task.find("<i32>")) + "<i32>x" + task.substr(task.find("<i32>") + 6));
    fails(3, {"info", "bad.xml"},
          {"'bad.xml' is not a valid task: line 7, encoder/", "it is no whole number"});
    // A name that its format does not end is kept where there is one file.
    works({"transcode", "in.wav", "-o", "clip", "--format", "wav", "--dry-run", "--save-task", "named.xml"});
    EXPECT_THAT(contents("named.xml"), HasSubstr("<key>exactName</key>"));
    EXPECT_THAT(task, testing::Not(HasSubstr("exactName")));
}

}  // namespace
