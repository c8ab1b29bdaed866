#include "core/preset/substitution_p.h"

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvpreset.h"
#include "core/preset/qvpresetmgr.h"

namespace {

// The module that can stand in for one that is missing here; null if it is here, or nothing can.
const char* substituteOf(const Any* name) {
    if (!name || !name->isString() || qv_registry()->module(name->asString())) return nullptr;
    const char* const other = qvPresetMgr()->getSubstitute(name->asString());
    return other && qv_registry()->module(other) ? other : nullptr;
}

}  // namespace

bool qvSubstituteModules(QvPreset& preset) {
    Any& streams = preset.get("streams");
    if (!streams.isVector()) return false;
    bool changed = false;
    for (Any& stream : streams.asVector()) {
        Any* const name = stream.isDict() ? stream.asDict().descendant("codec.name") : nullptr;
        const char* const other = substituteOf(name);
        if (!other) continue;
        qv_dbg()->debug("User preset '%s': substituting non existing '%s' for existing '%s'", preset.name(),
                        name->asString(), other);
        *name = other;
        changed = true;
    }
    return changed;
}
