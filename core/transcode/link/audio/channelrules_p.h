// Which input channel feeds which output channel when the job does not say: rules by source codec, encoder
// and channel counts. Internal to this folder.
#pragma once

#include <string_view>
#include <vector>

#include "core/engine/modules/moduletraits_p.h"

class AnyDict;

namespace qvchannels {

struct Connection {
    int in;
    int out;
    bool operator==(const Connection&) const = default;
};

struct Layout {
    std::string_view codec;                  // the source stream's
    CodecFamily target = CodecFamily::none;  // of the encoder
    const AnyDict* dolby = nullptr;  // positions of "L", "R", "C", "Ls", "Rs", "SUB" in a Dolby source
    int inChannels = 0;
    int outChannels = 0;
};

// In the order in which they are to be made. An output may lie outside the target's channels.
std::vector<Connection> connections(const Layout& layout);

}  // namespace qvchannels
