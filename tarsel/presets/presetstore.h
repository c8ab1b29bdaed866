// The user's presets: the file presets.xml in the folder of the user's settings.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

namespace PresetStore {

// The file's name, and whether it is there.
std::string fileName();

// What is stored; nothing where there is no file. Throws Failure (input) for one that is damaged.
QvUserPresets read();

// Reads, lets `change` do its work, and stores the result if it differs. Other runs wait meanwhile. What
// `change` throws leaves the file as it was. Throws Failure, also for a file of the older form of which
// something would be left out and so be lost.
void change(const std::function<void(QvUserPresets& presets)>& change);

}  // namespace PresetStore

// Exchanges a list for the presets of any file; `form` receives 1 or 2 for its form. Returns a line for each
// preset of the older form that is left out, and why. Throws Failure (input) for a file that holds none or is
// damaged.
std::vector<std::string> loadPresets(const std::string& file, QvUserPresets& presets, int* form = nullptr);
// Throws Failure (output).
void storePresets(const std::string& file, QvUserPresets& presets);
