// Jobs under a limit of memory or threads: each ends well, or says why, and leaves nothing.
#include "tests/system/tool.h"

namespace {

class ShortMemory : public Tool {
  protected:
    // With at most `limit` of the shell's "ulimit OPTION".
    Outcome under(const std::string& limit, const Words& arguments) const {
        std::string line = "ulimit " + limit + "; exec '" + program() + "'";
        for (const auto& word : arguments) line += " '" + word + "'";
        return runProgram({"sh", "-c", line}, here());
    }
};

// In steps from where the program hardly starts to where it has enough, so that the limit is met in the
// start, in the plan, when the output opens and while frames are on their way.
TEST_F(ShortMemory, EndsEveryFormOfOutputInOrder) {
    if (*QV_SANITIZE) GTEST_SKIP() << "a sanitizer takes more memory than any limit";
    const std::string card = "testgen:size=1280x720,duration=0.08";
    makeWav("in.wav", 200000);
    const Words jobs[] = {{"transcode", card + ",audio=0", "-o", "p.png"},
                          {"transcode", card, "-o", "p.avi"},
                          {"transcode", card, "-o", "p.raw", "--size", "640x480", "--fade", "0.04"},
                          {"transcode", "in.wav", "-o", "p.wav", "--split-channels"}};
    for (const auto& job : jobs) {
        int done = 0, refused = 0;
        for (int kilobytes = 34000; kilobytes < 110000; kilobytes += 6000) {
            const Outcome o = under("-v " + std::to_string(kilobytes), job);
            SCOPED_TRACE(job.at(3) + " with " + std::to_string(kilobytes) + " kB: " + o.err);
            if (o.status == 0) {
                ++done;
                for (const auto& name : listing())
                    if (name != "in.wav") std::filesystem::remove_all(folder.file(name));
                continue;
            }
            ++refused;
            ASSERT_EQ(o.status, 1);
            EXPECT_THAT(o.err, testing::AnyOf(testing::HasSubstr("out of memory"),
                                              testing::HasSubstr("no thread could be started")));
            EXPECT_EQ(listing(), std::set<std::string>{"in.wav"});
        }
        EXPECT_GT(done, 0);
        EXPECT_GT(refused, 0);
    }
}

// Commands that measure meet the limit in libraries, too.
TEST_F(ShortMemory, IsWhatCommandsThatMeasureSay) {
    if (*QV_SANITIZE) GTEST_SKIP() << "a sanitizer takes more memory than any limit";
    makeWav("in.wav", 200000);
    makeYuv("in.yuv", 4);
    const Words jobs[] = {{"loudness", "in.wav"},
                          asYuv({"compare", "in.yuv", "in.yuv", "--sheet", "out.png"}),
                          asYuv({"scope", "in.yuv", "-o", "out.png"}),
                          asYuv({"frame", "in.yuv", "--sheet", "4x4", "-o", "out.png"})};
    const std::set<std::string> inputs = listing();
    for (const auto& job : jobs)
        for (int kilobytes = 28000; kilobytes < 44000; kilobytes += 500) {
            const Outcome o = under("-v " + std::to_string(kilobytes), job);
            SCOPED_TRACE(job.front() + " with " + std::to_string(kilobytes) + " kB: " + o.err);
            std::filesystem::remove(folder.file("out.png"));
            EXPECT_EQ(listing(), inputs);
            if (o.status == 0 || o.status == 127) continue;  // the loader's own
            EXPECT_EQ(o.status, 1);
            EXPECT_THAT(o.err, testing::AnyOf(testing::HasSubstr("out of memory"),
                                              testing::HasSubstr("no thread could be started")));
        }
}

}  // namespace
