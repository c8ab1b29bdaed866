// Presets: kept for the user, brought from other places, and as what a job's output is to be.
#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

namespace fs = std::filesystem;
using nlohmann::json;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

class Presets : public Tool {
  protected:
    Presets() {
        fs::create_directory(folder.file("home"));
        setenv("HOME", folder.file("home").c_str(), 1);
        fs::create_directory(folder.file("plugins"));
        const fs::path plugin = folder.file("plugins/lines_plugin.so");
        fs::copy_file(QV_BINARY_DIR "/plugins/lines_plugin.so", plugin);
        fs::permissions(plugin, fs::perms{0755});
        fs::permissions(plugin.parent_path(), fs::perms{0755});
        works({"presets"});  // the folder of the settings is there from now on
    }
    ~Presets() override { setenv("HOME", home_.c_str(), 1); }

    std::string store() const { return "home/.QVTarselSdk/presets.xml"; }
    std::set<std::string> own() const {
        std::set<std::string> names;
        for (const json& row : json::parse(works({"presets", "--json"}).out))
            if (row["own"].get<bool>()) names.insert(row["name"].get<std::string>());
        return names;
    }
    std::string plan(const Words& options) const {
        return works(Words{"transcode", "testgen:size=640x360,rate=50,duration=1", "--dry-run"} + options)
            .out;
    }
    // With the plug-in of this test alone, and without any.
    Words coded(const Words& words) const { return Words{"--no-plugins", "--plugins", "plugins"} + words; }
    Words bare(const Words& words) const { return Words{"--no-plugins"} + words; }

  private:
    std::string home_ = getenv("HOME") ? getenv("HOME") : "";
};

TEST_F(Presets, AreKeptRenamedAndRemoved) {
    works({"presets", "save", "Web", "--size", "320x180", "--samplerate", "48000"});
    EXPECT_THAT(
        works({"presets", "show", "WEB"}).out,
        AllOf(HasSubstr("width = 320"), HasSubstr("samplerate = 48000"), Not(HasSubstr("framerate"))));
    fails(2, {"presets", "save", "web"}, {"'Web'", "--overwrite"});
    works({"presets", "save", "web", "--overwrite", "--size", "160x90"});
    const json shown = json::parse(works({"presets", "show", "web", "--json"}).out);
    EXPECT_EQ(shown["name"], "Web");
    EXPECT_EQ(shown["settings"]["streams"][0]["codec"]["settingsDict"]["width"], 160);
    works({"presets", "save", "Loud", "--preset", "avi_raw", "--bits", "24"});
    works({"presets", "rename", "web",
           "Gr\xC3\xB6\xC3\x9F"
           "e"});
    EXPECT_EQ(own(), (std::set<std::string>{"Gr\xC3\xB6\xC3\x9F"
                                            "e",
                                            "Loud"}));
    const struct {
        int status;
        Words words, parts;
    } rows[] = {
        {2,
         {"presets", "rename", "loud",
          "Gr\xC3\xB6\xC3\x9F"
          "e"},
         {"--overwrite"}},
        {2, {"presets", "rename", "loud", "avi_raw"}, {"'Uncompressed AVI'"}},
        {2, {"presets", "save", "H.264 high"}, {"'H.264 High'"}},
        {2, {"presets", "save", "a\nb"}, {"one line"}},
        {2, {"presets", "save", "stray\xFF"}, {"one line"}},
        {2, {"presets", "save", "control\xC2\x9B"}, {"one line"}},
        {2, {"presets", "save", "backwards\xE2\x80\xAE"}, {"one line"}},
        {2, {"presets", "rename", "loud", std::string(201, 'x')}, {"200 bytes"}},
        {2, {"presets", "save", " x"}, {"blanks"}},
        {2, {"presets", "save", " "}, {"blanks"}},
        {2, {"presets", "save"}, {"presets save", "one NAME"}},
        {2, {"presets", "save", "x", "--size", "0x0"}, {"--size"}},
        {2, {"presets", "save", "x", "--muxer", "rawavimux"}, {"rawmux"}},
        {2, {"presets", "remove", "RAW"}, {"'RAW/YUV'", "built in"}},
        {2, {"presets", "remove", "Loudd"}, {"did you mean 'Loud'?"}},
        {2, {"presets", "show", "AVI_RAV"}, {"did you mean 'AVI_RAW'?"}},
        {5, bare({"presets", "show", "h264_high"}), {"'H.264 High'", "h264venc"}},
        {2, {"presets", "export", "Loud"}, {"-o FILE"}},
    };
    const std::string before = contents(store());
    for (const auto& row : rows) fails(row.status, row.words, row.parts);
    EXPECT_EQ(contents(store()), before);
    works({"presets", "remove", "LOUD"});
    EXPECT_EQ(own().size(), 1u);
}

