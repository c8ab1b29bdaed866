#include "core/engine/qvcodec.h"

#include <memory>

#include "core/engine/init.h"
#include "core/engine/qvmodule.h"
#include "core/engine/qvregistry.h"
#include "tests/support/checks.h"

namespace {

// Knows "gain" (Int32), "settings" (a Dict with "gain") and "late", with which it steps beyond the core's
// states.
class Gain : public QvCodec {
  public:
    using QvCodec::_raiseInvalidParam;
    using QvCodec::_setErr;
    using QvCodec::getParam;
    using QvCodec::setError;
    using QvCodec::setState;

    explicit Gain(const QvModule* module = nullptr) : QvCodec(module) {}
    int setParam(const char* name, const Any& value) override {
        if (name == Any("gain") && value.isInt32()) {
            _traceParam(name, value);
            gain_ = value.asInt32();
            return 0;
        }
        if (name == Any("fail")) return value.toInt32();
        if (name == Any("throw")) throw 1;
        if (name == Any("settings") && value.isDict()) return setParamDict(value.asDict());
        return QvCodec::setParam(name, value);
    }
    void getParam(const char* name, Any& value) const override {
        if (name == Any("gain")) value = gain_;
        if (name == Any("settings"))
            value = AnyDict("gain", gain_);
        else
            QvCodec::getParam(name, value);
    }
    int open() override { return 0; }
    int close() override { return 0; }
    void* getInterface(int) const override { return nullptr; }

