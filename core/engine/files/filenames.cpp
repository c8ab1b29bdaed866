// File names as text: taking them apart and putting them together.
#include <algorithm>
#include <type_traits>

#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/value/nametext_p.h"

namespace {

using namespace qvname;

constexpr std::size_t longestOsName = 1023;

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
        return name.substr(0, 2) + ascii<C>(path_separator());
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
    unifySeparators(name, static_cast<C>(*path_separator()));
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
    return static_cast<C>(*path_separator());
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

bool hasWide(const AnyVector& parts) {
    for (int i = 0; i < parts.size(); ++i)
        if (parts.at(i).isWString()) return true;
    return false;
}

}  // namespace

Any QvFile::getPath(const Any& name) {
    return inWidth(name, [](const auto& text) { return path(text); });
}

Any QvFile::getFilename(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.getFilename: invalid argument type");
    return inWidth(name, [](const auto& text) { return filename(text); });
}

Any QvFile::getBasename(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.getBasename: invalid argument type");
    return inWidth(name, [](const auto& text) { return basename(text); });
}

Any QvFile::getExt(const Any& name, bool lower) {
    QV_ASSERT_MSG(name.isText(), "QvFile.getExt: filename argument must be string");
    const Any ext = inWidth(name, [](const auto& text) { return extension(text); });
    if (!lower) return ext;
    Narrow text = narrow(ext);
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return toAny(text);
}

Any QvFile::stripExt(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.stripExt: filename argument must be string");
    return inWidth(name, [](const auto& text) {
        const std::size_t length = extension(text).size();
        return length == 0 ? text : text.substr(0, text.size() - length - 1);
    });
}

Any QvFile::joinExt(const Any& name, const Any& ext) {
    QV_ASSERT_MSG(name.isText(), "QvFile.joinExt: filename argument must be string");
    QV_ASSERT_MSG(ext.isText(), "QvFile.joinExt: extension argument must be string");
    return inWidth(name, [&ext](const auto& text) {
        using C = typename std::decay_t<decltype(text)>::value_type;
        return joinedExt(text, textOf<C>(ext));
    });
}

Any QvFile::changeExt(const Any& name, const Any& ext) {
    const Any file = AnyVector(getBasename(name), ext).join(Any("."));
    return joinPath(getPath(name), file);
}

Any QvFile::joinPath(const Any& first, const Any& second) { return joinPath(AnyVector(first, second)); }

Any QvFile::joinPath(const AnyVector& parts) {
    if (parts.empty()) return Any("");
    if (parts.size() == 1) return parts.at(0);
    return hasWide(parts) ? toAny(joined<unsigned short>(parts)) : toAny(joined<char>(parts));
}

bool QvFile::isAbsolutePath(const Any& name) {
    QV_ASSERT_MSG(name.isText(), "QvFile.isAbsolutePath: invalid argument type");
    if (name.isWString()) {
        QV_ASSERT(name.size() > 0);
        return isAbsolute(wide(name));
    }
    QV_ASSERT(name.size() > 0);
    return isAbsolute(narrow(name));
}

void QvFile::winFname(const Any& in, Any& out) { out = osFname(in); }

Any QvFile::osFname(const Any& in) {
    return inWidth(in, [](const auto& text) { return osName(text); });
}

bool QvFile::setSeparator(Any& name, char separator) {
    bool changed = false;
    const Any unified = inWidth(name, [&](auto text) {
        using C = typename decltype(text)::value_type;
        changed = unifySeparators(text, static_cast<C>(separator));
        return text;
    });
    if (changed) name = unified;
    return changed;
}

Any QvFile::shellEscape(const Any& text) {
    return inWidth(text, [](const auto& plain) { return escaped(plain); });
}
