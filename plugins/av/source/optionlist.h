// Names with values as the libraries take them: options as text, "name=value:name=value", and the tags of a
// film. What their own functions only report, that memory ends, is an exception here.
#pragma once

#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "plugins/av/source/avheaders.h"

namespace av {

// Sets a value in a list that the libraries own; nullptr begins one. `flags` are theirs, AV_DICT_*.
// Throws std::bad_alloc.
void setEntry(AVDictionary*& list, const char* name, const std::string& value, int flags = 0);

// Throws std::bad_alloc if that is what a result of the libraries says.
int checked(int result);

class OptionList {
  public:
    OptionList() = default;
    ~OptionList() { av_dict_free(&all_); }
    OptionList(const OptionList&) = delete;
    OptionList& operator=(const OptionList&) = delete;

    // Adds the entries of the text, where '\\' and quotes protect a separator. False if it is no such list;
    // those before the fault are added. Throws std::bad_alloc.
    bool parse(const std::string& text);
    void set(const char* name, const std::string& value, int flags = 0) {
        setEntry(all_, name, value, flags);
    }

    // For functions of the libraries, which take entries out and leave others there.
    AVDictionary** raw() { return &all_; }

    // The entry after `before`, the first after nullptr, nullptr at the end.
    const AVDictionaryEntry* next(const AVDictionaryEntry* before) const {
        return av_dict_get(all_, "", before, AV_DICT_IGNORE_SUFFIX);
    }

  private:
    AVDictionary* all_ = nullptr;
};

// Names of options for writing in these classes, any of which may be null.
std::vector<std::string> writingOptions(std::initializer_list<const AVClass*> classes);
// Those of at most three that are spelt nearly as `name`, each in quotes: "'crf', 'qp'"; "" if none is.
std::string similarNames(std::string_view name, const std::vector<std::string>& all);

}  // namespace av
