#include "core/engine/modules/qvregistry.h"

#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/builtinplugin_p.h"
#include "core/engine/modules/init.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"

namespace {

int alive = 0;

struct Unwilling : FakeVideoFilter {
    Unwilling() { ++alive; }
    ~Unwilling() override { --alive; }
    int init() override { return -1; }
};

class TestModule : public QvModule {
  public:
    TestModule(int type, const char* name, const AnyDict& attributes = AnyDict(),
               QvCodec* (*make)() = nullptr)
        : QvModule(type, name, "for a test", name), make_(make) {
        setAttrs(attributes);
    }
    QvCodec* create() override { return make_ ? _setAttrs(make_()) : nullptr; }

  private:
    QvCodec* (*make_)();
};

template <class Codec>
QvCodec* make() {
    return new Codec;
}

// Registers nothing but its own plug-in, and leaves an empty registry.
class Registry : public testing::Test {
  protected:
    Registry() { registry.cleanup(); }
    ~Registry() override {
        registry.cleanup();
        registry.setConfig(AnyDict());
    }
    TestModule* add(int type, const char* name, const AnyDict& attributes = AnyDict(),
                    QvCodec* (*maker)() = nullptr) {
        auto* module = new TestModule(type, name, attributes, maker);
        plugin.addModule(module);
        return module;
    }
    Any decodersFor(const char* ext) const { return registry.decoders(ext).join(", "); }

