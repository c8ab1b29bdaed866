// Small options, each on a whole run; the texts that are made from the table of options.
#include <sys/stat.h>

#include <sstream>

#include "tests/system/tool.h"

namespace {

using testing::HasSubstr;

class Options : public Tool {};

TEST_F(Options, PointsThatAreRefusedOrWarnedOf) {
    makeYuv("clip.yuv", 100);
    fails(2, asYuv({"transcode", "clip.yuv", "-o", "none.yuv", "--from=-5"}), {"--from", "0:00:04.000"});
    fails(2, asYuv({"transcode", "clip.yuv", "-o", "none.yuv", "--duration", "1", "--to", "2"}),
          {"--to: --duration contradicts it"});
    EXPECT_THAT(
        works(asYuv({"transcode", "clip.yuv", "-o", "long.yuv", "--from", "3", "--duration", "9"})).err,
        HasSubstr("warning: --duration 9: from --from 3 it is after the end of 'clip.yuv'"));
    works(asYuv({"frame", "clip.yuv", "--at=-1f", "-o", "last.png"}));
    works(asYuv({"frame", "clip.yuv", "--at=99f", "-o", "same.png"}));
    EXPECT_TRUE(contents("last.png") == contents("same.png"));
}

// The end is that of the picture for the sound as well, which is longer here.
TEST_F(Options, TimesFromTheEndKeepStreamsTogether) {
    makeYuv("clip.yuv", 100);
    makeWav("clip.wav", 44100 * 9 / 2);
    works(asYuv({"transcode", "clip.yuv", "clip.wav", "-o", "end.yuv", "--from=-1"}));
    EXPECT_TRUE(contents("end.yuv") == contents("clip.yuv").substr(75 * kFrame));
    EXPECT_TRUE(wavPart(contents("end.wav"), "data") ==
                wavPart(contents("clip.wav"), "data").substr(3 * 44100 * 4, 44100 * 4));
}

TEST_F(Options, SizesThatMeanNothing) {
    makeYuv("clip.yuv", 1);
    for (const char* size : {"0x48", "64x-2", "64x100000", "x", "x-1", "-1x-1", "64x48x2", "6e1x48", ""}) {
        fails(2,
              {"transcode", "clip.yuv", "--raw", std::string("size=") + size + ",pixel=I420", "-o", "o.yuv"},
              {"--raw", "size"});
        fails(2, asYuv({"transcode", "clip.yuv", std::string("--size=") + size, "-o", "o.yuv"}), {"--size"});
    }
    refuses({"transcode", "testgen:size=64x48", "-o", "x.raw"},
            {{{"--fit", "10"}, {"--fit: '10' is not a box"}},
             {{"--fit", "10x10,pad"}, {"--fit", "WxH,bars"}},
             {{"--fit", "10x60000,bars"}, {"--fit", "too far"}},
             {{"--fit", "10x60000,crop"}, {"--fit", "too far"}},
             {{"--fit", "10x10", "--size", "10x10"}, {"--size: --fit contradicts it"}}});
}

// A row of the luma of the first frame.
std::string row(const std::string& frames, size_t width, size_t number) {
    return frames.substr(number * width, width);
}

TEST_F(Options, AFitAddsBarsOrCuts) {
    makeYuv("clip.yuv", 2);
    const std::string clip = contents("clip.yuv"), black(16, '\0');
    works(asYuv({"transcode", "clip.yuv", "-o", "bars.yuv", "--fit", "96x48,bars"}));
    EXPECT_EQ(size("bars.yuv"), 2 * 96 * 48 * 3 / 2);
    EXPECT_TRUE(row(contents("bars.yuv"), 96, 20) == black + row(clip, 64, 20) + black);
    works(asYuv({"transcode", "clip.yuv", "-o", "rows.yuv", "--fit", "64x64,bars"}));
    EXPECT_TRUE(row(contents("rows.yuv"), 64, 7) == std::string(64, '\0'));
    EXPECT_TRUE(row(contents("rows.yuv"), 64, 8) == row(clip, 64, 0));
    works(asYuv({"transcode", "clip.yuv", "-o", "cut.yuv", "--fit", "32x48,crop"}));
    EXPECT_TRUE(row(contents("cut.yuv"), 32, 20) == row(clip, 64, 20).substr(16, 32));
    // What --crop keeps is what is fitted.
    works(asYuv({"transcode", "clip.yuv", "-o", "both.yuv", "--crop", "32x32+8+4", "--fit", "16x32,crop"}));
    EXPECT_TRUE(row(contents("both.yuv"), 16, 10) == row(clip, 64, 14).substr(16, 16));
    works(asYuv({"frame", "clip.yuv", "--fit", "96x48,bars", "-o", "bars.png"}));
}

TEST_F(Options, StreamsLeftOut) {
    const Words card = {"transcode", "testgen:size=64x64,duration=0.2", "-o", "card.raw"};
    works(card + Words{"--no-audio"});
    EXPECT_EQ(listing(), std::set<std::string>{"card.raw"});
    works({"transcode", "testgen:size=64x64,duration=0.2", "-o", "card.wav", "--no-video"});
    const Outcome o = works({"transcode", "card.raw", "card.wav", "--raw", "size=64x64,pixel=BGR4,rate=25",
                             "--no-audio", "-o", "mute.avi"});
    EXPECT_THAT(o.err, testing::Not(HasSubstr("warning"))) << "what was left out by wish";
    fails(2, {"transcode", "card.wav", "-o", "x.wav", "--no-audio"}, {"--no-audio", "nothing to write"});
    fails(2, {"transcode", "testgen", "-o", "x.raw", "--no-video"},
          {"--no-video", "nothing to write", "'x.raw'"});
}

TEST_F(Options, WhatExistsIsKept) {
    const std::string card = "testgen:size=64x64,duration=0.2";
    const struct {
        std::string there;
        Words job;
    } cases[] = {
        {"out.raw", {"transcode", card, "-o", "out.raw"}},
        {"out.wav", {"transcode", card, "-o", "out.raw"}},
        {"out#3.png", {"transcode", card, "-o", "out.png"}},
        {"dump", {"transcode", card, "-o", "out.raw", "--filter", "rawdump:filename=dump"}},
        {"out.png", {"frame", card, "-o", "out.png"}},
    };
    for (const auto& c : cases) {
        folder.write(c.there, "precious");
        const Outcome o = works(c.job + Words{"-n"});
        EXPECT_EQ(o.err, "tarsel: left '" + c.there + "' as it is: it exists, and -n keeps what exists\n");
        EXPECT_EQ(listing(), std::set<std::string>{c.there});
        EXPECT_EQ(contents(c.there), "precious");
        std::filesystem::remove(folder.file(c.there));
    }
    works({"transcode", card, "-o", "out.raw", "-n"});
    EXPECT_EQ(works({"transcode", card, "-o", "out.raw", "-n", "-q"}).err, "");
    fails(2, {"transcode", card, "-o", "new.raw", "-n", "-y"}, {"-y: -n contradicts it"});
}

TEST_F(Options, StrictMakesWarningsFailures) {
    makeWav("in.wav", 1000);
    folder.write("unused.scc", "Scenarist_SCC V1.0\n\n00:00:00:00\t9420 9420\n");
    const Words job = {"transcode", "in.wav", "-o", "out.wav", "--to", "9"};
    EXPECT_THAT(works(job).err, HasSubstr("(1 warning)"));
    const auto before = listing();
    for (const Words& more : {Words{}, Words{"-q"}, Words{"--save-task", "job.xml"}, Words{"--dry-run"}}) {
        const Outcome o = tarsel(job + Words{"-y", "--strict"} + more);
        EXPECT_EQ(o.status, 1) << testing::PrintToString(more);
        EXPECT_THAT(o.err, HasSubstr("a warning is a failure"));
        EXPECT_EQ(o.out, "");
        EXPECT_EQ(listing(), before);
    }
    // One that comes while the job runs: the letter is in no font.
    folder.write("rare.srt", "1\n00:00:00,000 --> 00:00:02,000\n\xf4\x80\x80\x80\n");
    const Words burnt = {
        "transcode", "testgen:size=64x64,duration=0.2,audio=0", "--subtitles", "rare.srt", "-o", "burnt.raw"};
    EXPECT_THAT(works(burnt + Words{"-y"}).err, HasSubstr("warning"));
    std::filesystem::remove(folder.file("burnt.raw"));
    EXPECT_EQ(tarsel(burnt + Words{"--strict"}).status, 1);
    EXPECT_EQ(size("burnt.raw"), -1);
    works({"transcode", "in.wav", "-o", "fine.wav", "--strict"});
}

TEST_F(Options, ThreadsAreAsManyAsAskedFor) {
    const auto threads = [&](const std::string& number) {
        Process run(words({"transcode", "testgen:size=640x360,duration=20000,audio=0", "--size", "320x180",
                           "-o", "/dev/null", "--format", "raw", "--progress", "json", "--threads", number}),
                    here());
        EXPECT_TRUE(run.waitFor("\"event\":\"progress\"") && run.waitFor("\"event\":\"progress\""));
        int count = 0;
        for ([[maybe_unused]] const auto& task :
             std::filesystem::directory_iterator("/proc/" + std::to_string(run.id()) + "/task"))
            ++count;
        run.signal(SIGTERM);
        run.finish();
        return count;
    };
    const int one = threads("1");
    EXPECT_EQ(threads("2"), one + 1);
    EXPECT_EQ(threads("5"), one + 4);
    for (const char* wrong : {"0", "-1", "257", "many"})
        fails(2, {"transcode", "testgen", "-o", "x.raw", "--threads", wrong}, {"--threads", "from 1 to 256"});
}

// --- The texts about the options.

class OptionTexts : public Options {
  protected:
    Words commands() const {
        Words names;
        std::istringstream lines(works({"--help"}).out);
        bool listed = false;
        for (std::string line; std::getline(lines, line);) {
            if (listed && line.rfind("  ", 0) == 0 && line[2] != ' ')
                names.push_back(line.substr(2, line.find(' ', 2) - 2));
            listed = listed || line == "Subcommands:";
        }
        EXPECT_GE(names.size(), 9u);
        return names;
    }
    // All "--words" of a text.
    static std::set<std::string> optionsIn(const std::string& text) {
        std::set<std::string> found;
        for (size_t at = 0; (at = text.find("--", at)) != std::string::npos;) {
            const size_t end = text.find_first_not_of("abcdefghijklmnopqrstuvwxyz-", at);
            if (end - at > 3 && (at == 0 || text[at - 1] != '-')) found.insert(text.substr(at, end - at));
            at = end == std::string::npos ? text.size() : end;
        }
        return found;
    }
};

TEST_F(OptionTexts, HelpIsACommand) {
    EXPECT_EQ(works({"help"}).out, works({"--help"}).out);
    for (const auto& name : commands()) EXPECT_EQ(works({"help", name}).out, works({name, "--help"}).out);
    fails(2, {"help", "transcoed"}, {"'transcoed'", "did you mean 'transcode'"});
}

TEST_F(OptionTexts, EachOptionIsInTheDocumentAndTheManual) {
    const auto documented = optionsIn(TempFolder::read(QV_SOURCE_DIR "/docs/command-line.md"));
    folder.write("tarsel.1", works({"manual"}).out);
    // Without letters in bold, which would be written twice.
    const Outcome page = runProgram({"groff", "-man", "-Tascii", "-ww", "-P-cbou", "tarsel.1"}, here());
    EXPECT_EQ(page.err, "") << "roff finds fault";
    const auto inManual = optionsIn(page.out);
    const bool formatted = page.status != 127;  // groff is installed
    for (const auto& name : commands() + Words{""}) {
        const std::string help = works(name.empty() ? Words{"--help"} : Words{name, "--help"}).out;
        for (const auto& option : optionsIn(help)) {
            EXPECT_EQ(documented.count(option), 1u) << name << " " << option;
            EXPECT_TRUE(!formatted || inManual.count(option) > 0) << name << " " << option;
        }
    }
}

// One after the other, unchanged.
TEST_F(OptionTexts, TheExamplesOfTheManualWork) {
    const std::string page = works({"manual"}).out;
    std::string script =
        "set -e\ntarsel() { '" + program() + "' \"$@\"; }\n" + page.substr(page.find(".SH EXAMPLES"));
    for (size_t at = 0; (at = script.find('\\', at)) != std::string::npos;) script.erase(at, 1);
    std::erase_if(script, [](char c) { return c == '\r'; });
    std::string lines;
    std::istringstream all(script);
    int examples = 0;
    for (std::string line; std::getline(all, line);) {
        if (line[0] == '.') continue;
        lines += line + "\n";
        examples += line.starts_with("tarsel ") ? 1 : 0;
    }
    EXPECT_GE(examples, 4);
    const Outcome o = runProgram({"sh", "-c", lines}, here());
    EXPECT_EQ(o.status, 0) << o.err;
}

// In an interactive shell, by the tabulator.
TEST_F(OptionTexts, BashCompletes) {
    folder.write("film.wav", "x");
    folder.write("rc", "PS1='ready> '; bind 'set bell-style none'; source <('" + program() +
                           "' completion bash); tarsel() { printf '<%s>' \"$@\"; echo; }\n");
    ProcessOptions screen = here();
    screen.terminal = true;
    screen.environment = {"TERM=dumb", "INPUTRC=/dev/null", "HISTFILE=/dev/null"};
    Process shell({"bash", "--noprofile", "--rcfile", "rc", "-i"}, screen);
    const struct {
        std::string typed, result;
    } cases[] = {
        {"tarsel transc\t", "<transcode>"},
        {"tarsel transcode --over\t", "<transcode><--overwrite>"},
        {"tarsel transcode fi\t", "<transcode><film.wav>"},
        {"tarsel transcode -o fi\t", "<transcode><-o><film.wav>"},
        {"tarsel transcode --progress js\t", "<transcode><--progress><json>"},
        {"tarsel transcode --progress=js\t", "<transcode><--progress=json>"},
        {"tarsel transcode --deinterlace=do\t", "<transcode><--deinterlace=double>"},
        {"tarsel transcode --pixel I42\t2", "<transcode><--pixel><I422>"},
        {"tarsel --log x rec\t", "<--log><x><recover>"},
        {"tarsel --log=x fram\t --shee\t", "<--log=x><frame><--sheet>"},
        {"tarsel help capt\t", "<help><captions>"},
        {"tarsel completion z\t", "<completion><zsh>"},
    };
    for (const auto& c : cases) {
        ASSERT_TRUE(shell.waitFor("ready> ")) << c.typed;
        shell.type(c.typed + "\r");
        EXPECT_TRUE(shell.waitFor(c.result)) << c.typed;
    }
    shell.type("exit\r");
    shell.finish();
}

TEST_F(OptionTexts, OtherShellsTakeTheirs) {
    fails(2, {"completion", "tcsh"}, {"'tcsh'", "bash, zsh, fish"});
    for (const char* shell : {"bash", "zsh", "fish"}) {
        folder.write("script", works({"completion", shell}).out);
        const Outcome read = runProgram({shell, "-n", "script"}, here());
        if (read.status == 127) continue;  // not installed
        EXPECT_EQ(read.status, 0) << read.err;
        EXPECT_EQ(read.err, "");
        if (std::string(shell) != "fish") continue;
        const struct {
            const char *typed, *offered;
        } rows[] = {{"tarsel transc", "transcode\t"},
                    {"tarsel transcode --deinterlace=do", "--deinterlace=double"},
                    {"tarsel transcode --muxer null", "nullmux"},
                    {"tarsel --log x help fr", "frame"}};
        for (const auto& row : rows)
            EXPECT_THAT(
                runProgram({"fish", "-c", std::string("source script; complete -C '") + row.typed + "'"},
                           here())
                    .out,
                HasSubstr(row.offered))
                << row.typed;
    }
}

}  // namespace
