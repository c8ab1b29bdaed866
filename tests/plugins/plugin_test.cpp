// Plug-in files loaded by the shared library, as an application does it.
#include <link.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstddef>
#include <cstdlib>

#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvbuffer.h"
#include "core/preset/qvpresetmgr.h"
#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

struct Plugins : testing::Test {
    Plugins() {
        umask(022);  // a plug-in that a group may write is refused
        init_wrapper(nullptr);
        qv_dbg()->setLogger(&log);
    }
    ~Plugins() override {
        qv_dbg()->setLogger(&log);
        cleanup_wrapper();
    }
    // A copy of a built file in the test's folder; the full name.
    std::string bring(const std::string& file, const std::string& as = "") const {
        const fs::path to = folder.path() / (as.empty() ? file : as);
        fs::copy_file(fs::path(QV_PLUGIN_FOLDER) / file, to);
        fs::permissions(to, fs::perms{0755});  // whatever the build's are
        return to.string();
    }
    int load(const std::string& file) { return registry.loadPlugin(narrow(file)); }
    bool isMapped(const std::string& file) const {
        return TempFolder::read("/proc/self/maps").find(file) != std::string::npos;
    }

    TempFolder folder;
    LogCapture log;
    QvRegistry& registry = *qv_registry();
};

TEST_F(Plugins, ScanFindsModulesByExtensionNameAndKind) {
    const std::string file = bring("pcm8_plugin.so");
    EXPECT_EQ(registry.scanFolder(narrow(folder.path().string())), 0);
    EXPECT_TRUE(
        log.contains("[Registry] Loaded pcm8 (1.0 2025-03-01), containing 2 module(s)", QvLogMask::debug));
    QvPlugin* const plugin = registry.plugin("pcm8");
    ASSERT_TRUE(plugin && registry.nrPlugins() == 2);
    EXPECT_EQ(plugin->getAttr("filename"), file.c_str());
    EXPECT_EQ(registry.decoders("pcm8"), AnyVector(Any("pcm8dec")));
}

TEST_F(Plugins, DecoderAndFilterDoTheirWork) {
    load(bring("pcm8_plugin.so"));
    const std::string sound = folder.write("sound.pcm8", std::string("\x80\xFF\x01", 3));
    const std::unique_ptr<QvDecodePipe> decoder(QvDecFactory::decodePipe(narrow(sound)));
    ASSERT_TRUE(decoder);
    EXPECT_TRUE(decoder->nrSamples(0) == 3 && decoder->getAudioParam(0, "samplerate") == 8000);
    decoder->select(qvAudioStream, 0);
    EXPECT_EQ(decoder->readSamples(2, 0), 2);
    EXPECT_EQ(decoder->getAudioPtr(0)->ptr(1)[0], 0xFF);
    for (const int left : {1, -4}) EXPECT_EQ(decoder->readSamples(2, 0), left);

    const std::unique_ptr<QvCodec> codec(registry.newCodec("polarity"));
    ASSERT_TRUE(codec);
    auto* filter = static_cast<QvAudioFilter*>(codec->getInterface(QvModuleType::audioFilter));
    QvPcm pcm;
    pcm.init(2, 1, 4, 48000);
    const int values[] = {1000, -2147483647 - 1};
    pcm.write(2, reinterpret_cast<const unsigned char*>(values));
    ASSERT_TRUE(filter->write(pcm) == 0 && filter->samples() == 2);
    const auto* inverted = reinterpret_cast<const int*>(filter->pcm()->ptr(0));
    EXPECT_TRUE(inverted[0] == -1000 && inverted[1] == 2147483647);
}

TEST_F(Plugins, PresetsComeAndGoWithTheFile) {
    bring("presets_plugin.so");
    EXPECT_EQ(registry.scanFolder(narrow(folder.path().string())), 0);
    const QvPresetMgr& catalogue = *qvPresetMgr();
    ASSERT_EQ(catalogue.builtinPresets().size(), 5);
    EXPECT_STREQ(catalogue.builtinPreset(0).name(), "H.264 / SVC");
    EXPECT_TRUE(log.contains("[Preset] Plug-in 'presets': preset 2 left out"));
    EXPECT_EQ(catalogue.builtinGroups().findByName("Sound"), 2);
    EXPECT_EQ(catalogue.extendedGroups()[2].id(), 200);
    {
        const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        ASSERT_TRUE(pipe);
        EXPECT_STREQ(pipe->videoEncoder(0)->name(), "svcvenc");
        EXPECT_EQ(pipe->applyPreset(0x2800001, 0), 0) << pipe->errorDesc();
        EXPECT_TRUE(pipe->nrVideoStreams() == 0 && pipe->nrAudioStreams() == 1);
        const QvPreset preset(pipe.get(), "mine");
        EXPECT_EQ(preset.defaultMuxer(), "rawmux");
    }
    cleanup_wrapper();
    init_wrapper(nullptr);
    EXPECT_EQ(catalogue.findByProfile(0x2800001), -1);
}

