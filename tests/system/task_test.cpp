// Jobs that are kept as task files, and run from them.
#include "tests/system/tool.h"

namespace {

using SavedNames = Tool;

using testing::HasSubstr;
using testing::Not;

class Task : public Tool {
  protected:
    void SetUp() override {
        Tool::SetUp();
        folder.write("in.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 8000, 16)) +
                                    wavChunk("data", patternBytes(4000 * 4))));
        folder.write("talk.srt", "1\n00:00:00,000 --> 00:00:01,000\nHi\n");
    }

    void makeFolder(const char* name) { std::filesystem::create_directory(folder.path() / name); }

    // A run of the saved task writes what the job wrote.
    void expectSameBytes(const Words& job, const Words& outputs) {
        works(Words{"transcode"} + job + Words{"--save-task", "job.xml", "-y"});
        std::vector<std::string> before;
        for (const auto& name : outputs) before.push_back(contents(name));
        for (const auto& name : outputs) std::filesystem::remove(folder.path() / name);
        works({"task", "check", "job.xml"});
        works({"run", "job.xml"});
        for (size_t i = 0; i < outputs.size(); ++i)
            EXPECT_TRUE(contents(outputs[i]) == before[i]) << outputs[i] << testing::PrintToString(job);
        fails(4, {"run", "job.xml"}, {"exists", "-y"});
    }
};

const Words kCard = {"testgen:size=64x64,rate=25,duration=0.4"};

TEST_F(Task, ARunWritesTheSameBytes) {
    expectSameBytes({"in.wav", "-o", "cut.wav", "--from", "0.1", "--samplerate", "11025"}, {"cut.wav"});
    expectSameBytes({"in.wav", "-o", "parts.wav", "--split-channels"}, {"parts#00.wav", "parts#01.wav"});
    expectSameBytes(kCard + Words{"-o", "card.yuv", "--pixel", "I420", "--timecode", "--fade", "2f",
                                  "--subtitles", "talk.srt", "--filter", "rawdump:filename=dump"},
                    {"card.yuv", "card.wav", "dump"});
    expectSameBytes(kCard + Words{"-o", "card.avi", "--size", "96x80"}, {"card.avi"});
    Words pictures{"pic.wav"};
    for (int i = 0; i < 10; ++i) pictures.push_back("pic#" + std::to_string(i) + ".png");
    expectSameBytes(kCard + Words{"-o", "pic.png"}, pictures);
}

TEST_F(Task, OutputsGoElsewhere) {
    works({"transcode", "in.wav", "-o", "out.wav", "--save-task", "job.xml"});
    works({"run", "job.xml", "-o", "other.wav"});
    EXPECT_EQ(contents("other.wav"), contents("out.wav"));
    EXPECT_EQ(works({"run", "job.xml", "-o", "-"}).out.substr(80), contents("out.wav").substr(80));
    works({"transcode", "in.wav", "-o", "out.wav", "-y", "--save-task", "split.xml", "--split-channels"});
    fails(2, {"run", "split.xml", "-o", "-"}, {"'-'"});
    works(Words{"transcode"} + kCard + Words{"-o", "card.yuv", "--pixel", "I420", "--save-task", "two.xml"});
    fails(2, {"run", "two.xml", "-o", "-"}, {"'-'", "the task makes 2"});
    works(Words{"transcode"} + kCard + Words{"-o", "pic.png", "--save-task", "pic.xml"});
    works({"run", "pic.xml", "-o", "n%03d.png"});
    EXPECT_EQ(contents("n009.png"), contents("pic#9.png"));
    fails(4, {"run", "job.xml", "-o", "in.wav", "-y"}, {"'in.wav'", "input"});
    fails(4, {"run", "job.xml", "-o", "job.xml", "-y"}, {"'job.xml'", "input"});
    EXPECT_THAT(works({"run", "job.xml", "-o", "plan.wav", "--dry-run"}).out,
                HasSubstr("expect  4000 samples"));
    EXPECT_EQ(size("plan.wav"), -1);
}

