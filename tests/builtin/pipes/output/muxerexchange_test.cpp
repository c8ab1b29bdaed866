#include "builtin/pipes/output/muxerexchange.h"

#include "core/stream/qvbufstrm.h"
#include "tests/builtin/pipes/output/output_parts.h"

namespace {

struct Exchange : OutputParts {
    Exchange() {
        preset_.set(anyMuxer());
        end_.setSink("filesink");
        end_.setFilename("x.y");
        exchange_.start("rawmux");
    }
    ~Exchange() override { builder_.removeAll(qvAllStreams); }
    Any get(const QvCodec* codec, const char* name) const { return codec->getParam(name); }

    StreamBuilder builder_{streams_, end_, preset_, host_};
    MuxerExchange exchange_{streams_, end_, preset_, builder_, host_};
};

const AnyDict cropper("name", "cropper", "_on", 1);

TEST_F(Exchange, StreamsKeepTheirOrderEncodersFiltersAndSwitch) {
    const AnyDict settings("name", "rawvenc", "settingsDict", AnyDict("width", 64, "height", 48));
    ASSERT_EQ(builder_.add(qvAudioStream, "rawaenc"), 0);
    ASSERT_EQ(builder_.add(qvVideoStream, AnyDict("codec", settings)), 0);
    ASSERT_EQ(builder_.addDefault(qvVideoStream), 1);
    streams_[1].filters().setFilter("cropper", cropper);
    streams_[2].setEnabled(false);
    ASSERT_EQ(exchange_.change("rawavimux"), 0) << host_.lastFailure();
    EXPECT_STREQ(end_.muxer()->name(), "rawavimux");
    EXPECT_EQ(end_.sink()->stream()->atachee(), end_.muxer());
    ASSERT_EQ(streams_.size(), 3u);
    EXPECT_EQ(streams_[0].type, qvAudioStream);
    EXPECT_EQ(get(streams_[1].encoder, "width"), 64);
    EXPECT_EQ(streams_[1].filters().count(), 1);
    EXPECT_TRUE(streams_[2].filters().empty());
    EXPECT_TRUE(streams_[1].enabled() && !streams_[2].enabled());
    EXPECT_EQ(streams_[2].bitstream, end_.muxer()->stream(qvVideoStream, 1));
}

// A multiplexer that the catalogue of presets allows for sound only; it has no attributes of its own.
struct SoundMuxer : QvModule {
    SoundMuxer() : QvModule(QvModuleType::muxer, "mvrawmux", "", "mvrawmux") {}
    QvCodec* create() override { return _setAttrs(new RawMux); }
};

QvModule& installSoundMuxer() {
    static QvPlugin plugin("sound", "");
    if (plugin.nrModules() == 0) plugin.addModule(new SoundMuxer);
    qv_registry()->addPlugin(&plugin);
    qvPresetMgr()->update();
    return *qv_registry()->module("mvrawmux");
}

TEST_F(Exchange, StreamsWithoutACodecAreLeftOut) {
    installSoundMuxer();
    builder_.addDefault(qvVideoStream);
    builder_.addDefault(qvAudioStream);
    LogCapture log;
    ASSERT_EQ(exchange_.change("mvrawmux"), 0);
    EXPECT_EQ(streams_.count(qvVideoStream), 0);
    EXPECT_EQ(streams_.count(qvAudioStream), 1);
    EXPECT_TRUE(log.contains("skipped stream - no compatible video codec found for mvrawmux"));
    outputs_.params = AnyDict("rawmux.maxStreams", AnyDict("vids", 0, "auds", 0, "subs", 0, "total", 0));
    ASSERT_EQ(exchange_.change("rawmux"), 0);
    EXPECT_TRUE(streams_.empty());
    EXPECT_TRUE(log.contains("skipped stream - No (more) audio streams allowed"));
}

TEST_F(Exchange, SettingsComeBackWithTheMultiplexer) {
    end_.muxer()->setParam("splitVideo", 1);
    exchange_.change("rawavimux");
    exchange_.change("rawmux");
    EXPECT_EQ(get(end_.muxer(), "splitVideo"), 1);
    EXPECT_EQ(get(end_.muxer(), "filename"), "x.y");
    exchange_.change("rawavimux");
    end_.drop();
    exchange_.start("rawmux");
    EXPECT_EQ(get(end_.muxer(), "splitVideo"), 1) << "for another preset, too";
}

TEST_F(Exchange, TypeAndTimingAreHandedOn) {
    builder_.addDefault(qvVideoStream);
    for (const auto& [param, targets] : {std::pair<const char*, Texts>("type", {"rawmux.type"}),
                                         {"pal", {"rawmux.pal", "rawvenc.pal"}},
                                         {"dropFrameTC", {"rawmux.dropFrameTC", "rawvenc.dropFrameTC"}}})
        for (const auto& target : targets) {
            outputs_.watched = target;
            outputs_.calls.clear();
            outputs_.params.clear();
            exchange_.change("rawmux");
            EXPECT_TRUE(outputs_.calls.empty()) << target << ": the old one knows none";
            outputs_.params.set((std::string("rawmux.") + param).c_str(), 1);
            exchange_.change("rawmux");
            EXPECT_EQ(outputs_.calls.back(), target + "=1");
        }
}

TEST_F(Exchange, TheEnginesOwnMultiplexersBringTheirSink) {
    for (const auto& [muxer, sink] : {std::pair("nullmux", "nullsink"), {"memmux", "memsink"}}) {
        ASSERT_EQ(exchange_.change(muxer), 0);
        EXPECT_STREQ(end_.sink()->name(), sink);
        EXPECT_EQ(end_.sink()->stream()->atachee(), end_.muxer());
        ASSERT_EQ(builder_.add(qvVideoStream, "rawvenc"), 0);
        EXPECT_EQ(failureOf([&] { exchange_.change("nullmux"); }),
                  "Only allowed for multipass, there must be no streams");
        ASSERT_EQ(exchange_.change("rawmux"), 0);
        EXPECT_STREQ(end_.sink()->name(), "filesink");
        EXPECT_EQ(streams_.count(qvVideoStream), 1);
        builder_.removeAll(qvAllStreams);
    }
}

TEST_F(Exchange, AttributesOfAModuleOverrideTheTableOfNames) {
    auto& module = installSoundMuxer();
    const struct {
        const char* attribute;
        Any value;
        bool MuxerTraits::*trait;
    } cases[] = {{"anyCodec", 1, &MuxerTraits::anyCodec},
                 {"transportStream", 1, &MuxerTraits::transportStream},
                 {"manyPrograms", 1, &MuxerTraits::manyPrograms},
                 {"sizedStreams", 1, &MuxerTraits::sizedStreams}};
    for (const auto& [attribute, value, trait] : cases) {
        EXPECT_FALSE(MuxerTraits::of("mvrawmux", &module).*trait) << attribute;
        module.setAttr(attribute, value);
        EXPECT_TRUE(MuxerTraits::of("mvrawmux", &module).*trait) << attribute;
        module.setAttr(attribute, 0);
        for (const char* named : {"memmux", "mptsmux", "mpegtsmux", "rawmux"})
            EXPECT_FALSE(MuxerTraits::of(named, &module).*trait) << named;
    }
    module.setAttr("anyCodec", 1);
    module.setAttr("companionSink", "nullsink");
    ASSERT_EQ(exchange_.change("mvrawmux"), 0);
    EXPECT_STREQ(end_.sink()->name(), "nullsink");
    EXPECT_EQ(preset_.codecs(qvVideoStream).size(), 1) << "the catalogue knows none for it";
    module.setAttr("companionSink", Any());
    for (const auto& [attribute, value, trait] : cases) module.setAttr(attribute, Any());
}

// Modules that are refused are in encodepipe2_test.cpp.
TEST_F(Exchange, StreamsAreRemovedBeforeTheFirstMultiplexer) {
    builder_.addDefault(qvVideoStream);
    const auto* before = end_.muxer();
    EXPECT_EQ(failureOf([&] { exchange_.start("rawmux"); }),
              "EncodePipe._setMuxer: streams not removed while changingPreset");
    EXPECT_EQ(end_.muxer(), before);
    EXPECT_EQ(streams_.size(), 1u);
}

}  // namespace
