#include "builtin/pipes/output/presetapplier.h"

#include "tests/builtin/pipes/output/output_parts.h"

namespace {

struct Applier : OutputParts {
    Applier() { end_.setSink("filesink"); }
    ~Applier() override { builder_.removeAll(qvAllStreams); }
    int apply(const AnyVector& types) {
        AnyVector streams;
        for (const auto& type : types)
            streams.append(AnyDict("type", type, "codec",
                                   AnyDict("name", type == Any(qvVideoStream) ? "rawvenc" : "rawaenc")));
        return applier_.apply(
            QvPreset(AnyDict("profile", QvProfile::raw, "name", "mine", "custom", 1, "streams", streams)),
            false, "encpipe");
    }

    StreamBuilder builder_{streams_, end_, preset_, host_};
    MuxerExchange exchange_{streams_, end_, preset_, builder_, host_};
    PipeState state_{streams_, end_, preset_, builder_, exchange_, host_};
    PresetApplier applier_{streams_, end_, preset_, builder_, exchange_, state_, host_};
};

TEST_F(Applier, AUsersPresetGetsTheStreamsThatFit) {
    LogCapture log;
    EXPECT_EQ(apply(AnyVector(1, 2, 2, 1)), 0);
    EXPECT_EQ(streams_.count(qvVideoStream) * 10 + streams_.count(qvAudioStream), 22);
    EXPECT_EQ(apply(AnyVector()), 0);
    EXPECT_EQ(streams_.size(), 2u) << "one of each without a list";

    outputs_.params = AnyDict("rawmux.maxStreams", AnyDict("vids", 1, "auds", 9, "subs", 0, "total", 3));
    EXPECT_EQ(apply(AnyVector(1, 1, 2, 2, 2, 4)), 0);
    EXPECT_EQ(streams_.count(qvVideoStream) * 10 + streams_.count(qvAudioStream), 12);
    EXPECT_TRUE(log.contains("not adding video#1 due to muxer/preset limitation"));
    EXPECT_TRUE(log.contains("Preset 'mine' applied, 3 streams not added due to preset/muxer limitation"));

    EXPECT_EQ(apply(AnyVector(1, 7)), QvStatus::failed);
    EXPECT_STREQ(host_.lastFailure(), "Preset 'mine' applied with errors, failed to add some streams.");
    EXPECT_EQ(streams_.size(), 1u);
}

TEST_F(Applier, ABuiltinPresetKeepsSubpicturesAndOnRequestFilters) {
    outputs_.params = AnyDict("rawmux.maxStreams", AnyDict("vids", 1, "auds", 1, "subs", 2, "total", 4));
    ASSERT_EQ(applier_.applyBuiltin(QvProfile::raw, false), 0);
    ASSERT_EQ(builder_.addDefault(qvSubpicStream), 0);
    builder_.addDefault(qvSubpicStream);
    for (const bool keep : {true, false}) {
        streams_.find(qvSubpicStream, 1)->filters().setFilter("cropper", AnyDict("name", "cropper"));
        ASSERT_EQ(applier_.applyBuiltin(QvProfile::raw, keep), 0);
        ASSERT_EQ(streams_.count(qvSubpicStream), 2);
        EXPECT_EQ(streams_.find(qvSubpicStream, 0)->filters().count(), 0);
        EXPECT_EQ(streams_.find(qvSubpicStream, 1)->filters().count(), keep ? 1 : 0);
    }
    EXPECT_EQ(applier_.applyBuiltin(3, false), QvStatus::invalidStructure);
    EXPECT_STREQ(host_.lastFailure(), "Invalid preset #3");
    EXPECT_EQ(streams_.size(), 4u);
}

TEST_F(Applier, TransportStreamsAdjustTheirEncoders) {
    auto& module = *qv_registry()->module("rawmux");
    module.setAttr("transportStream", 1);
    outputs_.watched = "rawvenc.tsAdjust";
    EXPECT_EQ(applier_.applyBuiltin(QvProfile::raw, false), 0);
    EXPECT_EQ(outputs_.calls, Texts{"rawvenc.tsAdjust=1"});
    module.setAttr("transportStream", Any());
}

}  // namespace
