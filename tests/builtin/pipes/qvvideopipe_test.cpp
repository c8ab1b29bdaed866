#include "builtin/pipes/qvvideopipe.h"

#include "tests/builtin/pipes/initonce.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"
#include "tests/support/pictures.h"

namespace {

// A pipe of filters by name; "+" in front of it makes one that works in place.
struct Pipe : QvVf {
    explicit Pipe(const std::vector<const char*>& names, bool safe = false) {
        for (const char* name : names) {
            add(name[0] == '+' ? name + 1 : name, -1).inPlace = name[0] == '+';
            if (safe) at(nrFilters() - 1).known.set("_safeToApplyAfter", 1);
        }
        init();
    }
    FakeVideoFilter& add(const char* name, int place) {
        auto* filter = new FakeVideoFilter;
        filter->label = name;
        addFilter(filter, place);
        return *filter;
    }
    FakeVideoFilter& at(int i) { return static_cast<FakeVideoFilter&>(*filter(i)); }
    // The numbers of all frames that the pipe gives out for a decoder's.
    std::vector<int> drain(QvDecodePipe& decoder) {
        std::vector<int> numbers;
        for (; process(&decoder, 0) == 0; next()) numbers.push_back(frame()->frameNr);
        return numbers;
    }
};

TEST(VideoPipe, IsInitialisedOnce) {
    Pipe pipe({"a"});
    expectInitialisedOnce(pipe);
}

TEST(VideoPipe, PositionsAndNames) {
    Pipe pipe({"a", "b"});
    pipe.add("c", 0);
    pipe.add("d", -5);
    pipe.add("a", 99);
    ASSERT_EQ(pipe.nrFilters(), 5);
    const char* order[] = {"c", "a", "b", "d", "a"};
    for (int i = 0; i < 5; ++i) EXPECT_STREQ(pipe.filter(i)->name(), order[i]);
    EXPECT_EQ(pipe.filter("a", 1), pipe.filter(4));
    EXPECT_EQ(pipe.removeFilter(1), 0);
}

TEST(VideoPipe, GroupsInPlaceFiltersWithTheirHead) {
    const struct {
        std::vector<const char*> filters;
        const char* line;
        bool safe;
    } rows[] = {
        {{"a", "+b", "+c", "d"}, "VideoProcessingPipe: a:b:c->d", false},
        {{"a", "frconvert", "+b"}, "VideoProcessingPipe: a->frconvert:b", true},
    };
    for (const auto& row : rows) {
        LogCapture log;
        Pipe pipe(row.filters, row.safe);
        for (int i = 0; i < 2; ++i) EXPECT_EQ(pipe.open(), 0);  // an open pipe is unchanged
        EXPECT_EQ(log.texts().back(), row.line);
    }
}

TEST(VideoPipe, EveryFrameLeavesOnceAndInPlaceFiltersSeeEach) {
    FakeDecoder decoder(6, QvFramerate::f25p());
    Pipe pipe({"head", "+inplace", "double", "+late"});
    pipe.at(2).copies = [](int) { return 2; };
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.drain(decoder), (std::vector<int>{0, 0, 1, 1, 2, 2, 3, 3, 4, 4, 5, 5}));
    EXPECT_EQ(pipe.at(1).applied, (std::vector<int>{0, 1, 2, 3, 4, 5}));
    EXPECT_EQ(pipe.at(3).applied.size(), 12u);
    EXPECT_TRUE(pipe.framesIn() == 6u && pipe.framesOut() == 12u);
}

TEST(VideoPipe, DropsAndRepeatsThroughSeveralGroupsAndReadsNoFurtherThanItMust) {
    FakeDecoder decoder(9, QvFramerate::f25p());
    Pipe pipe({"third", "double", "plain"});
    pipe.at(0).copies = [](int nr) { return nr % 3 == 0 ? 1 : 0; };
    pipe.at(1).copies = [](int) { return 2; };
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(nullptr, 0), QvStatus::needsInput);
    EXPECT_EQ(pipe.process(&decoder, 0), 0);
    pipe.next();
    EXPECT_EQ(pipe.process(nullptr, 0), 0);  // the second copy was under way
    pipe.next();
    EXPECT_EQ(pipe.process(nullptr, 0), QvStatus::needsInput);
    EXPECT_EQ(decoder.read, 1);
    EXPECT_EQ(pipe.drain(decoder), (std::vector<int>{3, 3, 6, 6}));
    EXPECT_EQ(decoder.read, 9);
}

TEST(VideoPipe, PassesTheDecodersErrorOn) {
    FakeDecoder decoder(9, QvFramerate::f25p());
    decoder.failAt = 1;
    Pipe pipe({"a"});
    EXPECT_EQ(pipe.process(&decoder, 0), QvStatus::failed) << "not open";
    ASSERT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.process(&decoder, 0), 0);
    pipe.next();
    EXPECT_EQ(pipe.process(&decoder, 0), QvStatus::failed);
    decoder.failAt = -1;
    decoder.next = 9;
    EXPECT_EQ(pipe.process(&decoder, 0), QvStatus::endOfStream);
}

TEST(VideoPipe, AFilterThatFailsIsRememberedAndStopsNothing) {
    const struct {
        std::vector<std::pair<int, const char*>> refusals;
        int closed, error;
        const char* text;
    } cases[] = {
        {{}, 0, 0, ""},
        {{{1, "refuseApply"}}, 0, -1, "b: it failed"},
        {{{2, "refuseClose"}}, -1, -1, "c: it failed"},
        {{{1, "refuseApply"}, {0, "refuseClose"}}, -1, -1, "b: it failed"},
    };
    for (const auto& c : cases) {
        Pipe pipe({"a", "+b", "c"});
        for (const auto& [filter, what] : c.refusals) pipe.at(filter).known.set(what, -1);
        ASSERT_EQ(pipe.open(), 0);
        for (const int nr : {1, 2}) {
            QvFrame frame = makePicture(QvFourcc::GRAY, 16, 8);
            frame.frameNr = nr;
            pipe.write(frame);
            EXPECT_EQ(pipe.process(nullptr, 0), 0);
            EXPECT_EQ(pipe.frame()->frameNr, nr);
            pipe.next();
        }
        EXPECT_EQ(pipe.close(), c.closed);
        for (int i = 0; i < 3; ++i) EXPECT_EQ(pipe.at(i).closed, 1);
        EXPECT_EQ(pipe.errorCode(), c.error);
        EXPECT_STREQ(pipe.errorDesc(), c.text);
        EXPECT_EQ(pipe.open(), 0);
        EXPECT_EQ(pipe.errorCode(), 0) << "another run";
    }
}

TEST(VideoPipe, OpeningStopsAtTheFirstFailure) {
    LogCapture log;
    Pipe pipe({"a", "b", "c"});
    pipe.at(1).openResult = -3;
    EXPECT_EQ(pipe.open(), QvStatus::outOfMemory);
    EXPECT_TRUE(log.contains("[video pipe] open error"));
    EXPECT_EQ(pipe.at(0).getState(), 3);
    EXPECT_NE(pipe.at(2).getState(), 3);
    EXPECT_EQ(pipe.close(), 0);
    EXPECT_EQ(pipe.at(0).closed, 1);
    pipe.at(1).openResult = 0;
    EXPECT_EQ(pipe.open(), 0);
    EXPECT_EQ(pipe.ready(), 0);
}

}  // namespace
