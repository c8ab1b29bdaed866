// tarsel watch: files that arrive are made once, whole, and none is lost.
#include <chrono>
#include <fstream>
#include <thread>

#include "tests/system/tool.h"

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

class Watch : public Tool {
  protected:
    Watch() { fs::create_directory(folder.path() / "in"); }

    Words watch(const Words& options) const {
        return Words{"watch", "in", "--settle", "0.2", "--preset", "RAW:out"} + options;
    }
    std::string arrive(const std::string& name, unsigned samples = 1000) const {
        return makeWav("in/" + name, samples);
    }
    bool there(const std::string& name) const { return fs::exists(fs::symlink_status(folder.path() / name)); }
    // The outputs hold the sound of these samples.
    void holds(const std::string& name, unsigned samples) const {
        EXPECT_EQ(wavPart(contents(name), "data"), patternBytes(size_t{samples} * 4)) << name;
    }
};

TEST_F(Watch, MakesWhatIsThereOnce) {
    arrive("one.wav");
    arrive("two.wav", 2000);
    const Outcome first = works(watch({"--once"}));
    EXPECT_THAT(first.err, HasSubstr("made of 'one.wav'"));
    holds("out/one.wav", 1000);
    holds("out/two.wav", 2000);
    // Neither again, nor with another time or beside a new file; another preset's outputs are made.
    fs::remove(folder.path() / "out/one.wav");
    fs::last_write_time(folder.path() / "in/two.wav",
                        fs::file_time_type::clock::now() - std::chrono::hours(3));
    arrive("three.wav");
    const Outcome second = works(watch({"--once"}));
    EXPECT_THAT(second.err, HasSubstr("made of 'three.wav'"));
    EXPECT_THAT(second.err, testing::Not(HasSubstr("made of 'one.wav'")));
    EXPECT_THAT(second.err, testing::Not(HasSubstr("made of 'two.wav'")));
    works({"watch", "in", "--settle", "0.2", "--preset", "RAW", "--once"});
    for (const char* name : {"one", "two", "three"})
        EXPECT_TRUE(there("in-out/RAW_YUV/" + std::string(name) + ".wav"));
    // New content under an old name is not made over what is there.
    arrive("three.wav", 3000);
    const Outcome third = tarsel(watch({"--once"}));
    EXPECT_EQ(third.status, 1);
    EXPECT_THAT(third.err, HasSubstr("use -y to overwrite it"));
    holds("out/three.wav", 1000);
    works(watch({"--once", "-y"}));
    holds("out/three.wav", 3000);
}

TEST_F(Watch, LeavesWhatIsNoCompleteFile) {
    arrive("good.wav");
    for (const char* name : {"copy.wav.part", ".good.wav.Ab3dEf", "backup.wav~", "x.crdownload"})
        arrive(name);
    folder.write("in/zero.wav", "");
    fs::create_directory(folder.path() / "in/folder");
    fs::create_symlink("good.wav", folder.path() / "in/link.wav");
    std::ofstream writer(folder.file("in/slow.wav"), std::ios::binary);
    writer << contents("in/good.wav").substr(0, 500) << std::flush;
    const Outcome o = works(watch({"--once", "--delete", "--failed", "bad"}));
    EXPECT_EQ(listing(),
              (std::set<std::string>{"in", "in/.good.wav.Ab3dEf", "in/.watch.tarsel", "in/backup.wav~",
                                     "in/copy.wav.part", "in/folder", "in/link.wav", "in/slow.wav",
                                     "in/x.crdownload", "in/zero.wav", "out", "out/good.wav"}));
    for (const char* line : {"left 'zero.wav': it is empty\n", "left 'folder': it is a folder\n",
                             "left 'link.wav': it is a link", "left 'slow.wav': it is still being written\n"})
        EXPECT_THAT(o.err, HasSubstr(line));
    writer << contents("in/copy.wav.part").substr(500);
    writer.close();
    works(watch({"--once", "--delete", "--failed", "bad"}));
    holds("out/slow.wav", 1000);
    EXPECT_FALSE(there("in/slow.wav"));
}

TEST_F(Watch, PutsInputsAwayAfterAllTargets) {
    arrive("sound.wav");
    folder.write("in/bad.wav", "RIFF no sound at all");
    folder.write("in/notes.txt", "text");
    const Words both = watch({"--preset", "AVI_RAW:avi", "--once", "--move", "done", "--failed", "bad"});
    // The second preset needs a picture.
    const Outcome o = tarsel(both);
    EXPECT_EQ(o.status, 1) << o.err;
    EXPECT_FALSE(there("done"));
    for (const char* name : {"sound.wav", "bad.wav", "notes.txt"}) {
        EXPECT_TRUE(there("bad/" + std::string(name))) << o.err;
        EXPECT_FALSE(there("in/" + std::string(name)));
    }
    EXPECT_THAT(contents("bad/notes.txt.txt"), HasSubstr("no decoder for the extension 'txt'"));
    EXPECT_THAT(contents("bad/sound.wav.txt"), HasSubstr("no input has a picture"));
    EXPECT_EQ(std::count(o.err.begin(), o.err.end(), '\n'), 6) << "a line each: " << o.err;
    // The same name again, and one that is there already in the folder for what was done.
    for (int i = 0; i < 2; ++i) {
        fs::remove(folder.path() / "out/clip.wav");
        arrive("clip.wav");
        works(watch({"--once", "--move", "done"}));
        EXPECT_FALSE(there("in/clip.wav"));
        holds("out/clip.wav", 1000);
    }
    EXPECT_EQ(contents("done/clip.wav"), contents("done/clip (2).wav"));
}

