// Where an element stands in a document's text.
#pragma once

#include <span>

class Any;

// The line, from 1, in which an element of a well-formed file begins. `children` leads to it from the root:
// the number, from 0, of a child element at each level. 0 if it can't be found.
int qvXmlLine(const Any& file, std::span<const int> children);
