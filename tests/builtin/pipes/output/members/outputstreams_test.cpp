#include "tests/builtin/pipes/output/output_parts.h"

namespace {

using Streams = OutputParts;

TEST_F(Streams, PlacesAndNumbersFollowTheOrderOfAdding) {
    const int types[] = {qvVideoStream, qvAudioStream, qvVideoStream, qvSubpicStream, qvVideoStream};
    for (const int type : types) streams_.append(std::make_unique<OutputStream>(type));
    const int numbers[] = {0, 0, 1, 0, 2};
    for (std::size_t place = 0; place < std::size(types); ++place) {
        EXPECT_EQ(streams_.numberOf(streams_[place]), numbers[place]);
        EXPECT_EQ(streams_.find(types[place], numbers[place]), &streams_[place]);
        EXPECT_EQ(streams_.placeOf(&streams_[place]), static_cast<int>(place));
    }
    for (const auto& [mask, count] : {std::pair(0, 5), {255, 5}, {1, 3}, {2, 1}, {3, 4}, {4, 1}, {8, 0}})
        EXPECT_EQ(streams_.count(mask), count) << mask;
    EXPECT_EQ(streams_.list(-1).size(), 5);
    EXPECT_EQ(streams_.list(qvVideoStream).size(), 3);

    const auto removed = streams_.remove(0);
    EXPECT_EQ(streams_.placeOf(removed.get()), -1);
    EXPECT_EQ(streams_.numberOf(*removed), -1);
    EXPECT_EQ(streams_.placeOf(streams_.find(qvVideoStream, 1)), 3);
    for (const int nr : {-1, 2}) EXPECT_EQ(streams_.find(qvVideoStream, nr), nullptr);
    EXPECT_EQ(streams_.encoder(qvVideoStream, 0), nullptr) << "a stream without encoder";
}

TEST_F(Streams, AParameterGoesToTheEncodersOfItsTypesThatKnowIt) {
    auto& video = append<FakeVideoEncoder>(qvVideoStream, {});
    auto& audio = append<FakeAudioEncoder>(qvAudioStream, {});
    streams_.append(std::make_unique<OutputStream>(qvSubpicStream));
    audio.refused = AnyDict("b", 1);
    EXPECT_EQ(streams_.offer(qvVideoStream, "a", 1), 0);
    EXPECT_EQ(streams_.offer(qvAllStreams, "b", 2), 0) << "a name that is not known is passed over";
    EXPECT_EQ(video.params, AnyDict("a", 1, "b", 2));
    EXPECT_EQ(audio.params, AnyDict());
}

}  // namespace
