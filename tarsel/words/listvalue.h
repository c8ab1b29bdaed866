// Lists of the engine as people write them: JSON, as in [1,[0,1],-1] and [{"time":0,"volume":100}].
#pragma once

#include <string>
#include <string_view>

#include <qvplugcore/qvplugcore.h>

// A Vector: numbers with a point become Float, others Int32, or Int64 where they are larger; true and false
// are 1 and 0, null is an invalid value, objects are Dicts. Throws Failure (usage), with `option` in the
// line, for anything but a list.
Any parseList(const std::string& text, const std::string& option);

// How many characters the list has that `text` begins with; 0 if it begins with none, or if that has no end.
size_t listLength(std::string_view text);
