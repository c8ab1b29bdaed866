// Words about presets that come from outside: names, and what is wrong with one.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// Text for one line of a list: well-formed, and a blank in place of each character that a terminal would obey
// instead of showing it (controls, line ends, changes of the direction of writing).
std::string onOneLine(const std::string& text);

// The name of a preset that is nearest to a text: on one line, without blanks at its ends, and of 200 bytes
// at most. Empty if nothing is left.
std::string presetNameOf(const std::string& text);

// Why a preset is not valid, without its name; empty for a valid one.
std::string faultOf(const QvPreset& preset);
