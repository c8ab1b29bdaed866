#include "core/preset/qvprofile.h"

#include <cstring>
#include <iterator>
#include <span>

#include "core/preset/tables/profilesymbols_p.h"

namespace {

using profileScheme::second;

// Index: a number of the oldest scheme. Value: the member in the second one.
constexpr int kOldest[] = {100, 1,  1,  2,  10, 10, 18, 19, 12, 15, 13, 17, 16, 30,
                           30,  31, 32, 40, 40, 50, 50, 51, 52, 53, 60, 60, 61, 62};
static_assert(std::size(kOldest) == 28);

static_assert(QvProfile::firstOfPlugins == profileScheme::firstOfPlugins);

template <class Match>
const ProfileSymbol* find(Match match) {
    for (const std::span<const ProfileSymbol> table :
         {std::span<const ProfileSymbol>(profileScheme::currentSymbols),
          std::span<const ProfileSymbol>(profileScheme::secondSymbols)})
        for (const ProfileSymbol& row : table)
            if (match(row)) return &row;
    return nullptr;
}

}  // namespace

int qvSymToProfile(const char* symbol) {
    const ProfileSymbol* row =
        symbol ? find([&](const ProfileSymbol& s) { return std::strcmp(s.name, symbol) == 0; }) : nullptr;
    return row ? row->number : QvProfile::notSet;
}

const char* qvProfileToSym(int profile) {
    const ProfileSymbol* row = find([&](const ProfileSymbol& s) { return s.number == profile; });
    return row ? row->name : "";
}

int qvFixOldProfileNo(int profile) {
    if (profile >= 0x1000000) return profile;
    const bool known = profile >= 0 && profile < static_cast<int>(std::size(kOldest));
    return second(known ? kOldest[profile] : 100);
}
