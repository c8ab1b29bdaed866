#include "core/preset/qvpreset.h"

#include "core/encode/qvencodepipe.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/preset_modules.h"

namespace {

struct Preset : testing::Test {
    // A user preset of a whole state, with values in place of those of the raw profile.
    QvPreset whole(const char* path = nullptr, const Any& value = Any()) const {
        const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        pipe->applyPreset(QvProfile::raw, 0);
        QvPreset preset(pipe.get(), "mine");
        preset.remove("#valid");
        preset.remove("info");
        if (path) *preset.descendant("%s", path) = value;
        return preset;
    }
    PresetModules modules{{"mpegvenc", "mpegaenc", "mptsmux"}};
};

TEST_F(Preset, UserPresetsRestOnTheBuiltinOneOfTheirProfile) {
    QvPreset preset(qvSymToProfile("MPEG2_MAIN"), "mine");
    EXPECT_TRUE(preset.isCustom() && wordsOf(preset.codecs(QvModuleType::videoEncoder)) == "mpegvenc");
    EXPECT_EQ(preset.defaultMuxer(), "mptsmux");
    EXPECT_TRUE(preset.muxerAllowed("rawmux") && !preset.muxerAllowed("rawavimux"));
    preset.set("muxer", AnyDict("name", "rawmux"));
    EXPECT_EQ(preset.defaultMuxer(), "rawmux");
    LogCapture log;
    EXPECT_TRUE(QvPreset(qvSymToProfile("DVD") + 99, "x").muxers().empty());
    EXPECT_TRUE(log.contains("[Preset] Base preset not found for x", QvLogMask::warning));

    EXPECT_EQ(failureOf([&] { preset.setName("MPEG-2 Main"); }), "QvPreset.setName: name conflict.");
    QvPreset builtin = qvPresetMgr()->builtinPreset(0);
    EXPECT_EQ(failureOf([&] { builtin.setName("x"); }), "QvPreset.setName: allowed only for user presets");
    EXPECT_EQ(failureOf([&] { preset.setInfo(3); }), "QvPreset.setInfo: invalid argument");
    EXPECT_EQ(failureOf([&] { builtin.streamParams(1, 0, nullptr); }),
              "QvPreset.streamParams: builtin presets contain no stream params");
    EXPECT_TRUE(builtin.checkValid() && !builtin.error().isValid());
}

TEST_F(Preset, StreamParamsTakeTheNearestStream) {
    QvPreset preset;
    AnyVector streams;
    for (const char* codec : {"a", "b", "a"})
        streams.append(AnyDict("type", 1, "codec", AnyDict("name", codec, "nr", streams.size())));
    streams.append(AnyDict("type", "1", "codec", AnyDict("name", "b")));
    streams.append(AnyDict("type", 2, "codec", "no dictionary"));
    preset.set("streams", streams);
    const struct {
        int type, index;
        const char* codec;
        int nr;  // -1: empty
    } cases[] = {{1, 0, nullptr, 0}, {1, 1, nullptr, 1}, {1, 7, nullptr, 2}, {1, 0, "a", 0},
                 {1, 1, "a", 0},     {1, 7, "a", 2},     {1, 0, "b", -1},    {1, 7, "b", 1},
                 {1, 7, "c", -1},    {2, 0, "a", -1},    {4, 0, nullptr, -1}};
    for (const auto& c : cases) {
        const AnyDict found = preset.streamParams(c.type, c.index, c.codec);
        const Any* nr = found.descendant("codec.nr");
        EXPECT_EQ(nr ? nr->asInt32() : -1, c.nr) << c.type << " " << c.index << (c.codec ? c.codec : "");
    }
    for (const int bad : {0, 3, 255})
        EXPECT_NE(failureOf([&] { preset.streamParams(bad, 0, nullptr); }), "no failure");
}

TEST_F(Preset, InvalidOnesSayWhyAndStay) {
    const struct {
        QvPreset preset;
        const char* error;
    } cases[] = {
        {QvPreset(), "Uninitialized preset object?"},
        {QvPreset(AnyDict("profile", "RAW")), "Uninitialized preset object?"},
        {QvPreset(qvSymToProfile("H264_HIGH"), "x"),
         "Base profile 'H264_HIGH' not available - missing plugins?"},
        {QvPreset(13, "oldest"), "Base profile 'H264' not available - missing plugins?"},
        {QvPreset(QvProfile::firstOfPlugins, "x"),
         "Base profile '0x2800000' not available - missing plugins?"},
        {whole("muxer.name", "absentmux"), "mine - setMuxer: muxer 'absentmux' not available"},
        {whole("muxer.name", 3), "mine - Cannot restore - muxer entry not set"},
        {whole("streams.0.codec.name", "absentvenc"),
         "mine - Cannot add stream: encoder 'absentvenc' not loaded"},
        {whole("streams.0.codec", 3),
         "mine - [EncodePipe] restore - invalid stream entry, no codec specified."},
        {whole("streams.1.type", 77), "mine - Invalid stream type"},
    };
    for (const auto& c : cases) {
        QvPreset preset = c.preset;
        EXPECT_FALSE(preset.isValid()) << c.error;
        EXPECT_EQ(preset.error(), c.error);
        preset.createInfo();
        EXPECT_TRUE(preset.info().isText()) << c.error;
    }
    QvPreset good = whole();
    good.set("#err", "old");
    EXPECT_TRUE(good.isValid() && !good.error().isValid());
    good.set("profile", QvProfile::notSet);
    EXPECT_TRUE(good.isValid()) << "tried once";
    EXPECT_FALSE(good.checkValid());
    QvPreset broken = whole();
    broken.remove("custom");
    EXPECT_EQ(failureOf([&] { broken.checkValid(); }), "QvPreset: invalid object");
}

TEST_F(Preset, InfoTellsWhatThePipeMakes) {
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    ASSERT_EQ(pipe->applyPreset(qvSymToProfile("MPEG2_MAIN"), 0), 0);
    pipe->videoEncoder(0)->setParamDict(AnyDict("width", 720, "height", 576, "framerate", QvFramerate(25.0)));
    pipe->audioEncoder(0)->setParamDict(AnyDict("samplerate", 48000, "channels", 6));
    QvPreset preset(pipe.get(), "mine");
    const std::string info = preset.info().asString("");
    EXPECT_EQ(info.rfind("Format: mptsmux; Video: mpegvenc, 720x576, 25", 0), 0u) << info;
    EXPECT_NE(info.find("; Audio: mpegaenc, 48000Hz, multi ch."), std::string::npos) << info;
    EXPECT_FALSE(preset.isSet("presetName"));

    preset.remove("info");
    preset.createInfo();
    EXPECT_EQ(preset.info(), info.c_str()) << "from a pipe of its own";
    preset.setInfo("stays");
    preset.createInfo(pipe.get());
    EXPECT_EQ(preset.info(), "stays");

    QvPreset lost(qvSymToProfile("DVD") + 99, "lost");
    lost.createInfo();
    EXPECT_EQ(lost.info(), "Info not available");
    lost.remove("info");
    lost.set("muxer", AnyDict("name", "amux"));
    lost.set("streams", AnyDict("auds", AnyVector(Any(AnyDict("codec", AnyDict("name", "aaenc"))))));
    lost.createInfo();
    EXPECT_EQ(lost.info(), "Format: amux; Audio: aaenc");
    EXPECT_NE(failureOf([] { QvPreset(nullptr, "x"); }), "no failure");
    EXPECT_NE(failureOf([&] { QvPreset(pipe.get(), nullptr); }), "no failure");
}

TEST_F(Preset, StreamsOfAnOlderFormKeepTheirSettings) {
    QvPreset preset = whole("streams.0.codec.settingsDict.width", 320);
    const AnyVector streams = preset.getVector("streams");
    preset.set("streams", AnyDict("vids", AnyVector(streams.at(0)), "auds", AnyVector(streams.at(1))));
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    ASSERT_EQ(pipe->applyPreset(preset, 0), 0) << pipe->errorDesc();
    EXPECT_EQ(pipe->nrStreams(), 2);
    EXPECT_EQ(pipe->videoEncoder(0)->getParam("width"), 320);
}

TEST_F(Preset, WithoutStreamsTheyGetThoseThatTheMultiplexerTakes) {
    for (const char* name : {"h264venc", "mp4mux"}) modules.add(name);
    qvPresetMgr()->update();
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    ASSERT_EQ(pipe->applyPreset(QvPreset(qvSymToProfile("H264_HIGH"), "loose"), 0), 0) << pipe->errorDesc();
    EXPECT_STREQ(pipe->getMuxer()->name(), "mp4mux");
    EXPECT_EQ(pipe->nrVideoStreams() * 10 + pipe->nrAudioStreams(), 10) << "MP4 takes no PCM";
}

TEST_F(Preset, ToNoneReleasesItsProfileEverywhere) {
    QvPreset preset = whole();
    preset.checkValid();
    for (const char* path : {"muxer", "streams.0.codec"})
        preset.descendant("%s", path)->asDict().set("profile", QvProfile::raw);
    const QvPreset none = preset.toNone();
    EXPECT_EQ(none.profile(), QvProfile::none);
    EXPECT_EQ(*none.descendant("muxer.profile"), QvProfile::none);
    EXPECT_EQ(*none.descendant("streams.0.codec.profile"), QvProfile::none);
    EXPECT_FALSE(none.isSet("#valid"));
    EXPECT_EQ(preset.profile(), QvProfile::raw);
    preset.descendant("streams.0.codec")->asDict().set("profile", QvProfile::aviRaw);
    EXPECT_EQ(failureOf([&] { preset.toNone(); }), "QvPreset.toNone: a stream has another profile");
    EXPECT_EQ(failureOf([] { qvPresetMgr()->builtinPreset(0).toNone(); }),
              "QvPreset.toNone: allowed only for user presets");
}

}  // namespace
