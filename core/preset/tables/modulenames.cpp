#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/tables/modulenames_p.h"

bool ModuleRow::contains(std::string_view name) const {
    for (const char* own : *this)
        if (own == name) return true;
    return false;
}

InstalledModules::InstalledModules() {
    const QvRegistry& registry = *qv_registry();
    for (int i = 0, n = registry.nrModules(); i < n; ++i) names_.emplace(registry.module(i)->name());
}
