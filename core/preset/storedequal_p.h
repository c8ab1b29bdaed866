// Whether presets are the same as files keep them.
#pragma once

#include "core/value/any.h"

// Without the entries of the running program, whose keys begin with "#"; texts are equal in either width.
bool qvStoredEqual(const Any& a, const Any& b);
