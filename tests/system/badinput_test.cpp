// Inputs that can't be used, and names that are hard to handle: a clear line, and nothing that stays.
#include <sys/stat.h>

#include "tests/system/tool.h"

namespace {

class BadInput : public Tool {};

TEST_F(BadInput, OneLineAndTheRightStatus) {
    folder.write("empty.wav", "");
    folder.write("text.wav", "this is a letter and no sound\n");
    folder.write("adpcm.wav", riff(wavChunk("fmt ", wavFormat(0x11, 1, 8000, 4)) + wavChunk("data", "abcd")));
    folder.write("plain", "x");
    folder.write("odd.xyz", "x");
    makeYuv("clip.yuv", 1);
    std::filesystem::create_directory(folder.file("folder.wav"));
    mkfifo(folder.file("fifo.wav").c_str(), 0600);
    const struct {
        const char* file;
        Words parts;
    } cases[] = {
        {"absent.wav", {"no such file"}},         {"empty.wav/below.wav", {"can't open"}},
        {"folder.wav", {"this is a folder"}},     {"empty.wav", {"the file is empty"}},
        {"fifo.wav", {"no regular file"}},        {"text.wav", {"WAV"}},
        {"adpcm.wav", {"IMA ADPCM, 4 bits"}},     {"plain", {"'plain'", "tarsel formats"}},
        {"odd.xyz", {"'xyz'", "tarsel formats"}}, {"clip.yuv", {"--raw"}},
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

// What was found is named, in the words of a user.
TEST_F(BadInput, TheReasonIsTheTrueOne) {
    const auto wav = [&](const char* name, unsigned tag, unsigned channels, unsigned bits) {
        folder.write(name,
                     riff(wavChunk("fmt ", wavFormat(tag, channels, 8000, bits)) + wavChunk("data", "abcd")));
    };
    const std::string only =
        "; only PCM of 1 to 32 bits, float, A-law and mu-law of 1 to 256 channels can be read; convert it "
        "first";
    wav("ima.wav", 0x11, 1, 4);
    wav("deep.wav", 1, 300, 64);
    folder.write("cut.wav", riff(wavChunk("fmt ", wavFormat(1, 1, 8000, 16))));
    folder.write("text.scc", "hello\n");
    folder.write("none.scc", "Scenarist_SCC V1.0\n\n");
    folder.write("text.srt", "hello\n");
    folder.write("text.png", "hello\n");
    works({"frame", "testgen:size=64x48", "-o", "whole.png"});
    folder.write("half.png", contents("whole.png").substr(0, 300));
    folder.write("sign.png", contents("whole.png").substr(0, 9));
    const std::string damaged = ": the file is damaged; copy or make it again";
    const struct {
        Words words;
        std::string line;
    } cases[] = {
        {{"info", "ima.wav"}, "can't open 'ima.wav': it holds IMA ADPCM, 4 bits" + only},
        {{"info", "deep.wav"}, "can't open 'deep.wav': it holds PCM, 64 bits, 300 channels" + only},
        {{"info", "cut.wav"},
         "can't open 'cut.wav': it is a damaged WAV file without usable sound data; copy or make it again"},
        {{"info", "text.scc"},
         "can't open 'text.scc': this is no SCC file; its first line has to be Scenarist_SCC V1.0"},
        {{"captions", "none.scc"}, "can't open 'none.scc': it has no caption lines; check how it was made"},
        {{"frame", "testgen", "--subtitles", "text.srt", "-o", "x.png"},
         "--subtitles: 'text.srt' has no subtitles: nothing in it has the times of one; --accept-partial "
         "goes "
         "without"},
        {{"frame", "testgen", "--timecode=font=text.srt", "-o", "x.png"},
         "--timecode: font: can't use 'text.srt': it is no font; give a TrueType or OpenType font"},
        {{"frame", "testgen:picture=text.png", "-o", "x.png"},
         "can't read the picture 'text.png': it is no PNG file; give a PNG picture"},
        {{"frame", "testgen:picture=half.png", "-o", "x.png"}, "can't read the picture 'half.png'" + damaged},
        {{"frame", "testgen:picture=sign.png", "-o", "x.png"}, "can't read the picture 'sign.png'" + damaged},
        {{"transcode", "testgen", "--logo", "half.png@1,1", "-o", "x.avi"},
         "can't read the picture 'half.png'" + damaged},
    };
    for (const auto& c : cases) {
        const Outcome o = tarsel(c.words);
        EXPECT_EQ(o.status, 3) << c.line;
        EXPECT_EQ(o.err, "tarsel: " + c.line + "\n");
    }
    EXPECT_EQ(size("x.png"), -1);
    fails(3, {"frame", "testgen", "--filter", "logo:filename=half.png", "-o", "x.png"},
          {"'half.png'", "is damaged"});
    fails(4, {"--log", "no/x.log", "info", "testgen"}, {"'no/x.log'", "no such file or folder"});
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
