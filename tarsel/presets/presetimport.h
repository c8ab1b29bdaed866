// Presets that come from a file of somebody else's, and those that go into one.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

// What became of a file's presets, a line each, for people.
struct ImportReport {
    int added = 0, replaced = 0;
    std::vector<std::string> lines;    // of what was converted, renamed or replaced
    std::vector<std::string> skipped;  // of what was left out, and why
};

// Adds the presets of a file of either form. A name that is in use gets a number, or, with `overwrite`, the
// preset that has it is replaced; a name of a built-in preset gets a number in any case. Throws Failure for a
// file that can't be read; nothing is changed then.
ImportReport importPresets(const std::string& file, bool overwrite, QvUserPresets& presets);