    QvRegistry& registry = *qv_registry();
    QvPlugin plugin{"tests", "Modules of a test"};
};

TEST_F(Registry, AddsAPlugin) {
    add(2, "one");
    EXPECT_EQ(registry.addPlugin(&plugin), 0);
    EXPECT_EQ(registry.nrPlugins(), 1);
    EXPECT_EQ(registry.module("one")->plugin(), &plugin);
    for (int outside : {-1, 1, 2147483647})
        EXPECT_TRUE(!registry.plugin(outside) && !registry.module(outside) && !plugin.module(outside));
    EXPECT_TRUE(!registry.plugin("other") && !registry.plugin(static_cast<const char*>(nullptr)));
    EXPECT_EQ(failureOf([&] { registry.addPlugin(nullptr); }), "invalid ptr");
}

TEST_F(Registry, EarlierPluginsHideLaterOnes) {
    QvPlugin later("later", "Later");
    QvModule* const first = add(12, "scaler");
    add(0, "untyped")->setAttr("type", "text");
    later.addModule(new TestModule(12, "scaler", AnyDict("mine", 1)));
    later.addModule(new TestModule(2, "other"));
    registry.addPlugin(&plugin);
    registry.addPlugin(&later);
    for (const char* name : {"scaler", "colorconv", "scaler2"})
        EXPECT_EQ(registry.module(name), first) << name;
    EXPECT_EQ(registry.module("scaler3"), nullptr);
    EXPECT_TRUE(registry.nrModules(0) == 4 && registry.nrModules(2) == 1);
    EXPECT_STREQ(registry.module(3)->name(), "other");
    EXPECT_EQ(registry.moduleDefaults("scaler")->getInt32("mine"), 1);  // the later snapshot wins
    EXPECT_TRUE(registry.isOverriden(first));
    const auto names = [](const AnyVector& modules) {
        AnyVector all;
        for (const Any& row : modules) all.append(row.asDict().get("name"));
        return all.join(" ");
    };
    EXPECT_EQ(names(registry.modules(0)), "scaler untyped scaler other");
    EXPECT_EQ(names(registry.modules(AnyVector())), "scaler untyped scaler other");
    EXPECT_EQ(names(registry.modules(AnyVector(2, 99, "text"))), "other");
    EXPECT_EQ(registry.modules(12)[0].asDict().get("module").asGeneric(nullptr), first);
    registry.cleanup();
}

TEST_F(Registry, MakesCodecs) {
    add(12, "good", AnyDict(), make<FakeVideoFilter>);
    add(12, "bad", AnyDict(), make<Unwilling>);
    add(12, "none");
    registry.addPlugin(&plugin);
    const std::unique_ptr<QvCodec> codec(registry.newCodec("good"));
    ASSERT_TRUE(codec);
    EXPECT_TRUE(codec->getState() == QvCodec::stateInitialised && codec->getAttr("type") == 12);
    for (const char* name : {"bad", "none", "absent", static_cast<const char*>(nullptr)})
        EXPECT_EQ(registry.newCodec(name), nullptr);
    EXPECT_TRUE(alive == 0 && registry.module("bad")->codecList().empty());
}

TEST_F(Registry, DecodersComeBestFirst) {
    add(2, "low", AnyDict("exts", AnyVector("avi", "mov"), "priority", 20));
    add(2, "any", AnyDict("exts", AnyVector(Any("*")), "priority", -95));  // 6 for every file
    add(2, "late any", AnyDict("exts", AnyVector(Any("*"))));              // 200
    add(2, "named any", AnyDict("exts", AnyVector("*", "mov"), "priority", 20));
    add(2, "default", AnyDict("exts", AnyVector(Any("avi"))));  // 99
    add(2, "text", AnyDict("exts", AnyVector(Any("avi")), "priority", "1"));
    add(2, "off", AnyDict("exts", AnyVector(Any("avi")), "priority", 1, "disabled", 1));
    add(2, "oddly on", AnyDict("exts", AnyVector(Any("avi")), "priority", 30, "disabled", "yes"));
    add(2, "skip", AnyDict("exts", AnyVector(Any("avi")), "priority", 1, "skipAuto", 1));
    add(2, "never", AnyDict("exts", AnyVector(Any("avi")), "priority", 666));
    add(2, "huge", AnyDict("exts", AnyVector(Any("*")), "priority", 2147483647));
    add(2, "none");
    add(12, "filter", AnyDict("exts", AnyVector(Any("avi")), "priority", 1));
    registry.addPlugin(&plugin);
    EXPECT_EQ(decodersFor("avi"), "any, low, oddly on, default, text, named any, late any");
    EXPECT_EQ(decodersFor("mov"), "any, low, named any, late any");
    EXPECT_EQ(decodersFor("AVI"), "any, named any, late any");
    EXPECT_EQ(decodersFor(nullptr), "any, named any, late any");
    EXPECT_TRUE(registry.isModuleEnabled("oddly on"));
    EXPECT_FALSE(registry.isModuleEnabled("off") || registry.isModuleEnabled("absent"));
}

TEST_F(Registry, OverridesGoOutAndIn) {
    QvModule* a = add(2, "a", AnyDict("priority", 10));
    QvModule* b = add(2, "b", AnyDict("priority", 10));
    registry.addPlugin(&plugin);
    AnyDict overrides("stale", 1);
    registry.getModuleOverrides(overrides);
    EXPECT_TRUE(overrides.empty() && !registry.isOverriden(a));
    a->setAttr("priority", 5);
    a->setAttr("new", "x");
    registry.getModuleOverrides(overrides);
    EXPECT_EQ(overrides, AnyDict("a", AnyDict("priority", 5, "new", "x")));
    EXPECT_TRUE(registry.isOverriden(a) && !registry.isOverriden(b));
    a->setAttr("priority", 10);

    overrides.set("absent", AnyDict());
    overrides.set("b", 7);
    registry.setModuleOverrides(overrides);
    EXPECT_TRUE(a->getAttr("priority") == 5 && b->getAttr("priority") == 10);
}

TEST(Init, BringsTheBuiltinModulesUpAndDown) {
    const TempFolder folder;
    const std::string log = folder.file("log");
    const AnyDict config("logfile", log.c_str(), "userSettingsDir", folder.file("settings").c_str());
    QvRegistry& registry = *qv_registry();
    EXPECT_EQ(init_wrapper(&config), 0);
    EXPECT_EQ(init_wrapper(&config), 0);
    const int count = qvBuiltinPlugin()->nrModules();
    EXPECT_TRUE(registry.nrPlugins() == 1 && registry.nrModules(0) == count && count > 0);
    EXPECT_NE(TempFolder::read(log).find("containing " + std::to_string(count) + " module(s)"),
              std::string::npos);
    EXPECT_TRUE(std::filesystem::is_directory(folder.file("settings")));
    cleanup_wrapper();
    EXPECT_TRUE(registry.nrPlugins() == 0 && !registry.plugin("builtin") && registry.config().size() == 2);
    EXPECT_EQ(init_wrapper(nullptr), 0);
    EXPECT_EQ(registry.nrModules(0), count);
    EXPECT_FALSE(qv_dbg()->hasTarget());
    cleanup_wrapper();
    registry.setConfig(AnyDict());
}

// The record counts from its fourth word on.
TEST(QvRegistry, LendsItsExternalIO) {
    QvRegistry& registry = *qv_registry();
    int place = 0;
    QvExternalIO io;
    for (void*& word : io.words) word = &place;
    io.words[3] = nullptr;
    registry.setExternalDecoderIO(&io);
    EXPECT_EQ(registry.externalDecoderIO(), nullptr);
    io.words[3] = &io;
    registry.setExternalDecoderIO(&io);
    const QvExternalIO* const lent = registry.externalDecoderIO();
    ASSERT_TRUE(lent && lent != &io);
    EXPECT_TRUE(std::equal(std::begin(io.words), std::end(io.words), lent->words));
    registry.setExternalDecoderIO(nullptr);
    EXPECT_EQ(registry.externalDecoderIO(), nullptr);
}

TEST(Init, CallbackAndCleanup) {
    const TempFolder folder;
    LogCapture receiver;
    qv_dbg()->setLogger(nullptr);
    const AnyDict config("log_callback", static_cast<const void*>(static_cast<QvLogBase*>(&receiver)),
                         "userSettingsDir", folder.file("s").c_str());
    init_wrapper(&config);
    EXPECT_EQ(qv_registry()->logger(), &receiver);
    EXPECT_TRUE(receiver.contains("Using core library"));
    cleanup_wrapper();
    EXPECT_EQ(qv_dbg()->logger(), nullptr);
    qv_registry()->setConfig(AnyDict());
}

}  // namespace
