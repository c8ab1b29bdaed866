// A reader of INI files.
//
//     # comment             ! comment
//     [section]
//     key = value           key : value
//
// Keys and values are text without surrounding blanks and tabs; the key ends at the first "=", or without one
// at the first ":". Lines have at most 1,024 characters. Sections and keys may appear more than once: the
// first that answers wins. A byte order mark of UTF-8 at the start is skipped. A file takes less than 60
// times its size of memory; of more messages than maxErrors only the first are kept, with a last one that
// says so.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QV_API QvIniParser {
  public:
    static constexpr int maxErrors = 10'000;

    // Replaces what was loaded before. 0, -9 if the file can't be read, -15 if lines of it can't be
    // understood: the others are loaded all the same. With several failures the last stands. `errors`, which
    // may be null, is replaced by a message for each line that was passed over ("line %d: ..."), which may
    // also come with 0.
    int load(const Any& name, AnyVector* errors = nullptr);

    int nrSections() const { return sections_.size(); }
    Any section(int index) const;  // the name; invalid outside the range
    const AnyVector& sections() const { return sections_; }
    // Replaces `items` by all keys and values of a section. -1, with none, if there is no such section. Keys
    // are cut to the 40 characters that a dictionary holds; getValue finds longer ones.
    int getSectionItems(const char* section, AnyDict* items) const;

    Any getValue(const char* section, const char* key) const;  // a String; invalid if absent
    // The default if the value is absent, or, with a message in `errors()`, if it is not one whole number of
    // the type.
    int getInt32Value(const char* section, const char* key, int fallback);
    long long getInt64Value(const char* section, const char* key, long long fallback);
    double getFloatValue(const char* section, const char* key, double fallback);

    const AnyVector& errors() const { return errors_; }

  private:
    // Files may have millions of keys, so the items are no values of their own, but text: keys and values in
    // turn, each with its NUL. A section's begin at its start and end at the start of the next.
    AnyVector errors_;
    AnyVector sections_;
    std::vector<std::size_t> starts_;
    std::string items_;

    template <class Visit>
    bool visitItems(const char* section, Visit visit) const;
    template <class Number>
    Number number(const char* section, const char* key, Number fallback, const char* failure);
};
