#include "core/stream/qvbufstrm.h"
#include "tests/builtin/pipes/output/output_parts.h"

namespace {

struct Place : OutputParts {
    Place() { end_.setSink("filesink"); }
    Any muxerParam(const char* name) const {
        return static_cast<const QvCodec&>(*end_.muxer()).getParam(name);
    }
};

TEST_F(Place, ASinkThatIsNoneLeavesTheFormerOne) {
    end_.put(MuxerPlace::newMuxer("rawmux"));
    end_.attach();
    auto* before = end_.sink();
    for (const char* wrong : {"rawmux", "nosuch"}) {
        EXPECT_EQ(end_.setSink(wrong), QvStatus::failed);
        EXPECT_EQ(host_.lastFailure(), std::string("[EncodePipe2] setSink: Invalid module ") + wrong);
    }
    EXPECT_EQ(end_.sink(), before);
    EXPECT_EQ(end_.sinkName(), "filesink");
    EXPECT_EQ(before->stream()->atachee(), end_.muxer());
    EXPECT_EQ(MuxerPlace::newMuxer("rawvenc"), nullptr);

    ASSERT_EQ(end_.setSink("nullsink"), 0);
    EXPECT_EQ(end_.sinkName(), "nullsink");
    EXPECT_EQ(end_.sink()->stream()->atachee(), end_.muxer());
}

TEST_F(Place, TheFileNameReachesWhatComesLater) {
    end_.setFilename("a.b");
    EXPECT_EQ(end_.filename(), "a.b");
    end_.put(MuxerPlace::newMuxer("rawmux"));
    EXPECT_FALSE(muxerParam("filename").isValid());
    end_.repeatFilename();
    EXPECT_EQ(muxerParam("filename"), "a.b");
    end_.setSink("nullsink");
    EXPECT_EQ(end_.filename(), "a.b") << "of a sink without files";
    end_.setSink("filesink");
    EXPECT_EQ(static_cast<const QvCodec&>(*end_.sink()).getParam("filename"), "a.b");
}

// Looks at the stream that it writes to when it is detached.
struct DetachedMuxer : FakeMuxer {
    DetachedMuxer() : FakeMuxer("rawavimux") { refusal = 0; }
    int setParam(const char*, const Any&) override { return refusal; }
    int detachOutStream() override {
        detached = outStream() != nullptr && outStream()->atachee() == this;
        return FakeMuxer::detachOutStream();
    }
    bool detached = false;
    int refusal;
};

TEST_F(Place, AMultiplexerLeavesTheOldSinkWhileItIsThere) {
    auto made = std::make_unique<DetachedMuxer>();
    auto& muxer = *made;
    end_.put(std::move(made));
    end_.attach();
    end_.setSink("nullsink");
    EXPECT_TRUE(muxer.detached);
    muxer.refusal = -55;
    EXPECT_EQ(end_.setFilename("a.b"), -55);
}

TEST_F(Place, AMultiplexerThatComesBackHasItsSettings) {
    const auto fresh = [&](const QvPreset& preset) {
        end_.drop();
        end_.put(MuxerPlace::newMuxer("rawmux"));
        end_.restoreSettings(preset);
        return muxerParam("splitAudio").isTrue();
    };
    AnyDict params("name", "rawmux", "splitAudio", 1);
    const auto custom = [&] {
        return QvPreset(AnyDict("profile", QvProfile::raw, "name", "mine", "custom", 1, "muxer", params));
    };
    EXPECT_FALSE(fresh(anyMuxer()));
    EXPECT_TRUE(fresh(custom())) << "from the preset";
    params.set("name", "other");
    EXPECT_EQ(failureOf([&] { fresh(custom()); }),
              "_setMuxer - stored muxer parameters don't match current muxer 'rawmux'?");
    EXPECT_EQ(host_.code, QvStatus::failed);
    end_.muxer()->setParam("splitAudio", 1);
    end_.handOver();
    EXPECT_TRUE(fresh(anyMuxer()));
    EXPECT_TRUE(fresh(custom())) << "what was set here goes first";
    end_.muxer()->setParam("splitAudio", 0);
    end_.handOver();
    EXPECT_FALSE(fresh(anyMuxer())) << "the latest settings";
}

TEST_F(Place, RoomIsThatOfTheMultiplexer) {
    EXPECT_EQ(failureOf([&] { end_.room(qvVideoStream, 0, 0); }), "EncodePipe: muxer is null.");
    EXPECT_FALSE(end_.hasPrograms());
    EXPECT_EQ(end_.programs().count(), 0);
    outputs_.params = AnyDict("rawmux.maxStreams", AnyDict("vids", 2, "auds", 5, "subs", 0, "total", 4));
    end_.put(MuxerPlace::newMuxer("rawmux"));
    for (const auto& [type, ofThis, inAll, room] : {std::tuple<int, int, int, int>(qvVideoStream, 0, 0, 2),
                                                    {qvVideoStream, 2, 3, 0},
                                                    {qvAudioStream, 1, 3, 4},
                                                    {qvAudioStream, 1, 4, 0},
                                                    {qvSubpicStream, 0, 4, -1},
                                                    {0, 0, 3, 1}})
        EXPECT_EQ(end_.room(type, ofThis, inAll), room) << type << " " << ofThis << " " << inAll;
}

}  // namespace
