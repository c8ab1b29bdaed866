// Outputs: whole or absent, never over something that was not meant.
#include <sys/stat.h>

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
        {{"transcode", "in.wav", "-o", "/proc/out.wav"}, {"'/proc/out.wav'"}},
        {{"transcode", "in.wav", "-o", "out.wav", "--save-task", "no/t.xml"},
         {"'no/t.xml'", "does not exist"}},
    };
    for (const auto& c : cases) fails(4, c.job, c.parts);
    if (geteuid() != 0) {
        fs::create_directory(folder.file("locked"));
        fs::permissions(folder.file("locked"), fs::perms::owner_read | fs::perms::owner_exec);
        fails(4, {"transcode", "in.wav", "-o", "locked/out.wav"}, {"may not be written"});
    }
    fails(2, {"transcode", "in.wav", "-o", "out.mp3"}, {"'mp3'", "tarsel formats"});
    fails(2, {"transcode", "in.wav", "-o", "out.wva"}, {"'wva'", "Did you mean 'wav'?"});
}

// The system says how far a file may grow: the write fails in the middle, as on a full disk.
TEST_F(Output, AWriteThatFailsLeavesNothing) {
    ProcessOptions limited = here();
    limited.fileLimit = 40000;
    makeYuv("clip.yuv", 50);
    makeWav("long.wav", 100000);
    const auto before = listing();
    for (const auto& job : {Words{"transcode", "long.wav", "-o", "out.wav"},
                            asYuv({"transcode", "clip.yuv", "-o", "out.yuv"})}) {
        failsAs(4, tarsel(job, limited), {"'out.", "File too large"}, job[1]);
        EXPECT_EQ(listing(), before);
    }
    folder.write("out.wav", "precious");
    failsAs(4, tarsel({"transcode", "long.wav", "-o", "out.wav", "-y"}, limited), {"File too large"}, "-y");
    EXPECT_EQ(contents("out.wav"), "precious");
}

TEST_F(Output, AFullDeviceIsTold) {
    for (const auto& job :
         {Words{"transcode", "in.wav", "-o", "/dev/full"}, {"transcode", kCard, "-o", "/dev/full"}})
        fails(4, job, {"'/dev/full'", "No space left on device"});
}

TEST_F(Output, ADeviceOrAPipeTakesOneStream) {
    works({"transcode", "in.wav", "-o", "/dev/null"});
    const Outcome o = works({"transcode", kCard, "-o", "/dev/stdout"});
    EXPECT_EQ(o.out.size(), 25u * 64 * 64 * 4);
    mkfifo(folder.file("pipe.raw").c_str(), 0600);
    Process reader({"sh", "-c", "cat '" + folder.file("pipe.raw") + "' > '" + folder.file("copy.raw") + "'"});
    works({"transcode", kCard, "-o", "pipe.raw"});
    EXPECT_EQ(reader.finish().status, 0);
    EXPECT_TRUE(contents("copy.raw") == o.out);
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

}  // namespace
