// Text in documents.
#pragma once

#include <string_view>

#include "core/value/any.h"

inline bool qvIsAscii(std::string_view text) {
    unsigned char bits = 0;
    for (const char c : text) bits |= static_cast<unsigned char>(c);
    return bits < 0x80;
}

// A String for ASCII, else the UTF-8 as a WString.
Any qvXmlText(std::string_view text);

// True for what may name an element or attribute.
bool qvIsXmlName(const char* name);
