// Outputs: whole or absent, never over something that was not meant.
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>

#include <chrono>

#include "tests/system/tool.h"

namespace {

namespace fs = std::filesystem;

class Output : public Tool {
  protected:
    Output() { makeWav("in.wav", 1000); }
};

constexpr const char* kCard = "testgen:size=64x64,rate=25,duration=1";

TEST_F(Output, OverwritesNothingUnasked) {
    folder.write("out.wav", "precious");
    folder.write("card.wav", "precious");
    fails(4, {"transcode", "in.wav", "-o", "out.wav"}, {"'out.wav'", "exists", "-y"});
    fails(4, {"transcode", kCard, "-o", "card.raw"}, {"'card.wav'", "exists", "-y"});
    fails(4, {"transcode", "in.wav", "-o", "new.wav", "--save-task", "out.wav"},
          {"'out.wav'", "exists", "-y"});
    EXPECT_EQ(contents("out.wav"), "precious");
    fs::create_symlink("nowhere", folder.file("dangling.wav"));
    fails(4, {"transcode", "in.wav", "-o", "dangling.wav"}, {"'dangling.wav'", "exists"});
    works({"transcode", "in.wav", "-o", "out.wav", "-y"});
    EXPECT_TRUE(wavPart(contents("in.wav"), "data") == wavPart(contents("out.wav"), "data"));
}

TEST_F(Output, IsNeverAnInput) {
    fs::create_hard_link(folder.file("in.wav"), folder.file("hard.wav"));
    fs::create_symlink("in.wav", folder.file("soft.wav"));
    const std::string before = contents("in.wav");
    for (const std::string& name : Words{"in.wav", "./in.wav", "hard.wav", "soft.wav",
                                         "../" + folder.path().filename().string() + "/in.wav"})
        fails(4, {"transcode", "in.wav", "-o", name, "-y"}, {"'" + name + "'", "also an input"});
    fails(4, {"transcode", "in.wav", "-o", "t.wav", "--save-task", "in.wav", "-y"},
          {"'in.wav'", "also an input"});
    EXPECT_TRUE(before == contents("in.wav"));
    // Pictures have numbers, so their name is none of the input's.
    folder.write("same.raw", patternBytes(kFrame));
    works({"transcode", "same.raw", "--raw", "size=64x48,pixel=I420,rate=25", "-o", "same.png"});
    EXPECT_GT(size("same#0.png"), 0);
}

// A log would empty its file before anything reads it.
TEST_F(Output, ALogTakesTheNameOfNoOtherFile) {
    makeYuv("clip.yuv", 2);
    folder.write("mark.png", "a picture");
    fs::create_symlink("in.wav", folder.file("link"));
    const std::string wav = contents("in.wav"), png = contents("mark.png");
    const struct {
        const char* log;
        Words job;
        const char* other;
    } cases[] = {
        {"in.wav", {"info", "in.wav"}, "in.wav"},
        {"./in.wav", {"transcode", "in.wav", "-o", "out.wav"}, "in.wav"},
        {"link", {"info", "in.wav"}, "in.wav"},
        {"out.wav", {"transcode", "in.wav", "-o", "out.wav"}, "out.wav"},
        {"mark.png", asYuv({"transcode", "clip.yuv", "--logo", "mark.png@0,0", "-o", "x.yuv"}), "mark.png"},
        {"mark.png",
         {"transcode", "testgen", "--filter", "logo:xpos=1,filename=mark.png", "-o", "x.yuv"},
         "mark.png"},
        {"mark.png", {"transcode", "testgen", "--subtitles=mark.png", "-o", "x.yuv"}, "mark.png"},
    };
    for (const auto& c : cases) {
        const std::string reason =
            std::string("can't write the log '") + c.log + "': '" + c.other + "' is another file";
        fails(4, Words{"--log", c.log} + c.job, {reason});
        fails(4, Words{std::string("--log=") + c.log} + c.job, {reason});
    }
    EXPECT_TRUE(wav == contents("in.wav") && png == contents("mark.png"));
    works({"--log", "info.log", "info", "in.wav"});
    works({"--log", "info.log", "info", "in.wav"});
    EXPECT_GT(size("info.log"), 0);
}

TEST_F(Output, PlacesThatTakeNone) {
    fs::create_directory(folder.file("sub.wav"));
    const struct {
        Words job;
        Words parts;
    } cases[] = {
        {{"transcode", "in.wav", "-o", "no/out.wav"}, {"'no/out.wav'", "folder 'no' does not exist"}},
        {{"transcode", "in.wav", "-o", "in.wav/out.wav"}, {"'in.wav/out.wav'", "'in.wav' is no folder"}},
        {{"transcode", "in.wav", "-o", "sub.wav", "-y"}, {"'sub.wav'", "this is a folder"}},
        {{"transcode", "in.wav", "-o", "/proc/out.wav"},
         {"'/proc/out.wav': no such file or folder; check the name"}},
        {{"transcode", "in.wav", "-o", "out.wav", "--save-task", "no/t.xml"},
         {"'no/t.xml'", "does not exist"}},
    };
    for (const auto& c : cases) fails(4, c.job, c.parts);
    if (geteuid() != 0) {
        fs::create_directory(folder.file("locked"));
        fs::permissions(folder.file("locked"), fs::perms::owner_read | fs::perms::owner_exec);
        fails(4, {"transcode", "in.wav", "-o", "locked/out.wav"}, {"may not be written"});
    }
}

// The system says how far a file may grow: the write fails in the middle, as on a full disk.
TEST_F(Output, AWriteThatFailsLeavesNothing) {
    ProcessOptions limited = here();
    limited.fileLimit = 40000;
    makeYuv("clip.yuv", 50);
    makeWav("long.wav", 100000);
    const auto before = listing();
    for (const auto& job :
         {Words{"transcode", "long.wav", "-o", "out.wav"}, asYuv({"transcode", "clip.yuv", "-o", "out.yuv"}),
          asYuv({"transcode", "clip.yuv", "-o", "out.avi"}),
          Words{"transcode", "clip.yuv", "--raw", "size=320x480,pixel=I420", "-o", "out.png"}}) {
        failsAs(4, tarsel(job, limited), {"'out.", "a limit of the system", "ulimit -f"}, job.back());
        EXPECT_EQ(listing(), before);
    }
    folder.write("out.wav", "precious");
    failsAs(4, tarsel({"transcode", "long.wav", "-o", "out.wav", "-y"}, limited), {"a limit of the system"},
            "-y");
    EXPECT_EQ(contents("out.wav"), "precious");
}

TEST_F(Output, AFullDeviceIsTold) {
    for (const auto& job :
         {Words{"transcode", "in.wav", "-o", "/dev/full"}, {"transcode", kCard, "-o", "/dev/full"}})
        fails(4, job, {"'/dev/full'", "the disk is full"});
}

TEST_F(Output, APipeTakesOneStream) {
    mkfifo(folder.file("pipe.raw").c_str(), 0600);
    Process reader({"sh", "-c", "cat '" + folder.file("pipe.raw") + "' > '" + folder.file("copy.raw") + "'"});
    works({"transcode", kCard, "-o", "pipe.raw"});
    EXPECT_EQ(reader.finish().status, 0);
    EXPECT_EQ(size("copy.raw"), 25 * 64 * 64 * 4);
    EXPECT_EQ(listing(), (std::set<std::string>{"copy.raw", "in.wav", "pipe.raw"}));
}

TEST_F(Output, ThePostCommandSeesFinalNames) {
    works({"transcode", kCard, "-o", "it's a card.yuv", "--post",
           "printf '%s\\n' %o1 %o2 %op %ob > names; cat %o | wc -c > size"});
    EXPECT_EQ(contents("names"), "it's a card.yuv\nit's a card.wav\n./\nit's a card\n");
    EXPECT_EQ(std::stoll(contents("size")), size("it's a card.yuv") + size("it's a card.wav"));
    works({"transcode", "in.wav", "-o", "$(touch hit).wav", "--post",
           "cp %i1 copy; cmp %i copy && test -f %o"});
    EXPECT_EQ(size("hit"), -1);
    EXPECT_TRUE(contents("copy") == contents("in.wav"));
    const Outcome o = tarsel({"transcode", "in.wav", "-o", "kept.wav", "--post", "exit 7"});
    EXPECT_EQ(o.status, 1);
    EXPECT_THAT(o.err, testing::AllOf(testing::HasSubstr("--post"), testing::HasSubstr("7"),
                                      testing::HasSubstr("'kept.wav'")));
}

TEST_F(Output, KeepsWhatTheReplacedFileWasToOthers) {
    const auto stat = [&](const std::string& name) {
        struct stat status {};
        lstat(folder.file(name).c_str(), &status);
        return status;
    };
    const auto isNew = [&](const std::string& name) {
        return wavPart(contents("in.wav"), "data") == wavPart(contents(name), "data");
    };
    for (const mode_t mode : {0600u, 0444u, 0664u, 04755u}) {
        folder.write("out.wav", "old");
        ASSERT_EQ(chmod(folder.file("out.wav").c_str(), mode), 0);
        if (geteuid() == 0) {
            ASSERT_EQ(chown(folder.file("out.wav").c_str(), 65534, 65533), 0);
            ASSERT_EQ(chmod(folder.file("out.wav").c_str(), mode), 0);
        }
        works({"transcode", "in.wav", "-o", "out.wav", "-y"});
        EXPECT_TRUE(isNew("out.wav"));
        EXPECT_EQ(stat("out.wav").st_mode & 07777u, mode & 0777u);
        if (geteuid() == 0) {
            EXPECT_EQ(stat("out.wav").st_uid, 65534u);
            EXPECT_EQ(stat("out.wav").st_gid, 65533u);
        }
        fs::remove(folder.file("out.wav"));
    }
    folder.write("first.wav", "old");
    fs::create_hard_link(folder.file("first.wav"), folder.file("second.wav"));
    works({"transcode", "in.wav", "-o", "first.wav", "-y"});
    EXPECT_TRUE(isNew("first.wav"));
    EXPECT_EQ(contents("second.wav"), "old");
}

TEST_F(Output, FollowsALinkForOneFile) {
    fs::create_directory(folder.file("sub"));
    folder.write("sub/real.wav", "old");
    for (const char* to : {"sub/real.wav", "sub/none.wav"}) {
        fs::remove(folder.file("link.wav"));
        fs::create_symlink(to, folder.file("link.wav"));
        const Outcome o = works({"transcode", "in.wav", "-o", "link.wav", "-y"});
        EXPECT_THAT(o.err, testing::HasSubstr("wrote 'link.wav'"));
        EXPECT_EQ(fs::read_symlink(folder.file("link.wav")), to);
        EXPECT_TRUE(wavPart(contents("in.wav"), "data") == wavPart(contents(to), "data"));
    }
    fs::create_symlink("no/where.wav", folder.file("lost.wav"));
    fails(4, {"transcode", "in.wav", "-o", "lost.wav", "-y"}, {"where.wav'", "does not exist"});
    // Two files: each name is a file, and what the link led to is left as it was.
    folder.write("sub/real.raw", "old");
    fs::create_symlink("sub/real.raw", folder.file("card.raw"));
    works({"transcode", kCard, "-o", "card.raw", "-y"});
    EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(folder.file("card.raw"))));
    EXPECT_EQ(contents("sub/real.raw"), "old");
}

