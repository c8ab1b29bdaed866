// A parameter whose value is one of several words: an enum from 0 on, and the words in the order of the enum.
//
//     constexpr std::array words{"none", "triangular"};
//     {.name = "dither", .member = wordParam<Settings, &Settings::dither, words>, ...}
#pragma once

#include <array>
#include <string>

#include "core/engine/modules/params.h"

template <class Settings, auto member, const auto& words>
int setWord(Settings& settings, const Any& value) {
    using Enum = std::remove_reference_t<decltype(settings.*member)>;
    std::string word;
    if (!(value.isString() || value.isWString()) || !qvparam::convert(value, word))
        return QvStatus::invalidParam;
    for (std::size_t i = 0; i < words.size(); ++i)
        if (word == words[i]) {
            settings.*member = static_cast<Enum>(i);
            return QvStatus::ok;
        }
    return QvStatus::invalidParam;
}

template <class Settings, auto member, const auto& words>
void getWord(const Settings& settings, Any& value) {
    value = words[static_cast<std::size_t>(settings.*member)];
}

template <class Settings, auto member, const auto& words>
constexpr QvParamAccess<Settings> wordParam{setWord<Settings, member, words>,
                                            getWord<Settings, member, words>};