TEST_F(Plugins, BadFilesLeaveALineAndAReason) {
    const char *const failed = "Failed to load %s", *const noStart = "Loaded %s, failed to initialize";
    const struct {
        const char *file, *line;  // line null: no error is logged
        QvPluginFault fault;
        const char* reason;
    } cases[] = {
        {"noentry_plugin.so", noStart, QvPluginFault::noEntry, "has no function plugin_init"},
        {"throwing_plugin.so", noStart, QvPluginFault::failed, "failed in its start"},
        {"declining_plugin.so", nullptr, QvPluginFault::declined, "declined to load"},
        {"needy_plugin.so", failed, QvPluginFault::unresolved,  // the library is not brought along
         "needs the library 'libqvtestdependency.so', which is not there"},
        {"unlinked_plugin.so", failed, QvPluginFault::foreign,
         "needs 'qvtest::formerly(int, char const*)', which no library here has"},
        {"foreign_plugin.so", "%s was built for version 2", QvPluginFault::otherAbi,
         "was built for version 2 of the plug-in interface; this engine has version 1"},
        {"half_plugin.so", failed, QvPluginFault::invalid, "is incomplete: it ends after 5000 bytes"},
        {"text_plugin.so", failed, QvPluginFault::invalid, "is not a shared library"},
        {"folder_plugin.so", failed, QvPluginFault::invalid, "is a folder"},
        {"absent_plugin.so", failed, QvPluginFault::unreadable, "does not exist"},
        {"unreadable_plugin.so", failed, QvPluginFault::unreadable, "can't be opened: Permission denied"},
    };
    folder.write("text_plugin.so", "this is no library\n");
    fs::create_directory(folder.file("folder_plugin.so"));
    fs::resize_file(bring("pcm8_plugin.so", "half_plugin.so"), 5000);
    fs::permissions(bring("pcm8_plugin.so", "unreadable_plugin.so"), fs::perms::none);
    for (int i = 0; i < 6; ++i) bring(cases[i].file);
    std::size_t failures = 0;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.file);
        const std::string file = folder.file(c.file);
        if (access(file.c_str(), R_OK) == 0 && c.file[0] == 'u') continue;  // root reads everything
        log.clear();
        for (int attempt = 0; attempt < 2; ++attempt) EXPECT_EQ(load(file), -2);
        EXPECT_EQ(log.count("", QvLogMask::error) > 0, c.line != nullptr);
        EXPECT_TRUE(!c.line || log.contains(Any::sprintf(c.line, file.c_str()).asString(), QvLogMask::error));
        EXPECT_FALSE(isMapped(file));
        ASSERT_EQ(registry.pluginFailures().size(), ++failures);
        const QvPluginFailure& failure = registry.pluginFailures().back();
        EXPECT_TRUE(failure.file == file.c_str() && failure.fault == c.fault);
        EXPECT_EQ(failure.reason, c.reason);
    }
    EXPECT_EQ(registry.nrPlugins(), 1);
    // What is mended is no failure any more.
    fs::remove(folder.file("text_plugin.so"));
    EXPECT_EQ(load(bring("pcm8_plugin.so", "text_plugin.so")), 0);
    EXPECT_EQ(registry.pluginFailures().size(), failures - 1);
    EXPECT_EQ(QvRegistry::loadingPlugin(), nullptr);
}

// Found in the file before its code runs; in a file without sections, after its static constructors.
TEST_F(Plugins, OneForAnotherEngineIsNotStarted) {
    const std::string file = bring("foreign_plugin.so");
    unsetenv("QV_FOREIGN_RAN");
    EXPECT_EQ(load(file), -2);
    EXPECT_EQ(getenv("QV_FOREIGN_RAN"), nullptr);

    std::string bytes = TempFolder::read(file);
    std::memset(&bytes[offsetof(ElfW(Ehdr), e_shoff)], 0, sizeof(ElfW(Ehdr)::e_shoff));
    std::memset(&bytes[offsetof(ElfW(Ehdr), e_shnum)], 0, sizeof(ElfW(Ehdr)::e_shnum));
    EXPECT_EQ(load(folder.write("bare_plugin.so", bytes)), -2);
    EXPECT_NE(getenv("QV_FOREIGN_RAN"), nullptr);
    ASSERT_EQ(registry.pluginFailures().size(), 2u);
    for (const auto& failure : registry.pluginFailures()) EXPECT_EQ(failure.fault, QvPluginFault::otherAbi);
    std::uint32_t number = 0;
    EXPECT_TRUE(qv_platform().libraryNumber(bring("pcm8_plugin.so").c_str(), "qv_plugin_abi", number));
    EXPECT_EQ(number, qvPluginAbi);
    for (const char* symbol : {"qv_plugin", "qv_plugin_abi_", "plugin_init", ""})
        EXPECT_FALSE(qv_platform().libraryNumber(file.c_str(), symbol, number)) << symbol;
}

