// How the registry keeps the catalogue of presets, which is made of modules and so lies above it.
#pragma once

#include <memory>

class QvPresetMgr;

struct QvPresetHook {
    using Catalogue = std::unique_ptr<QvPresetMgr, void (*)(QvPresetMgr*)>;

    Catalogue (*make)();              // an empty one
    void (*update)(QvPresetMgr& of);  // builds it anew from the modules that are registered now
};

// Asked once, when the registry is made. Defined next to the catalogue.
const QvPresetHook& qvPresetHook();