TEST_F(Output, AShorterRunLeavesNoTail) {
    works({"transcode", "testgen:size=32x32,rate=25,duration=0.48", "-o", "card.png"});
    EXPECT_EQ(size("card#11.png") > 0 && size("card.wav") > 0, true);
    const auto before = listing();
    fails(4, {"transcode", "testgen:size=32x32,rate=25,duration=0.08", "-o", "card.png"}, {"'card#", "-y"});
    EXPECT_EQ(listing(), before);
    works({"transcode", "testgen:size=32x32,rate=25,duration=0.08,audio=0", "-o", "card.png", "-y"});
    EXPECT_EQ(listing(), (std::set<std::string>{"in.wav", "card#0.png", "card#1.png"}));
}

// Whatever a filter or the generator reads is an input, also for names that are made from the output's.
TEST_F(Output, NeverOverWhatAFilterReads) {
    const std::string card = "testgen:size=64x48,rate=25,audio=0,duration=";
    works({"frame", "testgen:size=32x32", "-o", "o#9.png"});
    folder.write("talk.srt", "1\n00:00:00,000 --> 00:00:01,000\nHello\n");
    for (const auto& entry : fs::recursive_directory_iterator("/usr/share/fonts"))
        if (entry.path().extension() == ".ttf" && !fs::exists(folder.file("f.ttf")))
            fs::copy_file(entry.path(), folder.file("f.ttf"));
    fs::create_symlink("o#9.png", folder.file("soft.png"));
    const std::string logo = contents("o#9.png"), talk = contents("talk.srt");
    const Words drawn{"--logo", "o#9.png@0,0", "-y"}, titled{"--subtitles", "talk.srt", "-y"};
    const struct {
        Words job;
        std::string name;
    } rows[] = {
        {Words{"transcode", card + "0.4", "-o", "o.png"} + drawn, "o#9.png"},
        {Words{"transcode", card + "0.4", "-o", "o.png", "--logo", "soft.png@0,0", "-y"}, "o#9.png"},
        {{"transcode", card + "0.4,picture=o#9.png", "-o", "o.png", "-y"}, "o#9.png"},
        {Words{"transcode", card + "0.4", "-o", "x.avi", "--save-task", "o#9.png"} + drawn, "o#9.png"},
        {Words{"transcode", card + "0.4", "-o", "x.avi", "--save-task", "talk.srt"} + titled, "talk.srt"},
        {Words{"transcode", card + "0.4", "-o", "x.avi", "--save-task", "talk.srt", "--dry-run"} + titled,
         "talk.srt"},
        {Words{"transcode", card + "0.4", "-o", "x.avi", "--filter", "rawdump:filename=talk.srt"} + titled,
         "talk.srt"},
        {{"transcode", card + "0.4", "-o", "x.avi", "--save-task", "f.ttf", "--timecode=font=f.ttf", "-y"},
         "f.ttf"},
        {Words{"frame", "testgen:size=64x48", "-o", "o#9.png"} + drawn, "o#9.png"},
        {{"frame", "testgen:size=64x48,picture=o#9.png", "-o", "o#9.png", "-y"}, "o#9.png"},
    };
    for (const auto& row : rows) fails(4, row.job, {"'" + row.name + "'", "also an input"});
    // Five pictures don't reach its number: it is no tail of theirs.
    works({"transcode", card + "0.4,picture=soft.png", "-o", "o.png", "--to", "0.2", "-y"});
    for (int i = 0; i < 2; ++i) works(Words{"transcode", card + "0.2", "-o", "o.png"} + drawn);
    EXPECT_TRUE(contents("o#9.png") == logo);
    EXPECT_EQ(contents("talk.srt"), talk);
    EXPECT_GT(size("o#4.png"), 0);
}

