#include "core/transcode/link/audio/channelmatrix_p.h"

#include <gtest/gtest.h>

namespace {

AnyDict source(int channel) { return AnyDict("channel", channel); }
AnyDict source(int stream, int channel) { return AnyDict("stream", stream, "channel", channel); }

// A vector of sources, a lone source, and three ways to be silent.
const AnyVector everyForm(Any(AnyVector(Any(source(1)), Any(source(2, 0)))), Any(source(0)), Any(0),
                          Any(AnyVector()), Any(AnyDict()));

TEST(ChannelMatrix, ReadsEveryFormOfAnEntry) {
    const ChannelMatrix matrix(everyForm, 1);
    EXPECT_EQ(matrix.entries(), everyForm);
    EXPECT_EQ(matrix.fault(5, {0, 2, 1}), "");
    EXPECT_EQ(matrix.streams(), (std::vector<int>{1, 2}));
    const char* lines[] = {"[stream:1, channel:1] + [stream:2, channel:0]", "[stream:1, channel:0]", "MUTE",
                           "MUTE", "MUTE"};
    for (int i = 0; i < 5; ++i) EXPECT_EQ(matrix.describe(i), lines[i]);
}

TEST(ChannelMatrix, TheFirstFaultIsReported) {
    const AnyVector good(Any(source(0)), Any(source(1)));
    const std::vector<int> twoChannels = {2, -1};  // the second stream does not say how many it has
    const auto second = [](const Any& entry) { return AnyVector(Any(source(0)), entry); };
    const struct {
        AnyVector entries;
        int outChannels;
        const char* fault;
    } rows[] = {
        {good, 2, ""},
        {AnyVector(), 2,
         "Not using audio channel map, it is 0 size, reverting to default audio channel mode."},
        {good, 6, "Not using audio channel map, it has 2 out channels, and encoder has 6."},
        {second(Any(AnyVector(Any(source(0)), Any(5)))), 2, "Invalid channel map at 1, 1"},
        {second(Any(AnyDict("stream", 0))), 2, "Invalid channel map at 1, 0, channel"},
        {second(Any(AnyDict("channel", 1LL))), 2, "Invalid channel map at 1, 0, channel"},
        {second(Any(source(2, 0))), 2,
         "Invalid channel map for out channel 1, input stream number (2)>= nr of input streams(2)"},
        {second(Any(source(-1, 0))), 2,
         "Invalid channel map for out channel 1, input stream number (-1)>= nr of input streams(2)"},
        {second(Any(source(1, 0))), 2, "Invalid channel map at 1, 0, , can not get audio1/channels"},
        {second(Any(source(2))), 2,
         "Invalid channel map for out channel 1, input channel (2)>= nr of input cannels(2)"},
        {second(Any(source(-1))), 2,
         "Invalid channel map for out channel 1, input channel (-1)>= nr of input cannels(2)"},
    };
    for (const auto& row : rows)
        EXPECT_EQ(ChannelMatrix(row.entries, 0).fault(row.outChannels, twoChannels), row.fault);
}

}  // namespace
