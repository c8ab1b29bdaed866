// Names that copy tools give to files that they have not completed.
#pragma once

#include <string_view>

// Hidden files, ".part" and ".tmp" and the like, "name~", and what rsync, browsers and office programs use.
bool isUnfinishedName(std::string_view name);
