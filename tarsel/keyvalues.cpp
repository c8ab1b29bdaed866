#include "keyvalues.h"

#include <algorithm>

#include "failure.h"

KeyValues::KeyValues(std::string_view text, const std::vector<std::string>& known, std::string_view option) {
    while (!text.empty()) {
        const size_t comma = text.find(',');
        const std::string_view pair = text.substr(0, comma);
        text = comma == std::string_view::npos ? std::string_view() : text.substr(comma + 1);
        const size_t equals = pair.find('=');
        if (equals == std::string_view::npos || equals == 0)
            throw Failure(Exit::usage,
                          std::string(option) + ": " + inQuotes(pair) + " is not of the form key=value");
        const std::string key(pair.substr(0, equals));
        if (!known.empty() && std::find(known.begin(), known.end(), key) == known.end())
            throw Failure(Exit::usage, std::string(option) + ": unknown key " + inQuotes(key) + "." +
                                           suggestion(key, known));
        pairs_.emplace_back(key, pair.substr(equals + 1));
    }
}

const std::string* KeyValues::find(std::string_view key) const {
    for (auto pair = pairs_.rbegin(); pair != pairs_.rend(); ++pair)
        if (pair->first == key) return &pair->second;
    return nullptr;
}
