// Filters that stand in for the library's own where a test looks at plans and at the movement of frames and
// samples, and a plug-in that offers them.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvbuffer.h"

// Takes every parameter and answers with what it was given.
template <class Base>
class AnyParamFilter : public Base {
  public:
    using Base::Base;
    using Base::getParam;

    const char* name() const override { return label ? label : Base::name(); }
    int setParam(const char* name, const Any& value) override {
        if (name[0] == '_' && name != std::string("_needsReport")) seen.set(name, value);
        if (name[0] == '_' && known.isSet(name) == false) return Base::setParam(name, value);
        known.set(name, value);
        return 0;
    }
    void getParam(const char* name, Any& value) const override {
        if (known.isSet(name))
            value = known.get(name);
        else
            Base::getParam(name, value);
    }
    void store(AnyDict& dict) const override {
        Base::store(dict);
        for (const auto [key, value] : known) dict.set(key, *value);
    }
    int restore(const AnyDict& dict) override {
        if (dict.isSet("broken")) return -1;
        for (const auto [key, value] : dict)
            if (key[0] != '_' && std::string(key) != "name") known.set(key, *value);
        return Base::restore(dict);
    }
    int open() override {
        this->setState(static_cast<QvCodec::State>(3));
        return openResult ? openResult : known.getInt32("refuseOpen", 0);
    }
    int close() override {
        ++closed;
        this->setState(QvCodec::stateInitialised);
        return known.getInt32("refuseClose", 0);
    }

    const char* label = nullptr;  // a name of its own
    AnyDict known;
    AnyDict seen;  // framework parameters that came
    int openResult = 0;
    int closed = 0;
};

// Hands each frame on, by number; `copies` says how many frames each input makes.
class FakeVideoFilter : public AnyParamFilter<QvVideoFilter> {
  public:
    using AnyParamFilter::AnyParamFilter;

    int write(QvFrame& frame) override {
        if (const int refused = known.getInt32("refuseWrite", 0)) return refused;
        out = frame;
        left = copies ? copies(frame.frameNr) : 1;
        return 0;
    }
    int apply(QvFrame& frame) override {
        applied.push_back(frame.frameNr);
        return known.getInt32("refuseApply", 0);
    }
    bool applySupported() const override { return inPlace; }
    int ready() const override { return left; }
    QvFrame* frame() override { return &out; }
    int next() override {
        if (left > 0) --left;
        return 0;
    }

    std::function<int(int)> copies;
    bool inPlace = false;
    std::vector<int> applied;
    QvFrame out;
    int left = 0;
};

// Hands samples on, `ratio` out for each one in, and keeps the last `holdBack` to itself.
class FakeAudioFilter : public AnyParamFilter<QvAudioFilter> {
  public:
    using AnyParamFilter::AnyParamFilter;

    int write(QvPcm& pcm) override {
        written.push_back(pcm.samples());
        if (writeResult) return writeResult;
        if (!out.inited()) out.init(0, pcm.channels(), pcm.bytesPerSample(), pcm.samplerate());
        if (swallows || pcm.samples() == 0) return 0;
        if (holdBack > 0) return delay(pcm);
        if (ratio == 1.0) return out.write(pcm.samples(), pcm.ptr(0));
        owed += pcm.samples() * ratio;
        const int count = static_cast<int>(owed);
        owed -= count;
        return out.addSilence(count);
    }
    int samples() const override { return out.samples(); }
    QvPcm* pcm() override { return &out; }
    int erase(int n) override { return out.erase(n); }

    double ratio = 1.0;
    double owed = 0;
    int holdBack = 0;
    bool swallows = false;
    int writeResult = 0;
    std::vector<int> written;
    QvPcm out;

  private:
    int delay(const QvPcm& pcm) {
        if (!held.inited()) held.init(0, pcm.channels(), pcm.bytesPerSample(), pcm.samplerate());
        held.write(pcm.samples(), pcm.ptr(0));
        const int surplus = held.samples() - holdBack;
        if (surplus < 1) return 0;
        out.write(surplus, held.ptr(0));
        return held.erase(surplus);
    }
    QvPcm held;
};

template <class Filter>
class FakeModule : public QvModule {
  public:
    FakeModule(int type, const char* name) : QvModule(type, name, name, nullptr) {}
    QvCodec* create() override {
        auto filter = std::make_unique<Filter>(this);
        if constexpr (requires { filter->known; }) {
            if (std::string(name()) == "frconvert") filter->known.set("_isFramerateConverter", 1);
            if (std::string(name()) == "bobber") filter->known.set("_rateFactor", 2);
        }
        return filter.release();
    }
};

// While it lives the registry offers these modules, as if they were built in.
class FakePlugin {
  public:
    FakePlugin() : plugin_(new QvPlugin("fakes", "filters of the tests")) {
        plugin_->setAttr("filename", "builtin");
        qv_registry()->addPlugin(plugin_.get());
    }
    ~FakePlugin() { qv_registry()->cleanup(); }
    FakePlugin& video(const char* name) {
        return add(new FakeModule<FakeVideoFilter>(QvModuleType::videoFilter, name));
    }
    FakePlugin& audio(const char* name) {
        return add(new FakeModule<FakeAudioFilter>(QvModuleType::audioFilter, name));
    }
    FakePlugin& add(QvModule* module) {
        plugin_->addModule(module);
        return *this;
    }

  private:
    std::unique_ptr<QvPlugin> plugin_;
};
