// Quoting for scripts of the shell.
#pragma once

#include <string>

// The text as one word for the shell, in quotes that take every character literally.
std::string shellWord(const std::string& text);
