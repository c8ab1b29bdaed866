// Shortcuts: each replaces stages of a list by fewer or cheaper ones, if it finds them. The picture stays the
// same byte by byte, except where a row says that it rounds otherwise.
#pragma once

#include <cstdint>
#include <span>

#include "builtin/kernels/convert/route.h"
#include "builtin/kernels/convert/stages.h"

namespace srk {

struct Rewrite {
    const char* name;
    // False: there was nothing to rewrite, and the list is as before.
    bool (*apply)(const Route& route, StageList& list);
    bool rounds = false;    // samples in work may differ by 1
    bool together = false;  // in both fields or in none
};

// In the order in which they are applied.
std::span<const Rewrite> rewrites();

}  // namespace srk