TEST_F(Presets, RunsThatSaveAtOnceLoseNone) {
    std::vector<std::unique_ptr<Process>> runs;
    std::set<std::string> names;
    for (int i = 0; i < 20; ++i) {
        names.insert("P" + std::to_string(i));
        runs.push_back(std::make_unique<Process>(
            words({"presets", "save", "P" + std::to_string(i), "--channels", "1"}), here()));
    }
    for (auto& run : runs) EXPECT_EQ(run->finish().status, 0);
    EXPECT_EQ(own(), names);
    EXPECT_EQ(size(store() + ".new"), -1);
}

// A file that is linked to from elsewhere stays where it is; a damaged one is neither used nor replaced.
TEST_F(Presets, TheStoreIsTreatedWithCare) {
    const std::string place = folder.file(store());
    folder.write("mine.xml", "");
    fs::remove(folder.file("mine.xml"));
    fs::create_symlink(folder.file("mine.xml"), place);
    works({"presets", "save", "Web", "--channels", "1"});
    EXPECT_TRUE(fs::is_symlink(place));
    fs::permissions(folder.file("mine.xml"), fs::perms{0600});
    works({"presets", "save", "Net", "--channels", "1"});
    EXPECT_EQ(fs::status(folder.file("mine.xml")).permissions(), fs::perms{0600});
    EXPECT_EQ(own().size(), 2u);
    folder.write("mine.xml", "<UserPresets");
    for (const Words& words : {Words{"presets"}, Words{"presets", "save", "More"},
                               Words{"transcode", "testgen", "-o", "x.raw", "--preset", "Web"}})
        fails(3, words, {"presets.xml'"});
    EXPECT_EQ(contents("mine.xml"), "<UserPresets");
}

TEST_F(Presets, ComeFromFilesOfBothForms) {
    works({"presets", "save", "Web", "--size", "320x180"});
    works({"presets", "save", "Net", "--size", "160x90"});
    const Outcome wrote = works({"presets", "export", "web", "NET", "-o", "both.xml"});
    EXPECT_THAT(wrote.err, HasSubstr("2 presets"));
    fails(4, {"presets", "export", "web", "-o", "both.xml"}, {"'both.xml'"});
    works({"presets", "remove", "Net"});
    EXPECT_THAT(works({"presets", "import", "both.xml"}).err,
                AllOf(HasSubstr("'Web' renamed to 'Web (1)'"), HasSubstr("imported 2 of 2")));
    EXPECT_THAT(works({"presets", "import", "both.xml", "--overwrite"}).err, HasSubstr("'Web' replaced"));
    EXPECT_EQ(own(), (std::set<std::string>{"Web", "Web (1)", "Net"}));
    const std::string part = "<key>name</key><str>",
                      params = "</str><key>params</key><dict><key>origProfile</key><i32>0</i32>";
    const auto module = [](const std::string& kind, const std::string& name) {
        return "<key>" + kind + "</key><dict><key>codec</key><str>" + name +
               "</str><key>state</key><dict><key>name</key><str>" + name + "</str></dict></dict>";
    };
    const auto older = [&](const std::string& name, const std::string& video) {
        return "<dict>" + part + name + params + module("video", video) + module("mux", "rawmux") +
               "</dict></dict>";
    };
    folder.write("old.xml", "<userprofiles version=\"1.6\"><dict><key>user</key><vec>" +
                                older("Old", "rawvenc") + older("RAW", "rawvenc") +
                                older("Alien", "alienenc") + "</vec></dict></userprofiles>");
    EXPECT_THAT(
        works(bare({"presets", "import", "old.xml"})).err,
        AllOf(HasSubstr("'Old' converted to the profile RAW"), HasSubstr("'RAW' renamed to 'RAW (1)'"),
              HasSubstr("kipping preset 'Alien"), HasSubstr("imported 2 of 3")));
    EXPECT_THAT(works({"presets", "check"}).err, HasSubstr("5 presets"));
    folder.write(
        "bad.xml",
        "<UserPresets version=\"2.0\"><dict><key>presets</key><vec><i32>1</i32></vec></dict></UserPresets>");
    const std::string before = contents(store());
    fails(3, {"presets", "import", "bad.xml"}, {"'bad.xml'", "preset 1"});
    fails(3, {"presets", "check", "none.xml"}, {"'none.xml'"});
    EXPECT_EQ(contents(store()), before);
}

