#include "tarsel/words/json.h"

#include <algorithm>

namespace {

constexpr char kHex[] = "0123456789abcdef";

int digitOf(char c) {
    const char* const found = std::find(kHex, kHex + 16, c);
    return found == kHex + 16 ? 0 : static_cast<int>(found - kHex);
}

}  // namespace

double numberIn(const Json& object, const char* key, double otherwise) {
    const auto found = object.find(key);
    return found != object.end() && found->is_number() ? found->get<double>() : otherwise;
}

std::string textIn(const Json& object, const char* key) {
    const auto found = object.find(key);
    return found != object.end() && found->is_string() ? found->get<std::string>() : "";
}

std::vector<std::string> textsIn(const Json& object, const char* key) {
    std::vector<std::string> texts;
    const auto found = object.find(key);
    if (found == object.end() || !found->is_array()) return texts;
    for (const Json& text : *found)
        if (text.is_string()) texts.push_back(text.get<std::string>());
    return texts;
}

std::string escapedBytes(const std::string& bytes) {
    std::string text;
    for (const char c : bytes) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte > 0x20 && byte < 0x7F && c != '%')
            text += c;
        else
            text += {'%', kHex[byte >> 4], kHex[byte & 15]};
    }
    return text;
}

std::string unescapedBytes(const std::string& text) {
    std::string bytes;
    for (size_t i = 0; i < text.size(); ++i) {
        const bool escape = text[i] == '%' && i + 2 < text.size();
        bytes += escape ? static_cast<char>(digitOf(text[i + 1]) * 16 + digitOf(text[i + 2])) : text[i];
        if (escape) i += 2;
    }
    return bytes;
}
