#include "tarsel/words/listvalue.h"

#include <climits>

#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int deepest = 16;  // lists in lists

bool isTooDeep(const Json& json, int depth) {
    if (depth > deepest) return true;
    for (const Json& part : json)
        if (part.is_structured() && isTooDeep(part, depth + 1)) return true;
    return false;
}

Any anyOf(const Json& json) {
    if (json.is_boolean()) return Any(json.get<bool>() ? 1 : 0);
    if (json.is_string()) return Any(json.get_ref<const std::string&>().c_str());
    if (json.is_number_float()) return Any(json.get<double>());
    if (json.is_number_unsigned() && json.get<unsigned long long>() > LLONG_MAX)
        return Any(json.get<double>());
    if (json.is_number()) {
        const auto whole = json.get<long long>();
        return whole >= INT_MIN && whole <= INT_MAX ? Any(static_cast<int>(whole)) : Any(whole);
    }
    if (json.is_array()) {
        AnyVector list;
        for (const Json& part : json) list.append(anyOf(part));
        return Any(list);
    }
    AnyDict dict;
    for (const auto& [key, value] : json.items()) dict.set(key.c_str(), anyOf(value));
    return json.is_object() ? Any(dict) : Any();
}

}  // namespace

Any parseList(const std::string& text, const std::string& option) {
    const Json json = Json::parse(text, nullptr, false);
    if (!json.is_array() || isTooDeep(json, 1)) throw failure(Msg::listWrong, {option, text});
    return anyOf(json);
}

size_t listLength(std::string_view text) {
    int depth = 0;
    bool quoted = false;
    for (size_t i = 0; i < text.size() && (i == 0 ? text[0] == '[' : true); ++i) {
        const char c = text[i];
        if (quoted) {
            if (c == '\\') ++i;
            if (c == '"') quoted = false;
            continue;
        }
        if (c == '"') quoted = true;
        if (c == '[' || c == '{') ++depth;
        if ((c == ']' || c == '}') && --depth == 0) return i + 1;
    }
    return 0;
}
