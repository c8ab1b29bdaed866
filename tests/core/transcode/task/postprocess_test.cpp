#include "tests/core/transcode/transcode_fixture.h"

namespace {

TEST(PostprocessCommand, PlaceholdersAreFileNamesThatCanDoNoHarm) {
    Job job;
    FakeDecoder other(1, QvFramerate::f25p());
    FakeMuxer muxer("rawmux");
    job.decoder.extra.set("filename", "/in/a b.avi");
    other.extra.set("filename", "/in/it's.wav");
    other.audio(10, 48000);
    job.pipe.audio(48000);
    ASSERT_EQ(job.task.link(&job.decoder, qvVideoStream, 0, 0), 0);
    ASSERT_EQ(job.task.link(&other, qvAudioStream, 0, 1), 1);
    job.pipe.muxer = &muxer;
    job.pipe.filename = "/out/x#1.raw";
    const auto commandOf = [&](const Any& command) -> std::string {
        job.task.setPostprocessCommand(command);
        const Any result = job.task.currentPostprocessCommand();
        return result.isString() ? result.asString() : "(none)";
    };
    const std::string a = "'/in/a b.avi'", b = R"('/in/it'\''s.wav')", x = "'/out/x#1.raw'";
    const struct {
        Any given;
        std::string expected;
    } rows[] = {
        {"100% %q %", "100% %q %"},
        {"cp %i1 %o1", "cp " + a + " " + x},
        {"%i2;%i", b + ";" + a + " " + b},
        {"%i3", a + " " + b + "3"},
        {"%i12", a + "2"},
        {"%o %op%ob", x + " '/out/''x#1'"},
        {Any(), "(none)"},
    };
    for (const auto& row : rows) EXPECT_EQ(commandOf(row.given), row.expected);

    // The multiplexer's files come where it names them.
    muxer.params.set("filenames", AnyVector("/o/y#1.m2v", "/o/y#2.wav"));
    EXPECT_EQ(commandOf("%o2 %ob %o"), "'/o/y#2.wav' 'y' '/o/y#1.m2v' '/o/y#2.wav'");
    job.decoder.extra.set("filename", "/in/%o1 %i.avi");
    EXPECT_EQ(commandOf("%i1"), "'/in/%o1 %i.avi'") << "a placeholder in a file name stays";
}

}  // namespace
