#include "tarsel/presets/presetwords.h"

#include "tarsel/words/failure.h"

namespace {

constexpr size_t kLongestName = 200;  // in bytes, as for the presets of plug-ins

}  // namespace

std::string onOneLine(const std::string& text) {
    std::string line;
    for (size_t at = 0; at < text.size();) {
        const char32_t character = QvUtf::next(text, at);
        QvUtf::append(line, isObeyed(character) ? U' ' : character);
    }
    return line;
}

std::string presetNameOf(const std::string& text) {
    const std::string line = onOneLine(text);
    std::string name;
    for (size_t at = line.find_first_not_of(' '); at < line.size();) {
        const size_t start = at;
        QvUtf::next(line, at);
        if (name.size() + (at - start) > kLongestName) break;
        name.append(line, start, at - start);
    }
    name.erase(name.find_last_not_of(' ') + 1);
    return name;
}

std::string faultOf(const QvPreset& preset) {
    const std::string fault = preset.error().toString().asString(""),
                      prefix = std::string(preset.name()) + " - ";
    return fault.starts_with(prefix) ? fault.substr(prefix.size()) : fault;
}
