#include "core/caption/subtitle/subtitlemarkup_p.h"

#include <algorithm>
#include <charconv>

#include "core/value/utf.h"

namespace {

using View = std::string_view;

std::string lower(View text) {
    std::string out(text);
    for (char& c : out)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c + ('a' - 'A'));
    return out;
}

constexpr struct {
    View name;
    char32_t character;
} entities[] = {
    {"amp", U'&'},     {"lt", U'<'},      {"gt", U'>'},      {"quot", U'"'},     {"apos", U'\''},
    {"nbsp", 0xA0},    {"lrm", 0x200E},   {"rlm", 0x200F},   {"hellip", 0x2026}, {"ndash", 0x2013},
    {"mdash", 0x2014}, {"lsquo", 0x2018}, {"rsquo", 0x2019}, {"ldquo", 0x201C},  {"rdquo", 0x201D},
};

constexpr View tags[] = {"<i>", "</i>", "<b>", "</b>", "<u>", "</u>", "<s>", "</s>", "<font>", "</font>"};

char32_t characterOf(View entity) {
    if (entity.starts_with('#')) {
        const bool hex = entity.size() > 1 && (entity[1] | 0x20) == 'x';
        const View digits = entity.substr(hex ? 2 : 1);
        unsigned value = 0;
        const auto [end, error] =
            std::from_chars(digits.data(), digits.data() + digits.size(), value, hex ? 16 : 10);
        const bool scalar = value >= 0x20 && value < 0x110000 && (value < 0xD800 || value > 0xDFFF);
        return error == std::errc() && end == digits.data() + digits.size() && scalar ? value : 0;
    }
    const auto* const row = std::find_if(std::begin(entities), std::end(entities),
                                         [entity](const auto& known) { return known.name == entity; });
    return row == std::end(entities) ? 0 : row->character;
}

// Bytes of the entity that a text begins with, which is appended to `out`; 0 without one.
std::size_t takeEntity(View text, std::string& out) {
    constexpr std::size_t longest = 10;
    const std::size_t end = text.substr(0, longest).find(';');
    if (text[0] != '&' || end == text.npos) return 0;
    const char32_t character = characterOf(text.substr(1, end - 1));
    if (character == 0) return 0;
    // A mark that is not drawn keeps it from opening a tag, and a bar from ending the line.
    QvUtf::append(out, character == U'|' ? 0xFF5C : character);
    if (character == U'<' || character == U'{') QvUtf::append(out, 0x2060);
    return end + 1;
}

// Likewise of a tag.
std::size_t takeTag(View text, bool brackets, std::string& out) {
    if (brackets && lower(text.substr(0, 4)) == "[br]") {
        out += '\n';
        return 4;
    }
    constexpr std::size_t longest = 256;
    const std::size_t end = text[0] == '<' ? text.substr(0, longest).find('>') : text.npos;
    if (end == text.npos) return 0;
    std::string tag = lower(text.substr(0, end + 1));
    if (tag.starts_with("<font ")) {
        out += tag;
        return end + 1;
    }
    std::erase(tag, ' ');
    if (tag == "<br>" || tag == "<br/>")
        out += '\n';
    else if (std::find(std::begin(tags), std::end(tags), tag) != std::end(tags))
        out += tag;
    else
        return 0;
    return end + 1;
}

struct Codes {
    bool italic = false, bold = false;
};

// "{y:i,b}" at the start of a line; others stay, the renderer leaves them out.
void takeCodes(View& line, Codes& one, Codes& all) {
    while (line.size() > 3 && line[0] == '{' && (line[1] | 0x20) == 'y' && line[2] == ':') {
        const std::size_t end = line.find('}');
        if (end == line.npos) return;
        const View values = line.substr(3, end - 3);
        Codes& codes = line[1] == 'Y' ? all : one;
        codes.italic |= values.find('i') != values.npos;
        codes.bold |= values.find('b') != values.npos;
        line.remove_prefix(end + 1);
    }
}

}  // namespace

std::string withSimpleMarkup(View line, bool brackets) {
    std::string out;
    while (!line.empty()) {
        std::size_t taken = takeEntity(line, out);
        if (taken == 0) taken = takeTag(line, brackets, out);
        if (taken == 0) out += line[taken++];
        line.remove_prefix(taken);
    }
    return out;
}

std::string withControlCodes(View text) {
    std::string out;
    Codes all;
    for (bool first = true; first || !text.empty(); first = false) {
        const std::size_t end = std::min(text.find('|'), text.size());
        View line = text.substr(0, end);
        Codes one;
        takeCodes(line, one, all);
        // There is one style at a time.
        const bool italic = one.italic || all.italic, bold = !italic && (one.bold || all.bold);
        out += italic ? "<i>" : bold ? "<b>" : "";
        out += line;
        out += italic ? "</i>" : bold ? "</b>" : "";
        if (end < text.size()) out += '|';
        text.remove_prefix(std::min(end + 1, text.size()));
    }
    return out;
}
