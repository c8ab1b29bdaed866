// The standard input as an input.
#include <sys/ioctl.h>
#include <sys/stat.h>

#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

using testing::HasSubstr;

class StandardInput : public Tool {
  protected:
    StandardInput() {
        makeWav("in.wav", 5000);
        works({"transcode", "in.wav", "-o", "a.wav"});
        makeYuv("clip.yuv", 3);
        folder.write("talk.srt", "1\n00:00:00,000 --> 00:00:01,000\nHello\n");
        std::filesystem::create_directory(folder.file("temp"));
    }
    // The temporary folder is one of the test's own.
    ProcessOptions own() const {
        ProcessOptions options = here();
        options.environment = {"TMPDIR=" + folder.file("temp")};
        return options;
    }
    // A line of the shell, in which "tarsel" is the tool.
    Outcome shell(const std::string& line) const {
        return runProgram({"/bin/sh", "-c", "tarsel() { " + program() + " \"$@\"; }\n" + line}, own());
    }
    Outcome shellWorks(const std::string& line) const {
        Outcome o = shell(line);
        EXPECT_EQ(o.status, 0) << line << o.err;
        return o;
    }
};

TEST_F(StandardInput, IsReadLikeAFile) {
    const std::string raw = " --raw size=64x48,rate=25,pixel=I420";
    const struct {
        std::string line, output, wanted;
    } rows[] = {
        {"cat a.wav | tarsel transcode - --input-format wav -o out.wav", "out.wav", "a.wav"},
        {"tarsel transcode - --input-format WAV -o file.wav < a.wav", "file.wav", "a.wav"},
        // From where the shell has left off.
        {"{ head -c 4608 >/dev/null; tarsel transcode -" + raw + " -o rest.yuv; } < clip.yuv", "rest.yuv",
         ""},
        {"cat clip.yuv | tarsel transcode -" + raw + " -o out.yuv", "out.yuv", "clip.yuv"},
        {"cat clip.yuv | tarsel transcode - a.wav --input-format i420 --raw size=64x48,rate=25 --to 0.1 -o "
         "two.yuv",
         "two.yuv", ""},
        {"cat a.wav | tarsel transcode clip.yuv -" + raw + " --input-format wav --to 0.12 -o both.yuv",
         "both.yuv", "clip.yuv"},
        {"cat a.wav | tarsel transcode - --input-format wav -o - --format wav > through.wav", "through.wav",
         "a.wav"},
        // Read twice.
        {"cat a.wav | tarsel transcode - --input-format wav --normalize=-30 -o soft.wav", "soft.wav", ""},
    };
    for (const auto& row : rows) {
        shellWorks(row.line);
        EXPECT_GT(size(row.output), 0) << row.line;
        EXPECT_TRUE(row.wanted.empty() || contents(row.output) == contents(row.wanted)) << row.line;
    }
    EXPECT_TRUE(contents("rest.yuv") == contents("clip.yuv").substr(kFrame));
    EXPECT_TRUE(contents("two.yuv") == contents("clip.yuv").substr(0, 2 * kFrame));
    works({"transcode", "a.wav", "--normalize=-30", "-o", "file-soft.wav"});
    EXPECT_TRUE(contents("soft.wav") == contents("file-soft.wav"));

    const auto json =
        nlohmann::json::parse(shellWorks("cat a.wav | tarsel info a.wav - --input-format wav --json").out);
    EXPECT_EQ(json[1]["file"], "-");
    for (const char* key : {"decoder", "bytes", "streams", "duration_s"})
        EXPECT_EQ(json[0][key], json[1][key]);
    EXPECT_THAT(shellWorks("cat talk.srt | tarsel info - --input-format srt").out, HasSubstr("1 subtitle"));
    EXPECT_TRUE(std::filesystem::is_empty(folder.file("temp")));
}

