// User presets as versions 1.x stored them: each is "name" and "params" with a profile number of the time,
// the names of three modules and their stored states.
#pragma once

#include "core/preset/loadedpresets_p.h"
#include "core/value/anycontainer.h"

// Lifts the presets of the vector "user" to today's profiles and modules and adds them. What can't be lifted
// is skipped with a line in the log. QvStatus::ok, or failed if an element is no preset; one without "params"
// is an assertion.
int qvImportOldPresets(const AnyVector& user, QvLoadedPresets& to);

// Why qvImportOldPresets would assert; null if it would not.
const char* qvFaultOfOldPreset(const Any& element);
