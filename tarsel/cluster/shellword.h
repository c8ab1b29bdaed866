// Words in the script of an element.
#pragma once

#include <string>

// One word for the shell, in quotes, in which no character acts.
std::string shellWord(const std::string& text);