// What nobody can name or see is not kept, and what is left out is said.
TEST_F(Presets, FilesOfOthersAreTakenWithCare) {
    const auto text = [](const std::string& key, const std::string& value) {
        return "<key>" + key + "</key><str>" + value + "</str>";
    };
    const auto number = [](const std::string& key, int value) {
        return "<key>" + key + "</key><i32>" + std::to_string(value) + "</i32>";
    };
    const auto preset = [](const std::string& name, const std::string& entries) {
        return "<Preset version=\"2.0\" name=\"" + name + "\">" + entries + "</Preset>";
    };
    const auto current = [](const std::string& presets) {
        return "<UserPresets version=\"2.0\"><dict><key>presets</key><vec>" + presets +
               "</vec></dict></UserPresets>";
    };
    constexpr int raw = 0x216000F;
    const std::string shown = number("profile", raw) + text("info", "one\xC2\x9B\ntwo\xE2\x80\xAE");

    // The store may have been written by hand: what is in it is the user's, whatever it says.
    folder.write(store(), current(preset("Mine", number("custom", 0) + shown) +
                                  preset("Far", number("custom", 0) + number("profile", 77))));
    const Outcome checked = tarsel({"presets", "check"});
    EXPECT_EQ(checked.status, 5);
    EXPECT_THAT(checked.err, AllOf(HasSubstr("'Far': "), HasSubstr("1 of them")));
    EXPECT_THAT(works({"presets"}).out, HasSubstr(" one  two \n"));
    EXPECT_THAT(works({"presets", "show", "Mine"}).out, HasSubstr(" one  two \n"));
    works({"presets", "rename", "Mine", "Yours"});
    EXPECT_EQ(own(), (std::set<std::string>{"Yours", "Far"}));

    // The reason does not repeat the name.
    folder.write(store(), current(preset("Web", number("profile", raw) +
                                                    "<key>muxer</key><dict/><key>streams</key><vec/>")));
    EXPECT_THAT(tarsel({"presets", "check"}).err, HasSubstr("'Web': cannot restore - muxer"));

    fs::remove(folder.file(store()));
    folder.write("names.xml", current(preset(" a\xC2\x9B"
                                             "b ",
                                             shown) +
                                      preset(std::string(300, 'x'), shown) + preset("\xE2\x80\xAE", shown)));
    EXPECT_THAT(works({"presets", "import", "names.xml"}).err, HasSubstr("imported 3 of 3"));
    EXPECT_EQ(own(), (std::set<std::string>{"a b", std::string(200, 'x'), "preset"}));

    const auto part = [&](const std::string& kind, const std::string& module) {
        return "<key>" + kind + "</key><dict>" + text("codec", module) + "<key>state</key><dict>" +
               text("name", module) + "</dict></dict>";
    };
    folder.write("old.xml", "<userprofiles version=\"1.6\"><dict><key>user</key><vec><i32>7</i32><dict>" +
                                text("name", "Gone") + "<key>params</key><dict>" + number("origProfile", 14) +
                                part("video", "h264venc") + part("mux", "rawmux") +
                                "</dict></dict></vec></dict></userprofiles>");
    EXPECT_THAT(works(bare({"presets", "import", "old.xml"})).err,
                AllOf(HasSubstr("'Gone' is hidden"), HasSubstr("kipping preset, it is no dictionary"),
                      HasSubstr("imported 1 of 2")));
    EXPECT_THAT(works(bare({"presets"})).out, Not(HasSubstr("Gone")));
    const Outcome lost = tarsel(bare({"presets", "check", "old.xml"}));
    EXPECT_THAT(lost.err, AllOf(HasSubstr("kipping preset, it is no dictionary"), HasSubstr("2 of them")));
    EXPECT_EQ(lost.status, 5);
    // A store of the older form is not written anew without what can't be read of it.
    fs::copy_file(folder.file("old.xml"), folder.file(store()), fs::copy_options::overwrite_existing);
    fails(3, {"presets", "save", "Web"}, {"presets.xml'", "kipping preset"});
    EXPECT_EQ(contents(store()), contents("old.xml"));

    // A folder that can't be made is named itself.
    folder.write("plain", "");
    setenv("HOME", folder.file("plain").c_str(), 1);
    fails(4, {"presets", "save", "Web"}, {"plain/.QVTarselSdk': "});
}

