#include "core/preset/qvuserpresets.h"

#include <gmock/gmock.h>

#include <memory>

#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/log_capture.h"
#include "tests/support/preset_modules.h"
#include "tests/support/temp_folder.h"

namespace {

// Entries of a dictionary in a file.
std::string entry(const std::string& key, const std::string& value) {
    return "<key>" + key + "</key>" + value;
}
std::string text(const std::string& key, const std::string& value) {
    return entry(key, "<str>" + value + "</str>");
}
std::string number(const std::string& key, int value) {
    return entry(key, "<i32>" + std::to_string(value) + "</i32>");
}
std::string dict(const std::string& key, const std::string& entries) {
    return entry(key, "<dict>" + entries + "</dict>");
}

std::string current(const std::string& elements) {
    return "<?xml version=\"1.0\"?><UserPresets version=\"2.0\"><dict>" +
           entry("presets", "<vec>" + elements + "</vec>") + "</dict></UserPresets>";
}
std::string preset(const std::string& name, const std::string& entries = number("profile", QvProfile::raw)) {
    return "<Preset version=\"2.0\" name=\"" + name + "\">" + number("custom", 1) + entries + "</Preset>";
}

std::string older(const std::string& elements) {
    return "<?xml version=\"1.0\"?><userprofiles version=\"1.6\"><dict>" +
           entry("user", "<vec>" + elements + "</vec>") + "</dict></userprofiles>";
}

// A part of an older preset, "video", "audio" or "mux".
std::string part(const std::string& name, const std::string& codec, const std::string& state = "") {
    return dict(name,
                text("codec", codec) + dict("state", text("name", codec) + number("profile", 30) + state));
}
std::string olderPreset(const std::string& name, const std::string& params) {
    return "<dict>" + text("name", name) + dict("params", params) + "</dict>";
}
std::string rawPreset(const std::string& name) {
    return olderPreset(name, number("origProfile", 0) + part("video", "rawvenc") + part("audio", "rawaenc") +
                                 part("mux", "rawmux"));
}

class UserPresets : public testing::Test {
  protected:
    void install(std::initializer_list<const char*> modules) {
        for (const char* name : modules) engine_.add(name);
        qvPresetMgr()->update();
    }
    std::string names(const QvUserPresets& presets) const {
        std::string all;
        for (int i = 0; i < presets.count(); ++i) all += std::string(presets.at(i).name()) + "|";
        return all;
    }
    int load(QvUserPresets& presets, const std::string& document, int mode, int* version = nullptr) const {
        return presets.load(Any(folder_.write("p.xml", document).c_str()), mode, version);
    }

