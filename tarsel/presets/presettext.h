// Presets as texts and as JSON.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/words/json.h"

// The rows of a list, by groups: the user's own first, then the built-in ones. `all`: also those that are
// hidden or for which modules are missing, with "waits_for" and a list of modules, one of which would bring
// them.
Json presetRows(const QvUserPresets& own, bool all);
std::string presetListText(const Json& rows);

// One preset with its settings.
Json presetJson(const QvPreset& preset);
std::string presetText(const QvPreset& preset);
