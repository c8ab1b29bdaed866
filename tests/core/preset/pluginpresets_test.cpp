// What plug-ins add to the catalogue by their attributes.
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/qvmodule.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/preset_modules.h"

namespace {

constexpr int kFirst = QvProfile::firstOfPlugins;

AnyDict entry(int profile, const char* name, const char* group, const Any& video, const Any& audio,
              const Any& muxers) {
    AnyDict dict("profile", profile, "name", name, "group", group);
    dict.set("video", video);
    dict.set("audio", audio);
    dict.set("muxers", muxers);
    return dict;
}

AnyVector words(const char* text) { return AnyVector::split(Any(text), Any(" ")); }

struct PluginPresets : testing::Test {
    void setPresets(const Any& presets) {
        modules.plugin().setAttr("presets", presets);
        qvPresetMgr()->update();
    }
    QvPreset last() const { return list().preset(list().size() - 1); }
    const QvPresetList& list() const { return qvPresetMgr()->builtinPresets(); }
    int groupId(const char* name) const {
        const auto& groups = qvPresetMgr()->builtinGroups();
        const int place = groups.findByName(name);
        return place < 0 ? -1 : groups[place].id();
    }

    PresetModules modules{{"av1venc", "opusenc", "h264venc", "webmmux"}};
};

TEST_F(PluginPresets, ComeAfterTheBuiltinOnesAndWork) {
    for (const char* encoder : {"av1venc", "opusenc"})
        qv_registry()->module(encoder)->setAttr("compatMuxers", AnyVector("webmmux", "absent"));
    const int before = list().size();
    AnyVector presets;
    presets.append(entry(kFirst + 7, "AV1 Web", "Web", words("absent av1venc"), words("opusenc rawaenc"),
                         words("mp4mux webmmux rawmux")));
    presets.append(entry(kFirst, "Opus", "Sound", AnyVector(), Any("opusenc"), Any("webmmux")));
    presets.append(entry(kFirst + 1, "AV1 Raw", "PSP", words("av1venc"), Any(), Any("webmmux")));
    presets.append(entry(kFirst + 2, "AV1 Blu-ray", "DVCAM", words("av1venc"), Any(), Any("webmmux")));
    presets.append(entry(kFirst + 3, "Waits", "Web", words("absent"), words("opusenc"), Any("webmmux")));
    presets.append(entry(kFirst + 4, "Unpaired", "Web", words("av1venc"), Any(), Any("rawmux")));
    setPresets(presets);

    ASSERT_EQ(list().size(), before + 4);
    const QvPreset web = list().preset(before);
    EXPECT_STREQ(web.name(), "AV1 Web");
    EXPECT_EQ(wordsOf(web.videoCodecs()) + "/" + wordsOf(web.audioCodecs()) + "/" + wordsOf(web.muxers()),
              "av1venc/opusenc rawaenc/webmmux");
    EXPECT_TRUE(qvPresetMgr()->isCompatible("av1venc", "webmmux", kFirst + 7));
    EXPECT_FALSE(qvPresetMgr()->isCompatible("av1venc", "absent"));
    EXPECT_EQ(groupId("Web"), 200);
    EXPECT_EQ(groupId("Sound"), 201);
    EXPECT_EQ(groupId("PSP"), 102) << "one of the library's, which has presets";
    EXPECT_EQ(groupId("DVCAM"), 112) << "one that had none";

    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    ASSERT_EQ(pipe->applyPreset(kFirst + 7, 0), 0) << pipe->errorDesc();
    EXPECT_STREQ(pipe->videoEncoder(0)->name(), "av1venc");
    ASSERT_EQ(pipe->applyPreset(kFirst, 0), 0) << pipe->errorDesc();
    EXPECT_TRUE(pipe->nrVideoStreams() == 0 && pipe->nrAudioStreams() == 1) << "sound alone";
    EXPECT_TRUE(QvPreset(pipe.get(), "mine").checkValid());
}

TEST_F(PluginPresets, IllFormedOnesAreLeftOutWithALine) {
    const AnyVector v = words("rawvenc"), a = words("rawaenc"), m = words("rawmux");
    const int before = list().size();
    const struct {
        Any presets;
        const char* line;
    } cases[] = {
        {Any(7), "'presets' is no vector"},
        {AnyVector(Any("RAW")), "preset 0 left out: it is no dictionary"},
        {AnyVector(Any(AnyDict())), "'name' is no text of one line"},
        {AnyVector(Any(entry(kFirst, "", "G", v, a, m))), "'name' is no text"},
        {AnyVector(Any(entry(kFirst, "\x1B[2J", "G", v, a, m))), "'name' is no text"},
        {AnyVector(Any(entry(kFirst, "\xFF", "G", v, a, m))), "'name' is no text"},
        {AnyVector(Any(entry(kFirst, repeated("n", 201).c_str(), "G", v, a, m))), "'name' is no text"},
        {AnyVector(Any(entry(kFirst, "N", "two\nlines", v, a, m))), "'group' is no text"},
        {AnyVector(Any(entry(kFirst - 1, "N", "G", v, a, m))), "'profile' is not a number of a plug-in"},
        {AnyVector(Any(entry(-1, "N", "G", v, a, m))), "'profile' is not a number of a plug-in"},
        {AnyVector(Any(entry(kFirst, "N", "G", Any(3), a, m))), "must be vectors of names"},
        {AnyVector(Any(entry(kFirst, "N", "G", v, AnyVector(AnyVector(), 1), m))),
         "must be vectors of names"},
        {AnyVector(Any(entry(kFirst, "N", "G", v, a, AnyDict("rawmux", 1)))), "must be vectors of names"},
        {AnyVector(Any(entry(kFirst, "RAW/YUV", "G", v, a, m))), "its name is taken"},
    };
    for (const auto& c : cases) {
        LogCapture log;
        setPresets(c.presets);
        EXPECT_TRUE(log.contains(c.line)) << c.line;
        EXPECT_EQ(list().size(), before) << c.line;
    }
    AnyVector twice;
    for (const char* name : {"A", "B", "A"}) twice.append(entry(kFirst, name, "G", v, a, m));
    twice[2].asDict().set("profile", kFirst + 1);
    LogCapture log;
    setPresets(twice);
    EXPECT_EQ(list().size(), before + 1);
    EXPECT_STREQ(last().name(), "A");
    EXPECT_TRUE(log.contains("preset 1 left out: its number is taken"));
    EXPECT_TRUE(log.contains("preset 2 left out: its name is taken"));
}

TEST_F(PluginPresets, IllFormedPairsAreIgnoredWithALine) {
    const std::string longName = repeated("x", 60) + "venc";
    modules.add(longName.c_str()).setAttr("compatMuxers", AnyVector(Any("webmmux")));
    modules.add("fakemux").setAttr("compatMuxers", AnyVector(Any("webmmux")));
    qv_registry()->module("av1venc")->setAttr("compatMuxers", "webmmux");
    qv_registry()->module("opusenc")->setAttr("compatMuxers", AnyVector(AnyDict(), 5, "webmmux", "webmmux"));
    LogCapture log;
    qvPresetMgr()->update();
    EXPECT_TRUE(log.contains("venc': 'compatMuxers' ignored: the module's name is too long"));
    EXPECT_TRUE(log.contains("'fakemux': 'compatMuxers' ignored: the module is no encoder"));
    EXPECT_TRUE(log.contains("'av1venc': 'compatMuxers' ignored: it is no vector"));
    EXPECT_EQ(log.count("'opusenc': an entry of 'compatMuxers' is no name"), 2);
    EXPECT_TRUE(qvPresetMgr()->isCompatible("opusenc", "webmmux"));
    EXPECT_FALSE(qvPresetMgr()->isCompatible("av1venc", "webmmux"));
}

TEST_F(PluginPresets, MultiplexersNameEncodersToo) {
    qv_registry()->module("webmmux")->setAttr("compatCodecs", AnyVector("av1venc", "rawaenc", "absent", 5));
    qv_registry()->module("opusenc")->setAttr("compatCodecs", AnyVector(Any("webmmux")));
    LogCapture log;
    qvPresetMgr()->update();
    EXPECT_TRUE(qvPresetMgr()->isCompatible("av1venc", "webmmux"));
    EXPECT_TRUE(qvPresetMgr()->isCompatible("rawaenc", "webmmux"));
    EXPECT_TRUE(qvPresetMgr()->isCompatible("rawaenc", "rawmux"));
    EXPECT_FALSE(qvPresetMgr()->isCompatible("absent", "webmmux"));
    EXPECT_TRUE(log.contains("'webmmux': an entry of 'compatCodecs' is no name"));
    EXPECT_TRUE(log.contains("'opusenc': 'compatCodecs' ignored: the module is no multiplexer"));
}

// An encoder without its hardware, and a multiplexer that can't be made; each comes first in the list.
TEST_F(PluginPresets, PipesBeginWithTheRawPresetWhereTheFirstCantBeMade) {
    struct Unmade : QvModule {
        Unmade(int type, const char* name) : QvModule(type, name, "", name) {}
        QvCodec* create() override { return nullptr; }
    };
    modules.plugin().addModule(new Unmade(QvModuleType::videoEncoder, "bch264venc"));
    for (const char* muxer : {"", "mp4mux"}) {
        if (*muxer) modules.plugin().addModule(new Unmade(QvModuleType::muxer, muxer));
        qvPresetMgr()->update();
        ASSERT_EQ(wordsOf(list().preset(0).muxers()), *muxer ? "mp4mux rawmux" : "rawmux");
        LogCapture log;
        const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        ASSERT_TRUE(pipe);
        EXPECT_TRUE(log.contains("[Encode Pipe] The first preset can't be applied"));
        EXPECT_EQ(pipe->activePreset()->profile(), QvProfile::raw);
        EXPECT_TRUE(pipe->nrStreams() == 2 && !*pipe->errorDesc());
    }
}

}  // namespace
