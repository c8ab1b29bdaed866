// The walk along a path of keys and indices, as "files.0.name".
#include <charconv>
#include <cstdarg>
#include <string_view>

#include "core/arch/cformat.h"
#include "core/value/anycontainer.h"
#include "core/value/numbertext_p.h"

struct AnyPath {
    static Any* in(const AnyDict& dict, std::string_view key) { return dict.lookup(key); }

    static Any* in(const AnyVector& vector, std::string_view component) {
        const int index = qvParseInt32(component);
        return index < 0 || index >= vector.size() ? nullptr : vector.elements()[index];
    }

    template <class Container>
    static Any* walk(const Container& start, std::string_view path) {
        if (path.empty()) return nullptr;
        std::string_view component = takeComponent(path);
        Any* reached = in(start, component);
        while (reached && !path.empty()) {
            component = takeComponent(path);
            if (reached->isDict())
                reached = in(reached->asDict(), component);
            else
                reached = reached->isVector() ? in(reached->asVector(), component) : nullptr;
        }
        return reached;
    }

    static std::string_view takeComponent(std::string_view& path) {
        const std::size_t dot = path.find('.');
        const std::string_view component = path.substr(0, dot);
        path.remove_prefix(dot == std::string_view::npos ? path.size() : dot + 1);
        return component;
    }

    // The path, at most Size - 1 characters of it.
    template <std::size_t Size, class Container>
    QV_PRINTF(2, 0)
    static Any* expandAndWalk(const Container& start, const char* format, va_list args) {
        char path[Size];
        if (!format || qv_vformat(path, Size, format, args) < 0) return nullptr;
        return walk(start, path);
    }
};

Any* AnyDict::descendant(const char* format, ...) {
    va_list args;
    va_start(args, format);
    Any* const found = AnyPath::expandAndWalk<1024>(*this, format, args);
    va_end(args);
    return found;
}

const Any* AnyDict::descendant(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    const Any* const found = AnyPath::expandAndWalk<1024>(*this, format, args);
    va_end(args);
    return found;
}

Any* AnyVector::descendant(const char* format, ...) {
    va_list args;
    va_start(args, format);
    Any* const found = AnyPath::expandAndWalk<2048>(*this, format, args);
    va_end(args);
    return found;
}

const Any* AnyVector::descendant(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    const Any* const found = AnyPath::expandAndWalk<2048>(*this, format, args);
    va_end(args);
    return found;
}
