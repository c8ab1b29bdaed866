// Names that XML keeps. The engine's XML holds UTF-8 and knows no characters by number, so a name with others
// would come back as a different one.
#pragma once

#include <string>

// Whether `name` comes back from an element's text as it is.
bool xmlKeeps(const std::string& name);
// The same of an attribute, where a line end and a tab come back as a blank.
bool xmlAttributeKeeps(const std::string& name);