TEST_F(Presets, GiveAnOutputWhatTheOptionsLeaveOpen) {
    works({"presets", "save", "Web", "--size", "320x180", "--rate", "25", "--pixel", "UYVY", "--channels",
           "1"});
    EXPECT_THAT(plan({"-o", "x.raw", "--preset", "web"}),
                AllOf(HasSubstr("320x180 UYVY 25\n"), HasSubstr("44100 Hz, 1 ch")));
    EXPECT_THAT(plan({"-o", "x.raw", "--preset", "web", "--size", "64x48", "--channels", "2"}),
                AllOf(HasSubstr("64x48 UYVY 25\n"), HasSubstr("44100 Hz, 2 ch")));
    EXPECT_THAT(plan({"-o", "x.raw", "--preset", "web", "--match"}), HasSubstr("640x360 UYVY 50\n"));
    EXPECT_THAT(plan({"-o", "x.raw", "--preset", "web", "--match", "--cut", "0.5-1", "--cut", "0-0.5"}),
                HasSubstr("640x360 UYVY 50\n"));
    EXPECT_THAT(plan({"-o", "x.yuv", "--preset", "web"}), HasSubstr("320x180 I420 25\n"));
    // What names no preset is as it was, and so is one that asks for nothing.
    EXPECT_EQ(plan({"-o", "x.raw", "--preset", "raw"}), plan({"-o", "x.raw"}));
    EXPECT_EQ(plan({"-o", "x.avi", "--preset", "uncompressed avi"}), plan({"-o", "x.avi"}));
    works({"presets", "save", "Quiet", "--no-audio"});
    const Outcome silent =
        works({"transcode", "testgen:size=64x48,duration=0.2", "-o", "s.raw", "--preset", "Quiet"});
    EXPECT_THAT(silent.err, HasSubstr("'Quiet' has no sound"));
    EXPECT_EQ(size("s.wav"), -1);
    refuses({"transcode", "testgen", "-o", "y.raw"},
            {{{"--match"}, {"--preset"}},
             {{"--preset", "Wbe"}, {"did you mean 'Web'?"}},
             {{"--preset", "avi_raw"}, {"'y.raw'", "'Uncompressed AVI'"}},
             {{"--preset", "Web", "--muxer", "rawavimux"}, {"rawmux"}}});
    // A task has the settings, not the name: it does the same when the preset has gone.
    const Words job = {
        "transcode", "testgen:size=640x360,rate=50,duration=1", "--preset", "web", "--save-task", "t.xml"};
    works(job + Words{"-o", "a.raw"});
    works({"transcode", "testgen:size=640x360,rate=50,duration=1", "--preset", "web", "--cut", "0-0.2",
           "--cut", "0.4-0.6", "-o", "c.raw"});
    EXPECT_EQ(size("c.raw"), 10LL * 320 * 180 * 2);
    works({"presets", "remove", "web"});
    works({"run", "t.xml", "-o", "b.raw"});
    EXPECT_EQ(contents("a.raw").size(), size_t{25} * 320 * 180 * 2);
    EXPECT_TRUE(contents("a.raw") == contents("b.raw") && contents("a.wav") == contents("b.wav"));
}

TEST_F(Presets, OneWithoutStreamsWritesNothing) {
    works({"presets", "save", "Bare", "--no-video", "--no-audio"});
    fails(2, {"transcode", "testgen:duration=0.1", "--preset", "bare", "-o", "x.raw"},
          {"the preset 'Bare' has neither picture nor sound", "'x.raw'"});
}

