// What the raw encoders share: the form in which they store their parameter tables, and how they state a
// constant bit rate.
#pragma once

#include <algorithm>
#include <climits>

#include "core/engine/modules/params.h"
#include "core/measure/bitrate.h"

namespace rawsettings {

// Beyond what an integer holds the largest one.
template <class Number>
int bitrateInt(Number bitsPerSecond) {
    return static_cast<int>(std::min(bitsPerSecond, static_cast<Number>(INT_MAX)));
}

// The one range of an encoder that has no choice.
inline Any bitrateRange(int bitsPerSecond) {
    AnyDict constant("type", static_cast<int>(QvBitrate::cbr));
    constant.set("range", AnyVector(bitsPerSecond));
    AnyVector ranges;
    ranges.append(constant);
    return ranges;
}

// "settings": a dictionary of parameters.
template <class Encoder>
int apply(Encoder& encoder, const Any& settings) {
    return settings.isDict() ? encoder.setParamDict(settings.asDict()) : QvStatus::invalidParam;
}

// `module`: the encoder's name.
template <class Settings>
AnyDict stored(const char* module, std::span<const QvParamRow<Settings>> rows, const Settings& settings) {
    AnyDict dict;
    qvStoreParamRows(rows, settings, dict);
    return AnyDict("name", module, "settingsDict", dict);
}

// The older form has the settings next to the name, or in "settings". The caller has checked the name;
// restoreRows(dict) sets the encoder's rows.
template <class Encoder, class RestoreRows>
int restore(Encoder& encoder, const AnyDict& state, RestoreRows restoreRows) {
    const Any& current = state.get("settingsDict");
    if (current.isDict()) return restoreRows(current.asDict());
    const int rows = restoreRows(state);
    const Any& older = state.get("settings");
    return (older.isDict() ? encoder.setParamDict(older.asDict()) : QvStatus::ok) | rows;
}

}  // namespace rawsettings
