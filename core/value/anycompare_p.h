// Equality and order of values, by their types.
#pragma once

#include "core/value/any.h"

// Any's ==, for two values of one type and, but for containers, one size.
bool qvSameContents(const Any& a, const Any& b);
// Any's <.
bool qvAnyBefore(const Any& a, const Any& b);
