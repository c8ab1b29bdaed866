#include "core/preset/qvformatmatcher.h"

#include "core/preset/qvpreset.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"

namespace {

using M = QvFormatMatcher;

const QvFramerate f25 = QvFramerate::f25p(), f29 = QvFramerate::f29p(), f50 = QvFramerate::f50p(),
                  f60 = QvFramerate::f60p(), i50 = QvFramerate::f50i(), i59 = QvFramerate::f59i();

// Bottom field first.
QvFramerate bottom(QvFramerate rate) {
    rate.setInterlaced(2);
    return rate;
}

AnyVector sizes(std::initializer_list<Pair> list) {
    AnyVector vector;
    for (const Pair& size : list) vector.append(Any(AnyDict("w", size.first, "h", size.second)));
    return vector;
}

AnyVector rates(std::initializer_list<QvFramerate> list) {
    AnyVector vector;
    for (const QvFramerate& rate : list) vector.append(Any(rate));
    return vector;
}

AnyVector bitrates(std::initializer_list<std::pair<int, Any>> list) {
    AnyVector vector;
    for (const auto& [type, range] : list) vector.append(Any(AnyDict("type", type, "range", range)));
    return vector;
}

// Writes down what is set, in order.
class Encoder : public FakeVideoEncoder {
  public:
    explicit Encoder(const char* name = "fake") : name_(name) {}
    const char* name() const override { return name_; }
    int setParam(const char* name, const Any& value) override {
        order += std::string(order.empty() ? "" : " ") + name;
        if (onSet) onSet(name, value);
        return FakeVideoEncoder::setParam(name, value);
    }
    std::string order;
    std::function<void(const std::string&, const Any&)> onSet;

  private:
    const char* name_;
};

class FormatMatcher : public testing::Test {
  protected:
    void match(int properties, const QvPreset* preset = nullptr) {
        EXPECT_EQ(M(properties, 0, preset).matchVideo(&decoder, 0, &encoder), 0);
    }

