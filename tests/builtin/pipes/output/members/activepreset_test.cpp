#include "tests/builtin/pipes/output/output_parts.h"

namespace {

struct Preset : OutputParts {
    Preset() { preset_.set(anyMuxer()); }
    AnyVector allowed(const char* key) const { return preset_.lists().getVector(key); }
    void follow(const char* muxer) {
        end_.put(muxer ? std::make_unique<FakeMuxer>(muxer) : nullptr);
        preset_.follow(end_.muxer());
    }
    StreamDefaults defaults(int type, int nr, const char* codec) const {
        return preset_.defaults(type, nr, codec, *end_.muxer());
    }
};

TEST_F(Preset, ListsFollowTheMultiplexer) {
    const AnyVector video(Any("rawvenc")), audio(Any("rawaenc"));
    for (const char* muxer : {"rawmux", "rawavimux", "nullmux", "memmux"}) {
        follow(muxer);
        EXPECT_EQ(allowed("vcodecs"), video) << muxer;
        EXPECT_EQ(allowed("acodecs"), audio) << muxer;
        EXPECT_TRUE(preset_.takes("rawvenc", *end_.muxer()));
        EXPECT_EQ(preset_.takes("other", *end_.muxer()), end_.traits().anyCodec) << muxer;
    }
    follow("mvrawmux");
    EXPECT_TRUE(allowed("vcodecs").empty());
    EXPECT_FALSE(preset_.takes("rawvenc", *end_.muxer()));
    preset_.follow(nullptr);
    EXPECT_TRUE(preset_.lists().getVector("acodecs").empty());
    EXPECT_EQ(allowed("muxers"), AnyVector("rawmux", "rawavimux", "mvrawmux"));
}

TEST_F(Preset, DefaultsAreThoseOfTheUsersPresetElseTheFirstCodec) {
    follow("rawmux");
    EXPECT_EQ(defaults(qvVideoStream, 0, nullptr).codec, "rawvenc");
    EXPECT_TRUE(defaults(qvVideoStream, 3, "rawvenc").settings.empty());
    EXPECT_EQ(failureOf([&] { defaults(qvSubpicStream, 0, nullptr); }),
              "EncodePipe._getStreamDefaults: invalid 'type'");
    LogCapture log;
    EXPECT_EQ(failureOf([&] { defaults(qvVideoStream, 0, "rawaenc"); }), "EncodePipe._getStreamDefaults: 2");
    EXPECT_TRUE(log.contains("codec 'rawaenc' specified but it's not allowed by muxer 'rawmux'"));

    const AnyDict codec("name", "rawvenc", "settingsDict", AnyDict("width", 32));
    const AnyDict stream("type", qvVideoStream, "codec", codec, "stream", AnyDict("lang", 3));
    preset_.set(QvPreset(
        AnyDict("profile", QvProfile::raw, "name", "mine", "custom", 1, "streams", AnyVector(Any(stream)))));
    preset_.follow(end_.muxer());
    const auto found = defaults(qvVideoStream, 0, nullptr);
    EXPECT_EQ(found.codec, "rawvenc");
    EXPECT_EQ(found.settings, codec);
    EXPECT_EQ(found.params, AnyDict("lang", 3));
    EXPECT_EQ(defaults(qvAudioStream, 0, nullptr).codec, "rawaenc") << "nothing is stored for it";
    EXPECT_TRUE(
        log.contains("cannot determine audio settings for custom preset 'mine', codec '<not "
                     "specified>', stream 0"));
    follow("mvrawmux");
    EXPECT_EQ(failureOf([&] { preset_.set(anyMuxer()), defaults(qvVideoStream, 0, nullptr); }),
              "EncodePipe._getStreamDefaults: 3");
}

TEST_F(Preset, SwitchesOnlyWithinItsProfile) {
    const AnyDict user("profile", QvProfile::raw, "name", "mine", "custom", 1);
    preset_.switchToUser(user);
    EXPECT_STREQ(preset_.preset().name(), "mine");
    preset_.switchToBuiltin(QvProfile::raw);
    EXPECT_STREQ(preset_.preset().name(), "RAW/YUV");
    AnyDict other = user;
    other.set("profile", QvProfile::aviRaw);
    AnyDict none = user;
    none.set("profile", QvProfile::none);
    const std::pair<std::function<void()>, const char*> refused[] = {
        {[&] { preset_.switchToBuiltin(QvProfile::none); }, "switch to none not supported yet"},
        {[&] { preset_.switchToBuiltin("x"); }, "profile not found"},
        {[&] { preset_.switchToBuiltin(0x2010001); }, "profile not found"},
        {[&] { preset_.switchToBuiltin(QvProfile::aviRaw); }, "mustn't change profile"},
    };
    for (const auto& [act, text] : refused)
        EXPECT_EQ(failureOf(act), std::string("switchToBuiltin: ") + text);
    EXPECT_EQ(failureOf([&] { preset_.switchToUser(1); }), "switchToUser: profile not found");
    EXPECT_EQ(failureOf([&] { preset_.switchToUser(none); }),
              "switchToUser: switch to none not supported yet");
    EXPECT_EQ(failureOf([&] { preset_.switchToUser(other); }), "switchToUser: mustn't change profile");
    EXPECT_STREQ(preset_.preset().name(), "RAW/YUV");
}

}  // namespace
