// Where a job is divided, planned from descriptions of inputs: no file is read.
#include "tarsel/split/splitplan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarsel/words/failure.h"
#include "tarsel/words/timespec.h"

namespace {

class SplitPlans : public testing::Test {
  protected:
    static void SetUpTestSuite() { init_wrapper(nullptr); }
    static void TearDownTestSuite() { cleanup_wrapper(); }

    static JobPlan planOf(const char* rate, long long frames, int samplerate, PlanOptions options = {}) {
        JobInput input;
        input.name = "in";
        InputStream& video = input.video.emplace_back();
        video.units = frames;
        video.picture = {64, 48, QvFourcc::I420, parseRate(rate, ""), 4.0 / 3};
        if (samplerate > 0) {
            InputStream& sound = input.audio.emplace_back();
            sound.type = qvAudioStream;
            sound.sound = {samplerate, 2, 16};
            sound.units = static_cast<long long>(video.end().seconds() * samplerate);
        }
        options.inputs = {"in"};
        if (options.output.empty()) options.output = "o.avi";
        return planJob(options, outputForm(options, OutputPlace::files), {input});
    }
};

TEST_F(SplitPlans, PointsAreWhereFramesAndSamplesBegin) {
    const struct {
        const char* rate;
        long long frames;
        int samplerate, parts;
        std::function<void(PlanOptions&)> change;
        long long unit;
        std::vector<long long> points;
        long long lead;
    } rows[] = {
        {"25", 100, 44100, 4, {}, 1, {0, 25, 50, 75, 100}, 0},
        {"29.97", 450, 44100, 3, {}, 100, {0, 200, 300, 450}, 0},
        {"29.97", 100, 48000, 3, {}, 5, {0, 35, 65, 100}, 0},
        {"29.97", 100, 0, 3, {}, 1, {0, 33, 66, 100}, 0},
        {"59.94", 99, 44100, 2, {}, 200, {0, 99}, 0},
        {"25", 3, 0, 8, {}, 1, {0, 1, 2, 3}, 0},
        {"25", 1, 0, 2, {}, 1, {0, 1}, 0},
        {"24", 96, 48000, 2, [](PlanOptions& o) { o.effects.rate = "30"; }, 5, {0, 60, 120}, 0},
        {"24", 9600, 48000, 2, [](PlanOptions& o) { o.effects.rate = "29.97"; }, 1250, {0, 6250, 11988}, 0},
        {"25i", 100, 48000, 2, [](PlanOptions& o) { o.effects.deinterlace = "double"; }, 2, {0, 100, 200}, 2},
        {"25", 100, 0, 2, [](PlanOptions& o) { o.from = "20f", o.to = "60f"; }, 1, {0, 20, 40}, 0},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(std::string(row.rate) + " " + std::to_string(row.samplerate));
        PlanOptions options;
        if (row.change) row.change(options);
        const JobPlan plan = planOf(row.rate, row.frames, row.samplerate, options);
        EXPECT_EQ(splitUnit(plan), row.unit);
        const SplitPlan split = planSplit(plan, row.parts);
        EXPECT_EQ(split.points, row.points);
        EXPECT_EQ(split.leadIn, row.lead);
        EXPECT_EQ(split.lead(0), 0);
    }
}

// A part in which the last picture is held has one to hold.
TEST_F(SplitPlans, HeldPicturesAreInTheLastPart) {
    JobPlan plan = planOf("25", 100, 0);
    PlannedStream& picture = plan.streams.front();
    picture.hold = true;
    picture.expected = 1000;
    picture.part.out = MediaTime(40.0);
    EXPECT_EQ(planSplit(plan, 4).points, (std::vector<long long>{0, 25, 50, 75, 1000}));
}

// Tasks of a batch share a machine with others; whoever runs one job says what each part takes.
TEST_F(SplitPlans, PartsTakeNoMoreThanTheirShare) {
    const struct {
        size_t parts;
        int cores, threads, processors, atOnce, each;
    } cases[] = {{8, 4, 0, 0, 4, 1},  {2, 8, 0, 0, 2, 4},  {3, 8, 0, 0, 3, 2},
                 {2, 0, 0, 0, 1, 1},  {4, 2, 1, 0, 2, 1},  {2, 2, 16, 0, 2, 16},
                 {8, 64, 4, 4, 4, 1}, {2, 64, 8, 8, 2, 4}, {5, 2, 1, 1, 1, 1}};
    for (const auto& given : cases) {
        const PartShare share = shareOf(given.parts, given.cores, given.threads, given.processors);
        EXPECT_EQ(share.atOnce, given.atOnce) << given.parts << " parts on " << given.cores;
        EXPECT_EQ(share.threads, given.each) << given.parts << " parts on " << given.cores;
    }
}

TEST_F(SplitPlans, WhatCanNotBeDividedIsNamed) {
    JobPlan moving = planOf("25", 100, 48000), dumping = moving, film = moving;
    moving.streams.front().filters.appendFilter("animatedlogo", AnyDict("name", "animatedlogo", "_on", 1));
    dumping.filterFiles.written.push_back({"dump", "rawdump"});
    film.output.kind = OutputKind::module;
    for (const auto& [plan, word] :
         {std::pair(moving, "animatedlogo"), std::pair(dumping, "rawdump"), std::pair(film, "o.avi")}) {
        std::string line;
        try {
            planSplit(plan, 2);
        } catch (const Failure& failure) {
            line = failure.what();
        }
        EXPECT_THAT(line, testing::HasSubstr(word));
        EXPECT_THAT(line, testing::HasSubstr("--split"));
    }
}

}  // namespace
