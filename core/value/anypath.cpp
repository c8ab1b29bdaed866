#include "core/value/anypath_p.h"

#include "core/arch/cformat.h"
#include "core/value/numbertext_p.h"

namespace {

std::string_view takeComponent(std::string_view& path) {
    const std::size_t dot = path.find('.');
    const std::string_view component = path.substr(0, dot);
    path.remove_prefix(dot == std::string_view::npos ? path.size() : dot + 1);
    return component;
}

// Null for a format that fails, else the path in `buffer`.
template <std::size_t Size>
QV_PRINTF(2, 0)
const char* expanded(char (&buffer)[Size], const char* format, va_list args) {
    return format && qv_vformat(buffer, Size, format, args) >= 0 ? buffer : nullptr;
}

}  // namespace

Any* AnyPath::in(const AnyDict& dict, std::string_view key) { return dict.lookup(key); }

Any* AnyPath::in(const AnyVector& vector, std::string_view component) {
    const int index = qvParseInt32(component);
    return index < 0 || index >= vector.size() ? nullptr : vector.elements()[index];
}

template <class Container>
Any* AnyPath::walk(const Container& start, std::string_view path) {
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

Any* AnyPath::find(const AnyDict& start, const char* format, va_list args) {
    char buffer[1024];
    const char* const path = expanded(buffer, format, args);
    return path ? walk(start, path) : nullptr;
}

Any* AnyPath::find(const AnyVector& start, const char* format, va_list args) {
    char buffer[2048];
    const char* const path = expanded(buffer, format, args);
    return path ? walk(start, path) : nullptr;
}
