#include "core/engine/modules/moduleoverrides_p.h"

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"

namespace {

AnyDict changedAttributes(const QvModule& module, const AnyDict& defaults) {
    AnyDict attributes;
    module.getAttrs(attributes);
    AnyDict changed;
    for (const auto& [key, value] : attributes)
        if (*value != defaults.get(key)) changed.set(key, *value);
    return changed;
}

void overrideAttributes(QvModule& module, const AnyDict& attributes) {
    for (const auto& [key, value] : attributes) module.setAttr(key, *value);
}

}  // namespace

bool qvIsOverridden(const QvModule& module, const AnyDict& defaults) {
    AnyDict attributes;
    module.getAttrs(attributes);
    return attributes != defaults;
}

void qvCollectOverrides(const QvRegistry& registry, AnyDict& overrides) {
    overrides.clear();
    for (int i = 0; const QvModule* module = registry.module(i); ++i) {
        const AnyDict* defaults = registry.moduleDefaults(module->name());
        const AnyDict changed = changedAttributes(*module, defaults ? *defaults : AnyDict());
        if (!changed.empty()) overrides.set(module->name(), changed);
    }
}

void qvApplyOverrides(const QvRegistry& registry, const AnyDict& overrides) {
    for (const auto& [name, attributes] : overrides) {
        QvModule* found = registry.module(name);
        if (!found)
            qv_dbg()->debug("Found overrides for module %s, but it is not loaded, skipping.", name);
        else if (!attributes->isDict())
            qv_dbg()->error("Found overrides for module %s, error in format, skipping.", name);
        else
            overrideAttributes(*found, attributes->asDict());
    }
}
