#include "core/engine/files/filelisting_p.h"

#include <algorithm>
#include <limits>
#include <optional>

#include "core/arch/platform.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/value/nametext_p.h"

namespace {

using namespace qvname;

// "*" any characters, "?" any one. After a mismatch only the last "*" takes one character more, so the time
// stays within the product of the lengths.
bool matches(std::string_view name, std::string_view pattern) {
    std::size_t n = 0, p = 0, retryName = 0, star = std::string_view::npos;
    while (n < name.size()) {
        if (p < pattern.size() && pattern[p] == '*') {
            star = p++;
            retryName = n;
        } else if (p < pattern.size() && (pattern[p] == '?' || pattern[p] == name[n])) {
            ++n;
            ++p;
        } else if (star != std::string_view::npos) {
            p = star + 1;
            n = ++retryName;
        } else {
            return false;
        }
    }
    return pattern.find_first_not_of('*', p) == std::string_view::npos;
}

// What `take` accepts of a folder's entries. nullopt, after a line in the log, if there is no such folder.
template <class Take>
std::optional<std::vector<std::string>> namesIn(const Any& folder, Take take) {
    const std::string place = qv_os_name(folder);
    std::vector<QvFolderEntry> entries;
    if (place.empty() || qv_platform().listFolder(place.c_str(), entries) != 0) {
        qv_dbg()->log(QvLogMask::debug,
                      folder.isWString() ? "get_folder_files_by_extW - Invalid (w)folder: %s"
                                         : "get_folder_files_by_extA - invalid folder: %s",
                      place.c_str());
        return std::nullopt;
    }
    std::vector<std::string> names;
    for (QvFolderEntry& entry : entries)
        if (take(entry)) names.push_back(std::move(entry.name));
    return names;
}

template <class Take>
void listMatching(const Any& folder, const char* ext, AnyVector* out, Take take) {
    out->clear();
    const std::string pattern = std::string("*") + (ext ? ext : "");
    bool matched = false;
    const auto names = namesIn(folder, [&](const QvFolderEntry& entry) {
        if (!matches(entry.name, pattern)) return false;
        matched = true;
        return static_cast<bool>(take(entry));
    });
    if (!names) return;
    if (!matched)
        qv_dbg()->log(QvLogMask::debug, "get_folder_files_by_ext%c - no files found: %s",
                      folder.isWString() ? 'W' : 'A', pattern.c_str());
    const std::string start = qv_os_name(folder) + path_separator();
    for (const std::string& name : *names) out->append(qv_any_name(start + name, folder));
}

template <class C>
std::size_t countLastDigits(const Text<C>& text) {
    const auto last = std::find_if(text.rbegin(), text.rend(), [](C c) { return c < C('0') || c > C('9'); });
    return static_cast<std::size_t>(last - text.rbegin());
}

// The number that a member's text after the prefix begins with, as atoi reads it. It must not be 0 unless the
// text is all zeros; a number of more than 31 bits is no frame's.
std::optional<int> memberNumber(const std::string& text) {
    if (text.find_first_not_of('0') == std::string::npos) return 0;
    std::size_t at = text.find_first_not_of(" \t\n\v\f\r");
    if (at == std::string::npos) return std::nullopt;
    const bool negative = text[at] == '-';
    if (negative || text[at] == '+') ++at;
    long long number = 0;
    for (; at < text.size() && text[at] >= '0' && text[at] <= '9'; ++at) {
        number = number * 10 + (text[at] - '0');
        if (number > std::numeric_limits<int>::max()) return std::nullopt;
    }
    if (number == 0) return std::nullopt;
    return static_cast<int>(negative ? -number : number);
}

struct Sequence {
    std::string ext;
    std::size_t length;  // of the base name
    std::string prefix;
};

std::optional<int> memberOf(const Sequence& sequence, const std::string& file) {
    const Any name(file.c_str());
    const std::string base = narrow(QvFile::getBasename(name));
    if (base.size() != sequence.length || !base.starts_with(sequence.prefix)) return std::nullopt;
    if (narrow(QvFile::getExt(name, false)) != sequence.ext) return std::nullopt;
    return memberNumber(base.substr(sequence.prefix.size()));
}

}  // namespace

void get_folder_files_by_ext(const Any& folder, const char* ext, AnyVector* out) {
    listMatching(folder, ext, out, [](const QvFolderEntry&) { return true; });
}

void get_folder_plugin_dlls(const Any& folder, AnyVector* out) {
    listMatching(folder, "_plugin.so", out, [](const QvFolderEntry& entry) { return !entry.isFolder; });
}

bool qvIsUnlisted(std::string_view name) {
    return name == "." || name == ".." || (name.front() == '.' && name.rfind('.') == 0);
}

AnyVector qvListFolder(const Any& folder, bool filesOnly) {
    AnyVector out;
    listMatching(folder, "", &out, [filesOnly](const QvFolderEntry& entry) {
        return !qvIsUnlisted(entry.name) && !(entry.isFolder && filesOnly);
    });
    return out;
}

// Works on bytes for wide names too: the digits are the same, and equal length in bytes after an equal prefix
// is equal length in units, since what follows is digits.
AnyVector qvNumberedSequence(const Any& name, int* digits) {
    int ignored;
    int& count = digits ? *digits : ignored;
    count = 0;
    if (!name.isText()) return {};
    const std::string base = narrow(QvFile::getBasename(name));
    count = static_cast<int>(countLastDigits(base));
    if (count == 0) return {};

    const Sequence sequence{narrow(QvFile::getExt(name, false)), base.size(),
                            base.substr(0, base.size() - static_cast<std::size_t>(count))};
    const Any path = QvFile::getPath(name);
    std::vector<int> numbers;
    const auto collect = [&](const QvFolderEntry& entry) {
        const auto number = entry.isFolder ? std::nullopt : memberOf(sequence, entry.name);
        if (number) numbers.push_back(*number);
        return false;
    };
    namesIn(path.size() > 0 ? QvFile::osFname(path) : Any("."), collect);
    if (numbers.size() < 2) {
        count = 0;
        return {};
    }
    std::sort(numbers.begin(), numbers.end());
    AnyVector out;
    for (const int number : numbers) out.append(Any(number));
    return out;
}