TEST_F(Watch, TwoInputsOfOneOutputLoseNothing) {
    arrive("a.wav");
    makeYuv("in/a.yuv", 1);
    const Words job = watch({"--raw", "size=64x48,pixel=I420,rate=25", "--once", "--delete", "-y"});
    const Outcome o = tarsel(job);
    // Both would write "a.wav" or next to it; one has to wait, whichever was first.
    EXPECT_EQ(o.status, 1) << o.err;
    EXPECT_THAT(o.err, HasSubstr("which has the same name but for the extension"));
    EXPECT_NE(there("in/a.wav"), there("in/a.yuv"));
}

TEST_F(Watch, FollowsUntilItIsStopped) {
    Process process(words(watch({"--delete", "--progress", "json"})), here());
    ASSERT_TRUE(process.waitFor("watching"));
    arrive("first.wav");
    ASSERT_TRUE(process.waitFor("made of 'first.wav'"));
    fs::rename(makeWav("away.wav", 1500), folder.path() / "in/moved.wav");
    ASSERT_TRUE(process.waitFor("made of 'moved.wav'"));
    // One that grows for longer than a file has to be unchanged.
    const std::string whole = contents("out/moved.wav");
    {
        std::ofstream writer(folder.file("in/slow.wav"), std::ios::binary);
        writer << whole.substr(0, 1000) << std::flush;
        ASSERT_TRUE(process.waitFor("left 'slow.wav': it is still being written"));
        writer << whole.substr(1000);
    }
    ASSERT_TRUE(process.waitFor("made of 'slow.wav'"));
    // A second one is refused meanwhile.
    const Outcome second = tarsel(watch({}));
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.err, HasSubstr("another 'tarsel watch' uses it"));
    process.signal(SIGTERM);
    const Outcome o = process.finish();
    EXPECT_EQ(o.status, 143) << o.err;
    EXPECT_THAT(o.err, HasSubstr("\"status\":143"));
    holds("out/slow.wav", 1500);
    EXPECT_EQ(listing(), (std::set<std::string>{"in", "in/.watch.tarsel", "out", "out/first.wav",
                                                "out/moved.wav", "out/slow.wav"}));
}

// However it ends in the middle of a file, the next run makes that file, and only that.
TEST_F(Watch, AKilledRunIsMadeUpFor) {
    arrive("small.wav");
    arrive("large.wav", 20'000'000);
    {
        Process process(words(watch({"--move", "done"})), here());
        ASSERT_TRUE(process.waitFor("made of 'small.wav'") || there("out/large.wav"));
        process.signal(SIGKILL);
        process.finish();
    }
    const Outcome o = works(watch({"--once", "--move", "done"}));
    holds("out/small.wav", 1000);
    EXPECT_TRUE(wavPart(contents("out/large.wav"), "data") == wavPart(contents("done/large.wav"), "data"));
    EXPECT_FALSE(there("in/large.wav") || there("in/small.wav")) << o.err;
    for (const std::string& name : listing())
        EXPECT_THAT(name, testing::Not(HasSubstr(".tarsel-"))) << "is left";
}

// What the run was told of plug-ins holds in the processes that do its work.
TEST_F(Watch, PlugInsReachTheTranscodes) {
    fs::create_directory(folder.path() / "plugins");
    fs::copy_file(QV_BINARY_DIR "/plugins/pcm8_plugin.so", folder.path() / "plugins/pcm8_plugin.so");
    folder.write("in/tone.pcm8", patternBytes(5000));
    works(Words{"--plugins", "plugins"} + watch({"--once"}));
    EXPECT_TRUE(wavPart(contents("out/tone.wav"), "data") == patternBytes(5000));
    works({"batch", "l.xml", "new"});
    works({"--plugins", "plugins", "batch", "l.xml", "add", "in/tone.pcm8", "-o", "task.wav"});
    EXPECT_EQ(tarsel({"--no-plugins", "batch", "l.xml", "run"}).status, 1);
    works({"--plugins", "plugins", "batch", "l.xml", "run"});
    EXPECT_EQ(contents("task.wav"), contents("out/tone.wav"));
}

TEST_F(Watch, RefusesWhatWouldGoRound) {
    fs::create_directory(folder.path() / "other");
    fs::create_symlink("in", folder.path() / "way");
    const auto refuse = [&](const Words& options, const Words& parts) {
        fails(2, Words{"watch", "in"} + options, parts);
    };
    refuse({}, {"--preset is missing"});
    refuse({"--preset", "RAW:in"}, {"can't write to", "it is in the watched folder"});
    refuse({"--preset", "RAW:in/out"}, {"it is in the watched folder"});
    refuse({"--preset", "RAW:way/out"}, {"it is in the watched folder"});
    refuse({"--preset", "RAW", "-o", "in"}, {"it is in the watched folder"});
    refuse({"--preset", "RAW:other", "--preset", "raw:other"}, {"two presets would write"});
    refuse({"--preset", "RAW:"}, {"no folder follows the colon"});
    refuse({"--preset", "RAV:other"}, {"there is no preset 'RAV'", "did you mean"});
    refuse({"--preset", "RAW:other", "--move", "way"}, {"--move", "is the watched folder"});
    refuse({"--preset", "RAW:other", "--failed", "other"}, {"--failed", "outputs go to"});
    refuse({"--preset", "RAW:other", "--move", "m", "--delete"}, {"--delete"});
    fails(3, {"watch", "nowhere", "--preset", "RAW"}, {"can't watch 'nowhere'"});
}

}  // namespace
