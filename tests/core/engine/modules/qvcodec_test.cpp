#include "core/engine/modules/qvcodec.h"

#include <memory>

#include "core/engine/modules/init.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
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
    GainModule() : QvModule(QvModuleType::audioFilter, "gain", "Gain", "Gain filter") {}
    QvCodec* create() override { return _setAttrs(new Gain); }
};

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
    codec.setError(-1, "%s", std::string(3000, 'x').c_str());
    EXPECT_EQ(std::string(codec.errorDesc()), std::string(1023, 'x'));
}

TEST(Codec, UnknownParameterThrowsOrIsAStatus) {
    Gain codec;
    LogCapture log;
    const std::string text = "unnamed::setParam - invalid parameter \"x\"";
    EXPECT_EQ(failureOf([&] { codec.setParam("x", 1); }), text);
    EXPECT_TRUE(log.contains("Exception: " + text, QvLogMask::debug));
    qv_registry()->setConfig(AnyDict("disable_exceptions", 1));
    EXPECT_EQ(codec.setParam("x", 1), QvStatus::invalidParam);
    EXPECT_EQ(codec.setParamDict(AnyDict("fail", 2, "unknown", 1)), 2 | -5);
    qv_registry()->setConfig(AnyDict());
    EXPECT_THROW(codec._raiseInvalidParam("x"), QvParamException);
    EXPECT_EQ(codec.setParamDict(AnyDict("a unknown", 1, "gain", 5, "z unknown", 1)), 0);
    EXPECT_EQ(codec.getParam("gain").asInt32(0), 5);
    EXPECT_EQ(codec.setParamDict(AnyDict("fail", 4, "gain", 6)), 4);
    EXPECT_THROW(codec.setParamDict(AnyDict("throw", 1)), int);
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
        EXPECT_EQ(codec->restore(foreign), QvStatus::failed);
        EXPECT_STREQ(codec->errorDesc(), "restore - invalid name");
    }
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