TEST_F(Task, NamesCountFromTheFolderOfTheTask) {
    makeFolder("sub");
    works({"transcode", "in.wav", "-o", "sub/out.wav", "--save-task", "sub/job.xml", "--relative"});
    EXPECT_THAT(contents("sub/job.xml"), HasSubstr("<str>../in.wav</str>"));
    EXPECT_THAT(contents("sub/job.xml"), Not(HasSubstr(folder.path().string())));
    const std::string written = contents("sub/out.wav");
    std::filesystem::rename(folder.path() / "sub", folder.path() / "moved");
    works({"run", "moved/job.xml", "-y"});
    EXPECT_EQ(contents("moved/out.wav"), written);

    std::filesystem::rename(folder.path() / "in.wav", folder.path() / "renamed.wav");
    fails(3, {"task", "check", "moved/job.xml"}, {"in.wav'", "no such file"});
    fails(3, {"run", "moved/job.xml", "-y"}, {"in.wav'", "no such file"});
    EXPECT_THAT(works({"task", "relink", "in.wav=renamed.wav", "moved/job.xml"}).err,
                HasSubstr("1 name changed"));
    EXPECT_THAT(contents("moved/job.xml"), HasSubstr("<str>../renamed.wav</str>"));
    works({"run", "moved/job.xml", "-y"});
    EXPECT_EQ(contents("moved/out.wav"), written);

    const std::string before = contents("moved/job.xml");
    fails(2, {"task", "relink", "no.wav=x", "moved/job.xml"}, {"'no.wav'"});
    for (const char* rule : {"x", "=x", "x="})
        fails(2, {"task", "relink", rule, "moved/job.xml"}, {"relink", rule, "OLD=NEW"});
    EXPECT_EQ(contents("moved/job.xml"), before);
}

TEST_F(Task, AFolderIsRelinkedWithAllThatIsInIt) {
    makeFolder("a");
    makeFolder("b");
    for (const char* name : {"talk.srt", "in.wav"})
        std::filesystem::copy(folder.path() / name, folder.path() / "b" / name);
    std::filesystem::rename(folder.path() / "talk.srt", folder.path() / "a" / "talk.srt");
    works(Words{"transcode"} + kCard +
          Words{"a/../in.wav", "-o", "a/card.yuv", "--pixel", "I420", "--subtitles", "a/talk.srt",
                "--save-task", "job.xml", "--no-audio"});
    const std::string written = contents("a/card.yuv");
    works({"task", "relink", "a=b", "job.xml"});
    const std::string shown = works({"task", "show", "job.xml"}).out;
    EXPECT_THAT(shown, HasSubstr("/b/talk.srt'"));
    EXPECT_THAT(shown, HasSubstr("/b/card.yuv'"));
    works({"run", "job.xml"});
    EXPECT_EQ(contents("b/card.yuv"), written);
}

TEST_F(Task, ACommandRunsOnlyWhenItIsAllowed) {
    works(
        {"transcode", "in.wav", "-o", "out.wav", "--save-task", "job.xml", "--post", "echo %o %i > posted"});
    std::filesystem::remove(folder.path() / "posted");
    const Outcome left = works({"run", "job.xml", "-y"});
    EXPECT_THAT(left.err, HasSubstr("'echo %o %i > posted' is left out; --allow-post runs it"));
    EXPECT_EQ(size("posted"), -1);
    EXPECT_THAT(works({"task", "show", "job.xml"}).out, HasSubstr("post     'echo %o %i > posted'"));
    works({"run", "job.xml", "-y", "--allow-post"});
    EXPECT_EQ(contents("posted"),
              (folder.path() / "out.wav").string() + " " + (folder.path() / "in.wav").string() + "\n");
}

// Segments that are switched off are not read, and neither are files that no segment uses any more.
TEST_F(Task, OnlyWhatIsReadHasToBeThere) {
    folder.write("off.wav", contents("in.wav"));
    works({"transcode", "--join", "in.wav", "off.wav", "-o", "out.wav", "--save-task", "job.xml"});
    std::string task = contents("job.xml");
    const std::size_t streams = task.rfind("  <key>streams</key>");
    task.insert(streams, "<key>segments</key><vec><i32>1</i32><i32>0</i32></vec>");
    folder.write("half.xml", task);
    task = contents("job.xml");
    const std::size_t second = task.rfind("<dict>", task.rfind("off.wav"));
    task.erase(second, task.find("</vec>", second) - second);
    folder.write("one.xml", task);
    const std::string name = folder.file("off.wav");
    for (const char* file : {"half.xml", "one.xml"}) {
        fails(4, {"run", file, "-o", "off.wav", "-y"}, {"'off.wav'", "input"});
        std::filesystem::rename(name, name + "-");
        works({"task", "check", file});
        works({"run", file, "-y"});
        EXPECT_EQ(contents("out.wav").substr(80), contents("in.wav").substr(44)) << file;
        std::filesystem::rename(name + "-", name);
    }
    std::filesystem::remove(name);
    fails(3, {"run", "job.xml", "-y"}, {"off.wav"});
}

