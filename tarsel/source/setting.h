// Parameters of codecs as people write them.
#pragma once

#include <string>

#include <qvplugcore/qvplugcore.h>

// Sets a parameter to what a text looks like: a list, a whole number, a number, or a text. Text of digits
// stays text for a parameter that is one. Throws Failure (usage), with `option` in the line, for a name that
// the codec does not have (with near ones) and a value that it refuses.
void setGuessed(QvCodec& codec, const std::string& key, const std::string& text, const std::string& option);
