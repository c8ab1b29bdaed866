// Channels out of others, compared with the definition of each entry.
#include "builtin/sound/format/chconvert.h"

#include "core/arch/qvassert.h"
#include "tests/builtin/sound/sounds.h"

namespace {

using Opened = OpenedSound<ChConvert>;
using Rows = std::vector<std::vector<int>>;

AnyVector matrixOf(const Rows& rows) {
    AnyVector matrix;
    for (const auto& row : rows) {
        AnyVector entry;
        for (const int channel : row) entry.append(Any(channel));
        matrix.append(Any(entry));
    }
    return matrix;
}

int32_t meanOf(const std::vector<int>& row, const int32_t* sample) {
    uint32_t sum = 0;
    for (const int channel : row) sum += static_cast<uint32_t>(sample[channel]);
    const auto wrapped = static_cast<int32_t>(sum);
    if (row.size() < 2) return wrapped;
    return row.size() == 2 ? wrapped >> 1 : wrapped / static_cast<int>(row.size());
}

}  // namespace

TEST(ChConvert, MakesTheMeanOfItsSources) {
    std::vector<int> all;
    for (int i = 0; i < 16; ++i) all.push_back(i);
    const struct {
        int channels;
        Rows rows;
    } jobs[] = {{2, {{1}, {0}}},
                {2, {{0, 1}}},
                {1, {{0}, {0}, {}, {0}}},
                {3, {{0, 1, 2}, {}, {2, 0}}},
                {6, {{0, 2, 4}, {1, 2, 5, 3}}},
                {16, Rows(16, all)},
                {16, {all, {15}, {14, 15}, {}}}};
    for (const auto& job : jobs) {
        const Values in = noise(static_cast<size_t>(job.channels) * 2500);
        Values wanted;
        for (size_t i = 0; i < in.size(); i += static_cast<size_t>(job.channels))
            for (const auto& row : job.rows) wanted.push_back(meanOf(row, &in[i]));
        for (const Blocks& blocks : {Blocks{}, Blocks{1, 999, 64}}) {
            Opened filter{{"connMatrix", matrixOf(job.rows)}};
            ASSERT_TRUE(throughFilter(filter, in, job.channels, blocks) == wanted) << job.rows.size();
            EXPECT_EQ(filter.pcm()->channels(), static_cast<int>(job.rows.size()));
        }
    }
}

TEST(ChConvert, RoundsTwoDownAndMoreTowardZero) {
    const AnyVector three(Any(AnyVector(Any(0), Any(1), Any(2)))), two(Any(AnyVector(Any(0), Any(1))));
    const auto one = [](const AnyVector& matrix, const Values& in, int channels) {
        Opened filter{{"connMatrix", matrix}};
        return throughFilter(filter, in, channels)[0];
    };
    EXPECT_EQ(one(three, {1, 2, 4}, 3), 2);
    EXPECT_EQ(one(three, {-1, -2, -4}, 3), -2);
    EXPECT_EQ(one(two, {-1, -2}, 2), -2);
    EXPECT_EQ(one(two, {INT32_MAX, 1}, 2), INT32_MIN / 2) << "the sum has 32 bits";
}

TEST(ChConvert, TakesIntegersAndSilence) {
    Opened filter{{"connMatrix", AnyVector(Any(1), Any(-1), Any(0), Any(-2), Any(AnyVector()))}};
    EXPECT_EQ(throughFilter(filter, {7, 8, 9, 10}, 2), (Values{8, 0, 7, 0, 0, 10, 0, 9, 0, 0}));
    EXPECT_EQ(throughFilter(filter, {1, 2}, 2), (Values{2, 0, 1, 0, 0}))
        << "memory of the output that is reused";
}

// A source that is not there counts as silence.
TEST(ChConvert, MixesSilence) {
    const auto row = [](std::vector<int> sources) { return matrixOf({sources})[0]; };
    Opened filter{
        {"connMatrix", AnyVector(row({1, -1}), row({-2, 1}), row({0, -1, 1}), row({-1, -2}), row({-1}))}};
    EXPECT_EQ(throughFilter(filter, {7, 9, -7, -9}, 2), (Values{4, 4, 5, 0, 0, -5, -5, -5, 0, 0}));
}

TEST(ChConvert, RefusesWhatIsNoMatrix) {
    AnyVector tooMany, tooManySources;
    for (int i = 0; i < 17; ++i) {
        tooMany.append(Any(0));
        tooManySources.append(Any(0));
    }
    const struct {
        AnyVector matrix;
        const char* text;
    } rows[] = {
        {{}, "the channel matrix has 0 output channels, not 1 to 16"},
        {tooMany, "the channel matrix has 17 output channels, not 1 to 16"},
        {AnyVector(Any(0), Any(-3)), "invalid entry for output channel 1"},
        {AnyVector(Any("0")), "invalid entry for output channel 0"},
        {AnyVector(Any(1.0)), "invalid entry for output channel 0"},
        {AnyVector(Any(tooManySources)), "invalid entry for output channel 0"},
        {AnyVector(Any(AnyVector(Any(0), Any(-3)))), "invalid entry for output channel 0"},
        {AnyVector(Any(AnyVector(Any("a")))), "invalid entry for output channel 0"},
    };
    for (const auto& row : rows) {
        ChConvert filter;
        ASSERT_EQ(filter.init(), 0);
        ASSERT_EQ(filter.setParam("connMatrix", row.matrix), 0);
        EXPECT_EQ(filter.open(), QvStatus::failed);
        EXPECT_NE(std::string(filter.errorDesc()).find(row.text), std::string::npos) << filter.errorDesc();
    }
    ChConvert fresh;
    EXPECT_THROW(fresh.open(), QvAssertFailure);
    EXPECT_THROW(fresh.setParam("connMatrix", AnyVector()), QvAssertFailure);
    Opened filter{{"connMatrix", AnyVector(Any(2))}};
    QvPcm stereo = pcmOf(bytesOf(noise(10)), 2, 4), narrow = pcmOf(noiseBytes(12), 3, 2);
    EXPECT_EQ(filter.write(stereo), QvStatus::failed);
    EXPECT_STREQ(filter.errorDesc(), "the channel matrix names input channel 2, but the sound has 2");
    EXPECT_THROW(filter.write(narrow), QvAssertFailure);
    EXPECT_EQ(filter.samples(), 0);
}