// The input was replaced by one that has less.
TEST_F(Task, AnInputThatLacksAStreamIsNamed) {
    works(Words{"transcode"} + kCard + Words{"-o", "card.avi", "--save-task", "job.xml", "--dry-run"});
    std::string task = contents("job.xml");
    const std::string address = "first=\"2\" second=\"0\"";
    task.replace(task.find(address), address.size(), "first=\"2\" second=\"4\"");
    folder.write("job.xml", task);
    fails(3, {"run", "job.xml"}, {"'job.xml' is not a valid task", "it takes audio stream 4 of"});
}

TEST_F(Task, DamagedTasksAreRefusedByName) {
    works({"transcode", "in.wav", "-o", "out.wav", "--save-task", "job.xml"});
    std::string task = contents("job.xml");
    folder.write("cut.xml", task.substr(0, 500));
    folder.write("empty.xml", "");
    std::string none = task;
    none.replace(none.find("rawaenc"), 7, "nowhere");
    folder.write("none.xml", none);
    for (const Words& command : {Words{"run"}, Words{"task", "show"}, Words{"task", "check"}}) {
        fails(3, command + Words{"cut.xml"}, {"'cut.xml' is not a valid task"});
        fails(3, command + Words{"empty.xml"}, {"'empty.xml'"});
        fails(3, command + Words{"none.xml"}, {"'none.xml' is not a valid task", "nowhere"});
        fails(3, command + Words{"absent.xml"}, {"'absent.xml'", "no such file"});
        fails(3, command + Words{"in.wav"}, {"'in.wav' is not a valid task"});
    }
    std::string other = task;
    const std::string stream = "<pair first=\"2\" second=\"0\"/>";
    ASSERT_NE(other.find(stream), std::string::npos);
    other.replace(other.find(stream), stream.size(), "<pair first=\"2\" second=\"7\"/>");
    folder.write("other.xml", other);
    fails(3, {"run", "other.xml", "-y"},
          {"'other.xml' is not a valid task", "audio stream 7 of", "not there;"});
    fails(2, {"task", "shwo", "job.xml"}, {"'shwo'", "did you mean 'show'?"});
    fails(2, {"task", "show", "job.xml", "job.xml"}, {"one task file"});
}

// `text` with `more` at the start of the first element `element` after each `key`.
std::string inserted(std::string text, const std::string& key, const std::string& element,
                     const std::string& more) {
    for (size_t at = 0; (at = text.find("<key>" + key + "</key>", at)) != std::string::npos;) {
        at = text.find(element, at) + element.size();
        text.insert(at, more);
        at += more.size();
    }
    return text;
}

// A task file can come from anywhere: whatever is in it, a run reads what it names and writes its outputs.
TEST_F(Task, ARunWritesNothingButItsOutputs) {
    makeYuv("clip.yuv", 20);
    works(asYuv({"transcode", "--join", "clip.yuv@0-0.2", "clip.yuv@0.4-0.6", "--subtitles", "talk.srt", "-o",
                 "out.raw", "--save-task", "join.xml"}));
    works(asYuv(
        {"transcode", "clip.yuv", "-o", "one.raw", "--subtitles", "talk.srt", "--save-task", "one.xml"}));
    for (const char* task : {"join.xml", "one.xml"})
        fails(4, {"run", task, "-o", "talk.srt", "-y"}, {"'talk.srt'", "also an input"});

    const std::string dump =
        "<dict name=\"rawdump\"><key>_front</key><i32>0</i32><key>_on</key><i32>1</i32>"
        "<key>_position</key><i32>9</i32><key>state</key><dict><key>filename</key><str>clip.yuv</str></dict>"
        "</dict>";
    const std::string before = contents("clip.yuv");
    for (const char* task : {"join.xml", "one.xml"}) {
        folder.write("dump.xml", inserted(contents(task), "customFilters", "<vec>", dump));
        EXPECT_NE(tarsel({"run", "dump.xml", "-y"}).status, 0) << task;
        EXPECT_TRUE(contents("clip.yuv") == before) << task;
    }
    const std::string log =
        "<key>qualityStats</key><vec><dict><key>filename</key><str>clip.yuv</str></dict></vec>";
    folder.write("log.xml", inserted(contents("join.xml"), "process", "<dict>", log));
    EXPECT_THAT(works({"run", "log.xml", "-y"}).err,
                HasSubstr("log of encoding quality 'clip.yuv' is left out"));
    EXPECT_EQ(tarsel({"run", "log.xml", "-y", "--strict"}).status, 1);
    EXPECT_TRUE(contents("clip.yuv") == before);
}

