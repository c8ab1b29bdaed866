// Order, equality and truth of values, by their types.
#pragma once

#include "core/value/any.h"

// Any's ==, < and isTrue, which say what is compared.
bool qvAnyEqual(const Any& a, const Any& b);
bool qvAnyBefore(const Any& a, const Any& b);
bool qvAnyTrue(const Any& value);