    PresetModules engine_;
    TempFolder folder_;
    LogCapture log_;
    QvUserPresets presets_;
};

TEST_F(UserPresets, EditedByNameAndByPlace) {
    EXPECT_FALSE(presets_.modified());
    presets_.set("A", QvPreset(QvProfile::raw, "x"));
    presets_.set("B", QvPreset(QvProfile::aviRaw, "x"));
    EXPECT_TRUE(presets_.modified());
    EXPECT_EQ(names(presets_), "A|B|");
    presets_.set("A", QvPreset(QvProfile::aviRaw, "y"));
    EXPECT_EQ(presets_.get("A").profile(), QvProfile::aviRaw);
    presets_.setModified(false);
    EXPECT_EQ(presets_.append(QvPreset(QvProfile::raw, "B")), -1);
    EXPECT_EQ(presets_.rename("A", "B"), -1);
    EXPECT_EQ(presets_.rename("none", "C"), -1);
    EXPECT_EQ(presets_.rename("A", "A"), 0);
    EXPECT_EQ(presets_.rename(1, "A"), -1);
    presets_.remove("none");
    EXPECT_FALSE(presets_.modified()) << "nothing of that changed the list";
    EXPECT_EQ(presets_.append(QvPreset(QvProfile::raw, "C")), 2);
    EXPECT_EQ(presets_.rename("A", "D"), 0);
    presets_.remove(1);
    EXPECT_EQ(presets_.getNames(), AnyVector("D", "C"));
    AnyDict found("left", 1);
    presets_.profile("C", found);
    EXPECT_EQ(found.getInt32("profile"), QvProfile::raw);
    presets_.profile("none", found);
    EXPECT_TRUE(found.empty());
    EXPECT_THROW(presets_.at(2), QvAssertFailure);
    EXPECT_THROW(presets_[-1], QvAssertFailure);
    EXPECT_THROW(presets_.get("none"), QvAssertFailure);
    presets_.clear();
    EXPECT_EQ(presets_.count(), 0);
}

TEST_F(UserPresets, NamesOfBuiltinOnesAreRefused) {
    presets_.set("A", QvPreset(QvProfile::raw, "x"));
    EXPECT_THROW(presets_.set("RAW/YUV", QvPreset(QvProfile::raw, "x")), QvAssertFailure);
    EXPECT_THROW(presets_.rename("A", "RAW/YUV"), QvAssertFailure);
    EXPECT_TRUE(log_.contains("QvPreset.setName: name conflict."));
    EXPECT_THROW(presets_.set("B", qvPresetMgr()->builtinPreset(0)), QvAssertFailure);
    EXPECT_EQ(names(presets_), "A|");
}

TEST_F(UserPresets, KeepAPipesSettings) {
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    ASSERT_EQ(pipe->applyPreset(QvProfile::aviRaw, 0), 0);
    pipe->videoEncoder(0)->setParam("width", 320);
    pipe->audioEncoder(0)->setParam("samplerate", 44100);
    ASSERT_EQ(presets_.create("Web", pipe.get()), 0);
    EXPECT_EQ(presets_.create("Web", pipe.get()), -1);
    EXPECT_STREQ(presets_.get("Web").shortName(), "Web");
    const std::string file = folder_.file("kept.xml");
    ASSERT_EQ(presets_.save(Any(file.c_str())), 0);
    EXPECT_FALSE(presets_.modified());
    QvUserPresets loaded;
    int version = 0;
    ASSERT_EQ(loaded.load(Any(file.c_str()), 0, &version), 0);
    EXPECT_EQ(version, 2);
    EXPECT_TRUE(loaded == presets_);
    const std::unique_ptr<QvEncodePipe> other(QvEncodePipe::create());
    EXPECT_EQ(loaded.apply("none", other.get()), -1);
    ASSERT_EQ(loaded.apply("Web", other.get()), 0) << other->errorDesc();
    EXPECT_EQ(other->videoEncoder(0)->QvCodec::getParam("width"), 320);
    EXPECT_EQ(other->audioEncoder(0)->QvCodec::getParam("samplerate"), 44100);
    EXPECT_STREQ(other->getMuxer()->name(), "rawavimux");
    QvUserPresets again;
    ASSERT_EQ(again.create("Web", other.get()), 0);
    EXPECT_TRUE(again == presets_);
    other->videoEncoder(0)->setParam("width", 322);
    again.clear();
    again.create("Web", other.get());
    EXPECT_TRUE(again != presets_);
}

TEST_F(UserPresets, StoreNamesOfAnyScriptAndNoMarks) {
    const std::string name =
        "Gr\xC3\xB6\xC3\x9F"
        "e \xE2\x98\x83 <&\">";
    QvPreset wide(QvProfile::raw, name.c_str());
    wide.setShortName("k\xC3\xBCrzer");
    wide.setInfo(Any("\xC3\xBC").toWString());
    ASSERT_EQ(presets_.append(wide), 0);
    for (int i = 0; i < 1000; ++i)
        presets_.append(QvPreset(QvProfile::raw, ("P" + std::to_string(i)).c_str()));
    EXPECT_EQ(presets_.checkPresets(0), 1001);
    const std::string file = folder_.file("wide.xml");
    ASSERT_EQ(presets_.save(Any(file.c_str())), 0);
    EXPECT_EQ(TempFolder::read(file).find("#valid"), std::string::npos);
    QvUserPresets loaded;
    ASSERT_EQ(loaded.load(Any(file.c_str()), QvUserPresets::clearFirst), 0);
    EXPECT_TRUE(loaded == presets_);
    EXPECT_EQ(loaded.indexOf(name.c_str()), 0);
    EXPECT_STREQ(loaded.at(0).shortName(), "k\xC3\xBCrzer");
    EXPECT_THROW(presets_.save(Any((folder_.file("none") + "/x.xml").c_str())), QvFileException);
}

TEST_F(UserPresets, NamesInUseByMode) {
    const std::string file = current(preset("My") + preset("Other") + preset("My"));
    const struct {
        int mode;
        const char *first, *second;
    } rows[] = {
        {QvUserPresets::clearFirst, "My|Other|My|", "My|Other|My|"},
        {QvUserPresets::keep, "Old|My|Other|My (1)|", "Old|My|Other|My (1)|My (2)|Other (1)|My (3)|"},
        {QvUserPresets::overwrite, "Old|My|Other|", "Old|My|Other|"},
        {QvUserPresets::overwrite | QvUserPresets::keep, "Old|My|Other|", "Old|My|Other|"},
        {6, "Old|My|Other|My (1)|", "Old|My|Other|My (1)|My (2)|Other (1)|My (3)|"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.mode);
        QvUserPresets presets;
        presets.set("Old", QvPreset(QvProfile::raw, "Old"));
        ASSERT_EQ(load(presets, file, row.mode), 0);
        EXPECT_EQ(names(presets), row.first);
        EXPECT_FALSE(presets.modified());
        ASSERT_EQ(load(presets, file, row.mode), 0);
        EXPECT_EQ(names(presets), row.second);
    }
    // A number that is taken is passed over.
    QvUserPresets presets;
    for (const char* name : {"My", "My (1)", "My (3)"}) presets.set(name, QvPreset(QvProfile::raw, name));
    ASSERT_EQ(load(presets, file, QvUserPresets::keep), 0);
    EXPECT_EQ(names(presets), "My|My (1)|My (3)|My (2)|Other|My (4)|");
    // What is loaded is what is stored.
    ASSERT_EQ(
        load(presets, current(preset("My", number("profile", QvProfile::aviRaw))), QvUserPresets::overwrite),
        0);
    EXPECT_EQ(presets.get("My").profile(), QvProfile::aviRaw);
}

// In the current form a damaged element is an assertion, of which check() warns; the list stays.
TEST_F(UserPresets, DamagedFilesChangeNothing) {
    constexpr const char* structure = "QvUserPresets._importV2: invalid preset structure";
    constexpr const char* unnamed = "QvUserPresets.import: 'name' not defined";
    const struct {
        std::string document;
        bool asserts;
        const char *assertion, *said;
    } rows[] = {
        {current("<i32>1</i32>"), true, structure, structure},
        {current("<dict>" + text("name", "x") + "</dict>"), true, structure, structure},
        {current(preset("good") + "<Preset version=\"2.0\">" + number("profile", 1) + "</Preset>"), true,
         unnamed, "preset 2: QvUserPresets.import: 'name' not defined"},
        {"<UserPresets version=\"2.0\"><dict><key>presets</key><i32>2</i32></dict></UserPresets>", true, "",
         "'presets'"},
        {"<UserPresets version=\"2.0\"><dict><key>user</key><vec/></dict></UserPresets>", true, "",
         "'presets'"},
        {"<userprofiles version=\"1.6\"><dict><key>presets</key><vec/></dict></userprofiles>", true, "",
         "'user'"},
        {older("<dict>" + text("name", "x") + "</dict>"), true, "", "'params' not defined"},
        {"<BatchList version=\"2.0\"><dict><key>presets</key><vec/></dict></BatchList>", false, "",
         "'BatchList'"},
        {"<UserPresets", false, "", "Error in xml file"},
        {"", false, "", "Error in xml file"},
    };
    presets_.set("Old", QvPreset(QvProfile::raw, "Old"));
    for (const auto& row : rows) {
        SCOPED_TRACE(row.document);
        log_.clear();
        if (row.asserts)
            EXPECT_THROW(load(presets_, row.document, 0), QvAssertFailure);
        else
            EXPECT_EQ(load(presets_, row.document, 0), -1);
        EXPECT_TRUE(log_.contains(row.assertion));
        EXPECT_EQ(names(presets_), "Old|");
        EXPECT_TRUE(presets_.modified());
        EXPECT_THAT(QvUserPresets::check(Any(folder_.file("p.xml").c_str())), testing::HasSubstr(row.said));
    }
    EXPECT_EQ(presets_.load(Any("/none/x.xml"), 0), -1);
    EXPECT_EQ(load(presets_, current(""), 0), 0);
    EXPECT_EQ(QvUserPresets::check(Any(folder_.file("p.xml").c_str())), "");
    EXPECT_EQ(presets_.count(), 0);
}

TEST_F(UserPresets, OlderFormIsLifted) {
    install({"h264venc", "vc1venc", "dv100venc", "ddproaenc", "mptsmux", "mp4mux", "asfmux", "dv100mux"});
    const std::string file = older(
        olderPreset("Card", number("origProfile", 14) + part("video", "stdh264venc", number("type", 14)) +
                                part("audio", "ddaenc") + part("mux", "mpegtsmux")) +
        olderPreset("Dict", number("origProfile", 18) +
                                part("video", "stdvc1venc", dict("settingsDict", number("video_type", 5))) +
                                part("mux", "mp4mux")) +
        olderPreset("Tape", number("origProfile", 19) +
                                part("video", "dvvenc", entry("settings", "<gen>03 00 00 00 </gen>")) +
                                part("mux", "dvmux")) +
        rawPreset("Raw"));
    int version = 0;
    ASSERT_EQ(load(presets_, file, 0, &version), 0);
    EXPECT_EQ(version, 1);
    EXPECT_EQ(names(presets_), "Card|Dict|Tape|Raw|");
    const QvPreset card = presets_.get("Card");
    EXPECT_STREQ(card.symbol(), "AVCHD");
    EXPECT_STREQ(presets_.get("Dict").symbol(), "VC1_HIGH");
    EXPECT_STREQ(presets_.get("Tape").symbol(), "DVCPRO50");
    EXPECT_STREQ(presets_.get("Raw").symbol(), "RAW");
    const auto at = [&](const char* path) {
        const Any* const value = card.descendant("%s", path);
        return value ? *value : Any();
    };
    EXPECT_EQ(at("muxer.name"), "mptsmux");
    EXPECT_EQ(at("muxer.profile"), card.profile());
    EXPECT_EQ(at("streams.0.type"), 1);
    EXPECT_EQ(at("streams.0.codec.name"), "h264venc");
    EXPECT_EQ(at("streams.0.codec.profile"), card.profile());
    EXPECT_TRUE(at("streams.0.stream").isDict());
    EXPECT_EQ(at("streams.1.type"), 2);
    EXPECT_EQ(at("streams.1.codec.name"), "ddproaenc");
    EXPECT_EQ(presets_.get("Dict").getVector("streams").size(), 1);
    EXPECT_STREQ(presets_.get("Tape").muxerParams().getString("name"), "dv100mux");
    EXPECT_TRUE(log_.contains("user preset 'Raw' 1.6->2.0 convert - switching profile from NONE(0) to RAW "));
    EXPECT_TRUE(presets_.get("Raw").isValid());
    // Module names may be wide text.
    std::string wide = older(rawPreset("Wide"));
    for (const std::string from = "<str>rawvenc</str>", to = "<wstr>rawvenc</wstr>";
         wide.find(from) != std::string::npos;)
        wide.replace(wide.find(from), from.size(), to);
    ASSERT_EQ(load(presets_, wide, QvUserPresets::keep), 0);
    EXPECT_STREQ(presets_.get("Wide").symbol(), "RAW");
    EXPECT_TRUE(presets_.get("Wide").isValid());
    // The names that are in use count as in the current form.
    ASSERT_EQ(load(presets_, older(rawPreset("Raw")), QvUserPresets::keep), 0);
    EXPECT_TRUE(presets_.contains("Raw (1)"));
}

TEST_F(UserPresets, OlderFormSkipsWhatCanNotBeLifted) {
    const std::string video = part("video", "rawvenc"), mux = part("mux", "rawmux");
    const std::string file = older(
        "<i32>7</i32>" + olderPreset("Alien", number("origProfile", 14) + part("video", "alienenc") + mux) +
        olderPreset("Gone", number("origProfile", 14) + part("video", "h264venc", number("type", 0)) + mux) +
        olderPreset("NoMux", number("origProfile", 0) + video + dict("mux", text("codec", "rawmux"))) +
        olderPreset("Empty", number("origProfile", 0) + dict("video", text("codec", "rawvenc")) + mux) +
        olderPreset("Text", text("origProfile", "x") + video + mux) + "<dict>" + dict("params", video) +
        "</dict>");
    EXPECT_EQ(load(presets_, file, 0), -1) << "an element is no preset";
    EXPECT_EQ(names(presets_), "Gone|Text|");
    EXPECT_TRUE(presets_.get("Gone").isDisabled());
    EXPECT_FALSE(presets_.get("Text").isDisabled());
    EXPECT_TRUE(log_.contains("Skipping preset, it is no dictionary", QvLogMask::error));
    EXPECT_TRUE(
        log_.contains("Skipping preset 'Alien , base profile H264(14) not available.", QvLogMask::debug));
    EXPECT_TRUE(log_.contains("Disabled preset 'Gone', base profile H264_BASELINE (", QvLogMask::warning));
    EXPECT_TRUE(log_.contains("Skipping preset 'NoMux', muxer record not present", QvLogMask::error));
    EXPECT_TRUE(
        log_.contains("Skipping preset 'Empty', no video or audio records found.", QvLogMask::warning));
}

TEST_F(UserPresets, CheckedPresetsAreDescribedRemovedAndSubstituted) {
    install({"bch264venc", "mp4mux"});
    const int profile = qvSymToProfile("H264_HIGH");
    QvPreset other(profile, "Other");
    other.set("streams", AnyVector(Any(AnyDict("type", 1, "codec", Any(AnyDict("name", "h264venc"))))));
    presets_.append(QvPreset(QvProfile::raw, "Good"));
    presets_.append(other);
    presets_.append(QvPreset(qvSymToProfile("AVS"), "Bad"));
    const auto codec = [&] { return *presets_.get("Other").descendant("streams.0.codec.name"); };
    const auto described = [&](const char* name) { return presets_.get(name).info().isText(); };
    presets_.setModified(false);
    EXPECT_EQ(presets_.checkPresets(0), 1);
    EXPECT_TRUE(presets_.modified() && described("Good") && !described("Bad") && codec() == "h264venc");
    presets_.setModified(false);
    EXPECT_EQ(presets_.checkPresets(0), 1);
    EXPECT_FALSE(presets_.modified()) << "nothing was left to change";
    presets_.checkPresets(QvUserPresets::describeInvalid);
    EXPECT_TRUE(described("Bad"));
    presets_.checkPresets(QvUserPresets::substituteModules);
    EXPECT_EQ(codec(), "bch264venc");
    EXPECT_TRUE(
        log_.contains("User preset 'Other': substituting non existing 'h264venc' for existing 'bch264venc'",
                      QvLogMask::debug));
    presets_.checkPresets(QvUserPresets::removeInvalid);
    EXPECT_EQ(names(presets_), "Good|Other|");
}

}  // namespace
