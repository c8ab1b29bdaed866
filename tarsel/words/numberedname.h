// Output names that number what is written: "pic_%04d.png" is pic_0000.png, pic_0001.png and so on.
#pragma once

#include <optional>
#include <string>
#include <string_view>

class NumberedName {
  public:
    // `name`: a file name without its folder. Nothing unless it has "%d" or "%0Nd" (N from 1 to 9). Then "%%"
    // is a percent sign, and what else begins with '%' is refused: throws Failure (usage).
    static std::optional<NumberedName> parse(std::string_view name);
    // For names that have to number something anyway: also refuses other uses of '%' where there is no "%d".
    static std::optional<NumberedName> parseStrictly(std::string_view name);

    // The name of a number. `extension` (with its dot) takes the place of the name's own; "" keeps that.
    std::string at(long long number, std::string_view extension = "") const;
    // The name of what has no number, as the sound next to pictures: without the place of the number and what
    // separates it.
    std::string plain(std::string_view extension) const;
    // The n of which `name` is at(n, extension); one too large for the type is its largest number. Nothing
    // for other names.
    std::optional<long long> numberOf(std::string_view name, std::string_view extension = "") const;
    bool matches(std::string_view name, std::string_view extension = "") const {
        return numberOf(name, extension).has_value();
    }

  private:
    NumberedName() = default;

    std::string before_, after_, extension_;  // `after_` ends before the extension, which has its dot
    int digits_ = 1;                          // at least; filled with zeros
};

// A name without a place for a number, with '%' for "%%".
std::string withoutEscapes(std::string name);

// "c_%d.wav" for "c.wav", to show in a message.
std::string numberedLike(const std::string& name);
