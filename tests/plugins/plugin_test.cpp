// Plug-in files loaded by the shared library, as an application does it.

#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvbuffer.h"
#include "tests/support/checks.h"

namespace {

namespace fs = std::filesystem;

struct Plugins : testing::Test {
    Plugins() {
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

TEST_F(Plugins, BadFilesLeaveNothingButALine) {
    const struct {
        const char *file, *line;  // line null: no error is told
    } cases[] = {
        {"noentry_plugin.so", "Loaded %s, failed to initialize"},
        {"throwing_plugin.so", "Loaded %s, failed to initialize"},
        {"declining_plugin.so", nullptr},
        {"needy_plugin.so", "libqvtestdependency.so"},  // stays behind
        {"text_plugin.so", "Failed to load %s"},
        {"absent_plugin.so", "Failed to load %s"},
    };
    folder.write("text_plugin.so", "this is no library\n");
    for (int i = 0; i < 4; ++i) bring(cases[i].file);
    for (const auto& c : cases) {
        SCOPED_TRACE(c.file);
        log.clear();
        const std::string file = folder.file(c.file);
        EXPECT_EQ(load(file), -2);
        EXPECT_EQ(log.count("", QvLogMask::error) > 0, c.line != nullptr);
        EXPECT_TRUE(!c.line || log.contains(Any::sprintf(c.line, file.c_str()).asString(), QvLogMask::error));
        EXPECT_FALSE(isMapped(file));
    }
    EXPECT_EQ(registry.nrPlugins(), 1);
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
