#include "core/transcode/link/audio/streammix_p.h"

#include <gtest/gtest.h>

namespace {

AnyDict source(int stream, int channel) { return AnyDict("stream", stream, "channel", channel); }

struct Block {
    Block(int channels, std::vector<short> values, int bytes = 2) {
        const int samples = static_cast<int>(values.size()) / channels;
        pcm.init(samples, channels, bytes, 48000);
        pcm.setSamples(samples);
        if (bytes == 2) std::memcpy(pcm.ptr(0), values.data(), values.size() * sizeof values[0]);
    }
    QvPcm pcm;
};

TEST(StreamMix, ChannelsCountAcrossTheStreamsThatTakePart) {
    const StreamMix mix({{1, 2}, {4, 1}, {7, 6}});
    const struct {
        int stream, channel, place;
    } rows[] = {{1, 0, 0}, {1, 1, 1}, {4, 0, 2}, {7, 5, 8}, {0, 0, -1}, {5, 0, -1}};
    for (const auto& row : rows) EXPECT_EQ(mix.channelNr(row.stream, row.channel), row.place);
    const AnyVector entries(Any(AnyVector(Any(source(1, 1)), Any(source(4, 0)))), Any(0), Any(source(5, 0)));
    EXPECT_EQ(mix.numbered(ChannelMatrix(entries, 1)),
              AnyVector(Any(AnyVector(1, 2)), Any(-1), Any(AnyVector(Any(-1)))));
}

TEST(StreamMix, TheShortestStreamSaysHowMuchIsInterleaved) {
    StreamMix mix({{0, 2}, {1, 1}});
    const Block stereo(2, {1, 2, 3, 4, 5, 6}), mono(1, {7, 8}), longMono(1, {7, 8, 9, 10});
    const struct {
        const Block* second;
        std::vector<short> values;
    } rows[] = {{&mono, {1, 2, 7, 3, 4, 8}}, {&longMono, {1, 2, 7, 3, 4, 8, 5, 6, 9}}};
    for (const auto& row : rows) {
        const QvPcm* mixed = mix.interleave({&stereo.pcm, &row.second->pcm});
        ASSERT_TRUE(mixed);
        EXPECT_EQ(mixed->channels(), 3);
        ASSERT_EQ(mixed->samples() * 3, static_cast<int>(row.values.size()));
        EXPECT_EQ(std::memcmp(mixed->ptr(0), row.values.data(), row.values.size() * 2), 0);
    }
    const Block wide(1, {1, 2, 3}, 4);
    EXPECT_FALSE(mix.interleave({&stereo.pcm, &wide.pcm})) << "different widths";
    EXPECT_FALSE(mix.interleave({&stereo.pcm, nullptr}));
    EXPECT_FALSE(StreamMix().interleave({}));
}

}  // namespace
