#include "builtin/pipes/output/members/muxertraits.h"

#include <cstring>

namespace {

// clang-format off
//   module      companion   any    transport  many      sized
//               sink        codec  stream     programs  streams
constexpr MuxerTraits table[] = {
    {"nullmux",   "nullsink", true,  false,     false,    false},
    {"memmux",    "memsink",  true,  false,     false,    false},
    {"mptsmux",   nullptr,    false, true,      true,     false},
    {"mpegtsmux", nullptr,    false, true,      false,    false},
    {"rawmux",    nullptr,    false, false,     false,    true },
};
// clang-format on

constexpr MuxerTraits plain;

}  // namespace

const MuxerTraits& muxerTraits(const char* module) {
    for (const auto& row : table)
        if (module && std::strcmp(row.module, module) == 0) return row;
    return plain;
}