TEST_F(StandardInput, WhatCantBeReadIsRefused) {
    const struct {
        int status;
        std::string line, part;
    } rows[] = {
        {2, "tarsel info - < a.wav", "--input-format wav"},
        {2, "tarsel transcode - -o x.wav < a.wav", "--input-format wav"},
        {2, "tarsel info - - --input-format wav < a.wav", "twice"},
        {2, "tarsel info a.wav --input-format wav < a.wav", "no input is -"},
        {2, "tarsel info - --input-format mmf < a.wav", "names others"},
        {2, "tarsel info - --input-format xml < a.wav", "names others"},
        {2, "tarsel loudness - < a.wav", "does not read the standard input"},
        {2, "tarsel transcode - --input-format wav -o x.wav --save-task t.xml < a.wav", "--save-task"},
        {2, "tarsel transcode - --input-format wav -o x.wav --cut 0-0.01 < a.wav", "--cut"},
        {2, "tarsel transcode - a.wav --join --input-format wav -o x.wav < a.wav", "--join"},
        {2, "tarsel transcode - --input-format wav -o x.wav --post 'cat %i' < a.wav", "--post with %i"},
        {2, "tarsel transcode a.wav - --input-format wav -o x.wav --post 'cat %i2' < a.wav",
         "--post with %i"},
        {3, "tarsel info - --input-format nonsense < a.wav", "'nonsense'"},
        {3, "tarsel info - --input-format yuv < clip.yuv", "--raw"},
        {3, "tarsel info - --input-format wav < clip.yuv", "no WAV file"},
        {3, "tarsel info - --input-format scc < a.wav", "no SCC file"},
        {3, "tarsel info - --input-format srt < clip.yuv", "no subtitle file"},
        {3, "tarsel info - --input-format wav < /dev/null", "empty"},
        {3, "tarsel info - --input-format wav <&-", "closed"},
        {3, "tarsel info - --input-format wav < .", "folder"},
        {3, "head -c 300 a.wav | tarsel transcode - --input-format wav -o x.wav", "is damaged"},
        {3, "head -c 300 a.wav | tarsel info - --input-format wav >/dev/null", "is damaged"},
        {4, "tarsel transcode - --input-format wav -o a.wav -y < a.wav", "also an input"},
        {4, "cat a.wav | TMPDIR=nowhere tarsel info - --input-format wav", "'nowhere/'"},
        // More than may be written to a file.
        {4, "cat clip.yuv clip.yuv | (ulimit -f 8; tarsel info - --input-format wav)",
         "can't keep the standard input"},
    };
    for (const auto& row : rows) {
        const auto before = listing();
        failsAs(row.status, shell(row.line), {row.part}, row.line);
        EXPECT_EQ(listing(), before) << row.line;
    }
    ProcessOptions terminal = own();
    terminal.terminal = true;
    const Outcome o = tarsel({"info", "-", "--input-format", "wav"}, terminal);
    EXPECT_EQ(o.status, 2);
    EXPECT_THAT(o.out, HasSubstr("a terminal"));
}

// The writer of the pipe is not done yet.
TEST_F(StandardInput, ASignalEndsTheWait) {
    const std::string pipe = folder.file("pipe");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int writer = open(pipe.c_str(), O_RDWR | O_CLOEXEC);
    ASSERT_GE(writer, 0);
    for (const int number : {SIGINT, SIGTERM}) {
        const auto before = listing();
        Process run(
            {"/bin/sh", "-c", "exec " + program() + " transcode - --input-format wav -o out.wav < pipe"},
            own());
        ASSERT_EQ(write(writer, "RIFF", 4), 4);
        for (int left = 1; left > 0;) {
            ASSERT_EQ(ioctl(writer, FIONREAD, &left), 0);
            usleep(1000);
        }
        run.signal(number);
        const Outcome o = run.finish();
        EXPECT_EQ(o.status, 128 + number) << o.err;
        EXPECT_THAT(o.err, HasSubstr("stopped"));
        EXPECT_EQ(listing(), before);
    }
    close(writer);
}

}  // namespace