    EngineScope engine;
    FakeDecoder decoder{10, f25};
    Encoder encoder;
};

TEST_F(FormatMatcher, Dimensions) {
    const AnyDict limits("wmin", 32, "wmax", 1920, "hmin", 32, "hmax", 1088);
    const struct {
        const char* what;
        Pair in;
        Any range;
        Pair out;
    } rows[] = {
        {"inside", {720, 576}, limits, {720, 576}},
        {"each side by itself", {4096, 16}, limits, {1920, 32}},
        {"listed", {720, 576}, sizes({{704, 576}, {720, 576}}), {720, 576}},
        {"nearest width, then height", {700, 500}, sizes({{704, 288}, {704, 480}, {1280, 500}}), {704, 480}},
        {"the first of equal widths", {710, 480}, sizes({{700, 480}, {720, 480}}), {700, 480}},
        {"heights of both sides compete", {710, 576}, sizes({{700, 480}, {720, 570}}), {700, 570}},
        {"a tie of heights", {704, 500}, sizes({{704, 480}, {704, 520}}), {704, 480}},
        {"no size", {720, 576}, AnyVector(), {100000, 100000}},
    };
    for (const auto& row : rows) {
        decoder.video.set("width", row.in.first);
        decoder.video.set("height", row.in.second);
        encoder.params = AnyDict("sizeRange", row.range);
        match(M::dimensions);
        EXPECT_EQ(encoder.params.getInt32("width"), row.out.first) << row.what;
        EXPECT_EQ(encoder.params.getInt32("height"), row.out.second) << row.what;
    }
    encoder.params = AnyDict();
    match(M::dimensions);
    EXPECT_FALSE(encoder.params.isSet("width")) << "an encoder that does not say stays as it is";
}

TEST_F(FormatMatcher, Framerate) {
    const QvFramerate drop(QvRatio(30000, 1001), 1, true), noDrop(QvRatio(30000, 1001), 1, false);
    const struct {
        const char* what;
        QvFramerate in;
        AnyVector list;
        QvFramerate out;
    } rows[] = {
        {"there is the rate", f25, rates({i50, f50, f25}), f25},
        {"no rate of the scan", i59, rates({f25, f29}), f29},
        {"no rate of the scan, but doubled", i59, rates({f29, QvFramerate(QvRatio(60000, 1001), 1)}),
         QvFramerate(QvRatio(60000, 1001), 1)},
        {"each frame twice", f25, rates({f50, f60}), f50},
        {"nearest", QvFramerate(QvRatio(12, 1)), rates({f60, f29, QvFramerate(QvRatio(15, 1))}),
         QvFramerate(QvRatio(15, 1))},
        {"drop frame as the source", drop, rates({noDrop, drop}), drop},
        {"drop frame of the other kind", drop, rates({noDrop}), noDrop},
        {"another kind of field order", bottom(i50), rates({f25, i50}), i50},
        {"the first of the nearest", QvFramerate(QvRatio(27, 1)), rates({f25, QvFramerate(QvRatio(29, 1))}),
         f25},
        {"an empty list", f25, rates({}), QvFramerate()},
    };
    for (const auto& row : rows) {
        decoder.video.set("framerate", row.in);
        encoder.params = AnyDict("framerateRange", row.list);
        match(M::framerate);
        EXPECT_EQ(encoder.params.get("framerate"), Any(row.out))
            << row.what << ": " << encoder.params.get("framerate").asFramerate().desc(true, true).asString();
    }
    encoder.params = AnyDict("framerateRange", rates({f25, i50}), "canChangeDominance", 1);
    decoder.video.set("framerate", bottom(i50));
    match(M::framerate);
    EXPECT_EQ(encoder.params.get("framerate"), Any(bottom(i50)));
}

// A size that rules a rate out is seen by the second search.
TEST_F(FormatMatcher, TheRateIsMatchedBeforeAndAfterTheSize) {
    encoder.params = AnyDict("framerateRange", rates({f25, f50}), "sizeRange", sizes({{1920, 1080}}));
    encoder.onSet = [&](const std::string& name, const Any&) {
        if (name == "height") encoder.params.set("framerateRange", rates({f29, f50}));
    };
    LogCapture log;
    match(M::framerate | M::dimensions);
    EXPECT_EQ(encoder.order, "framerate width height framerate");
    EXPECT_EQ(encoder.params.get("framerate"), Any(f50));
    EXPECT_TRUE(log.contains("[Video format match]"));
    EXPECT_TRUE(log.contains("setting framerate to 25p"));
    EXPECT_TRUE(log.contains("setting dimensions to 1920x1080"));
    EXPECT_TRUE(log.contains("(re)setting framerate to 50p"));
}

TEST_F(FormatMatcher, VideoBitrate) {
    const Any constant = Pair(2000000, 8000000), variable = Pair(1000000, 5000000);
    const AnyVector both = bitrates({{0, constant}, {1, variable}}), onlyC = bitrates({{0, constant}}),
                    onlyV = bitrates({{1, variable}}), none = bitrates({{2, constant}});
    const QvBitrate unset;
    const struct {
        double rate;
        int vbr;
        AnyVector ranges;
        QvBitrate out;
    } rows[] = {
        {4000000, 0, both, QvBitrate(0, 4000000)},
        {9000000, 0, both, QvBitrate(0, 8000000)},
        {1, 0, onlyC, QvBitrate(0, 2000000)},
        {3000000, 0, onlyV, QvBitrate(1, 3000000, 0, 4200000)},
        {4000000, 0, onlyV, QvBitrate(1, 4000000, 0, 5000000)},
        {6000000, 1, onlyV, QvBitrate(1, 3571428, 0, 5000000)},
        {1000000, 1, both, QvBitrate(1, 1000000, 0, 1000000)},
        {7000000, 1, onlyC, QvBitrate(0, 5000000)},
        {7000000, 1, none, unset},
        {7000000, 0, AnyVector(), unset},
        {0.0, 0, both, unset},
    };
    for (const auto& row : rows) {
        decoder.video.set("vBitrate", row.rate);
        decoder.video.set("vbr", row.vbr);
        encoder.params = AnyDict("bitrateRange", row.ranges);
        match(M::videoBitrate);
        ASSERT_EQ(encoder.params.isSet("bitrate"), row.out.target != 0) << row.rate;
        if (row.out.target == 0) continue;
        const QvBitrate& set = encoder.params.get("bitrate").asBitrate();
        EXPECT_EQ(set.type, row.out.type) << row.rate;
        EXPECT_EQ(set.target, row.out.target) << row.rate;
        EXPECT_EQ(set.max, row.out.max) << row.rate;
        EXPECT_EQ(set.min + set.mode, 0) << row.rate;
    }
    decoder.video.set("vBitrate", 5);
    encoder.params = AnyDict("bitrateRange", both);
    match(M::videoBitrate);
    EXPECT_FALSE(encoder.params.isSet("bitrate")) << "only a Float is a rate";
}

TEST_F(FormatMatcher, FrameAspect) {
    const AnyDict limits("min", 1.0, "max", 2.0);
    const struct {
        const char* what;
        double in;
        Pair size, own;
        Any range;
        double out;
    } rows[] = {
        {"square pixels", 1.5, {300, 200}, {600, 400}, limits, 0.0},
        {"another picture", 1.5, {300, 200}, {600, 300}, limits, 1.5},
        {"clamped", 2.35, {300, 200}, {600, 400}, limits, 2.0},
        {"nearest", 1.5, {300, 200}, {300, 200}, AnyVector(1.3333, 1.7778), 1.3333},
        {"the last of equals", 1.5, {300, 200}, {300, 200}, AnyVector(1.25, 1.75), 1.75},
        {"its own picture", 1.5, {300, 200}, {300, 200}, AnyVector(1.3333, 0.0, 1.7778), 0.0},
    };
    for (const auto& row : rows) {
        decoder.video.set("frameAspect", row.in);
        decoder.video.set("width", row.size.first);
        decoder.video.set("height", row.size.second);
        encoder.params = AnyDict("aspectRange", row.range, "width", row.own.first, "height", row.own.second);
        match(M::frameAspect);
        EXPECT_EQ(encoder.params.get("frameAspect"), Any(row.out)) << row.what;
    }
}

TEST_F(FormatMatcher, Gop) {
    const AnyDict byP("minM", 1, "maxM", 3, "minP", 0, "maxP", 2),
        byN("minM", 1, "maxM", 3, "minN", 6, "maxN", 9);
    const struct {
        const char* what;
        const char* encoder;
        const char* codec;
        Any n, m;
        AnyDict range;
        Pair out;
    } rows[] = {
        {"P limited", "mpegvenc", "MPEG-2", 12, 3, byP, {9, 3}},
        {"M limited, P by the source's M", "mpegvenc", "MPEG-1", 12, 6, byP, {6, 3}},
        {"N limited", "mpegvenc", "MPEG-2", 15, 3, byN, {9, 3}},
        {"N raised", "mpegvenc", "MPEG-2", 2, 1, byN, {6, 1}},
        {"another encoder", "h264venc", "MPEG-2", 12, 3, byP, {-1, -1}},
        {"another source", "mpegvenc", "H.264", 12, 3, byP, {-1, -1}},
        {"pictures of one kind", "mpegvenc", "MPEG-2", 1, 1, byP, {-1, -1}},
        {"M above N", "mpegvenc", "MPEG-2", 12, 13, byP, {-1, -1}},
        {"no M", "mpegvenc", "MPEG-2", 12, 0, byP, {-1, -1}},
        {"no number", "mpegvenc", "MPEG-2", "12", 3, byP, {-1, -1}},
        {"one picture is no group",
         "mpegvenc",
         "MPEG-2",
         2,
         1,
         AnyDict("minM", 1, "maxM", 1, "minP", 0, "maxP", 0),
         {-1, -1}},
    };
    for (const auto& row : rows) {
        Encoder target(row.encoder);
        decoder.video.set("codec", row.codec);
        decoder.video.set("N", row.n);
        decoder.video.set("M", row.m);
        target.params = AnyDict("gopRange", row.range);
        M(M::gop, 0, nullptr).matchVideo(&decoder, 0, &target);
        EXPECT_EQ(target.params.getInt32("N", -1), row.out.first) << row.what;
        EXPECT_EQ(target.params.getInt32("M", -1), row.out.second) << row.what;
    }
}

TEST_F(FormatMatcher, Sound) {
    const struct {
        const char* name;
        const char* range;
        int property, in;
        AnyVector list;
        int out;
    } rows[] = {
        {"channels", "channelsRange", M::channels, 4, AnyVector(2, 6), 2},
        {"channels", "channelsRange", M::channels, 5, AnyVector(2, 6), 6},
        {"samplerate", "samplerateRange", M::samplerate, 44100, AnyVector(48000, 32000), 48000},
        {"bitsPerSample", "bitsPerSampleRange", M::bitsPerSample, 20, AnyVector(24, 16), 24},
        {"bitsPerSample", "none", M::bitsPerSample, 24, AnyVector(24), 16},
    };
    decoder.audio(100, 48000);
    for (const auto& row : rows) {
        FakeAudioEncoder target;
        decoder.tracks[0]->params.set(row.name, row.in);
        target.params = AnyDict(row.range, row.list);
        EXPECT_EQ(M(row.property, 0, nullptr).matchAudio(&decoder, 0, &target), 0);
        EXPECT_EQ(target.params.getInt32(row.name), row.out) << row.name << " " << row.in;
    }
    FakeAudioEncoder target;
    target.params =
        AnyDict("bitrateRange", bitrates({{1, AnyVector(1)}, {0, AnyVector(128000, 192000, 256000)}}));
    M matcher(M::audioBitrate | M::bitsPerSample, 0, nullptr);
    matcher.matchAudio(&decoder, 0, &target);
    EXPECT_FALSE(target.params.isSet("bitrate")) << "the source does not say";
    decoder.tracks[0]->params.set("aBitrate", 160);
    matcher.matchAudio(&decoder, 0, &target);
    EXPECT_EQ(target.params.get("bitrate"), Any(QvBitrate(0, 128000)));
    // Of this parameter alone a refusal is no matter.
    target.refused.set("bitsPerSample", 1);
    EXPECT_EQ(matcher.matchAudio(&decoder, 0, &target), 0);
    target.refused.set("bitrate", 1);
    EXPECT_NE(failureOf([&] { matcher.matchAudio(&decoder, 0, &target); }), "no failure");
}

// A preset's range wins, but an empty list of rates; what it says of sound is not asked for.
TEST_F(FormatMatcher, PresetsWin) {
    QvPreset preset(1, "test");
    EXPECT_FALSE(preset.presetMeta());
    preset.set("PresetMeta", AnyDict("framerateRange", AnyVector(), "sizeRange", sizes({{640, 480}}),
                                     "channelsRange", AnyVector(6)));
    ASSERT_TRUE(preset.presetMeta());
    EXPECT_EQ(preset.presetMeta()->aspectRange(), nullptr);
    EXPECT_EQ(preset.presetMeta()->preferredGroup(), nullptr);
    encoder.params = AnyDict("framerateRange", rates({f50}), "sizeRange", sizes({{16, 8}}));
    match(M::framerate | M::dimensions, &preset);
    EXPECT_EQ(encoder.params.get("framerate"), Any(f50));
    EXPECT_EQ(encoder.params.getInt32("width"), 640);

    QvPresetMeta meta(AnyDict("preferredGroup", "Web", "disableAdvanced", AnyDict("audio", 1, "muxer", 0)));
    EXPECT_STREQ(meta.preferredGroup(), "Web");
    EXPECT_TRUE(meta.disableAdvanced(QvPresetMeta::audio));
    for (const int other : {9, 10, 0, 7}) EXPECT_FALSE(meta.disableAdvanced(other));
}

class TwoPictures : public FakeEncodePipe {
  public:
    TwoPictures() : FakeEncodePipe(f25) { audio(44100).audio(44100); }
    int nrStreams(int mask) const override { return (mask & 1 ? 2 : 0) + (mask & 2 ? 2 : 0); }
    QvVideoEncoder* videoEncoder(int nr) const override { return const_cast<Encoder*>(&pictures[nr]); }
    Encoder pictures[2];
};

TEST_F(FormatMatcher, AFileFitsAllStreamsOfAPipe) {
    decoder.audio(100, 48000);
    decoder.video.set("pal", 1);
    TwoPictures pipe;
    for (Encoder& picture : pipe.pictures) picture.params = AnyDict("framerateRange", rates({f25, f50}));
    for (auto& sound : pipe.audios) sound->params.set("samplerateRange", AnyVector(44100, 48000));
    LogCapture log;
    EXPECT_EQ(M(M::type | M::framerate | M::samplerate, 0, nullptr).matchFile(&decoder, &pipe), 0);
    EXPECT_EQ(pipe.set.get("pal"), Any(1));
    for (Encoder& picture : pipe.pictures) EXPECT_EQ(picture.params.get("framerate"), Any(f25));
    for (auto& sound : pipe.audios) EXPECT_EQ(sound->params.getInt32("samplerate"), 48000);
    EXPECT_TRUE(log.contains("setting type to PAL"));
    EXPECT_TRUE(log.contains("[Video format match 0 to 1]"));
    EXPECT_TRUE(log.contains("[Audio format match 0 to 1]"));
    decoder.video.remove("pal");
    decoder.video.set("framerate", f29);
    match(M::type);
    EXPECT_EQ(encoder.params.get("pal"), Any(0)) << "by its rate, where the source does not say";
}

}  // namespace
