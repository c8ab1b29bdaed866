#include "core/preset/qvprofile.h"

#include <cstring>
#include <iterator>
#include <span>

namespace {

struct Symbol {
    const char* name;
    int number;
};

constexpr int second(int member) { return 0x1000000 | member; }

constexpr Symbol kCurrent[] = {
    {"RAW", QvProfile::raw},
    {"AVI_RAW", QvProfile::aviRaw},
};

constexpr Symbol kSecond[] = {
    {"NONE", second(100)},
    {"RAW", second(101)},
};

// Index: a number of the oldest scheme. Value: the member in the second one.
constexpr int kOldest[] = {100, 1,  1,  2,  10, 10, 18, 19, 12, 15, 13, 17, 16, 30,
                           30,  31, 32, 40, 40, 50, 50, 51, 52, 53, 60, 60, 61, 62};
static_assert(std::size(kOldest) == 28);

template <class Match>
const Symbol* find(Match match) {
    for (std::span<const Symbol> table :
         {std::span<const Symbol>(kCurrent), std::span<const Symbol>(kSecond)})
        for (const Symbol& row : table)
            if (match(row)) return &row;
    return nullptr;
}

}  // namespace

int qvSymToProfile(const char* symbol) {
    const Symbol* row =
        symbol ? find([&](const Symbol& s) { return std::strcmp(s.name, symbol) == 0; }) : nullptr;
    return row ? row->number : QvProfile::notSet;
}

const char* qvProfileToSym(int profile) {
    const Symbol* row = find([&](const Symbol& s) { return s.number == profile; });
    return row ? row->name : "";
}

int qvFixOldProfileNo(int profile) {
    if (profile >= 0x1000000) return profile;
    const bool known = profile >= 0 && profile < static_cast<int>(std::size(kOldest));
    return second(known ? kOldest[profile] : 100);
}
