#include "core/preset/presetgroup.h"

#include "core/preset/extendedpresets_p.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "core/preset/qvuserpresets.h"
#include "tests/support/checks.h"
#include "tests/support/preset_modules.h"

namespace {

TEST(PresetGroups, AreFoundByWhatTheyHold) {
    QvPresetList presets;
    for (const char* name : {"a", "b", "c"}) presets.append(QvPreset(10 + presets.size(), name));
    PresetGroupList groups;
    groups.addToGroup(7, "X", AnyVector(0, 1));
    groups.addToGroup(8, "Y", AnyVector(Any(1)));
    groups.addToGroup(7, "other name", AnyVector(Any(2)));
    ASSERT_EQ(groups.size(), 2);
    EXPECT_TRUE(groups[0].size() == 3 && groups[0].preset(2) == 2);
    EXPECT_EQ(groups.findById(8) * 10 + groups.findByName("Y"), 11);
    EXPECT_TRUE(groups.findById(9) == -1 && groups.findByName(nullptr) == -1);
    EXPECT_EQ(groups.findByPresetIndex(1), 0);
    EXPECT_EQ(groups.findByPresetIndex(1, 1), 1);
    EXPECT_EQ(groups.findByPresetIndex(1, 2), -1);
    EXPECT_EQ(groups.findByPresetIndex(1, 99), -1);
    EXPECT_EQ(groups.findByPresetProfile(presets, 11, 1), 1);
    EXPECT_EQ(groups.findByPresetName(presets, "c"), 0);
    EXPECT_EQ(failureOf([&] { groups.findByPresetProfile(presets, 9); }),
              "container doesn't contain profile");
    EXPECT_EQ(failureOf([&] { groups.findByPresetName(presets, "z"); }), "container doesn't contain name");
    EXPECT_EQ(failureOf([&] { groups.addToGroup(9, "Y", AnyVector()); }),
              "addToGroup: groupName already taken");
    EXPECT_EQ(failureOf([&] { groups.addToGroup(8, "Y", AnyVector(3, "4")); }),
              "PresetGroup.update: invalid data type");
    EXPECT_EQ(groups[1].size(), 1) << "not even the first";
    for (const int bad : {-1, 2}) EXPECT_NE(failureOf([&] { groups.at(bad); }), "no failure");
    EXPECT_NE(failureOf([&] { groups[1].preset(1); }), "no failure");
    EXPECT_STREQ(PresetGroup().name(), "_root_");
}

TEST(ExtendedPresets, FollowTheBuiltinOnesInTheirGroups) {
    const PresetModules modules({"dvvenc", "dvmux", "h264venc", "mp4mux"});
    const auto builtin = BuiltinCatalogue::make();
    const auto preset = [](const Any& profile, const char* name, const char* group) {
        AnyDict dict("name", name, "custom", 1);
        dict.set("profile", profile);
        if (group) dict.set("PresetMeta", AnyDict("preferredGroup", group));
        return dict;
    };
    const int dv25 = qvSymToProfile("DVCPRO25");
    QvPresetList source;
    source.append(preset(dv25, "mine", "Flash"));
    source.append(preset(dv25, "plain", nullptr));
    source.append(preset(dv25, "lost", "No such group"));
    source.append(preset(dv25, "DV", nullptr));
    source.append(preset(qvSymToProfile("DCI_2K"), "cinema", "Flash"));
    source.append(preset(19, "old", nullptr));  // DVCPRO in the oldest scheme, which is no preset of today
    source.append(preset(-1, "none", nullptr));
    source.append(preset("DV", "text", nullptr));
    source.append(Any(5));
    LogCapture log;
    const auto all = ExtendedPresets::make(builtin, source);
    const int first = builtin.presets.size();
    ASSERT_EQ(all.presets.size(), first + 3);
    for (int i = 0; i < first; ++i) EXPECT_EQ(all.presets.at(i), builtin.presets.at(i));
    const auto groupOf = [&](int index) {
        return std::string(all.groups[all.groups.findByPresetIndex(index)].name());
    };
    EXPECT_EQ(groupOf(first) + " " + groupOf(first + 1) + " " + groupOf(first + 2), "Flash DV DV");
    EXPECT_TRUE(log.contains("Skipped extended preset 'DV', name conflict", QvLogMask::warning));
    EXPECT_TRUE(log.contains("Skipped extended preset 'cinema', base profile not available."));
    EXPECT_EQ(log.count("Skipped"), 3) << "what has no number is skipped without a word";
    EXPECT_EQ(builtin.groups[builtin.groups.findByName("Flash")].size(), 2) << "unchanged";
}

TEST(ExtendedPresets, ComeFromFilesAndLastUntilTheyAreCleared) {
    const PresetModules modules({"dvvenc", "dvmux"});
    QvPresetMgr& catalogue = *qvPresetMgr();
    const TempFolder folder;
    QvUserPresets user;
    QvPreset preset(qvSymToProfile("DVCPRO25"), "mine");
    preset.set("PresetMeta", AnyDict("preferredGroup", "Uncompressed"));
    user.append(preset);
    user.append(QvPreset(qvSymToProfile("DV"), "second"));
    const Any file = narrow(folder.file("more.xml"));
    ASSERT_EQ(user.save(file), 0);

    const int builtin = catalogue.builtinPresets().size();
    for (const int loaded : {2, 4}) {
        ASSERT_EQ(catalogue.loadExtendedPresets(file), 0);
        EXPECT_EQ(catalogue.extendedPresets().size(), builtin + loaded);
    }
    EXPECT_STREQ(catalogue.extendedPreset(builtin + 2).name(), "mine (1)");
    const auto& groups = catalogue.extendedGroups();
    EXPECT_EQ(groups[groups.findByName("Uncompressed")].preset(2), builtin);
    EXPECT_EQ(catalogue.builtinPresets().size(), builtin);

    folder.write("broken.xml", "<QvUserPresets><presets>");
    EXPECT_NE(catalogue.loadExtendedPresets(narrow(folder.file("broken.xml"))), 0);
    EXPECT_NE(catalogue.loadExtendedPresets(narrow(folder.file("absent.xml"))), 0);
    EXPECT_EQ(catalogue.extendedPresets().size(), builtin + 4) << "a failure changes nothing";
    catalogue.update();
    EXPECT_EQ(catalogue.extendedPresets().size(), builtin + 4) << "they are found a base again";
    catalogue.clearExtendedPresets();
    EXPECT_EQ(catalogue.extendedPresets(), catalogue.builtinPresets());
}

}  // namespace
