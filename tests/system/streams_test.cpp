// Outputs that are streams: the standard output, pipes, sockets, devices.
#include <sys/socket.h>
#include <sys/stat.h>

#include "tests/system/tool.h"

namespace {

constexpr const char* kCard = "testgen:size=64x64,rate=25,duration=1";
constexpr size_t kFrames = 25u * 64 * 64 * 4;

class Streams : public Tool {
  protected:
    Streams() { makeWav("in.wav", 44100); }

    // The tool's words with `tail` after them, run by a shell.
    Outcome shell(const Words& arguments, const std::string& tail) const {
        std::string line = "set -o pipefail; ";
        for (const auto& word : words(arguments)) line += "'" + word + "' ";
        return runProgram({"bash", "-c", line + tail}, here());
    }
    static bool installed(const std::string& program) {
        return runProgram({"sh", "-c", "command -v " + program}).status == 0;
    }
    static unsigned field(const std::string& wav, size_t at) {
        unsigned value = 0;
        std::memcpy(&value, wav.data() + at, 4);
        return value;
    }
    // Ends with `status` without an assertion of our own about time: a run that hangs is killed.
    void stops(Process& run, int signal, int status, const std::string& message) const {
        run.signal(signal);
        const Outcome o = run.finish();
        EXPECT_EQ(o.status, status) << o.err;
        EXPECT_THAT(o.err, testing::HasSubstr(message));
    }
};

TEST_F(Streams, WavIsAStreamWithTheSizesOfAFile) {
    works({"transcode", "in.wav", "-o", "file.wav"});
    const std::string file = contents("file.wav");
    for (const std::string name : {"-", "/dev/stdout", "/dev/fd/1"}) {
        const Outcome o = works({"transcode", "in.wav", "-o", name, "--format", "wav"});
        EXPECT_TRUE(o.out == file) << name;
        EXPECT_EQ(o.err, "tarsel: wrote '" + name + "', 44100 samples\n");
    }
    const Outcome o = works({"transcode", "in.wav", "-o", "-", "--format", "WAV", "--accept-partial"});
    EXPECT_EQ(o.out.substr(80), file.substr(80));
    for (const size_t at : {4u, 68u, 76u})
        EXPECT_EQ(field(o.out, at), 0xFFFFFFFFu) << "no length is promised";
    folder.write("unknown.wav", o.out);
    works({"transcode", "unknown.wav", "-o", "again.wav"});
    EXPECT_TRUE(contents("again.wav") == file);
}

TEST_F(Streams, OtherProgramsReadThePipe) {
    for (const std::string partial : {"--quiet", "--accept-partial"}) {
        const Words job = {"transcode", "in.wav", "-o", "-", "--format", "wav", partial};
        if (installed("ffmpeg")) {
            EXPECT_EQ(shell(job, "| ffmpeg -v error -i - -f s16le -y pcm").status, 0);
            EXPECT_TRUE(contents("pcm") == wavPart(contents("in.wav"), "data")) << partial;
        }
        if (installed("sox")) {
            EXPECT_EQ(shell(job, "| sox -t wav - -t s16 pcm").status, 0);
            EXPECT_TRUE(contents("pcm") == wavPart(contents("in.wav"), "data")) << partial;
        }
    }
    if (!installed("ffmpeg") && !installed("sox")) GTEST_SKIP() << "neither ffmpeg nor sox is installed";
}

// What the shell wrote before stays, what it writes afterwards follows.
TEST_F(Streams, ARedirectedFileIsWrittenWhereItStands) {
    for (const std::string how : {">", ">>"}) {
        folder.write("out", "old\n");
        const std::string name = how == ">" ? "-" : "/dev/stdout";
        const Outcome o = runProgram({"bash", "-c",
                                      "{ echo head; " + program() + " transcode " + kCard + " -o " + name +
                                          " --format raw; echo tail; } " + how + " out"},
                                     here());
        EXPECT_EQ(o.status, 0) << o.err;
        const std::string got = contents("out"), before = how == ">" ? "head\n" : "old\nhead\n";
        EXPECT_EQ(got.size(), before.size() + kFrames + 5);
        EXPECT_EQ(got.substr(0, before.size()), before);
        EXPECT_TRUE(got.ends_with("tail\n"));
    }
    const Outcome o = shell({"transcode", "in.wav", "-o", "-", "--format", "wav"}, ">> in.wav");
    failsAs(4, o, {"'-'", "also an input"}, "reading what is written");
}

TEST_F(Streams, TheStandardOutputIsForDataOnly) {
    const Outcome o = works({"transcode", kCard, "-o", "-", "--format", "raw", "--progress", "log:1",
                             "--post", "echo said by the command"});
    EXPECT_EQ(o.out.size(), kFrames);
    EXPECT_THAT(o.err, testing::HasSubstr("said by the command"));
    EXPECT_EQ(works({"transcode", kCard, "-o", "/dev/stderr", "--format", "raw", "-q"}).err.size(), kFrames);
}

TEST_F(Streams, WhatCanNotBeAStreamIsRefused) {
    const struct {
        int status;
        Words job, parts;
    } cases[] = {
        {2, {kCard, "-o", "-"}, {"-o -", "--format"}},
        {2, {kCard, "-o", "-", "--format", "avi"}, {"'-'", "AVI", "--format wav"}},
        {2, {kCard, "-o", "/dev/stdout", "--format", "png"}, {"'/dev/stdout'", "PNG", "--format raw"}},
        {2, {kCard, "-o", "-", "--format", "wva"}, {"'wva'", "Did you mean 'wav'?"}},
        {2, {"in.wav", "-o", "-", "--format", "wav", "--split-channels"}, {"--split-channels", "one stream"}},
        {3, {"in.wav", "-o", "-", "--format", "raw"}, {"no input has a picture", "'-'"}},
        {2, {kCard, "-o", "clip"}, {"'clip'", "no extension", "--format"}},
    };
    for (const auto& c : cases) fails(c.status, Words{"transcode"} + c.job, c.parts);
    failsAs(4, shell({"transcode", kCard, "-o", "-", "--format", "raw"}, ">&-"), {"'-'", "closed"}, "closed");
    ProcessOptions terminal = here();
    terminal.terminal = true;
    const Outcome o = tarsel({"transcode", kCard, "-o", "-", "--format", "raw"}, terminal);
    EXPECT_EQ(o.status, 2);
    EXPECT_THAT(o.out, testing::AllOf(testing::HasSubstr("'-'"), testing::HasSubstr("terminal")));
}

TEST_F(Streams, AFormatNamesWhatTheExtensionDoesNot) {
    works({"transcode", kCard, "-o", "sound", "--format", "wav"});
    works({"transcode", kCard, "-o", "clip.x", "--format", "raw"});
    works({"transcode", kCard, "-o", "movie", "--format", "avi"});
    EXPECT_EQ(listing(), (std::set<std::string>{"clip.wav", "clip.x", "in.wav", "movie", "sound"}));
    EXPECT_EQ(size("clip.x"), static_cast<long long>(kFrames));
    EXPECT_TRUE(contents("sound") == contents("clip.wav"));
    EXPECT_EQ(contents("movie").substr(8, 4), "AVI ");

    ProcessOptions limited = here();
    limited.fileLimit = 40000;
    for (const std::string name : {"new", "new.i420"}) {
        const std::string format = name == "new" ? "wav" : "raw";
        const Outcome o = tarsel({"transcode", kCard, "-o", name, "--format", format}, limited);
        failsAs(4, o, {"can't write '" + name + "'", "larger than the disk or a limit"},
                "the name that the user wrote");
    }
}

TEST_F(Streams, OnePictureIsAStream) {
    works({"frame", kCard, "-o", "card.png"});
    for (const std::string name : {"-", "/dev/stdout"})
        EXPECT_TRUE(works({"frame", kCard, "-o", name}).out == contents("card.png")) << name;
    works({"frame", kCard, "-o", "/dev/null"});
    fails(4, {"frame", kCard, "-o", "/dev/full"}, {"'/dev/full'"});
    EXPECT_TRUE(std::filesystem::exists("/dev/full"));
}

TEST_F(Streams, TheNullDeviceTakesAnything) {
    const auto before = listing();
    for (const Words& options : {Words{}, {"--format", "raw"}, {"--format", "png"}, {"--format", "avi"}}) {
        const Outcome o = works(Words{"transcode", kCard, "-o", "/dev/null"} + options);
        EXPECT_EQ(o.err, "tarsel: wrote '/dev/null', 25 frames, 44100 samples\n");
    }
    for (const Words& options : {Words{}, {"--format", "wav"}, {"--split-channels"}})
        EXPECT_EQ(works(Words{"transcode", "in.wav", "-o", "/dev/null"} + options).err,
                  "tarsel: wrote '/dev/null', 44100 samples\n");
    EXPECT_EQ(shell({"transcode", kCard, "-o", "-", "--format", "avi"}, "> /dev/null").status, 0);
    EXPECT_EQ(listing(), before);
}

TEST_F(Streams, AStopEndsAWaitForTheReader) {
    const std::string endless = "testgen:size=640x480,rate=25,duration=20000,audio=0";
    // Nobody opens it.
    mkfifo(folder.file("pipe").c_str(), 0600);
    {
        Process run(words({"transcode", endless, "-o", "pipe", "--progress", "json"}), here());
        ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
        stops(run, SIGTERM, 143, "\"stopped: a signal ended the job; no output was written\"");
    }
    // Nobody reads it.
    const int reader = open(folder.file("pipe").c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    int sockets[2];
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets), 0);
    const struct {
        std::string name;
        int signal, status, reader;
    } cases[] = {{"pipe", SIGINT, 130, reader},
                 {"/dev/fd/" + std::to_string(fcntl(sockets[1], F_DUPFD, 100)), SIGTERM, 143, sockets[0]}};
    for (const auto& c : cases) {
        Process run(words({"transcode", endless, "-o", c.name}), here());
        pollfd data{c.reader, POLLIN, 0};
        ASSERT_EQ(poll(&data, 1, Process::kPatience), 1);
        stops(run, c.signal, c.status,
              "tarsel: stopped: a signal ended the job; '" + c.name + "' has a part of the output");
    }
    close(reader), close(sockets[0]), close(sockets[1]);
}

}  // namespace
