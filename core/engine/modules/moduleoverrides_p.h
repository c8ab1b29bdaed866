// Attributes of modules that differ from those that the modules had when they were loaded.
#pragma once

#include "core/value/anycontainer.h"

class QvModule;
class QvRegistry;

bool qvIsOverridden(const QvModule& module, const AnyDict& defaults);
// QvRegistry::getModuleOverrides and setModuleOverrides.
void qvCollectOverrides(const QvRegistry& registry, AnyDict& overrides);
void qvApplyOverrides(const QvRegistry& registry, const AnyDict& overrides);
