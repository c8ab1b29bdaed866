// The walk along a path of keys and indices, as "files.0.name".
#pragma once

#include <cstdarg>
#include <string_view>

#include "core/arch/api.h"
#include "core/value/anycontainer.h"

// A component is a key of a dictionary or an index of a vector.
struct AnyPath {
    // What the formatted path leads to, or null. A longer path is cut, to 1,023 bytes from a dictionary and
    // 2,047 from a vector.
    QV_PRINTF(2, 0) static Any* find(const AnyDict& start, const char* format, va_list args);
    QV_PRINTF(2, 0) static Any* find(const AnyVector& start, const char* format, va_list args);

  private:
    static Any* in(const AnyDict& dict, std::string_view key);
    static Any* in(const AnyVector& vector, std::string_view component);
    template <class Container>
    static Any* walk(const Container& start, std::string_view path);
};