  private:
    int gain_ = 0;
};

class GainModule : public QvModule {
  public:
    using QvModule::_setAttrs;
    GainModule() : QvModule(QvModuleType::audioFilter, "gain", "Gain", "Gain filter") {}
    QvCodec* create() override { return _setAttrs(new Gain); }
};

TEST(Codec, InitOnce) {
    Gain codec;
    EXPECT_EQ(codec.getState(), QvCodec::stateCreated);
    EXPECT_EQ(codec.init(), 0);
    EXPECT_EQ(codec.init(), -1);
    EXPECT_STREQ(codec.errorDesc(), "Already initialized");
    EXPECT_TRUE(codec.errorCode() == -1 && codec.getState() == QvCodec::stateInitialised);
    EXPECT_STREQ(codec.displayName(), "unnamed");
    EXPECT_THROW(codec.getAttr("type"), QvAssertFailure);
}

TEST(Codec, ErrorsKeepCodeAndText) {
    GainModule module;
    const std::unique_ptr<QvCodec> made(module.create());
    Gain& codec = static_cast<Gain&>(*made);
    LogCapture log;
    EXPECT_EQ(codec.setError(-4, "no %s", "data"), -4);
    EXPECT_EQ(codec._setErr(-7), -7);
    EXPECT_STREQ(codec.errorDesc(), "no data");
    EXPECT_EQ(codec.getErrorCode(), -7);
    EXPECT_EQ(log.texts(), (Texts{"[Gain filter] no data (-4)", "[Gain filter] Error (-7)"}));
    EXPECT_EQ(codec.setError(0), 0);
    EXPECT_STREQ(codec.errorDesc(), "");
    EXPECT_EQ(codec._setErr(0, "fine %d", 1), 0);
    EXPECT_STREQ(codec.errorDesc(), "fine 1");
    codec.setError(-1, "%s", std::string(3000, 'x').c_str());
    EXPECT_EQ(std::string(codec.errorDesc()), std::string(1023, 'x'));
    codec.setError(-1, static_cast<const char*>(nullptr));
    EXPECT_STREQ(codec.errorDesc(), "");
    EXPECT_EQ(log.count("(-1)", QvLogMask::error), 2);
}

TEST(Codec, UnknownParameterThrowsOrIsAStatus) {
    Gain codec;
    LogCapture log;
    const std::string text = "unnamed::setParam - invalid parameter \"x\"";
    EXPECT_EQ(failureOf([&] { codec.setParam("x", 1); }), text);
    EXPECT_TRUE(log.contains("Exception: " + text, QvLogMask::debug));
    qv_registry()->setConfig(AnyDict("disable_exceptions", 1));
    EXPECT_EQ(codec.setParam("x", 1), -5);
    EXPECT_EQ(codec.setParamDict(AnyDict("fail", 2, "unknown", 1)), 2 | -5);
    qv_registry()->setConfig(AnyDict());
    EXPECT_THROW(codec._raiseInvalidParam("x"), QvParamException);
    EXPECT_EQ(codec.setParamDict(AnyDict("a unknown", 1, "gain", 5, "z unknown", 1)), 0);
    EXPECT_EQ(codec.getParam("gain").asInt32(0), 5);
    EXPECT_EQ(codec.setParamDict(AnyDict("fail", 4, "gain", 6)), 4);
    EXPECT_THROW(codec.setParamDict(AnyDict("throw", 1)), int);
}

TEST(Codec, GetParamWarnsOfMisuse) {
    GainModule module;
    const std::unique_ptr<QvCodec> codec(module.create());
    LogCapture log;
    EXPECT_FALSE(codec->getParam("unknown").isValid());
    EXPECT_TRUE(log.lines().empty());
    EXPECT_EQ(codec->getParam("displayName"), "Gain filter");
    EXPECT_TRUE(log.contains("QvCodec::displayName should be used", QvLogMask::warning));
    codec->getParam("gain");  // writes its value and asks the base all the same
    EXPECT_TRUE(log.contains("gain: module possibly not implementing getParam('gain') correctly?",
                             QvLogMask::warning));
}

TEST(Codec, StateGoesOutAndIn) {
    GainModule module;
    const std::unique_ptr<QvCodec> codec(module.create());
    codec->setParam("gain", 7);
    AnyDict state("stale", 1);
    codec->store(state);
    EXPECT_EQ(state, AnyDict("name", "gain", "settings", AnyDict("gain", 7)));
    codec->setParam("gain", 1);
    EXPECT_EQ(codec->restore(state), 0);
    EXPECT_EQ(codec->getParam("gain").asInt32(0), 7);
    state.set("settings", 5);  // not what this codec takes
    EXPECT_EQ(codec->restore(state), 0);
    for (const AnyDict& foreign : {AnyDict(), AnyDict("name", "other"), AnyDict("name", 1)}) {
        codec->init();
        EXPECT_EQ(codec->restore(foreign), -1);
        EXPECT_STREQ(codec->errorDesc(), "restore - invalid name");
    }
}

TEST(Codec, TracesParametersOnceItIsSetUp) {
    GainModule module;
    const std::unique_ptr<QvCodec> codec(module.create());
    LogCapture log;
    codec->setParam("gain", 1);
    EXPECT_TRUE(log.lines().empty());
    codec->init();
    codec->setParam("gain", 2);
    EXPECT_THROW(codec->setParam("other", "x"), QvParamException);
    EXPECT_EQ(log.texts(), (Texts{"gain.setParam: gain [Int32]             = 2",
                                  "gain.setParam: other [String]           x",
                                  "Exception: gain::setParam - invalid parameter \"other\""}));
    qv_registry()->setDbgOption("log_setparam", 0);
    codec->setParam("gain", 3);
    qv_registry()->setDbgOption("log_setparam", 1);
    EXPECT_EQ(log.lines().size(), 3u);
}

TEST(Module, AttributesAndTexts) {
    GainModule module;
    EXPECT_STREQ(module.displayName(), "Gain filter");
    EXPECT_TRUE(module.getAttr("type") == 13 && !module.getAttr("absent").isValid());
    module.setAttrs(AnyDict("priority", 3, "displayName", 1));
    EXPECT_STREQ(module.displayName(), "gain");
    AnyDict all("stale", 1);
    module.getAttrs(all);
    EXPECT_EQ(all, AnyDict("displayName", 1, "priority", 3, "type", 13));
}

TEST(Module, KnowsItsInstances) {
    GainModule module, other;
    std::unique_ptr<QvCodec> first(module.create());
    const std::unique_ptr<QvCodec> second = std::make_unique<Gain>(&module);
    QvCodec* const c = first.get();
    Gain copy(static_cast<Gain&>(*c));
    EXPECT_TRUE(module.codecList().size() == 2 && module.codecList().contains(c));
    const std::string list = "QvModule.codecCreated: ", attrs = "QvModule._setAttrs: ";
    EXPECT_EQ(failureOf([&] { module.codecCreated(nullptr); }), list + "null object passed");
    EXPECT_EQ(failureOf([&] { module._setAttrs(nullptr); }), list + "null object passed");
    EXPECT_EQ(failureOf([&] { other.codecCreated(c); }), list + "invalid object.");
    EXPECT_EQ(failureOf([&] { other.codecDeleted(c); }), list + "invalid object.");
    EXPECT_EQ(failureOf([&] { module.codecCreated(c); }), attrs + "object already in list!");
    EXPECT_EQ(failureOf([&] { module._setAttrs(c); }), attrs + "instance already has _module.");
    EXPECT_EQ(failureOf([&] { module.codecDeleted(&copy); }), "QvModule.releaseCodec: object not found.");
    first.reset();
    EXPECT_EQ(module.codecList().size(), 1);
}

TEST(Module, CopiesOfACodecAreNoInstancesAndItMayEndFirst) {
    auto module = std::make_unique<GainModule>();
    GainModule other;
    Gain codec(module.get()), moved(&other);
    codec.setError(-3, "text");
    EXPECT_STREQ(Gain(codec).errorDesc(), "text");
    EXPECT_EQ(module->codecList().size(), 1);
    moved = codec;
    EXPECT_EQ(moved.module(), module.get());
    EXPECT_EQ(other.codecList().size(), 0);  // it would hold a dangling pointer later
    LogCapture log;
    module.reset();
    EXPECT_EQ(log.count(" instances still alive", QvLogMask::warning), 1);
    EXPECT_STREQ(codec.name(), "unnamed");
}

}  // namespace
