#include "tarsel/source/picturefiles.h"

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <filesystem>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/numberedname.h"

namespace fs = std::filesystem;

namespace {

constexpr int kMost = 10'000'000;

bool isPicture(const std::string& extension) {
    constexpr const char* names[] = {".png", ".jpg", ".jpeg", ".tif", ".tiff", ".dpx", ".exr"};
    return std::find(std::begin(names), std::end(names), extension) != std::end(names);
}

// "a[001-120].jpg"
std::optional<PictureFiles> rangeOf(const fs::path& path) {
    const std::string name = path.filename().string();
    const size_t open = name.rfind('['), minus = name.find('-', open), close = name.find(']', open);
    if (open == std::string::npos || minus == std::string::npos || close == std::string::npos ||
        minus > close)
        return std::nullopt;
    const std::string from = name.substr(open + 1, minus - open - 1),
                      to = name.substr(minus + 1, close - minus - 1);
    const auto number = [](const std::string& text) {
        const bool digits =
            !text.empty() && text.size() < 10 && text.find_first_not_of("0123456789") == text.npos;
        return digits ? std::atoi(text.c_str()) : -1;
    };
    const int first = number(from), last = number(to);
    if (first < 0 || last < first || last - first >= kMost) return std::nullopt;
    return PictureFiles{
        (path.parent_path() / (name.substr(0, open) + from + name.substr(close + 1))).string(),
        last - first + 1};
}

std::optional<PictureFiles> numberedOf(const fs::path& path) {
    const auto name = NumberedName::parse(path.filename().string());
    if (!name) return std::nullopt;
    long long lowest = LLONG_MAX, highest = -1;
    const fs::path folder = path.has_parent_path() ? path.parent_path() : fs::path(".");
    for (const Any& entry : QvFile::ls(Any(folder.c_str()), 1))
        if (const auto number = name->numberOf(fs::path(entry.toString().asString("")).filename().string())) {
            lowest = std::min(lowest, *number);
            highest = std::max(highest, *number);
        }
    if (highest < 0 || highest - lowest >= kMost) throw failure(Msg::inputAbsent, {path.string()});
    return PictureFiles{(path.parent_path() / name->at(lowest)).string(),
                        static_cast<int>(highest - lowest) + 1};
}

}  // namespace

std::optional<PictureFiles> pictureFiles(const std::string& spec) {
    const fs::path path(spec);
    if (!isPicture(path.extension().string()) || exists(spec)) return std::nullopt;
    if (const auto range = rangeOf(path)) return range;
    if (spec.find("%d") == std::string::npos && spec.find("%0") == std::string::npos) return std::nullopt;
    return numberedOf(path);
}
