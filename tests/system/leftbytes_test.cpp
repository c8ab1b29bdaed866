// What memory holds before a run must not show in its outputs, and too little of it must not end a run with a
// signal.
#include <map>

#include "tests/system/tool.h"

namespace {

const Words kFormats = {"GRAY", "I420", "YV12", "I422", "W016", "YUY2", "YUYV", "UYVY", "Y216",
                        "v210", "BGR3", "BGR4", "BGRA", "ARGB", "R32C", "b64a", "R555", "R565"};

Words raw(const std::string& size, const std::string& pixel) {
    return {"in.raw", "--raw", "size=" + size + ",pixel=" + pixel + ",rate=25",
            "--to",   "3f",    "--accept-partial"};
}

struct Memory : Tool {
    void SetUp() override {
        makeYuv("in.raw", 40);
        for (const unsigned bits : {8u, 16u, 24u}) makeWav(std::to_string(bits) + ".wav", 5001, 3, bits);
        folder.write("s.srt", "1\n00:00:00,000 --> 00:00:01,000\nW\xC3\xA4rter <i>und</i> mehr\n");
    }

    // All files that the job writes, when its memory is filled with `byte` before it is used.
    std::map<std::string, std::string> outputs(const Words& job, const std::string& name, int byte) const {
        const std::string place = "out" + std::to_string(byte);
        std::filesystem::remove_all(folder.path() / place);
        std::filesystem::create_directory(folder.path() / place);
        ProcessOptions options = here();
        options.environment = {"MALLOC_PERTURB_=" + std::to_string(byte)};
        const Outcome o = tarsel(Words{"transcode", "-q", "-o", place + "/" + name} + job, options);
        EXPECT_EQ(o.status, 0) << o.err << testing::PrintToString(job);
        std::map<std::string, std::string> found;
        for (const auto& entry : std::filesystem::directory_iterator(folder.path() / place))
            found[entry.path().filename().string()] = TempFolder::read(entry.path().string());
        return found;
    }
    void sameInAnyMemory(const Words& job, const std::string& name) const {
        const auto first = outputs(job, name, 85);
        EXPECT_FALSE(first.empty());
        EXPECT_TRUE(first == outputs(job, name, 170)) << name << testing::PrintToString(job);
    }
};

TEST_F(Memory, DoesNotShowInPicturesOfAnyFormat) {
    for (const auto& pixel : kFormats) {
        sameInAnyMemory({"testgen:size=50x35,rate=25,duration=3f", "--pixel", pixel}, "o.raw");
        sameInAnyMemory(raw("64x48", "I420") + Words{"--size", "33x17", "--pixel", pixel}, "o.raw");
        sameInAnyMemory(raw(pixel == "v210" ? "14x4" : "5x3", pixel) + Words{"--size", "37x27"}, "o.raw");
    }
}

TEST_F(Memory, DoesNotShowInOtherOutputs) {
    const Words card = {"testgen:size=51x37,rate=25,duration=5f"};
    for (const char* pixel : {"BGR3", "BGR4", "I420", "YV12", "YUY2", "UYVY", "v210"})
        sameInAnyMemory(card + Words{"--pixel", pixel}, "o.avi");
    for (const Words& effect : {Words{"--crop", "31x21+3+5"},
                                {"--flip"},
                                {"--subtitles", "s.srt"},
                                {"--timecode"},
                                {"--rate", "30"},
                                {"--fade", "0.08"},
                                {"--pixel", "I422", "--size", "35x33"}}) {
        sameInAnyMemory(card + effect, "o.png");
        sameInAnyMemory(card + effect, "o.raw");
    }
    sameInAnyMemory({"testgen:size=51x37,rate=25i,duration=5f", "--deinterlace"}, "o.raw");
    for (const char* input : {"8.wav", "16.wav", "24.wav"}) {
        sameInAnyMemory({input}, "o.wav");
        sameInAnyMemory({input, "--split-channels"}, "o.wav");
    }
}

// fontconfig does not survive a failed allocation, so it is not called without some memory to spare.
TEST_F(Memory, TooLittleOfItForFontsIsAFailureWithASentence) {
    if (*QV_SANITIZE) GTEST_SKIP() << "a sanitizer needs more room for addresses";
    for (int limit = 26'000; limit < 62'000; limit += 1500) {
        const std::string line =
            "ulimit -v " + std::to_string(limit) + "; exec '" + program() +
            "' transcode testgen:size=640x480,rate=25,duration=1f -y -q --timecode -o o.raw";
        const Outcome o = runProgram({"/bin/sh", "-c", line}, here());
        EXPECT_THAT(o.status, testing::AllOf(testing::Ge(0), testing::Lt(127))) << limit << o.err;
    }
}

}  // namespace
