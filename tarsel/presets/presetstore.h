// The user's presets: the file presets.xml in the folder of the user's settings.
#pragma once

#include <functional>
#include <string>

#include <qvplugcore/qvplugcore.h>

namespace PresetStore {

// The file's name, and whether it is there.
std::string fileName();

// What is stored; nothing where there is no file. Throws Failure (input) for one that is damaged.
QvUserPresets read();

// Reads, lets `change` do its work, and stores the result if it differs. Other runs wait meanwhile. What
// `change` throws leaves the file as it was. Throws Failure.
void change(const std::function<void(QvUserPresets& presets)>& change);

}  // namespace PresetStore

// Presets of any file, added to a list. Throws Failure (input) for a file that holds none or is damaged.
void loadPresets(const std::string& file, QvUserPresets& presets, int mode, int* form = nullptr);
// Throws Failure (output).
void storePresets(const std::string& file, QvUserPresets& presets);
