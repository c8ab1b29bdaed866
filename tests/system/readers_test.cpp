// What a peer reads from our files. Our own reader would share our own mistakes.
#include "tests/system/tool.h"

namespace {

class Peer : public Tool {
  protected:
    void SetUp() override {
        if (runProgram({"/bin/sh", "-c", "command -v ffmpeg ffprobe"}, here()).status != 0)
            GTEST_SKIP() << "ffmpeg is not installed";
    }

    // The first picture of a file, as the peer decodes it.
    std::string picture(const Words& input, const std::string& format) const {
        const Outcome o =
            runProgram(Words{"/usr/bin/env", "ffmpeg", "-v", "error", "-y"} + input +
                           Words{"-frames:v", "1", "-f", "rawvideo", "-pix_fmt", format, "peer"},
                       here());
        EXPECT_EQ(o.status, 0) << o.err;
        return contents("peer");
    }
    std::string shown(const std::string& file, const std::string& entries) const {
        const Outcome o = runProgram({"/usr/bin/env", "ffprobe", "-v", "error", "-select_streams", "v",
                                      "-show_entries", "stream=" + entries, "-of", "csv=p=0", file},
                                     here());
        EXPECT_EQ(o.status, 0) << o.err;
        return o.out;
    }
};

// The planes of the raw file of the same type are what has to come out, in the same order.
TEST_F(Peer, PicturesInAvi) {
    const std::string card = "testgen:size=64x48,duration=0.2";
    const struct {
        const char *pixel, *peer;
    } rows[] = {{"I420", "yuv420p"}, {"YV12", "yuv420p"}, {"YUYV", "yuyv422"},    {"UYVY", "uyvy422"},
                {"BGR3", "bgr24"},   {"BGR4", "bgr0"},    {"v210", "yuv422p10le"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.pixel);
        works({"transcode", card, "--pixel", row.pixel, "-o", "a.avi", "-y"});
        works({"transcode", card, "--pixel", row.pixel, "-o", "a.raw", "-y"});
        EXPECT_EQ(shown("a.avi", "width,height,sample_aspect_ratio"), "64,48,1:1\n");
        std::string expected = contents("a.raw");
        if (std::string(row.pixel) == "v210") {
            expected = picture({"-f", "v210", "-video_size", "64x48", "-i", "a.raw"}, row.peer);
        } else {
            const size_t luma = 64 * 48, chroma = luma / 4;
            if (std::string(row.pixel) == "YV12")
                expected = expected.substr(0, luma) + expected.substr(luma + chroma, chroma) +
                           expected.substr(luma, chroma);
            expected.resize(picture({"-i", "a.avi"}, row.peer).size());
        }
        std::string found = picture({"-i", "a.avi"}, row.peer);
        if (std::string(row.pixel) == "BGR4")  // the fourth byte means nothing
            for (size_t i = 3; i < found.size(); i += 4) found[i] = expected[i];
        EXPECT_TRUE(found == expected);
    }
}

}  // namespace
