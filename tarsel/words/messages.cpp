#include "tarsel/words/messages.h"

#include <cassert>
#include <iterator>

namespace {

// clang-format off
constexpr Message kMessages[] = {
    // outputs
    {Msg::outputExists,       Exit::output, "can't write {file}", "it exists",                       "use -y to overwrite it"},
    {Msg::outputIsInput,      Exit::output, "can't write {file}", "it is also an input",             "give the output another name"},
    {Msg::outputFolderAbsent, Exit::output, "can't write {file}", "the folder {file} does not exist", "make the folder first"},
};
// clang-format on

constexpr bool inOrder() {
    for (size_t i = 0; i < std::size(kMessages); ++i)
        if (kMessages[i].id != static_cast<Msg>(i)) return false;
    return std::size(kMessages) == static_cast<size_t>(Msg::count);
}
static_assert(inOrder());

std::string shown(std::string_view placeholder, std::string_view value) {
    if (placeholder == "file" || placeholder == "name") return inQuotes(value);
    return placeholder == "system" ? inLine(std::string(value)) : std::string(value);
}

using Values = std::initializer_list<std::string_view>;

// `text` with its placeholders filled from `value` on.
std::string filled(std::string_view text, Values::iterator& value, Values::iterator end) {
    std::string line;
    for (size_t at = 0; at < text.size();) {
        const size_t open = text.find('{', at);
        line += text.substr(at, open - at);
        if (open == std::string_view::npos) break;
        const size_t close = text.find('}', open);
        assert(value != end);
        line += shown(text.substr(open + 1, close - open - 1), value == end ? "" : *value++);
        at = close + 1;
    }
    return line;
}

}  // namespace

std::span<const Message> messages() { return kMessages; }

std::string lineOf(Msg id, Values values) {
    const Message& row = kMessages[static_cast<size_t>(id)];
    auto value = values.begin();
    std::string line = filled(row.what, value, values.end());
    if (*row.why) line += ": " + filled(row.why, value, values.end());
    if (*row.remedy) line += "; " + filled(row.remedy, value, values.end());
    assert(value == values.end());
    return line;
}

Failure failure(Msg id, Values values) {
    return {kMessages[static_cast<size_t>(id)].exit, lineOf(id, values)};
}
