// Stands in front of the built-in output modules, so that a test can make any of them fail at any point.
//
//     FailingOutputs outputs;            // registry: these modules first, then all built-in ones
//     outputs.failAt = "rawmux.close";   // that call fails once it comes; "" for none
//     outputs.how = FailingOutputs::assertion;
//     ... outputs.calls holds what ran, as "filesink.open"
#pragma once

#include <new>
#include <string>
#include <vector>

#include "builtin/encoders/rawaenc.h"
#include "builtin/encoders/rawvenc.h"
#include "builtin/muxers/rawmux.h"
#include "builtin/sinks/qvfilebuiltins.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/builtinplugin_p.h"
#include "core/engine/modules/init.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvpresetmgr.h"

class FailingOutputs {
  public:
    enum How { status, assertion, noMemory };
    static constexpr int failure = -77;

    FailingOutputs() {
        self_ = this;
        qv_registry()->cleanup();
        qv_registry()->addPlugin(&plugin());
        qv_registry()->addPlugin(qvBuiltinPlugin());
        qvPresetMgr()->update();
    }
    ~FailingOutputs() {
        qv_registry()->cleanup();
        self_ = nullptr;
    }

    std::string failAt;
    How how = status;
    std::vector<std::string> calls;
    std::string watched;  // a parameter, as "rawvenc.meta"; setting it is a call "rawvenc.meta=1" or "=0"
    AnyDict params;  // answers of the multiplexer and encoders that replace their own, as "rawmux.maxStreams"

  private:
    // Runs `real` unless this call is to fail. A call that fails still does its work when it is an end.
    template <class Codec, class Real>
    static int run(Codec& codec, const char* what, Real real) {
        const std::string call = std::string(codec.name()) + "." + what;
        self_->calls.push_back(call);
        const bool fails = call == self_->failAt;
        const bool ends = call.ends_with(".close") || call.ends_with(".abort");
        const int result = !fails || ends ? real() : 0;
        if (!fails) return result;
        if (self_->how == noMemory) throw std::bad_alloc();
        if (self_->how == assertion) qvAssertFail("test", (call + " asserts").c_str());
        return codec.fail(call + " fails");
    }

    template <class Base>
    class Failing : public Base {
      public:
        int open() override {
            return run(*this, "open", [this] { return Base::open(); });
        }
        int close() override {
            return run(*this, "close", [this] { return Base::close(); });
        }
        int abort() override {
            return run(*this, "abort", [this] { return Base::abort(); });
        }
        void getParam(const char* name, Any& value) const override {
            const auto& instead = self_->params.get((std::string(this->name()) + "." + name).c_str());
            if (instead.isValid())
                value = instead;
            else
                Base::getParam(name, value);
        }
        int setParam(const char* name, const Any& value) override {
            const std::string call = std::string(this->name()) + "." + name;
            if (call == self_->watched) self_->calls.push_back(call + (value.isTrue() ? "=1" : "=0"));
            return Base::setParam(name, value);
        }
        using QvCodec::getParam;
        int fail(const std::string& text) { return this->setError(failure, "%s", text.c_str()); }
    };
    class FailingVideo : public Failing<RawVideoEnc> {
      public:
        int writeFrame(QvFrame* frame) override {
            return run(*this, "write", [&] { return RawVideoEnc::writeFrame(frame); });
        }
    };
    class FailingAudio : public Failing<RawAudioEnc> {
      public:
        int writePcm(QvPcm* pcm, int samples) override {
            return run(*this, "write", [&] { return RawAudioEnc::writePcm(pcm, samples); });
        }
    };

    template <class Codec>
    class Module : public QvModule {
      public:
        Module(int type, const char* name) : QvModule(type, name, "fails on demand", name) {}
        QvCodec* create() override { return _setAttrs(new Codec); }
    };

    static QvPlugin& plugin() {
        static QvPlugin plugin("failing", "Modules that fail on demand");
        if (plugin.nrModules() == 0) {
            plugin.addModule(new Module<Failing<FileSink>>(QvModuleType::sink, "filesink"));
            plugin.addModule(new Module<Failing<RawMux>>(QvModuleType::muxer, "rawmux"));
            plugin.addModule(new Module<FailingVideo>(QvModuleType::videoEncoder, "rawvenc"));
            plugin.addModule(new Module<FailingAudio>(QvModuleType::audioEncoder, "rawaenc"));
        }
        return plugin;
    }

    static inline FailingOutputs* self_ = nullptr;
};
