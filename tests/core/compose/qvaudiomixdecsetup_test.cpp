// Set-ups of a mix: what each call changes, and what is stored.
#include "core/compose/qvaudiomixdecsetup.h"

#include <limits>

#include "core/compose/qvmetafile.h"
#include "core/job/filtersstate.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

namespace {

class MixSetup : public testing::Test {
  protected:
    EngineScope engine;
    QvAudioMixDecSetup setup;

    const AnyVector& sources(int out) const {
        return setup.outChannels().at(out).asDict().getVector("source");
    }
};

TEST_F(MixSetup, OnlyTheWeightOfChannelZeroIsReplaced) {
    setup.setInFileNames(AnyVector("a.wav", "b.wav"));
    ASSERT_EQ(setup.nrOutChannels(), 2);
    for (const double weight : {0.5, 0.25}) {
        EXPECT_EQ(setup.setWeight(0, 0, 0, 0, weight), 0);
        EXPECT_EQ(setup.setWeight(1, Any("b.wav"), 3, 1, weight), 0);
    }
    ASSERT_EQ(sources(0).size(), 1);
    EXPECT_EQ(sources(0).at(0).asDict().getDouble("weight"), 0.25);
    ASSERT_EQ(sources(1).size(), 2);
    // Looked up as channel 0, the first entry of that file and stream is found whatever its channel is.
    setup.setWeight(1, 1, 3, 0, 2.0);
    EXPECT_EQ(sources(1).at(0).asDict().getDouble("weight"), 2.0);
    EXPECT_EQ(sources(1).size(), 2);
    EXPECT_EQ(setup.setWeight(0, 0, 1, 5, 1), 0);
    EXPECT_TRUE(setup.getFileActiveStreams(Any("a.wav")) == AnyVector(0, 1));
    EXPECT_TRUE(setup.getFileActiveStreams(Any("b.wav")) == AnyVector(Any(3)));

    for (const int index : {-1, 2}) {
        EXPECT_EQ(setup.setWeight(index, 0, 0, 0, 1), -1);
        EXPECT_EQ(setup.setWeight(0, index, 0, 0, 1), -1);
        EXPECT_EQ(setup.setChannelPosition(index, "L"), -1);
        EXPECT_EQ(setup.setDecoder(index, "wavdec"), -1);
        EXPECT_EQ(setup.setFilters(index, 0, FiltersState()), -1);
        EXPECT_EQ(setup.filters(index, 0), nullptr);
        EXPECT_EQ(setup.decoder(index), nullptr);
    }
    EXPECT_EQ(setup.setWeight(0, Any("c.wav"), 0, 0, 1), -1);
    EXPECT_EQ(setup.setDecoder(0, nullptr), -1);
}

TEST_F(MixSetup, ManyChannelsAreNotGivenUp) {
    EXPECT_EQ(setup.setNrOutChannels(-1), -1);
    EXPECT_EQ(setup.setNrOutChannels(100), 0);
    EXPECT_EQ(setup.setNrOutChannels(2), -1);
    EXPECT_EQ(setup.nrOutChannels(), 100);
}

TEST_F(MixSetup, StoresAndRestores) {
    setup.setInFileNames(AnyVector("a.wav", "b.wav", "unused.wav"));
    setup.setWeight(0, 1, 0, 0, 0.5);
    setup.setWeight(1, 0, 2, 1, 1.0);
    AnyDict plain;
    setup.store(plain);
    EXPECT_FALSE(plain.isSet("decoders") || plain.isSet("filters"));
    setup.setChannelPosition(0, "L");
    setup.setDecoder(Any("a.wav"), "wavdec");
    FiltersState filters;
    filters.setFilter("avol", AnyDict("name", "avol", "_on", 0));
    EXPECT_EQ(setup.setFilters(0, 2, filters), 0);
    EXPECT_EQ(setup.setFilters(Any("a.wav"), 2, filters), 0);
    AnyDict dict;
    setup.store(dict);
    EXPECT_EQ(dict.getVector("filters").size(), 1);
    ASSERT_NE(setup.filters(0, 2), nullptr);
    EXPECT_EQ(setup.filters(0, 2)->count(), 1);  // also what is switched off
    EXPECT_EQ(setup.filters(0, 1), nullptr);

    QvAudioMixDecSetup back;
    ASSERT_EQ(back.restore(dict), 0);
    EXPECT_TRUE(back.inFileNames() == AnyVector("b.wav", "a.wav"));
    EXPECT_STREQ(back.decoder(1), "wavdec");
    EXPECT_EQ(back.decoder(Any("b.wav")), nullptr);
    AnyDict again;
    back.store(again);
    EXPECT_TRUE(again == dict);

    TempFolder folder;
    const Any name = narrow(folder.file("x.mmf"));
    ASSERT_EQ(back.save(name), 0);
    QvAudioMixDecSetup loaded;
    ASSERT_EQ(loaded.load(name), 0);
    EXPECT_TRUE(loaded.inFileName(1) == narrow(folder.file("a.wav")));
    EXPECT_TRUE(loaded.outChannels().at(0).asDict().get("pos") == "L");

    LogCapture log;
    folder.write("mono.mmf", "<Metafile><MonoInterleave/></Metafile>");
    EXPECT_EQ(loaded.load(narrow(folder.file("mono.mmf"))), -1);
    EXPECT_TRUE(log.contains("[audiomixdec]Failed to open " + folder.file("mono.mmf") +
                             ", metafile contents not supported"));
    EXPECT_EQ(loaded.load(narrow(folder.file("none.mmf"))), -15);
    EXPECT_EQ(loaded.restore(AnyDict("name", "x", "outChannels", AnyVector())), -1);
    EXPECT_EQ(loaded.restore(AnyDict("name", "AudioMixSetup")), -1);
    EXPECT_EQ(loaded.nrOutChannels(), 3);
}

TEST_F(MixSetup, CheckFindsWhatWouldNotBeMixed) {
    const AnyDict sound("src", "a.wav", "stream", 0, "channel", 0, "weight", 1.0);
    const auto with = [&](const char* key, const Any& value) {
        AnyDict source = sound;
        source.set(key, value);
        return AnyVector(Any(AnyDict("source", AnyVector(Any(source)))));
    };
    const auto check = [](const AnyVector& channels) {
        return QvAudioMixDecSetup::check(AnyDict("name", "AudioMixSetup", "outChannels", channels));
    };
    EXPECT_EQ(check(with("src", "b.wav")), "");
    EXPECT_NE(QvAudioMixDecSetup::check(AnyDict()), "");
    EXPECT_NE(check(AnyVector()), "");
    EXPECT_NE(check(AnyVector(Any(1))), "");
    EXPECT_NE(check(AnyVector(Any(AnyDict("source", AnyVector())))), "");
    EXPECT_NE(check(AnyVector(Any(AnyDict("source", 1)))), "");
    const struct {
        const char* key;
        Any value;
    } rows[] = {{"src", ""},       {"src", 1},        {"stream", -1},
                {"stream", "0"},   {"channel", -1},   {"channel", 256},
                {"weight", "1.0"}, {"weight", 1e300}, {"weight", std::numeric_limits<double>::quiet_NaN()}};
    for (const auto& row : rows) EXPECT_NE(check(with(row.key, row.value)), "") << row.key;
    AnyDict named("name", "AudioMixSetup", "outChannels", with("stream", 0));
    for (const char* name : {"nonsense", "filesink"}) {
        named.set("decoders", AnyVector(Any(AnyDict("file", "a.wav", "dec", name))));
        EXPECT_NE(QvAudioMixDecSetup::check(named), "") << name;
    }
}

}  // namespace
