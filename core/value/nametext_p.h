// File names as plain text of either width, for the units that implement qvfileutil.h.
#pragma once

#include <string>
#include <utility>

#include "core/arch/widename.h"
#include "core/value/any.h"

namespace qvname {

template <class C>
using Text = std::basic_string<C>;

using Narrow = Text<char>;
using Wide = QvWideString;

template <class C>
bool isSeparator(C c) {
    return c == C('/') || c == C('\\');
}

inline Narrow narrow(const Any& name) {
    if (name.isString()) return name.asString();
    if (!name.isWString()) return {};
    const Wide units = name.asWString();
    return qv_narrow_name(units.data(), units.size());
}

inline Wide wide(const Any& name) {
    if (name.isWString()) return name.asWString();
    return name.isString() ? qv_wide_name(name.asString()) : Wide();
}

inline Any toAny(const Narrow& text) { return Any(text.c_str()); }
inline Any toAny(const Wide& text) { return Any(text.c_str()); }

template <class C>
Text<C> textOf(const Any& name) {
    if constexpr (sizeof(C) == 1)
        return narrow(name);
    else
        return wide(name);
}

// A literal of ASCII in the wished width.
template <class C>
Text<C> ascii(const char* literal) {
    Text<C> out;
    for (; *literal; ++literal) out.push_back(static_cast<C>(*literal));
    return out;
}

// What `operation` makes of the text of `name`, in the name's own width. Invalid if it is no text.
template <class Operation>
Any inWidth(const Any& name, Operation operation) {
    if (name.isString()) return toAny(operation(narrow(name)));
    if (name.isWString()) return toAny(operation(wide(name)));
    return Any();
}

}  // namespace qvname