TEST_F(Plugins, UnsafeFilesAndDependenciesAreRefusedUnlessAllowed) {
    const fs::perms all = fs::perms::others_write;
    const std::string file = bring("needy_plugin.so");
    fs::permissions(bring("libqvtestdependency.so"), all, fs::perm_options::add);
    EXPECT_EQ(load(file), -2);
    EXPECT_EQ(registry.pluginFailures().back().reason,
              "needs the library 'libqvtestdependency.so', which can be written to by other users");
    fs::permissions(file, all, fs::perm_options::add);
    EXPECT_EQ(registry.scanFolder(narrow(folder.path().string())), 0);
    EXPECT_EQ(registry.pluginFailures().back().fault, QvPluginFault::unsafe);
    EXPECT_EQ(registry.nrPlugins(), 1);
    registry.setConfig(AnyDict("allow_unsafe_plugins", 1));
    EXPECT_EQ(load(file), 0);
    EXPECT_TRUE(registry.pluginFailures().empty());
    registry.setConfig(AnyDict());
}

TEST_F(Plugins, ABadFileDoesNotStopTheScan) {
    folder.write("a_plugin.so", "no library");
    bring("noentry_plugin.so", "b_plugin.so");
    bring("pcm8_plugin.so", "c_plugin.so");
    bring("declining_plugin.so", "d_plugin.so");
    bring("pcm8_plugin.so", "other.so");
    EXPECT_EQ(registry.scanFolder(narrow(folder.path().string())), 0);
    EXPECT_EQ(registry.nrPlugins(), 2);
    EXPECT_FALSE(log.contains("other.so"));
}

TEST_F(Plugins, OwnFolderServesDependencies) {
    bring("libqvtestdependency.so");
    EXPECT_EQ(load(bring("needy_plugin.so")), 0);
    ASSERT_NE(registry.plugin("needy"), nullptr);
    EXPECT_EQ(registry.plugin("needy")->desc(), "needy from its own folder");
}

TEST_F(Plugins, LoadedOnce) {
    const std::string file = bring("pcm8_plugin.so"), link = folder.file("link_plugin.so");
    fs::create_symlink(file, link);
    for (const std::string& name : {file, file, link}) EXPECT_EQ(load(name), 0);
    EXPECT_EQ(log.count("[Registry] Already loaded, skipping", QvLogMask::debug), 2);
    EXPECT_TRUE(registry.nrPlugins() == 2 && registry.nrModules(0) == 46);
    EXPECT_EQ(registry.plugin("pcm8")->getAttr("filename"), file.c_str());
}

TEST_F(Plugins, ComesBackAfterCleanup) {
    const std::string file = bring("pcm8_plugin.so");
    for (int round = 0; round < 2; ++round) {
        EXPECT_EQ(load(file), 0);
        EXPECT_EQ(registry.plugin("pcm8")->nrModules(), 2);
        testing::internal::CaptureStderr();
        cleanup_wrapper();
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "unloading pcm8\npcm8 unloaded.\n");
        EXPECT_TRUE(registry.nrPlugins() == 0 && !registry.module("pcm8dec") && !isMapped(file));
        init_wrapper(nullptr);
    }
}

TEST_F(Plugins, CodecsOutliveCleanup) {
    const std::string file = bring("pcm8_plugin.so");
    load(file);
    std::unique_ptr<QvCodec> decoder(registry.newCodec("pcm8dec"));
    const std::unique_ptr<QvCodec> filter(registry.newCodec("polarity"));
    cleanup_wrapper();
    EXPECT_TRUE(log.contains("8-bit PCM import: *** 1 instances still alive", QvLogMask::warning));
    EXPECT_TRUE(log.contains("Invert polarity: *** 1 instances still alive", QvLogMask::warning));
    EXPECT_EQ(registry.nrPlugins(), 0);
    decoder.reset();
    EXPECT_EQ(filter->getParam("displayName"), "Invert polarity");
}

}  // namespace