TEST_F(Output, NothingIsWrittenTwice) {
    fs::create_directory(folder.file("sub"));
    fs::create_symlink("card.raw", folder.file("link.raw"));
    mkfifo(folder.file("pipe").c_str(), 0600);
    const auto dump = [](const std::string& name) { return Words{"--filter", "rawdump:filename=" + name}; };
    const struct {
        int status;
        Words options;
        Words parts;
    } rows[] = {
        {2, {"-o", "card.raw", "--save-task", "card.wav"}, {"'card.wav'", "two files"}},
        {4, {"-o", "card.raw", "--save-task", "./card.raw"}, {"'./card.raw'", "the output of the job"}},
        {4, {"-o", "card.raw", "--save-task", "sub/../link.raw", "-y"}, {"link.raw'", "the output"}},
        {2, Words{"-o", "card.raw", "--save-task", "x"} + dump("./x"), {"x'", "two files"}},
        {2, Words{"-o", "card.raw"} + dump("card.wav"), {"'card.wav'", "two files"}},
        {2, Words{"-o", "card.raw"} + dump("x") + dump("sub/../x"), {"x'", "two files"}},
        {2, Words{"-o", "card.png"} + dump("card#03.png"), {"'card#03.png'", "two files"}},
        {2, Words{"-o", "pipe", "--format", "raw"} + dump("./pipe"), {"'./pipe'", "two files"}},
        {2, Words{"-o", "card.raw", "--save-task", "pipe"} + dump("pipe"), {"'pipe'", "two files"}},
        {2, {"-o", "-", "--format", "raw", "--save-task", "/dev/stdout"}, {"'/dev/stdout'", "two files"}},
        {2, {"-o", "card.raw", "--save-task", "-", "--dry-run"}, {"--save-task", "the plan of --dry-run"}},
        {2, {"-o", "card.wav", "--format", "raw"}, {"'card.wav'", "two files", "the extension"}},
    };
    for (const auto& row : rows) fails(row.status, Words{"transcode", kCard} + row.options, row.parts);
    works(Words{"transcode", kCard, "-o", "card.raw"} + dump("/dev/null") + dump("/dev/null"));
}

