// Presets by the names that users give.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

// A preset of the user or a built-in one by its name or symbol, without regard to case; the very name comes
// first. Throws Failure: with near matches for an unknown name, and with the modules that a built-in preset
// waits for.
QvPreset findPreset(const std::string& name);

// A preset of the user whose missing modules have given way to those that can stand in for them; checked.
QvPreset withInstalledModules(const QvPreset& preset);

// The place of a user's preset in a list, or -1.
int presetPlace(const QvUserPresets& presets, const std::string& name);
// The place of a user's preset in a list; throws Failure, with near matches, if there is none.
int findUserPreset(const QvUserPresets& presets, const std::string& name);

// Throws Failure for a name that no preset of the user may have: that or the symbol of a built-in one, of
// those too for which modules are missing; one that is empty, or that presetNameOf() would change.
void requireFreeName(const std::string& name);

// A name as these searches compare it: letters of ASCII are small.
std::string foldedName(std::string name);
// The folded names and symbols of all built-in presets, of those too for which modules are missing.
std::vector<std::string> builtinFoldedNames();

// "mp4mux, rawmux" of a list of names.
std::string namesOf(const AnyVector& names);
