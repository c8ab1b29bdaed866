#include "plugins/av/source/optionlist.h"

#include <algorithm>
#include <memory>
#include <new>
#include <numeric>

namespace av {

namespace {

struct FreeText {
    void operator()(char* text) const { av_free(text); }
};

// Up to one of the ends, where `text` points then.
std::unique_ptr<char, FreeText> word(const char*& text, const char* ends) {
    std::unique_ptr<char, FreeText> made(av_get_token(&text, ends));
    if (!made) throw std::bad_alloc();
    return made;
}

// Letters to change, add or leave out.
std::size_t distance(std::string_view a, std::string_view b) {
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), std::size_t{0});
    for (std::size_t i = 0; i < a.size(); ++i) {
        std::size_t before = row[0];
        row[0] = i + 1;
        for (std::size_t j = 0; j < b.size(); ++j) {
            const std::size_t changed = before + (a[i] != b[j]);
            before = row[j + 1];
            row[j + 1] = std::min({changed, row[j] + 1, row[j + 1] + 1});
        }
    }
    return row.back();
}

}  // namespace

int checked(int result) {
    if (result == AVERROR(ENOMEM)) throw std::bad_alloc();
    return result;
}

void setEntry(AVDictionary*& list, const char* name, const std::string& value, int flags) {
    checked(av_dict_set(&list, name, value.c_str(), flags));
}

bool OptionList::parse(const std::string& text) {
    const char* rest = text.c_str();
    while (*rest) {
        const auto name = word(rest, "=");
        if (!*name || *rest != '=') return false;
        ++rest;
        const auto value = word(rest, ":");
        if (!*value) return false;
        set(name.get(), value.get());
        if (*rest) ++rest;
    }
    return true;
}

std::vector<std::string> writingOptions(std::initializer_list<const AVClass*> classes) {
    std::vector<std::string> all;
    for (const AVClass* const kind : classes) {
        const AVOption* option = nullptr;
        while (kind && (option = av_opt_next(&kind, option)))
            if (option->type != AV_OPT_TYPE_CONST && (option->flags & AV_OPT_FLAG_ENCODING_PARAM))
                all.emplace_back(option->name);
    }
    return all;
}

std::string similarNames(std::string_view name, const std::vector<std::string>& all) {
    constexpr std::size_t longest = 64, most = 3;
    if (name.size() > longest) return "";
    const std::size_t letters = std::clamp<std::size_t>(name.size() / 3, 1, 2);
    std::string text;
    std::size_t count = 0;
    for (const std::string& other : all)
        if (count < most && distance(name, other) <= letters)
            text += (count++ == 0 ? "'" : ", '") + other + "'";
    return text;
}

}  // namespace av
