// A still picture that the user names.
#pragma once

#include <string>

// Throws Failure (input) for a file that is no PNG, or not a whole one: of such a picture the engine draws
// the part that it could read.
void requirePicture(const std::string& name);
