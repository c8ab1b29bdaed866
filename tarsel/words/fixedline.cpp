#include "tarsel/words/fixedline.h"

FixedLine::FixedLine(Msg id, std::initializer_list<std::string_view> values) {
    const Message& row = messages()[static_cast<std::size_t>(id)];
    auto value = values.begin();
    std::string_view before = "tarsel: ";
    for (const std::string_view column : {row.what, row.why, row.remedy}) {
        if (!column.empty()) add(before);
        before = before == "tarsel: " ? ": " : "; ";
        for (std::size_t at = 0; at < column.size();) {
            const std::size_t open = std::min(column.find('{', at), column.size());
            add(column.substr(at, open - at));
            if (open == column.size()) break;
            const std::size_t close = column.find('}', open);
            const std::string_view placeholder = column.substr(open + 1, close - open - 1);
            const std::string_view word = value == values.end() ? std::string_view() : *value++;
            if (placeholder == "file" || placeholder == "name")
                addName(word);
            else
                add(word);
            at = close + 1;
        }
    }
    text_[length_++] = '\n';
}

void FixedLine::addName(std::string_view name) {
    add("'");
    for (const char c : name)
        add(static_cast<unsigned char>(c) < 0x20 || c == 0x7F ? "?" : std::string_view(&c, 1));
    add("'");
}
