// Plug-ins that let their host down, through the tool.
#include <sys/stat.h>

#include "tests/system/tool.h"

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

class PluginTool : public Tool {
  protected:
    PluginTool() {
        umask(022);  // a plug-in that a group may write is refused
        fs::create_directory(folder.file("plugins"));
    }
    std::string bring(const std::string& file, const std::string& as) const {
        const std::string to = folder.file("plugins/" + as);
        fs::copy_file(fs::path(QV_PLUGIN_FOLDER) / file, to);
        fs::permissions(to, fs::perms{0755});
        return to;
    }
    // The whole of what a run says that reads a file of the one good plug-in.
    Outcome transcode(const Words& options = {}) const {
        folder.write("tone.pcm8", patternBytes(100));
        return tarsel(Words{"--plugins", "plugins"} + options +
                      Words{"transcode", "tone.pcm8", "-y", "-o", "tone.wav"});
    }
};

std::string notLoaded(const std::string& name, const std::string& reason) {
    return "tarsel: warning: the plug-in 'plugins/" + name + "_plugin.so' was not loaded: it " + reason +
           "\n";
}

// Outputs that need no plug-in, with one whose preset is the first of the list.
TEST_F(PluginTool, PresetsOfPluginsLeaveOtherOutputsAlone) {
    bring("pcm8_plugin.so", "good_plugin.so");
    bring("presets_plugin.so", "presets_plugin.so");
    const Outcome sound = transcode();
    EXPECT_EQ(sound.status, 0) << sound.err;
    for (const char* name : {"out.i420", "out.avi", "out.wav", "/dev/null"}) {
        const Outcome o = tarsel(
            {"--plugins", "plugins", "transcode", "testgen:size=64x48,rate=25,duration=1", "-y", "-o", name});
        EXPECT_EQ(o.status, 0) << name << ": " << o.err;
    }
}

TEST_F(PluginTool, NamesEachOneThatDoesNotLoadAndGoesOn) {
    bring("pcm8_plugin.so", "good_plugin.so");
    fs::resize_file(bring("pcm8_plugin.so", "a_plugin.so"), 40000);
    ASSERT_EQ(mkfifo(folder.file("plugins/b_plugin.so").c_str(), 0600), 0);
    fs::permissions(bring("pcm8_plugin.so", "f_plugin.so"), fs::perms{0757});
    folder.write("plugins/h\x1b[2J_plugin.so", "text");
    const std::string whole = "; replace it by a whole one for this machine, or remove it";
    const std::string safe =
        "; keep plug-ins where only you and root may write, or use --allow-unsafe-plugins";
    const std::string before = notLoaded("a", "is incomplete: it ends after 40000 bytes" + whole) +
                               notLoaded("b", "is a pipe" + whole);
    const std::string after = notLoaded("h\\x1b[2J", "is not a shared library" + whole);
    const std::string wrote = "tarsel: wrote 'tone.wav', 100 samples ";
    Outcome o = transcode();
    EXPECT_EQ(o.status, 0);
    EXPECT_EQ(o.err, before + notLoaded("f", "can be written to by other users" + safe) + after + wrote +
                         "(4 warnings)\n");
    o = transcode({"--allow-unsafe-plugins"});
    EXPECT_EQ(o.status, 0);
    EXPECT_EQ(o.err, before + after + wrote + "(3 warnings)\n");
}

// Anybody may add a file there, so all of them are refused: in one line.
TEST_F(PluginTool, NamesAnUnsafeFolderOnce) {
    bring("pcm8_plugin.so", "good_plugin.so");
    const std::string place = folder.file("plugins");
    fs::permissions(place, fs::perms{01777});
    const std::string why = "is in the folder '" + place +
                            "', to which other users may write; keep plug-ins where only you and root may "
                            "write, or use --allow-unsafe-plugins";
    Outcome o = transcode();
    EXPECT_EQ(o.status, 3);
    EXPECT_THAT(o.err, HasSubstr(notLoaded("good", why)));
    bring("pcm8_plugin.so", "other_plugin.so");
    bring("needy_plugin.so", "third_plugin.so");
    o = transcode();
    EXPECT_EQ(o.status, 3);
    EXPECT_EQ(o.err.rfind("tarsel: warning: 3 plug-ins of 'plugins' were not loaded: each " + why + "\n", 0),
              0u)
        << o.err;
    EXPECT_EQ(o.err.find("_plugin.so"), std::string::npos) << o.err;
}

TEST_F(PluginTool, SaysWhyAFolderGivesNone) {
    folder.write("file", "text");
    const struct {
        const char *folder, *reason;
    } cases[] = {{"nowhere", "no such folder; check its name and permissions"},
                 {"file/below", "not a directory; check its name and permissions"},
                 {"file", "this is no folder; check its name and permissions"},
                 {"plugins", "no file '*_plugin.so' was found there; check the folder's name"}};
    for (const auto& c : cases) {
        const Outcome o = tarsel({"--plugins", c.folder, "modules"});
        EXPECT_EQ(o.status, 0);
        EXPECT_EQ(o.err, std::string("tarsel: warning: no plug-ins were loaded from '") + c.folder +
                             "': " + c.reason + "\n");
    }
}

TEST_F(PluginTool, NamesTheOneThatEndsTheProgram) {
    bring("hostile_plugin.so", "x_plugin.so");
    const struct {
        const char *start, *why;
    } cases[] = {
        {"before main: exit", "it called exit()"},
        {"before main: crash", "it crashed"},
        {"before main: fault", "it crashed"},
        {"before main: overflow", "it crashed"},
        {"before main: abort", "it aborted"},
        {"before main: throw", "an exception left its start"},
        {"entry: exit", "it called exit()"},
        {"entry: crash", "it crashed"},
        {"entry: trap", "it crashed"},
        {"entry: quick_exit", "it called quick_exit()"},
        {"entry: system call", "it made a system call that is forbidden here"},
    };
    ProcessOptions options = here();
    for (const auto& c : cases) {
        options.environment = {std::string("QV_TEST_START=") + c.start};
        const Outcome o = tarsel({"--plugins", "plugins", "modules"}, options);
        EXPECT_EQ(o.status, 5) << c.start;
        EXPECT_EQ(o.out, "") << c.start;
        EXPECT_EQ(
            o.err,
            std::string("tarsel: the plug-in 'plugins/x_plugin.so' ended the program while it was loaded: ") +
                c.why + "; remove it, or get another version of it\n")
            << c.start;
    }
    options.environment = {"QV_TEST_START=entry: throw"};
    const Outcome o = tarsel({"--plugins", "plugins", "modules"}, options);
    EXPECT_EQ(o.status, 0);
    EXPECT_EQ(o.err, notLoaded("x", "failed in its start: no licence\\x1b[2J; ask its maker, or remove it"));
}

}  // namespace
