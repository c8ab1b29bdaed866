#include "builtin/kernels/convert/workspace.h"

#include <algorithm>

namespace srk {

Workspace::Workspace(const Plan& plan) {
    int places = 0, neutrals = 0, longest = 0;
    for (const auto& list : plan.lists) {
        lines.grow(list.bytes);
        places = std::max(places, list.tags);
        neutrals = std::max(neutrals, list.neutral);
        longest = std::max(longest, list.sourceWidth);
    }
    tags.resize(static_cast<size_t>(places));
    const auto around = static_cast<size_t>(longest) + beforeLine + afterLine;
    const auto samples = static_cast<size_t>(neutrals) + wordBlock;
    if (plan.route.deep) {
        paddedWide.grow(around);
        neutral.grow(2 * samples);
        std::fill_n(reinterpret_cast<uint16_t*>(neutral.get()), samples, uint16_t{32768});
    } else {
        padded.grow(around);
        neutral.grow(samples);
        std::fill_n(neutral.get(), samples, Byte{128});
    }
}

}  // namespace srk
