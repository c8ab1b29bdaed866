// "key=value,key=value" as in "testgen:size=1280x720,rate=25" and "scaler:kind=2". A backslash before a comma
// or a backslash makes it a part of the value; so is all of a list, "key=[1,2],key=value".
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

class KeyValues {
  public:
    // Throws Failure (usage), with `option` in the line, for a pair without "=", a key that is not among
    // `known` (any key when that is empty), or one that is given twice.
    KeyValues(std::string_view text, const std::vector<std::string>& known, std::string_view option);

    // The value of a key, or null.
    const std::string* find(std::string_view key) const;
    const std::vector<std::pair<std::string, std::string>>& all() const { return pairs_; }

  private:
    std::vector<std::pair<std::string, std::string>> pairs_;
};
