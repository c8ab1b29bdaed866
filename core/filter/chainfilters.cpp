#include "core/filter/chainfilters_p.h"

#include <string>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"

namespace {

// Takes a codec as what it is asked to be; any other kind is destroyed.
template <class Filter>
std::unique_ptr<Filter> asFilter(QvCodec* codec, int kind) {
    std::unique_ptr<QvCodec> owner(codec);
    if (!codec) return nullptr;
    auto* filter = static_cast<Filter*>(codec->getInterface(kind));
    if (filter) owner.release();
    return std::unique_ptr<Filter>(filter);
}

template <class Filter>
std::unique_ptr<Filter> newFilter(const char* name);

template <>
std::unique_ptr<QvVideoFilter> newFilter(const char* name) {
    return asFilter<QvVideoFilter>(qv_registry()->newCodec(name), QvModuleType::videoFilter);
}

template <>
std::unique_ptr<QvAudioFilter> newFilter(const char* name) {
    return asFilter<QvAudioFilter>(qv_registry()->newCodec(name), QvModuleType::audioFilter);
}

void assertAvailable(bool available, const char* name) {
    if (!available) QV_FAIL((std::string("filter module '") + name + "' is not available").c_str());
}

template <class Filter>
std::unique_ptr<Filter> restoreFilter(const AnyDict& state) {
    const Any& name = state.get("name");
    if (!name.isString() || !state.get("_on").isTrue()) return nullptr;
    auto filter = newFilter<Filter>(name.asString());
    if (!filter) {
        qv_log()->error("Can not restore filter %s, non existent filter", name.asString());
    } else if (filter->restore(state) != QvStatus::ok) {
        qv_log()->error("Can not restore filter %s from state dict", name.asString());
        filter.reset();
    }
    return filter;
}

template <class Filter>
std::vector<std::unique_ptr<Filter>> restoreFilters(const AnyVector& states) {
    std::vector<std::unique_ptr<Filter>> filters;
    for (int i = 0; i < states.size(); ++i) {
        if (!states.at(i).isDict()) continue;
        if (auto filter = restoreFilter<Filter>(states.at(i).asDict())) filters.push_back(std::move(filter));
    }
    return filters;
}

Any fileOf(const QvModule& module) {
    Any file = module.getAttr("filename");
    if (!file.isValid() && module.plugin()) file = module.plugin()->getAttr("filename");
    return file;
}

QvModule* findUserModule(const char* name) {
    auto* registry = qv_registry();
    for (int i = 0; i < registry->nrModules(0); ++i) {
        auto* module = registry->module(i);
        if (Any(module->name()) == name && fileOf(*module) != "builtin") return module;
    }
    return nullptr;
}

std::unique_ptr<QvVideoFilter> newFromModule(QvModule& module) {
    auto filter = asFilter<QvVideoFilter>(module.create(), QvModuleType::videoFilter);
    if (filter && filter->getState() == QvCodec::stateCreated && filter->init() != QvStatus::ok)
        filter.reset();
    return filter;
}

}  // namespace

namespace qvchain {

std::unique_ptr<QvVideoFilter> newVideoFilter(const char* name) { return newFilter<QvVideoFilter>(name); }

std::unique_ptr<QvAudioFilter> newAudioFilter(const char* name) { return newFilter<QvAudioFilter>(name); }

std::unique_ptr<QvAudioFilter> requireAudioFilter(const char* name) {
    auto filter = newAudioFilter(name);
    assertAvailable(filter != nullptr, name);
    return filter;
}

std::unique_ptr<QvVideoFilter> requireConverter(const char* name, const char* what) {
    std::unique_ptr<QvVideoFilter> filter;
    if (auto* module = findUserModule(name)) {
        const Any file = fileOf(*module).toString();
        qv_dbg()->info("Using user supplied %s:%s", what, file.asString(""));
        filter = newFromModule(*module);
    } else {
        filter = newVideoFilter(name);
    }
    assertAvailable(filter != nullptr, name);
    return filter;
}

VideoFilters restoreVideoFilters(const AnyVector& states) { return restoreFilters<QvVideoFilter>(states); }

AudioFilters restoreAudioFilters(const AnyVector& states) { return restoreFilters<QvAudioFilter>(states); }

}  // namespace qvchain
