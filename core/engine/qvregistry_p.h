// The private part of the registry.
#pragma once

#include "core/engine/qvregistry.h"
#include "core/preset/qvpresetmgr.h"

class QvRegistry_p {
  public:
    AnyDict options;  // the debug options, under "dbgOpts"
    QvPresetMgr presets;
    QvExternalIO externalIO;
};
