// What folders hold, and numbered sequences in them.
#pragma once

#include <string_view>

#include "core/value/anycontainer.h"

// "." and "..", and names that are nothing but an extension. The name is not empty.
bool qvIsUnlisted(std::string_view name);
// As QvFile::ls; with `filesOnly` without folders.
AnyVector qvListFolder(const Any& folder, bool filesOnly);
// As QvFile::numberedSequence.
AnyVector qvNumberedSequence(const Any& name, int* digits);
