// The private part of the registry.
#pragma once

#include <vector>

#include "core/engine/modules/presethook_p.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"

class QvRegistry_p {
  public:
    AnyDict options;  // the debug options, under "dbgOpts"
    QvPresetHook::Catalogue presets = qvPresetHook().make();
    QvExternalIO externalIO;
    std::vector<QvPluginFailure> failures;  // plug-in files that were not loaded
};
