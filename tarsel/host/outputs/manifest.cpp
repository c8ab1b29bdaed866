#include "tarsel/host/outputs/manifest.h"

#include <cstdint>
#include <cstdio>
#include <set>

#include "tarsel/host/outputs/foldercalls.h"

namespace {

constexpr std::string_view kHead = "tarsel-manifest 1\n";
constexpr size_t kSumDigits = 16;

// FNV-1a of 64 bits: it finds what was cut or damaged, and need not withstand more.
std::string checksum(std::string_view text) {
    uint64_t sum = 0xcbf29ce484222325;
    for (const char c : text) sum = (sum ^ static_cast<unsigned char>(c)) * 0x100000001b3;
    char digits[kSumDigits + 1];
    std::snprintf(digits, sizeof digits, "%016llx", static_cast<unsigned long long>(sum));
    return digits;
}

std::string escaped(std::string_view name) {
    std::string text;
    for (const char c : name) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte <= 0x20 || byte == 0x7F || c == '%') {
            char escape[4];
            std::snprintf(escape, sizeof escape, "%%%02x", byte);
            text += escape;
        } else {
            text += c;
        }
    }
    return text;
}

int digit(char c) { return c >= '0' && c <= '9' ? c - '0' : c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1; }

bool unescape(std::string_view text, std::string& name) {
    for (size_t at = 0; at < text.size(); ++at) {
        if (text[at] != '%') {
            name += text[at];
            continue;
        }
        if (at + 2 >= text.size()) return false;
        const int high = digit(text[at + 1]), low = digit(text[at + 2]);
        if (high < 0 || low < 0) return false;
        name += static_cast<char>(high * 16 + low);
        at += 2;
    }
    return isEntryName(name);
}

void append(std::string& text, const char* kind, const std::vector<Manifest::Row>& rows) {
    for (const auto& row : rows)
        text.append(kind).append(escaped(row.hidden)).append(" ").append(escaped(row.name)).append("\n");
}

bool parseRow(std::string_view line, std::vector<Manifest::Row>& rows) {
    const size_t space = line.find(' ');
    Manifest::Row row;
    if (space == std::string_view::npos || !unescape(line.substr(0, space), row.hidden) ||
        !unescape(line.substr(space + 1), row.name))
        return false;
    rows.push_back(std::move(row));
    return true;
}

// Within a kind each name stands for one file; the same file may go in and a new one come out.
bool allDiffer(const Manifest& manifest) {
    std::set<std::string_view> hidden;
    for (const auto* rows : {&manifest.old, &manifest.fresh}) {
        std::set<std::string_view> names;
        for (const auto& row : *rows)
            if (!hidden.insert(row.hidden).second || !names.insert(row.name).second) return false;
    }
    return true;
}

}  // namespace

std::string Manifest::text() const {
    std::string text(kHead);
    append(text, "old ", old);
    append(text, "new ", fresh);
    return text + "end " + checksum(text) + "\n";
}

std::optional<Manifest> Manifest::parse(std::string_view text) {
    constexpr size_t endLine = 4 + kSumDigits + 1;
    if (text.size() < kHead.size() + endLine || text.substr(0, kHead.size()) != kHead) return std::nullopt;
    const std::string_view rows = text.substr(0, text.size() - endLine);
    if (text.substr(rows.size()) != "end " + checksum(rows) + "\n") return std::nullopt;
    Manifest manifest;
    for (size_t at = kHead.size(); at < rows.size();) {
        const size_t end = rows.find('\n', at);
        if (end == std::string_view::npos) return std::nullopt;
        const std::string_view line = rows.substr(at, end - at);
        const std::string_view kind = line.substr(0, 4);
        if (kind != "old " && kind != "new ") return std::nullopt;
        if (!parseRow(line.substr(4), kind == "old " ? manifest.old : manifest.fresh)) return std::nullopt;
        at = end + 1;
    }
    if (!allDiffer(manifest)) return std::nullopt;
    return manifest;
}