TEST_F(Presets, LightUpWithTheModulesOfPlugins) {
    const auto names = [&](const Words& words) {
        std::set<std::string> all;
        for (const json& row : json::parse(works(words).out))
            if (!row.contains("waits_for")) all.insert(row["symbol"].get<std::string>());
        return all;
    };
    EXPECT_EQ(names(bare({"presets", "list", "--all", "--json"})), (std::set<std::string>{"RAW", "AVI_RAW"}));
    const auto lit = names(coded({"presets", "--json"}));
    EXPECT_TRUE(lit.contains("H264_HIGH") && !lit.contains("MPEG2_MAIN"));
    EXPECT_EQ(json::parse(works(bare({"presets", "--all", "--json"})).out).size(), 98u);
    const Words job = {"transcode", "testgen:size=640x360,rate=50,duration=0.2", "--no-audio"};
    fails(5, bare(job + Words{"-o", "clip.h264"}), {"'clip.h264'", "presets list --all"});
    // By its extension, in the format of the input; by its name, in the encoder's own.
    works(coded(job + Words{"-o", "x.h264", "--preset", "h264_high"}));
    EXPECT_EQ(contents("x.h264"), "320x240\n320x240\n320x240\n320x240\n320x240\n");
    works(coded(job + Words{"-o", "y.h264"}));
    EXPECT_EQ(contents("y.h264").size(), 10 * std::strlen("640x360\n"));
    EXPECT_EQ(contents("y.h264").substr(0, 8), "640x360\n");
    works(coded(job + Words{"-o", "m.h264", "--preset", "h264_high", "--match"}));
    EXPECT_EQ(contents("m.h264"), contents("y.h264"));
    works(coded(job + Words{"-o", "z.h264", "--preset", "h.264 main", "--size", "160x96"}));
    EXPECT_EQ(contents("z.h264").substr(0, 7), "160x96\n");
    for (const Words& options : {Words{"--size", "800x600"}, Words{"--rate", "30"}})
        failsAs(2, tarsel(coded(job + options + Words{"-o", "w.h264"})),
                {options[0], "'h264venc'", "--match"}, options[0]);
    fails(2, coded(job + Words{"-o", "w.yuv", "--preset", "h.264 main"}), {"'w.yuv'"});
    // The other multiplexer of an extension does where the first one is missing.
    EXPECT_THAT(works(coded(job + Words{"-o", "x.dv", "--dry-run"})).out, HasSubstr("dvmux"));
    // Both the preset's range and the encoder's hold.
    folder.write("ranges.xml",
                 "<UserPresets version=\"2.0\"><dict><key>presets</key><vec><Preset version=\"2.0\" "
                 "name=\"Narrow\"><key>custom</key><i32>1</i32><key>profile</key><i32>" +
                     std::to_string(0x2160003) +
                     "</i32><key>PresetMeta</key><dict><key>sizeRange</key><dict><key>wmin</key>"
                     "<i32>100</i32><key>wmax</key><i32>2000</i32></dict></dict></Preset></vec></dict>"
                     "</UserPresets>");
    works(coded({"presets", "import", "ranges.xml"}));
    const Words narrow = job + Words{"--preset", "narrow", "-o", "n.h264", "--size"};
    fails(2, coded(narrow + Words{"96x96"}), {"the preset 'Narrow'", "100x"});
    fails(2, coded(narrow + Words{"800x480"}), {"the encoder 'h264venc'", "720x576"});
    works(coded(narrow + Words{"160x96"}));
    works({"presets", "remove", "narrow"});
    works(coded({"presets", "save", "Small", "--preset", "h264_high", "--size", "64x48"}));
    works(coded(job + Words{"-o", "s.h264", "--preset", "small"}));
    EXPECT_EQ(contents("s.h264").substr(0, 6), "64x48\n");
    // A preset that was kept for one multiplexer is used with another one, if its base allows both.
    works(
        coded({"presets", "save", "Two", "--preset", "two ways", "--muxer", "rawavimux", "--size", "64x48"}));
    works(coded(job + Words{"-o", "two.avi", "--preset", "two"}));
    works(coded(job + Words{"-o", "two.raw", "--preset", "two", "--muxer", "rawmux", "--pixel", "UYVY"}));
    EXPECT_EQ(size("two.raw"), 10LL * 64 * 48 * 2);
    EXPECT_GT(size("two.avi"), 10LL * 64 * 48);
    works(coded({"presets", "save", "One", "--preset", "two", "--muxer", "rawmux"}));
    EXPECT_EQ(
        json::parse(works(coded({"presets", "show", "One", "--json"})).out)["settings"]["muxer"]["name"],
        "rawmux");
    EXPECT_THAT(works(coded({"presets", "show", "One"})).out, HasSubstr("0x2800010"));
    // A module that can stand in for a missing one.
    setenv("QV_LINES_NAME", "bch264venc", 1);
    EXPECT_THAT(works(coded({"presets"})).out, Not(HasSubstr("can't be used")));
    works(coded({"presets", "check"}));
    unsetenv("QV_LINES_NAME");
    for (const char* name : {"Two", "One"}) works({"presets", "remove", name});
    const Outcome gone = tarsel(bare({"presets", "check"}));
    EXPECT_EQ(gone.status, 5);
    EXPECT_THAT(gone.err, HasSubstr("ase profile 'H264_HIGH' not available - missing plugins?"));
    fails(5, bare(job + Words{"-o", "s.h264", "--preset", "small", "-y"}), {"'Small'", "missing plugins?"});
}

}  // namespace
