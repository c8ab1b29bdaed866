#include "tarsel/words/xmlnames.h"

#include <algorithm>

#include "tarsel/words/json.h"

namespace {

// U+FFFE and U+FFFF are no characters.
bool hasNoCharacter(const std::string& name) {
    return name.find("\xEF\xBF\xBE") != std::string::npos || name.find("\xEF\xBF\xBF") != std::string::npos;
}

bool keeps(const std::string& name, const char* controls) {
    const std::string kept = controls;
    return validUtf8(name) == name && !hasNoCharacter(name) &&
           std::none_of(name.begin(), name.end(), [&](char c) {
               return static_cast<unsigned char>(c) < ' ' && kept.find(c) == std::string::npos;
           });
}

}  // namespace

bool xmlKeeps(const std::string& name) { return keeps(name, "\t\n"); }

bool xmlAttributeKeeps(const std::string& name) { return keeps(name, ""); }
