// Inputs that can't be used, and names that are hard to handle: a clear line, and nothing left behind.
#include <sys/stat.h>

#include "tests/system/tool.h"

namespace {

class BadInput : public Tool {};

TEST_F(BadInput, OneLineAndTheRightStatus) {
    folder.write("empty.wav", "");
    folder.write("text.wav", "this is a letter and no sound\n");
    folder.write("alaw.wav", riff(wavChunk("fmt ", wavFormat(6, 1, 8000, 8)) + wavChunk("data", "abcd")));
    folder.write("plain", "x");
    folder.write("odd.xyz", "x");
    makeYuv("clip.yuv", 1);
    std::filesystem::create_directory(folder.file("folder.wav"));
    mkfifo(folder.file("fifo.wav").c_str(), 0600);
    const struct {
        const char* file;
        Words parts;
    } cases[] = {
        {"absent.wav", {"no such file"}},
        {"empty.wav/below.wav", {"can't open"}},
        {"folder.wav", {"this is a folder"}},
        {"empty.wav", {"the file is empty"}},
        {"fifo.wav", {"no regular file"}},
        {"text.wav", {"WAV"}},
        {"alaw.wav", {"WAV"}},
        {"plain", {"'plain'", "tarsel formats"}},
        {"odd.xyz", {"'xyz'", "tarsel formats"}},
        {"clip.yuv", {"--raw"}},
    };
    for (const auto& c : cases) {
        const Words parts = c.parts + Words{"'" + std::string(c.file) + "'"};
        fails(3, {"transcode", c.file, "-o", "out.wav"}, parts);
        fails(3, {"info", c.file}, parts);
        fails(3, {"frame", c.file, "-o", "out.png"}, parts);
    }
    makeWav("good.wav", 10);
    fails(3, {"transcode", "good.wav", "absent.wav", "-o", "out.wav"}, {"'absent.wav'"});
    fails(3, {"transcode", "good.wav", "-o", "out.yuv"}, {"no input has a picture", "'out.yuv'"});
    fails(3, asYuv({"transcode", "clip.yuv", "-o", "out.wav"}), {"no input has sound", "'out.wav'"});
    fails(3, {"frame", "good.wav", "-o", "out.png"}, {"'good.wav' has no picture"});
}

TEST_F(BadInput, SeveralFilesAreAllLookedAt) {
    makeWav("a.wav", 10);
    makeWav("b.wav", 20);
    const Outcome o = tarsel({"info", "a.wav", "absent.wav", "b.wav"});
    EXPECT_EQ(o.status, 3);
    EXPECT_THAT(o.out, testing::AllOf(testing::HasSubstr("'a.wav'"), testing::HasSubstr("'b.wav'")));
    EXPECT_THAT(o.err, testing::HasSubstr("'absent.wav': no such file"));
}

TEST_F(BadInput, NamesThatAreHardToHandle) {
    for (const std::string name :
         {"%n%s%x", "two words", "line\nfeed", "-dash", "'quote'", "$(touch hit)`touch hit`", "caf\xC3\xA9",
          "\xFF\xFE", "#00", "a\\b", "tab\there", "*"}) {
        SCOPED_TRACE(name);
        makeWav(name + ".wav", 500);
        const Outcome o = works({"transcode", "-o", "./" + name + "_out.wav", "--", name + ".wav"});
        EXPECT_EQ(std::count(o.err.begin(), o.err.end(), '\n'), 1) << o.err;
        EXPECT_TRUE(wavPart(contents(name + ".wav"), "data") == wavPart(contents(name + "_out.wav"), "data"));
        EXPECT_EQ(tarsel({"info", "--json", "--", name + ".wav"}).status, 0);
        fails(3, {"info", "--", name + "_absent.wav"}, {"no such file"});
    }
    EXPECT_EQ(size("hit"), -1);
    const std::string longest = std::string(240, 'n') + ".wav";
    makeWav(longest, 5);
    works({"transcode", longest, "-o", "x.wav"});
    fails(4, {"transcode", "x.wav", "-o", std::string(300, 'n') + ".wav"}, {"too long"});
}

}  // namespace
