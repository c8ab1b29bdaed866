#include "builtin/pipes/output/streambuilder.h"

#include "tests/builtin/pipes/output/output_parts.h"

namespace {

struct Builder : OutputParts {
    Builder() {
        preset_.set(anyMuxer());
        end_.setSink("filesink");
        end_.put(MuxerPlace::newMuxer("rawmux"));
        preset_.follow(end_.muxer());
    }
    ~Builder() override { builder_.removeAll(qvAllStreams); }

    StreamBuilder builder_{streams_, end_, preset_, host_};
};

// An encoder that does not take its output.
struct Unattached : QvModule {
    struct Encoder : FakeVideoEncoder {
        int attachOutStream(QvBufStream*) override { return setError(-55, "not this one"); }
    };
    Unattached() : QvModule(QvModuleType::videoEncoder, "rawvenc", "", "rawvenc") {}
    QvCodec* create() override { return _setAttrs(new Encoder); }
};

TEST_F(Builder, AnEncoderThatDoesNotTakeItsOutputLeavesNothing) {
    static QvPlugin plugin("unattached", "");
    if (plugin.nrModules() == 0) plugin.addModule(new Unattached);
    qv_registry()->cleanup();
    qv_registry()->addPlugin(&plugin);
    EXPECT_EQ(builder_.addDefault(qvVideoStream), -55);
    EXPECT_STREQ(host_.lastFailure(), "not this one");
    EXPECT_TRUE(streams_.empty());
    EXPECT_EQ(end_.muxer()->nrStreams(qvVideoStream), 0);
}

TEST_F(Builder, ACodecIsExchangedWithItsFormerSettingsOnly) {
    auto& module = *qv_registry()->module("rawmux");
    module.setAttr("transportStream", 1);
    end_.put(MuxerPlace::newMuxer("rawmux"));
    module.setAttr("transportStream", Any());
    builder_.addDefault(qvVideoStream);
    outputs_.watched = "rawvenc.tsAdjust";
    streams_[0].encoder->setParam("width", 64);
    for (const bool adjust : {false, true})
        ASSERT_EQ(builder_.setCodec(qvVideoStream, 0, "rawvenc", AnyDict(), adjust), 0);
    EXPECT_TRUE(outputs_.calls.empty()) << "settings that come back are not adjusted";
    EXPECT_EQ(static_cast<const QvCodec&>(*streams_[0].encoder).getParam("width"), 64);
    EXPECT_EQ(failureOf([&] { builder_.setCodec(qvVideoStream, 1, "rawvenc", AnyDict(), false); }),
              "[EncodePipe] setCodec: Invalid stream number 1");
    EXPECT_EQ(
        failureOf([&] { builder_.setCodec(qvVideoStream, 0, "rawvenc", AnyDict("profile", 1), false); }),
        "EncodePipe.setCodec: 'profile' is not that of the preset");
}

}  // namespace