TEST_F(Task, WhatFiltersReadIsCheckedBeforeTheRun) {
    makeYuv("clip.yuv", 20);
    works({"frame", "testgen:size=32x32", "-o", "mark.png"});
    const Words effects{"--subtitles", "talk.srt", "--logo", "mark.png@2,2"};
    works(asYuv({"transcode", "--join", "clip.yuv@0-0.2", "clip.yuv@0.4-0.6", "-o", "out.raw", "--save-task",
                 "join.xml"}) +
          effects);
    works(asYuv({"transcode", "clip.yuv", "-o", "one.raw", "--save-task", "one.xml"}) + effects);
    const std::string text = contents("talk.srt"), picture = contents("mark.png");
    const struct {
        const char* name;
        std::string content;
        Words parts;
        bool partly;  // --accept-partial goes without
    } rows[] = {
        {"talk.srt", "nothing of the kind\n", {"'subtitle' can't use", "no subtitles"}, true},
        {"talk.srt", text + "2\n00:00:xx,000 --> 00:00:02,000\nHo\n", {"the times of 1 of 2"}, true},
        {"talk.srt", "", {"talk.srt'", "empty"}, false},
        {"mark.png", picture.substr(0, 60), {"mark.png'", "damaged"}, false},
        {"mark.png", text, {"mark.png'", "no PNG"}, false},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.parts.back());
        folder.write(row.name, row.content);
        for (const char* task : {"join.xml", "one.xml"}) {
            fails(3, {"run", task, "-y"}, row.parts);
            EXPECT_EQ(tarsel({"run", task, "-y", "--accept-partial"}).status, row.partly ? 0 : 3) << task;
        }
        folder.write("talk.srt", text);
        folder.write("mark.png", picture);
    }
    std::filesystem::remove(folder.file("talk.srt"));
    for (const char* task : {"join.xml", "one.xml"})
        fails(3, {"run", task, "-y"}, {"talk.srt'", "no such file"});
}

TEST_F(Task, TheNullDeviceTakesEveryForm) {
    const Words forms[] = {{"out.avi"}, {"out.png"}, {"out.yuv"}, {"out.wav"}};
    for (const Words& form : forms) {
        works(Words{"transcode"} + kCard + Words{"--save-task", "job.xml", "-y", "-o"} + form);
        const auto before = listing();
        works({"run", "job.xml", "-o", "/dev/null"});
        EXPECT_EQ(listing(), before) << form.front();
    }
}

// What the task would not find again is not written.
TEST_F(SavedNames, ComeBackOrAreRefused) {
    for (const char* name : {"cr\r.wav", "bell\a.wav", "latin\xE4.wav", "none\xEF\xBF\xBF.wav"}) {
        makeWav(name, 10);
        fails(2, {"transcode", name, "-o", "out.wav", "--save-task", "t.xml"}, {"'t.xml'", "XML"});
    }
    fails(2, {"transcode", "bell\a.wav", "-o", "out.wav", "--save-task", "t.xml", "--dry-run"}, {"'t.xml'"});
    for (const char* name : {"line\nend.wav", "tab\t.wav", " two  '\"&<>\xC3\xA4 .wav"}) {
        makeWav(name, 10);
        works({"transcode", name, "-o", "out.wav", "--save-task", "t.xml", "-y"});
        works({"run", "t.xml", "-y"});
        EXPECT_EQ(wavPart(contents("out.wav"), "data"), wavPart(contents(name), "data")) << name;
    }
}

}  // namespace
