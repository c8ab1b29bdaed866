#include "tarsel/words/numberedname.h"

#include <algorithm>
#include <charconv>
#include <filesystem>
#include <limits>

#include "tarsel/words/messages.h"

namespace {

// The digits that "%d" or "%04d" at `at` asks for, and its length; 0 digits for anything else.
struct Place {
    int digits;
    size_t length;
};

Place placeAt(std::string_view text, size_t at) {
    const std::string_view rest = text.substr(at);
    if (rest.starts_with("%d")) return {1, 2};
    if (rest.size() >= 4 && rest[1] == '0' && rest[2] >= '1' && rest[2] <= '9' && rest[3] == 'd')
        return {rest[2] - '0', 4};
    return {0, 1};
}

bool hasPlace(std::string_view name) {
    for (size_t at = 0; (at = name.find('%', at)) != std::string_view::npos; ++at) {
        if (name.substr(at).starts_with("%%"))
            ++at;
        else if (placeAt(name, at).digits > 0)
            return true;
    }
    return false;
}

bool isDigit(char c) { return c >= '0' && c <= '9'; }

}  // namespace

std::optional<NumberedName> NumberedName::parse(std::string_view name) {
    return hasPlace(name) ? parseStrictly(name) : std::nullopt;
}

std::optional<NumberedName> NumberedName::parseStrictly(std::string_view name) {
    NumberedName parsed;
    std::string* part = &parsed.before_;
    for (size_t at = 0; at < name.size(); ++at) {
        if (name[at] != '%') {
            *part += name[at];
            continue;
        }
        const Place place = placeAt(name, at);
        if (name.substr(at).starts_with("%%")) {
            *part += name[++at];
        } else if (place.digits > 0 && part == &parsed.before_) {
            parsed.digits_ = place.digits;
            part = &parsed.after_;
            at += place.length - 1;
        } else {
            throw failure(Msg::numberWrong, {name, name.substr(at, std::max<size_t>(place.length, 2))});
        }
    }
    if (part == &parsed.before_) return std::nullopt;
    if (const size_t dot = parsed.after_.rfind('.'); dot != std::string::npos) {
        parsed.extension_ = parsed.after_.substr(dot);
        parsed.after_.resize(dot);
    }
    return parsed;
}

std::string NumberedName::at(long long number, std::string_view extension) const {
    std::string digits = std::to_string(number);
    const auto least = static_cast<size_t>(digits_);
    if (digits.size() < least) digits.insert(0, least - digits.size(), '0');
    return before_ + digits + after_ + (extension.empty() ? extension_ : std::string(extension));
}

std::string NumberedName::plain(std::string_view extension) const {
    constexpr std::string_view separators = "_-. #";
    std::string name = before_;
    while (!name.empty() && separators.find(name.back()) != std::string_view::npos) name.pop_back();
    name += after_;
    while (!name.empty() && separators.find(name.front()) != std::string_view::npos) name.erase(0, 1);
    if (name.empty()) name = "sound";
    return name + std::string(extension);
}

std::optional<long long> NumberedName::numberOf(std::string_view name, std::string_view extension) const {
    const std::string end = after_ + (extension.empty() ? extension_ : std::string(extension));
    if (name.size() <= before_.size() + end.size() || !name.starts_with(before_) || !name.ends_with(end))
        return std::nullopt;
    const std::string_view digits = name.substr(before_.size(), name.size() - before_.size() - end.size());
    if (!std::all_of(digits.begin(), digits.end(), isDigit)) return std::nullopt;
    // "%04d" never writes 12 as 00012.
    const auto least = static_cast<size_t>(digits_);
    if (digits.size() != least && (digits.size() < least || digits[0] == '0')) return std::nullopt;
    long long number = 0;
    const auto read = std::from_chars(digits.data(), digits.data() + digits.size(), number);
    return read.ec == std::errc() ? number : std::numeric_limits<long long>::max();
}

std::string withoutEscapes(std::string name) {
    for (size_t at = 0; (at = name.find("%%", at)) != std::string::npos; ++at) name.erase(at, 1);
    return name;
}

std::string numberedLike(const std::string& name) {
    const std::filesystem::path path(name);
    std::filesystem::path file = path.stem();
    file += "_%d";
    file += path.extension();
    return (path.has_parent_path() ? path.parent_path() / file : file).string();
}
