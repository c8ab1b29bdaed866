#include "tarsel/words/valuetext.h"

#include <cmath>
#include <cstdio>

#include "tarsel/words/failure.h"
#include "tarsel/words/timespec.h"

std::string valueText(const Any& value) {
    if (value.isText()) {
        const Any text = value.toString();
        return inQuotes(text.asString(""));
    }
    char text[64];
    switch (value.type()) {
        case Any::Int32:
        case Any::Int64: return std::to_string(value.toInt64());
        case Any::Float: {
            const double number = value.asFloat();
            const bool whole = std::abs(number) < 1e15 && number == std::trunc(number);
            std::snprintf(text, sizeof text, whole ? "%.0f" : "%g", number);
            return text;
        }
        case Any::Point:
            return std::to_string(value.asPoint().x()) + "," + std::to_string(value.asPoint().y());
        case Any::Rect:
            return std::to_string(value.asRect().width()) + "x" + std::to_string(value.asRect().height()) +
                   "+" + std::to_string(value.asRect().left()) + "+" + std::to_string(value.asRect().top());
        case Any::Framerate: return formatRate(value.asFramerate());
        default: return "";
    }
}
