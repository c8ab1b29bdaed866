#include "core/document/qviniparser.h"

#include <charconv>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>

#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"

namespace {

constexpr std::size_t longestLine = 1024;
constexpr std::size_t shortestLine = 3;
constexpr std::string_view blanks = " \t";

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};
using File = std::unique_ptr<std::FILE, CloseFile>;

std::string_view trimmed(std::string_view text, std::string_view atEnd = blanks) {
    text.remove_prefix(std::min(text.find_first_not_of(blanks), text.size()));
    return text.substr(0, text.find_last_not_of(atEnd) + 1);
}

Any textOf(std::string_view text) { return Any(std::string(text).c_str()); }

// One line without its end, kept up to the longest and read through to the end.
struct Line {
    std::string text;
    bool cut = false;
};

bool readLine(std::FILE* file, Line& line) {
    line = {};
    int c = std::getc(file);
    if (c == EOF) return false;
    for (; c != EOF && c != '\n'; c = std::getc(file)) {
        if (line.text.size() < longestLine)
            line.text.push_back(static_cast<char>(c));
        else if (c != '\r')
            line.cut = true;
    }
    return true;
}

// The state of one reading.
class Reading {
  public:
    Reading(AnyVector& errors, AnyVector& sections, std::vector<std::size_t>& starts, std::string& items)
        : errors_(errors), sections_(sections), starts_(starts), items_(items) {}

    int run(std::FILE* file) {
        constexpr std::string_view byteOrderMark = "\xEF\xBB\xBF";
        Line line;
        for (number_ = 1; readLine(file, line); ++number_) {
            if (number_ == 1 && line.text.starts_with(byteOrderMark))
                line.text.erase(0, byteOrderMark.size());
            if (line.cut) refuse("line too long, cut to 1024 characters");
            take(trimmed(line.text, " \t\r\n"));
        }
        if (std::ferror(file)) refuse("read failed", QvStatus::cannotParse);
        return status_;
    }

  private:
    void take(std::string_view line) {
        if (line.empty() || line.front() == '#' || line.front() == '!') return;
        if (line.size() < shortestLine && line.front() != '[' && separatorOf(line) == line.npos) {
            report("line too short");
            return;
        }
        if (line.find('\0') != line.npos) return refuse("can't parse line");
        if (line.front() == '[') return takeSection(line);
        if (starts_.empty()) return refuse("data outside section");
        takePair(line);
    }

    void takeSection(std::string_view line) {
        const std::size_t end = line.find(']');
        if (end == line.npos || end == 1) return refuse("unterminated or empty section");
        starts_.push_back(items_.size());
        sections_.append(textOf(line.substr(1, end - 1)));
    }

    void takePair(std::string_view line) {
        const std::size_t separator = separatorOf(line);
        if (separator == line.npos) return refuse("can't parse line");
        const std::string_view key = trimmed(line.substr(0, separator));
        const std::string_view value = trimmed(line.substr(separator + 1));
        if (key.empty()) return refuse("key too short");
        if (value.empty()) return refuse("value too short");
        items_.append(key).push_back('\0');
        items_.append(value).push_back('\0');
    }

    static std::size_t separatorOf(std::string_view line) {
        const std::size_t equals = line.find('=');
        return equals != line.npos ? equals : line.find(':');
    }

    void report(const char* what) {
        if (errors_.size() == QvIniParser::maxErrors) what = "further messages are left out";
        if (errors_.size() <= QvIniParser::maxErrors)
            errors_.append(Any::sprintf("line %d: %s", number_, what));
    }
    void refuse(const char* what, int status = QvStatus::noSegment) {
        report(what);
        status_ = status;
    }

    AnyVector& errors_;
    AnyVector& sections_;
    std::vector<std::size_t>& starts_;
    std::string& items_;
    int number_ = 1;
    int status_ = QvStatus::ok;
};

}  // namespace

int QvIniParser::load(const Any& name, AnyVector* errors) {
    errors_.clear();
    sections_.clear();
    starts_.clear();
    items_.clear();
    int result = QvStatus::cannotParse;
    const File file(static_cast<std::FILE*>(name.isText() ? qvfopen(name, "r") : nullptr));
    if (file)
        result = Reading(errors_, sections_, starts_, items_).run(file.get());
    else
        errors_.append(Any("Failed to open file"));
    if (errors) *errors = errors_;
    return result;
}

Any QvIniParser::section(int index) const { return sections_.at(index); }

// Calls visit(key, value) for each item of the sections of this name, until it returns true. False if there
// is no such section.
template <class Visit>
bool QvIniParser::visitItems(const char* section, Visit visit) const {
    bool found = false;
    for (int i = 0; i < sections_.size(); ++i) {
        if (!(sections_.at(i) == section)) continue;
        found = true;
        const auto place = static_cast<std::size_t>(i);
        const char* key = items_.data() + starts_[place];
        const char* const end =
            items_.data() + (place + 1 < starts_.size() ? starts_[place + 1] : items_.size());
        while (key < end) {
            const char* const value = key + std::strlen(key) + 1;
            if (visit(key, value)) return true;
            key = value + std::strlen(value) + 1;
        }
    }
    return found;
}

int QvIniParser::getSectionItems(const char* section, AnyDict* items) const {
    items->clear();
    const bool found = visitItems(section, [items](const char* text, const char* value) {
        const std::string key = std::string(text).substr(0, AnyDict::maxKeyLength);
        if (!items->isSet(key.c_str())) items->set(key.c_str(), Any(value));
        return false;
    });
    return found ? 0 : -1;
}

Any QvIniParser::getValue(const char* section, const char* key) const {
    Any result;
    visitItems(section, [&](const char* candidate, const char* value) {
        if (!key || std::strcmp(candidate, key) != 0) return false;
        result = value;
        return true;
    });
    return result;
}

template <class Number>
Number QvIniParser::number(const char* section, const char* key, Number fallback, const char* failure) {
    const Any value = getValue(section, key);
    if (!value.isString()) return fallback;
    const char* const text = value.asString();
    const char* const end = text + std::strlen(text);
    Number result{};
    const auto [stopped, error] =
        std::from_chars(*text == '+' && text[1] != '-' ? text + 1 : text, end, result);
    if (error == std::errc() && stopped == end) return result;
    errors_.append(Any(failure));
    qv_dbg()->error("%s", failure);
    return fallback;
}

int QvIniParser::getInt32Value(const char* section, const char* key, int fallback) {
    return number(section, key, fallback, "Couldn't read int value");
}

long long QvIniParser::getInt64Value(const char* section, const char* key, long long fallback) {
    return number(section, key, fallback, "Couldn't read int64_t value");
}

double QvIniParser::getFloatValue(const char* section, const char* key, double fallback) {
    return number(section, key, fallback, "Couldn't read double value");
}
