#include "builtin/pipes/output/outputanswers.h"

#include "tests/builtin/pipes/output/output_parts.h"

namespace {

struct Answers : OutputParts {
    Any get(const char* name) const {
        Any value;
        EXPECT_TRUE(OutputAnswers(streams_, end_, preset_, "Pipe").get(name, value)) << name;
        return value;
    }
};

TEST_F(Answers, WithoutMembers) {
    for (const auto& [name, value] : {std::pair<const char*, Any>("estimateSecKb", 0.0),
                                      {"extension", "000"},
                                      {"filesWritten", AnyVector()},
                                      {"muxerName", "none"},
                                      {"videoName", "none"},
                                      {"audioName", "none"},
                                      {"sinkName", "filesink"},
                                      {"srPossible", 0},
                                      {"pal", Any()},
                                      {"bitrateRange", Any()}})
        EXPECT_EQ(get(name), value) << name;
    Any value;
    EXPECT_FALSE(OutputAnswers(streams_, end_, preset_, "Pipe").get("other", value));
    EXPECT_EQ(failureOf([&] { get("audioAvailable"); }), "EncodePipe: 'audioAvailable' parameter OBSOLETE.");
}

TEST_F(Answers, ComeFromTheMemberThatKnows) {
    auto& video = append<FakeVideoEncoder>(qvVideoStream, AnyDict("estimateSecKb", 2.5));
    append<FakeAudioEncoder>(qvAudioStream, AnyDict("estimateSecKb", 4));
    end_.put(std::make_unique<FakeMuxer>("rawmux"));
    auto& muxer = static_cast<FakeMuxer&>(*end_.muxer());
    EXPECT_EQ(get("estimateSecKb"), 6.5) << "the sum of the encoders";
    muxer.params = AnyDict("estimateSecKb", 9, "pal", 1);
    EXPECT_EQ(get("estimateSecKb"), 9);
    EXPECT_EQ(get("pal"), 1) << "the encoder knows none";
    video.params.set("pal", 0);
    EXPECT_EQ(get("pal"), 0);
    for (const int both : {0, 1, 2, 3}) {
        muxer.params.set("srPossible", both & 1);
        video.params.set("srPossible", both >> 1);
        EXPECT_EQ(get("srPossible"), both == 3 ? 1 : 0);
    }
    muxer.params.set("videoNecessary", 0);
    EXPECT_EQ(get("videoNecessary"), 0);
    video.params.set("bitrateRange", AnyVector(Any(AnyDict("type", 1, "range", 2, "more", 3)), Any(7)));
    EXPECT_EQ(get("bitrateRange").asVector(), AnyVector(Any(AnyDict("type", 1, "range", 2))));
}

}  // namespace
