#include <gtest/gtest.h>

#include "core/transcode/task/segmentdurations_p.h"
#include "tests/core/transcode/transcode_fixture.h"

namespace {

constexpr long long second = MediaTime::defaultTimescale;

// A file of that many frames (25 a second) and samples (48000 a second).
struct File : FakeDecoder {
    File(const char* name, int frames, long long samples) : FakeDecoder(frames, QvFramerate::f25p()) {
        audio(samples, 48000);
        extra.set("filename", name);
    }
};

std::string pointsOf(const QvIStream& stream) {
    const auto points = stream.params.inOutPoints();
    if (!points) return "-";
    const auto number = [](const MediaTime& time) {
        return std::to_string(static_cast<double>(time.value()) / second).substr(0, 4);
    };
    return number(points->inPoint()) + "-" + number(points->outPoint());
}

TEST(SegmentDurations, TheShortestVideoDecidesAndSoundFollows) {
    File four("a", 100, 4 * 48000), three("b", 75, 3 * 48000), sameName("a", 100, 9 * 48000);
    struct In {
        File* file;
        int type;
        double in, out;  // both 0: without points
    };
    const struct {
        const char* what;
        std::vector<In> streams;
        int winner;
        Texts points;
    } rows[] = {
        {"nothing to do", {{&four, 1, 0, 0}, {&four, 2, 0, 0}}, 0, {"-", "-"}},
        {"sound of the file follows", {{&four, 1, 1, 3}, {&four, 2, 0, 0}}, 0, {"1.00-3.00", "1.00-3.00"}},
        {"also by its name", {{&four, 1, 1, 3}, {&sameName, 2, 2, 9}}, 0, {"1.00-3.00", "1.00-3.00"}},
        {"another file keeps its start",
         {{&four, 1, 1, 3}, {&three, 2, 0.5, 0}},
         0,
         {"1.00-3.00", "0.50-2.50"}},
        {"it may be short", {{&four, 1, 0, 0}, {&three, 2, 1, 0}}, 0, {"-", "1.00-0.00"}},
        {"short sound of the file", {{&four, 1, 1, 3}, {&four, 2, 1, 2}}, 0, {"1.00-3.00", "1.00-2.00"}},
        {"long video ends early", {{&four, 1, 0.5, 0}, {&three, 1, 1, 0}}, 1, {"0.50-2.50", "1.00-0.00"}},
        {"sound never decides over video", {{&three, 2, 0, 1}, {&four, 1, 0, 0}}, 1, {"0.00-1.00", "-"}},
        {"without video it does", {{&four, 2, 0, 0}, {&three, 2, 1, 0}}, 1, {"0.00-2.00", "1.00-0.00"}},
        {"an out point beyond the end",
         {{&three, 1, 0, 99}, {&four, 2, 0, 0}},
         0,
         {"0.00-99.0", "0.00-3.00"}},
        {"subpictures stay", {{&four, 1, 0, 2}, {&three, 4, 0, 1}}, 0, {"0.00-2.00", "0.00-1.00"}},
    };
    for (const auto& row : rows) {
        std::vector<QvIStream> streams;
        QvIStreamList list;
        for (const In& in : row.streams) {
            streams.emplace_back(in.file, in.type, 0);
            if (in.in == 0 && in.out == 0) continue;
            streams.back().params.setInOutPoints(InOutPoints(MediaTime(in.in), MediaTime(in.out)));
        }
        for (QvIStream& stream : streams) list.append(&stream);
        SCOPED_TRACE(row.what);
        EXPECT_EQ(qvAdjustSegmentDurations(list), row.winner);
        Texts points;
        for (const QvIStream& stream : streams) points.push_back(pointsOf(stream));
        EXPECT_EQ(points, row.points);
    }
}

TEST(SegmentDurations, ASegmentHasAStreamThatEnds) {
    File endless("a", 0, 1LL << 50);
    QvIStream sound(&endless, 2, 0), captions(&endless, 4, 0);
    QvIStreamList none, only, longest;
    only.append(&captions);
    longest.append(&sound);
    for (const QvIStreamList* list : {&none, &only, &longest})
        EXPECT_EQ(failureOf([&] { qvAdjustSegmentDurations(*list); }), "BatchTask.segmentAdjustDurations");
}

// A picture without frames leaves nothing of the others.
TEST(SegmentDurations, NothingPlaysBesideAnEmptyPicture) {
    File empty("a", 0, 48000), sameName("a", 25, 48000), other("b", 25, 48000);
    std::vector<QvIStream> streams{
        {&empty, 1, 0}, {&empty, 2, 0}, {&sameName, 2, 0}, {&other, 1, 0}, {&other, 2, 0}};
    QvIStreamList list;
    for (QvIStream& stream : streams) list.append(&stream);
    EXPECT_EQ(qvAdjustSegmentDurations(list), 0);
    for (const QvIStream& stream : streams)
        EXPECT_EQ(stream.effectiveDuration().position(48000), 0) << qvStreamLabel(stream);
}

// Points of another timescale, negative ones, and what is no pair of times.
TEST(SegmentDurations, StoredPointsAreUsableWhateverTheyAre) {
    File file("a", 100, 0);
    const struct {
        AnyVector points;
        double in, length;
    } rows[] = {
        {AnyVector(MediaTime(90000, 90000), MediaTime(2, 1)), 1, 1},
        {AnyVector(MediaTime(-5 * second), MediaTime(2.0)), 0, 2},
        {AnyVector(MediaTime(3.0), MediaTime(2.0)), 3, 0},
        {AnyVector(MediaTime(9.0), MediaTime(0.0)), 9, 0},
        {AnyVector(7, "x"), 0, 4},
        {AnyVector(Any(MediaTime(1.0))), 0, 4},
    };
    for (const auto& row : rows) {
        QvIStream stream(&file, qvVideoStream, 0);
        stream.params.set("inOutPoints", row.points);
        EXPECT_EQ(stream.inPoint(), MediaTime(row.in));
        EXPECT_EQ(stream.effectiveDuration(), MediaTime(row.length));
        stream.setOutPoint(MediaTime(row.in + 1));
        EXPECT_EQ(stream.outPoint(), MediaTime(row.in + 1));
    }
}

TEST(TaskDurations, LinksGetPointsForWhatTheyHadFromTheTask) {
    Job job(100, true);
    job.decoder.extra.set("filename", "a");
    job.task.setProcessParams(
        ProcessParams(AnyDict("inOutPoints", InOutPoints(MediaTime(1.0), MediaTime(2.0)))), 1);
    EXPECT_EQ(job.task.checkDurations(), 0);
    AnyVector params;
    QvTask::makeOpenParams(job.task, job.task.links(), params);
    for (const Any& link : params)
        EXPECT_EQ(link.asDict().get("inOutPoints"), Any(InOutPoints(MediaTime(1.0), MediaTime(2.0))));
    QvTask empty;
    EXPECT_EQ(empty.checkDurations(), 0);
}

}  // namespace
