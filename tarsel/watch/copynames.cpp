#include "tarsel/watch/copynames.h"

#include <algorithm>
#include <string>

namespace {

// clang-format off
constexpr std::string_view kEndings[] = {
    ".part", ".partial", ".tmp", ".temp", ".filepart", ".crdownload", ".download", ".opdownload", ".inprogress",
    ".incomplete", ".writing", ".uploading", ".upload", ".aria2", ".!ut", ".swp", ".lock", "~",
};
// clang-format on

constexpr std::string_view kStarts[] = {".", "~$"};

}  // namespace

bool isUnfinishedName(std::string_view name) {
    std::string small(name);
    std::transform(small.begin(), small.end(), small.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return std::any_of(std::begin(kStarts), std::end(kStarts),
                       [&](std::string_view start) { return small.starts_with(start); }) ||
           std::any_of(std::begin(kEndings), std::end(kEndings),
                       [&](std::string_view ending) { return small.ends_with(ending); });
}