// The task file gets its name with the output; a stream has it at once.
TEST_F(Output, TheTaskFileIsPartOfTheJob) {
    folder.write("job.xml", "old");
    const Words job{"transcode", "in.wav", "-o", "out.wav", "-y", "--save-task"};
    ProcessOptions limited = here();
    limited.fileLimit = 3000;  // the task has room, the sound has not
    makeWav("in.wav", 10000);
    EXPECT_EQ(tarsel(job + Words{"job.xml"}, limited).status, 4);
    EXPECT_EQ(contents("job.xml"), "old");
    works(job + Words{"job.xml"});
    const std::string task = contents("job.xml");
    EXPECT_THAT(task, testing::HasSubstr("out.wav"));
    EXPECT_EQ(works(job + Words{"-"}).out, task);
    ProcessOptions into = here();
    into.outputTo = folder.write("log", "");
    EXPECT_EQ(tarsel(job + Words{"-"}, into).status, 0);
    EXPECT_EQ(contents("log"), task);
    EXPECT_EQ(listing(), (std::set<std::string>{"in.wav", "job.xml", "log", "out.wav"}));
}

TEST_F(Output, ASocketIsNoFile) {
    const int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    fs::current_path(folder.path());
    std::strcpy(address.sun_path, "s.raw");
    ASSERT_EQ(bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    ASSERT_EQ(listen(listener, 1), 0);
    fs::current_path("/");
    folder.write("t.srt", "1\n00:00:00,000 --> 00:00:01,000\nHello\n");
    for (const auto& job :
         {Words{"transcode", kCard, "-o", "s.raw"}, {"captions", "t.srt", "--vtt", "-o", "s.raw"}})
        fails(4, job, {"'s.raw'", "it is a socket", "-o -"});
    close(listener);
}

TEST_F(Output, ALogThatIsFull) {
    for (const auto& [job, status] : {std::pair{Words{"transcode", "in.wav", "-o", "out.wav"}, 0},
                                      {Words{"transcode", "none.wav", "-o", "other.wav"}, 3}}) {
        const Outcome o = tarsel(Words{"--log", "/dev/full"} + job);
        EXPECT_EQ(o.status, status);
        const std::string line = "tarsel: warning: can't write the log '/dev/full': the disk is full; ";
        const size_t at = o.err.find(line);
        ASSERT_NE(at, std::string::npos) << o.err;
        EXPECT_EQ(o.err.find(line, at + 1), std::string::npos);
    }
}

// Another program removes a picture that the run has already written, while the run is held up.
TEST_F(Output, IsCheckedForWhatWasWritten) {
    Process run(words({"transcode", "testgen:size=320x240,rate=25,duration=40,audio=0", "-o", "p_%04d.png"}),
                here());
    std::string first;
    const auto last = std::chrono::steady_clock::now() + std::chrono::milliseconds(Process::kPatience);
    while (first.empty() && std::chrono::steady_clock::now() < last)
        for (const std::string& name : listing())
            if (name.ends_with(".png")) first = name;
    run.signal(SIGSTOP);
    ASSERT_TRUE(std::filesystem::remove(folder.file(first))) << first;
    run.signal(SIGCONT);
    failsAs(6, run.finish(), {"it has 999 pictures in place of 1000"}, first);
    EXPECT_EQ(listing(), std::set<std::string>{"in.wav"});
}

// Killed while it writes: the next run in the folder removes what is left, and says so unless messages are
// off.
TEST_F(Output, WhatAKilledRunLeftGoesWithTheNext) {
    const Words endless = words({"transcode", "testgen:size=64x64,rate=25,duration=20000,audio=0", "-o",
                                 "out.raw", "--filter", "rawdump:filename=dump", "--progress", "json"});
    const auto kill = [&] {
        Process run(endless, here());
        // The first one comes before the first frame.
        for (int i = 0; i < 2; ++i) ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
        EXPECT_EQ(tarsel({"recover", "."}).status, 0);
        run.signal(SIGKILL);
        run.finish();
        EXPECT_GT(listing().size(), 1u);
    };
    kill();
    const Outcome o = works({"transcode", "in.wav", "-o", "a.wav"});
    EXPECT_THAT(o.err, testing::HasSubstr("removed what an ended run left: 2 files, "));
    EXPECT_EQ(listing(), (std::set<std::string>{"a.wav", "in.wav"}));
    kill();
    EXPECT_EQ(works({"transcode", "in.wav", "-o", "b.wav", "-q", "--dry-run"}).err, "");
    EXPECT_GT(listing().size(), 2u);
    EXPECT_EQ(works({"transcode", "in.wav", "-o", "b.wav", "-q"}).err, "");
    EXPECT_EQ(listing(), (std::set<std::string>{"a.wav", "b.wav", "in.wav"}));
    kill();
    EXPECT_THAT(works({"recover", "."}).err, testing::HasSubstr("2 files, "));
    EXPECT_EQ(listing(), (std::set<std::string>{"a.wav", "b.wav", "in.wav"}));
    fails(2, {"recover", "no"}, {"'no'", "no such folder"});
    fails(2, {"transcode", "in.wav", "-o", "c.wav", "--stale", "1w"}, {"--stale", "'1w'", "12h"});
}

}  // namespace
