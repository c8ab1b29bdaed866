#include "builtin/video/levels/videofade.h"

#include "tests/builtin/video/effect_frames.h"

namespace {

using Opened = OpenedEffect<CVideoFade>;

// The first luma sample of frame after frame of white.
std::vector<int> levels(Opened& fade, int frames) {
    std::vector<int> found;
    QvFrame white = makePicture(QvFourcc::GRAY, 4, 2);
    for (int i = 0; i < frames; ++i) {
        std::memset(white.plane(), 235, 8);
        found.push_back(fade.through(white).plane()[0]);
    }
    return found;
}

}  // namespace

TEST(CVideoFade, RampsAreLinearAndMeetBlackAtTheEnds) {
    using Levels = std::vector<int>;
    struct {
        int in, out, count, announced;
        Levels levels;
    } const rows[] = {
        {4, 0, 0, 0, {16, 71, 126, 180, 235, 235}},
        {0, 4, 6, 0, {235, 235, 180, 126, 71, 16}},
        {0, 2, 4, 0, {235, 235, 126, 16, 16, 16}},  // past the count
        {2, 2, 3, 0, {16, 71, 16}},                 // overlapping
        {0, 2, 0, 4, {235, 235, 126, 16}},          // counted by the job
        {0, 2, 3, 9, {235, 126, 16}},               // set otherwise
        {0, 9, 0, 0, {235, 235, 235}},              // nobody knows
        {1, 1, 1, 0, {16}},
    };
    for (const auto& row : rows) {
        Opened fade({{"fade_in", row.in},
                     {"fade_out", row.out},
                     {"frames_count", row.count},
                     {"_totalFrames", row.announced}});
        const int frames = static_cast<int>(row.levels.size());
        EXPECT_EQ(levels(fade, frames), row.levels) << row.in << row.out << row.count;
        fade.close();
        EXPECT_EQ(fade.open(), 0);
        EXPECT_EQ(levels(fade, frames), row.levels) << "opened again";
    }
}

TEST(CVideoFade, EveryFormatFadesToItsBlackAndKeepsAlpha) {
    for (const auto& format : qvPixelFormats()) {
        QvFrame in = makePicture(format.fourcc, 13, 6), black = makePicture(format.fourcc, 13, 6, 2);
        sameInPlace(Opened({{"fade_in", 3}}), Opened({{"fade_in", 3}}), in);
        // Frame 0 of any picture is the black that another one gives.
        Opened fade({{"fade_in", 1}}), other({{"fade_in", 1}});
        const std::string first = samplesOf(fade.through(in)), second = samplesOf(other.through(black));
        const std::string name = fourccName(format.fourcc);
        const bool alpha =
            name == "BGRA" || name == "BGR4" || name == "ARGB" || name == "R32C" || name == "b64a";
        EXPECT_EQ(first == second, !alpha) << name;
        EXPECT_TRUE(samplesOf(fade.through(in)) == samplesOf(in)) << name << ": untouched after the fade";
    }
    QvFrame clear = makePicture(QvFourcc::BGRA, 4, 2);
    EXPECT_EQ(Opened({{"fade_in", 1}}).through(clear).plane()[7], clear.plane()[7]);
    // Read as 8 bits, whatever the format.
    const struct {
        unsigned fourcc;
        int plane, byte, black;
    } samples[] = {
        {QvFourcc::I420, 2, 0, 128}, {QvFourcc::YUYV, 0, 3, 128}, {QvFourcc::UYVY, 0, 1, 16},
        {QvFourcc::Y216, 0, 3, 128}, {QvFourcc::R32C, 0, 1, 16},  {QvFourcc::b64a, 0, 3, 0},
        {QvFourcc::v210, 0, 3, 32},  {QvFourcc::R565, 0, 1, 0},   {QvFourcc::I422, 2, 1, 128},
    };
    for (const auto& sample : samples) {
        QvFrame in = makePicture(sample.fourcc, 12, 6);
        Opened fade({{"fade_in", 2}});
        const QvFrame& out = fade.through(in);
        const int last = sampleRows(out, sample.plane) - 1;
        EXPECT_EQ(rowOf(out, sample.plane, last)[sample.byte], sample.black) << fourccName(sample.fourcc);
    }
}
