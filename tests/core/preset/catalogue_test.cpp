// The catalogue of presets with modules of all sorts installed.
#include <map>
#include <set>

#include "core/encode/qvencodepipe.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "core/preset/tables/profilesymbols_p.h"
#include "tests/support/checks.h"
#include "tests/support/preset_modules.h"

namespace {

int numberOf(const char* symbol) { return qvSymToProfile(symbol); }

// A preset of the catalogue by its symbol; one without name if it is not there.
QvPreset presetOf(const char* symbol) {
    const int index = qvPresetMgr()->findByProfile(numberOf(symbol));
    return index < 0 ? QvPreset() : qvPresetMgr()->builtinPreset(index);
}

// The names in a group, separated by "; ".
std::string namesIn(const char* group) {
    const auto& groups = qvPresetMgr()->extendedGroups();
    const int place = groups.findByName(group);
    std::string names;
    for (int i = 0; place >= 0 && i < groups[place].size(); ++i)
        names += (i ? "; " : "") + std::string(qvPresetMgr()->extendedPreset(groups[place].preset(i)).name());
    return names;
}

TEST(Catalogue, WithAllModulesEachPresetHasAnOwnNameOneGroupAndAPair) {
    const PresetModules modules(PresetModules::all());
    const auto& presets = qvPresetMgr()->builtinPresets();
    const auto& groups = qvPresetMgr()->builtinGroups();
    ASSERT_EQ(presets.size(), 98);
    std::set<std::string> names;
    std::set<int> profiles;
    for (int i = 0; i < presets.size(); ++i) {
        const QvPreset preset = presets.preset(i);
        SCOPED_TRACE(preset.name());
        names.insert(preset.name());
        profiles.insert(preset.profile());
        const int group = groups.findByPresetIndex(i);
        EXPECT_GE(group, 0);
        EXPECT_EQ(groups.findByPresetIndex(i, group + 1), -1) << "in two groups";
        EXPECT_TRUE(preset.isBuiltin());
        EXPECT_TRUE(
            preset.isCompatible(preset.videoCodecs().at(0).asString(), preset.defaultMuxer().asString()));
    }
    EXPECT_EQ(names.size(), 98u);
    Texts without;
    for (const ProfileSymbol& row : profileScheme::currentSymbols)
        if (!profiles.contains(row.number)) without.push_back(row.name);
    EXPECT_EQ(without, (Texts{"DIVX7_DPS_TRICKPLAY", "MVC_STEREO_HIGH"}));
    EXPECT_TRUE(qvPresetMgr()->missingPresets().empty());
    EXPECT_EQ(groups.size(), 25);
    int members = 0;
    for (int i = 0; i < groups.size(); ++i) members += groups[i].size();
    EXPECT_EQ(members, 98);
}

TEST(Catalogue, GroupsHaveTheirOwnOrder) {
    const PresetModules modules(PresetModules::all());
    EXPECT_EQ(namesIn("PSP"),
              "PSP H.264 Highest Resolution; PSP H.264 High Resolution; "
              "PSP H.264 Low Resolution; PSP MPEG-4 Low Resolution");
    EXPECT_EQ(namesIn("3GP"), "3GP H.263; 3GP MPEG-4; 3GP H.264");
    EXPECT_EQ(namesIn("HDV"), "HDV HD2; HDV HD1") << "without Silverlight, of the same number";
    EXPECT_EQ(namesIn("JPEG2000"), "DigitalCinema 2K; DigitalCinema 4K; JPEG2000 Lossy; JPEG2000 Lossless");
    EXPECT_EQ(namesIn("DV"),
              "DV; DVCPRO 25; DVCPRO 50; DVCPRO HD 100 720p; DVCPRO HD 100 720p Native; "
              "DVCPRO HD 100 1080i");
    const auto& groups = qvPresetMgr()->builtinGroups();
    EXPECT_EQ(groups[5].id() * 1000 + groups[8].id(), 125109);
}

// Video, audio and multiplexers of a preset when all modules are there.
TEST(Catalogue, ColumnsFollowTheTableAndWhereItIsOpenThePairs) {
    const PresetModules modules(PresetModules::all());
    const struct {
        const char *symbol, *video, *audio, *muxers;
    } cases[] = {
        {"PSP_H264_480x270", "bch264venc h264venc h264mfxvenc", "aacaenc rawaenc", "mp4mux rawmux"},
        {"3GP_H264", "bch264venc h264venc h264mfxvenc", "aacaenc amraenc rawaenc", "mp4mux rawmux"},
        {"GPU", "h264cudavenc h264openclvenc", "aacaenc rawaenc", "mp4mux mptsmux mpegpsmux rawmux"},
        {"H264_QT", "bch264venc h264venc h264mfxvenc",
         "aacaenc ddproaenc ddplusproaenc mpegpcmenc mpegaenc rawaenc", "mp4mux mptsmux mpegpsmux rawmux"},
        {"MPEG1", "mpegvenc", "mpegaenc mpegpcmenc aacaenc ddproaenc ddplusproaenc rawaenc",
         "mptsmux mpegpsmux mp4mux rawmux"},
        {"VC1_MAIN", "vc1venc",
         "mpegaenc mpegpcmenc wmaaenc aacaenc ddaenc ddproaenc ddplusproaenc amraenc rawaenc",
         "asfmux mpegtsmux mptsmux rawmux"},
        {"DCI_2K", "mj2kvenc", "mpegaenc mpegpcmenc aacaenc ddaenc ddproaenc ddplusproaenc amraenc rawaenc",
         "mj2mux mxfmux rawmux"},
        {"DIVX6_HDTV", "divxvenc", "mpegaenc aacaenc ddaenc ddproaenc ddplusproaenc amraenc mp3aenc rawaenc",
         "dmfmux mkvmux rawmux"},
        {"DIVX7_DPS_SD", "divxh264venc", "aacaenc ddproaenc ddplusproaenc mp3aenc", "mkvmux"},
        {"DV", "dvvenc dv100venc", "dummyaenc", "dvmux dv100mux"},
        {"DVAVI_DV", "dvvenc dv100venc", "dummyaenc", "dvavimux"},
        {"P2_DVCPRO50", "dvvenc dv100venc", "dummyaenc mpegpcmenc", "mxfmux"},
        {"XDCAM_EX_1280", "mpegvenc",
         "mpegaenc mpegpcmenc aacaenc ddaenc ddproaenc ddplusproaenc amraenc rawaenc", "mp4mux rawmux"},
        {"MVC_BD_3D", "mvcvenc", "mpegaenc aacaenc ddaenc ddproaenc ddplusproaenc rawaenc", "mvrawmux"},
        {"RAW", "rawvenc", "rawaenc", "rawmux"},
        {"AVI_RAW", "rawvenc", "rawaenc", "rawavimux"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.symbol);
        const QvPreset preset = presetOf(c.symbol);
        EXPECT_EQ(wordsOf(preset.videoCodecs()), c.video);
        EXPECT_EQ(wordsOf(preset.audioCodecs()), c.audio);
        EXPECT_EQ(wordsOf(preset.muxers()), c.muxers);
    }
    EXPECT_EQ(wordsOf(presetOf("SILVERLIGHT_H264").muxers()), "rawmux") << "ASF takes no H.264";
}

TEST(Catalogue, OnlyWhatIsInstalledIsThere) {
    {
        const PresetModules modules({"mpegvenc", "mptsmux"});
        const QvPreset preset = presetOf("MPEG2_MAIN");
        EXPECT_EQ(wordsOf(preset.videoCodecs()), "mpegvenc");
        EXPECT_EQ(wordsOf(preset.muxers()), "mptsmux rawmux");
        EXPECT_EQ(qvPresetMgr()->findByProfile(numberOf("H264_HIGH")), -1);
        EXPECT_EQ(presetOf("XDCAM_HD_422_1920").defaultMuxer(), "rawmux");
        EXPECT_EQ(qvPresetMgr()->builtinGroups().findByName("PSP"), -1);
    }
    {
        const PresetModules modules({"dv100venc", "dvmux", "dv100mux", "divxh264venc", "asfmux"});
        EXPECT_EQ(wordsOf(presetOf("DVCAM").muxers()), "dv100mux") << "dvmux takes no DV100";
        EXPECT_FALSE(qvPresetMgr()->profileAvailable(numberOf("DIVX7_HD_PLUS"))) << "nothing takes its video";
    }
    const PresetModules modules;
    EXPECT_EQ(qvPresetMgr()->builtinPresets().size(), 2);
    EXPECT_EQ(namesIn("Uncompressed"), "RAW/YUV; Uncompressed AVI");
    EXPECT_EQ(qvPresetMgr()->builtinGroups().size(), 1);
}

TEST(Catalogue, MissingPresetsNameWhatTheyWaitFor) {
    const PresetModules modules({"divxh264venc"});
    std::map<std::string, AnyDict> missing;
    for (const Any& entry : qvPresetMgr()->missingPresets())
        missing[entry.asDict().getString("name")] = entry.asDict();
    EXPECT_EQ(missing.size(), 96u);
    const AnyDict &avchd = missing["AVCHD"], &divx = missing["DivX Plus DPS SD"];
    EXPECT_EQ(wordsOf(avchd.getVector("waitsFor")), "bch264venc h264venc h264mfxvenc");
    EXPECT_EQ(wordsOf(divx.getVector("waitsFor")), "mkvmux") << "its encoder is there";
    EXPECT_STREQ(divx.getString("group"), "DivX Plus");
    EXPECT_EQ(avchd.getInt32("profile"), numberOf("AVCHD"));
}

TEST(Catalogue, EveryPresetIsAppliedCapturedAndAppliedAgain) {
    const PresetModules modules(PresetModules::all());
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    ASSERT_TRUE(pipe);
    const auto& presets = qvPresetMgr()->builtinPresets();
    for (int i = 0; i < presets.size(); ++i) {
        const QvPreset preset = presets.preset(i);
        SCOPED_TRACE(preset.name());
        ASSERT_EQ(pipe->applyPreset(preset.profile(), 0), 0) << pipe->errorDesc();
        EXPECT_EQ(pipe->nrVideoStreams() * 10 + pipe->nrAudioStreams(), 11);
        const bool dv100 = std::string_view(preset.symbol()).find("DVCPRO100") != std::string_view::npos;
        const bool special = dv100 && preset.muxerAllowed("dv100mux");
        EXPECT_EQ(Any(special ? "dv100mux" : preset.defaultMuxer()), pipe->getMuxer()->name());
        EXPECT_EQ(dv100, std::string_view(pipe->videoEncoder(0)->name()) == "dv100venc");

        pipe->videoEncoder(0)->setParam("width", 1280);
        QvPreset captured(pipe.get(), "mine");
        const std::unique_ptr<QvEncodePipe> other(QvEncodePipe::create());
        ASSERT_EQ(other->applyPreset(captured, 0), 0) << other->errorDesc();
        EXPECT_EQ(other->videoEncoder(0)->getParam("width"), 1280);
        EXPECT_EQ(QvPreset(other.get(), "mine"), captured);
        EXPECT_TRUE(captured.checkValid()) << captured.error().asString("");
    }
}

TEST(Catalogue, PairsDependOnThePresetToo) {
    const PresetModules modules(PresetModules::all());
    const QvPresetMgr& catalogue = *qvPresetMgr();
    const struct {
        const char *codec, *muxer, *symbol;
        bool goes;
    } cases[] = {
        {"h264venc", "rawmux", nullptr, true},           {"h264venc", "mxfmux", nullptr, false},
        {"bch264venc", "mxfmux", "AVCINTRA_50", true},   {"mpegvenc", "mp4mux", "H264_HIGH", false},
        {"mpegpcmenc", "mptsmux", "AVCHD", true},        {"mpegpcmenc", "mptsmux", "BD_H264_HDMV", true},
        {"mpegpcmenc", "mptsmux", "BD_VC1", true},       {"mpegpcmenc", "mptsmux", "MPEG2_MAIN", false},
        {"mpegpcmenc", "mptsmux", nullptr, false},       {"mptsmux", "mpegpcmenc", "AVCHD", false},
        {"mpegpcmenc", "mp4mux", "XDCAM_EX_1920", true}, {"mpegpcmenc", "mp4mux", "H264_HIGH", false},
        {"mpegpcmenc", "mpegpsmux", "MPEG2_MAIN", true},
    };
    for (const auto& c : cases)
        EXPECT_EQ(catalogue.isCompatible(c.codec, c.muxer, c.symbol ? numberOf(c.symbol) : -1), c.goes)
            << c.codec << " " << c.muxer << " " << (c.symbol ? c.symbol : "-");
    EXPECT_TRUE(catalogue.isCompatible("mpegpcmenc", "mptsmux")) << "the list alone";
    for (const int past : {numberOf("BD_H264_HDMV") - 1, numberOf("BD_VC1") + 1})
        EXPECT_FALSE(catalogue.isCompatible("mpegpcmenc", "mptsmux", past)) << "past the ends of Blu-ray";
    EXPECT_TRUE(catalogue.isCompatible("mpegvenc", "mp4mux", 0x2FFFFFF)) << "no such preset";
    EXPECT_FALSE(catalogue.isCompatible(nullptr, "mp4mux") || catalogue.isCompatible("mpegvenc", nullptr));

    EXPECT_EQ(wordsOf(catalogue.getCompatible("mp4mux", QvModuleType::audioEncoder, numberOf("MPEG2_MAIN"))),
              "aacaenc ddproaenc ddplusproaenc");
    EXPECT_EQ(wordsOf(catalogue.getCompatible("mpegvenc", QvModuleType::muxer, numberOf("DVD"))),
              "mpegpsmux rawmux");
    const AnyVector any = catalogue.getCompatible("asfmux", QvModuleType::audioEncoder);
    EXPECT_EQ(wordsOf(any), "wmaaenc");
    EXPECT_TRUE(catalogue.getCompatible("mptsmux", QvModuleType::audioEncoder).contains(Any("mpegpcmenc")));
    EXPECT_STREQ(catalogue.getSubstitute("h264venc"), "bch264venc");
    EXPECT_TRUE(!catalogue.getSubstitute("mpegvenc") && !catalogue.getSubstitute(nullptr));
}

TEST(Catalogue, UpdateForgetsWhatIsGone) {
    PresetModules modules({"mpegvenc"});
    EXPECT_TRUE(qvPresetMgr()->isCompatible("mpegvenc", "rawmux"));
    modules.add("mj2kvenc");
    qvPresetMgr()->update();
    EXPECT_TRUE(qvPresetMgr()->profileAvailable(numberOf("DCI_4K")));
    qv_registry()->cleanup();
    qvPresetMgr()->update();
    EXPECT_FALSE(qvPresetMgr()->isCompatible("mpegvenc", "rawmux"));
    EXPECT_TRUE(qvPresetMgr()->builtinPresets().empty() && qvPresetMgr()->builtinGroups().size() == 0);
    EXPECT_EQ(failureOf([] { qvPresetMgr()->findByProfile(1); }), "") << "an assertion without a text";
}

}  // namespace
