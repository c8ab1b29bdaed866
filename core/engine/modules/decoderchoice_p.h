// Which decoders try a file, by its extension.
#pragma once

#include <memory>
#include <vector>

#include "core/value/anycontainer.h"

class QvModule;

using QvKnownModules = std::vector<QvModule*>;  // borrowed, in the registry's order

bool qvIsDisabled(const QvModule& module);
// QvRegistry::inputExts and decoders, of these modules.
std::unique_ptr<AnyVector> qvInputExtensions(const QvKnownModules& modules, bool dot, bool star);
AnyVector qvDecodersFor(const QvKnownModules& modules, const char* ext);
