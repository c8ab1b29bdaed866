#include "tarsel/words/keyvalues.h"

#include <algorithm>

#include "tarsel/words/listvalue.h"
#include "tarsel/words/messages.h"

namespace {

// The text up to a comma, which goes as well. A backslash takes the meaning from what follows it, and a list
// as the value is taken whole.
std::string takePart(std::string_view& text) {
    std::string part;
    while (!text.empty()) {
        if (!part.empty() && part.find('=') == part.size() - 1) {
            std::string_view list = text.substr(0, listLength(text));
            if (list.find("\\,") != std::string_view::npos)
                list = {};  // a name with brackets, written as ever
            part += list;
            text.remove_prefix(list.size());
            if (text.empty()) break;
        }
        const char c = text[0];
        const bool escaped = c == '\\' && text.size() > 1 && (text[1] == ',' || text[1] == '\\');
        text.remove_prefix(1);
        if (c == ',') break;
        part += escaped ? text[0] : c;
        if (escaped) text.remove_prefix(1);
    }
    return part;
}

}  // namespace

KeyValues::KeyValues(std::string_view text, const std::vector<std::string>& known, std::string_view option) {
    while (!text.empty()) {
        const std::string pair = takePart(text);
        const size_t equals = pair.find('=');
        if (equals == std::string::npos || equals == 0) throw failure(Msg::keyNotPair, {option, pair});
        const std::string key = pair.substr(0, equals);
        if (!known.empty() && std::find(known.begin(), known.end(), key) == known.end())
            throw failure(Msg::keyUnknown, {option, key, suggestion(key, known), joined(known)});
        if (find(key)) throw failure(Msg::keyRepeated, {option, key});
        pairs_.emplace_back(key, pair.substr(equals + 1));
    }
}

const std::string* KeyValues::find(std::string_view key) const {
    for (const auto& pair : pairs_)
        if (pair.first == key) return &pair.second;
    return nullptr;
}
