#include <gtest/gtest.h>

#include "tests/core/transcode/transcode_fixture.h"

namespace {

class NamingMuxer : public QvMuxer {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    void getParam(const char* name, Any& value) const override {
        if (std::string(name) == "filenames")
            value = names;
        else
            QvMuxer::getParam(name, value);
    }
    QvBufStream* addStream(int, const AnyDict&) override { return nullptr; }
    void removeStreams(int) override {}
    void removeStream(int, int) override {}
    int nrStreams(int) const override { return 0; }
    QvBufStream* stream(int, int) const override { return nullptr; }
    AnyVector names;
};

struct Command {
    Command() {
        job.decoder.extra.set("filename", "/in/a b.avi");
        other.extra.set("filename", "/in/it's.wav");
        other.audio(10, 48000);
        job.pipe.audio(48000);
        EXPECT_EQ(job.task.link(&job.decoder, 1, 0, 0), 0);
        EXPECT_EQ(job.task.link(&other, 2, 0, 1), 1);
        job.pipe.muxer = &muxer;
        job.pipe.filename = "/out/x#1.raw";
    }
    std::string of(const Any& command) {
        job.task.setPostprocessCommand(command);
        const Any result = job.task.currentPostprocessCommand();
        return result.isString() ? result.asString() : "(none)";
    }
    Job job;
    FakeDecoder other{1, QvFramerate::f25p()};
    NamingMuxer muxer;
};

TEST(PostprocessCommand, PlaceholdersAreFileNamesThatCanDoNoHarm) {
    Command command;
    const std::string a = "'/in/a b.avi'", b = R"('/in/it'\''s.wav')", x = "'/out/x#1.raw'";
    const struct {
        const char* given;
        std::string expected;
    } rows[] = {
        {"true", "true"},
        {"", ""},
        {"100% %q %", "100% %q %"},
        {"cp %i1 %o1", "cp " + a + " " + x},
        {"%i2;%i", b + ";" + a + " " + b},
        {"%i3", a + " " + b + "3"},
        {"%i0", a + " " + b + "0"},
        {"%i12", a + "2"},
        {"%o %op%ob", x + " '/out/''x#1'"},
    };
    for (const auto& row : rows) EXPECT_EQ(command.of(row.given), row.expected) << row.given;
    EXPECT_EQ(command.of(Any()), "(none)");
    EXPECT_EQ(command.of(Any(7)), "(none)");
}

TEST(PostprocessCommand, TheMultiplexersFilesCome) {
    Command command;
    command.muxer.names = AnyVector(Any("/o/y#1.m2v"), Any("/o/y#2.wav"));
    EXPECT_EQ(command.of("%o2 %ob %o"), "'/o/y#2.wav' 'y' '/o/y#1.m2v' '/o/y#2.wav'");
    command.muxer.names = AnyVector(Any("/o/y#1.m2v"));
    EXPECT_EQ(command.of("%ob"), "'y#1'");
    command.job.pipe.audios.pop_back();  // one stream of a type has no numbers
    command.muxer.names.append(Any("/o/y#2.wav"));
    EXPECT_EQ(command.of("%ob"), "'y#1'");
}

TEST(PostprocessCommand, APlaceholderInAFileNameStays) {
    Command command;
    command.job.decoder.extra.set("filename", "/in/%o1 %i.avi");
    EXPECT_EQ(command.of("%i1"), "'/in/%o1 %i.avi'");
}

}  // namespace
