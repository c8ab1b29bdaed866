#include "tarsel/source/segmentwords.h"

#include <utility>

#include "tarsel/host/files.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

bool isInput(const std::string& name) { return Source::isGenerator(name) || exists(name); }

// What times are made of.
bool looksLikeRange(const std::string& text) {
    return text.find('-') != std::string::npos &&
           text.find_first_not_of("0123456789.:;f-") == std::string::npos;
}

std::vector<std::string> namesIn(const std::string& text) {
    if (isInput(text) && (exists(text) || text.find('+') == std::string::npos)) return {text};
    for (size_t plus = text.find('+'); plus != std::string::npos; plus = text.find('+', plus + 1)) {
        const std::string first = text.substr(0, plus), rest = text.substr(plus + 1);
        if (!isInput(first) || rest.empty()) continue;
        std::vector<std::string> names{first};
        for (auto& name : namesIn(rest)) names.push_back(std::move(name));
        return names;
    }
    return {text};
}

}  // namespace

TimeRange parseRange(const std::string& text, const std::string& option) {
    const size_t dash = text.find('-');
    if (dash == std::string::npos || text.size() == 1) throw failure(Msg::rangeWrong, {option, text});
    return {text.substr(0, dash), text.substr(dash + 1)};
}

SegmentWords parseSegment(const std::string& word) {
    const size_t at = word.rfind('@');
    std::vector<std::string> whole = namesIn(word);
    if (at == std::string::npos || !looksLikeRange(word.substr(at + 1)) || exists(whole.back()))
        return {std::move(whole), {}, word};
    return {namesIn(word.substr(0, at)), parseRange(word.substr(at + 1), word), word};
}
