// File names as text, in either width: taking them apart and putting them together. Both "/" and "\\"
// separate.
#pragma once

#include <algorithm>
#include <string_view>

#include "core/value/anycontainer.h"
#include "core/value/nametext_p.h"

namespace qvname {

inline constexpr char platformSeparator[] = "/";
inline constexpr std::size_t longestOsName = 1023;

template <class C>
std::size_t afterLastSeparator(const Text<C>& name) {
    const auto last = std::find_if(name.rbegin(), name.rend(), isSeparator<C>);
    return static_cast<std::size_t>(name.rend() - last);
}

template <class C>
Text<C> filename(const Text<C>& name) {
    const std::size_t start = afterLastSeparator(name);
    const bool drive = name.size() > start + 1 && name[start + 1] == C(':');
    return name.substr(drive ? start + 2 : start);
}

template <class C>
Text<C> path(const Text<C>& name) {
    const std::size_t end = afterLastSeparator(name);
    if (end == 0 && name.size() > 1 && name[1] == C(':'))
        return name.substr(0, 2) + ascii<C>(platformSeparator);
    return name.substr(0, end);
}

template <class C>
Text<C> extension(const Text<C>& name) {
    const Text<C> file = filename(name);
    const std::size_t dot = file.rfind(C('.'));
    return file.size() < 2 || dot == Text<C>::npos ? Text<C>() : file.substr(dot + 1);
}

template <class C>
Text<C> basename(const Text<C>& name) {
    const Text<C> file = filename(name);
    return file.substr(0, file.rfind(C('.')));
}

template <class C>
bool isAbsolute(const Text<C>& name) {
    if (isSeparator(name.front())) return true;
    for (std::size_t i = 1; i < name.size() && !isSeparator(name[i]); ++i)
        if (name[i] == C(':')) return true;
    return false;
}

template <class C>
Text<C> joinedExt(Text<C> name, const Text<C>& ext) {
    if (name.empty() || name.back() != C('.')) name.push_back(C('.'));
    return name + ext;
}

template <class C>
bool unifySeparators(Text<C>& name, C separator) {
    bool changed = false;
    for (C& c : name) {
        if (!isSeparator(c) || c == separator) continue;
        c = separator;
        changed = true;
    }
    return changed;
}

template <class C>
Text<C> osName(Text<C> name) {
    name.resize(std::min(name.size(), longestOsName));
    unifySeparators(name, static_cast<C>(*platformSeparator));
    return name;
}

template <class C>
Text<C> escaped(const Text<C>& text) {
    constexpr std::string_view special = "|&;<>()$`\\\"' \t";
    Text<C> out;
    for (const C c : text) {
        const bool isSpecial =
            std::any_of(special.begin(), special.end(), [c](char s) { return c == static_cast<C>(s); });
        if (isSpecial) out.push_back(C('\\'));
        out.push_back(c);
    }
    return out;
}

template <class C>
Text<C> withoutOuterSeparators(const Text<C>& part) {
    const auto plain = [](C c) { return !isSeparator(c); };
    const auto first = std::find_if(part.begin(), part.end(), plain);
    const auto last = std::find_if(part.rbegin(), std::make_reverse_iterator(first), plain);
    return Text<C>(first, last.base());
}

template <class C>
C separatorOf(const AnyVector& parts) {
    for (int i = 0; i < parts.size(); ++i) {
        const Text<C> part = textOf<C>(parts.at(i));
        const auto found = std::find_if(part.begin(), part.end(), isSeparator<C>);
        if (found != part.end()) return *found;
    }
    return static_cast<C>(*platformSeparator);
}

// The first piece may be empty, and is so for a root: "/" and "a" give "" and "a", joined "/a".
template <class C>
Text<C> joined(const AnyVector& parts) {
    const C separator = separatorOf<C>(parts);
    Text<C> out;
    bool any = false;
    for (int i = 0; i < parts.size(); ++i) {
        Text<C> part = textOf<C>(parts.at(i));
        if (part.empty()) continue;
        if (!any) {
            if (isSeparator(part.back())) part.pop_back();
        } else {
            part = withoutOuterSeparators(part);
            if (part.empty()) continue;
            out.push_back(separator);
        }
        out += part;
        any = true;
    }
    unifySeparators(out, separator);
    return out;
}

inline bool hasWide(const AnyVector& parts) {
    for (int i = 0; i < parts.size(); ++i)
        if (parts.at(i).isWString()) return true;
    return false;
}

}  // namespace qvname
