#include "plugins/av/text/eventtext.h"

#include <algorithm>
#include <utility>

namespace av {

namespace {

constexpr int fieldsBefore = 8;  // order, layer, style, name, three margins, effect

// What the tags of an event have set so far.
struct Style {
    bool italic = false, bold = false, drawing = false;
};

bool isNumber(std::string_view text) {
    return !text.empty() && text.find_first_not_of("0123456789") == text.npos;
}

// One tag without its backslash; what it becomes.
std::string translate(std::string_view tag, Style& style) {
    const std::string_view value = tag.substr(std::min<std::size_t>(tag.size(), 1));
    const bool off = value == "0";
    if (tag.substr(0, 2) == "an" && tag.size() == 3 && isNumber(tag.substr(2)))
        return "{\\" + std::string(tag) + "}";
    if (tag.substr(0, 1) == "p" && isNumber(value)) style.drawing = !off;
    const bool italic = tag.substr(0, 1) == "i" && isNumber(value),
               bold = tag.substr(0, 1) == "b" && isNumber(value), reset = tag.substr(0, 1) == "r";
    std::string made;
    if ((italic && off) || reset)
        if (std::exchange(style.italic, false)) made += "</i>";
    if ((bold && off) || reset)
        if (std::exchange(style.bold, false)) made += "</b>";
    if (italic && !off && !std::exchange(style.italic, true)) made += "<i>";
    if (bold && !off && !std::exchange(style.bold, true)) made += "<b>";
    return made;
}

std::string translateBlock(std::string_view block, Style& style) {
    std::string made;
    for (std::size_t at = block.find('\\'); at != block.npos;) {
        const std::size_t next = block.find('\\', at + 1);
        made += translate(block.substr(at + 1, std::min(next, block.size()) - at - 1), style);
        at = next;
    }
    return made;
}

}  // namespace

std::string textOfEvent(std::string_view event) {
    for (int i = 0; i < fieldsBefore; ++i) {
        const std::size_t comma = event.find(',');
        event.remove_prefix(comma == event.npos ? event.size() : comma + 1);
    }
    std::string text;
    Style style;
    for (std::size_t at = 0; at < event.size(); ++at) {
        const char c = event[at];
        const std::size_t close = c == '{' ? event.find('}', at) : event.npos;
        if (close != event.npos) {
            text += translateBlock(event.substr(at + 1, close - at - 1), style);
            at = close;
        } else if (style.drawing || c == '\r') {
            continue;
        } else if (c == '\\' && at + 1 < event.size() && std::string_view("Nnh").find(event[at + 1]) < 3) {
            text += event[++at] == 'h' ? ' ' : '|';
        } else {
            text += c == '\n' ? '|' : c;
        }
    }
    while (!text.empty() && text.back() == '|') text.pop_back();
    return text;
}

}  // namespace av
