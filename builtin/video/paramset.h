// "paramSet": the parameters that a user interface offers, from the rows that have a description.
#pragma once

#include <limits>
#include <string_view>

#include "core/engine/modules/params.h"
#include "core/filter/qvprocessutil.h"

namespace paramset {

constexpr double least = std::numeric_limits<double>::lowest(), most = std::numeric_limits<double>::max();

// A number of the type that the parameter has.
inline Any ofType(int type, double value) {
    return type == Any::Int32 ? Any(static_cast<int>(value)) : Any(value);
}

// The description of one row; an invalid value for one that no control can show.
inline Any describe(qvparam::Kind kind, const char* name, const char* label, double min, double max) {
    using enum qvparam::Kind;
    const int type = kind == number ? Any::Float : kind == text ? Any::String : Any::Int32;
    if (kind != number && kind != text && kind != integer && kind != flag) return {};
    if (kind == flag) return QvProcessUtil::createParamDesc(name, type, QV_GUI_CHECKBOX, label);
    if (kind == text) {
        const bool file = std::string_view(name).ends_with("filename");
        return QvProcessUtil::createParamDesc(name, type, file ? QV_GUI_FILESELECT_LOAD : QV_GUI_EDIT, label);
    }
    const bool slider = kind == number && min > least && max < most;
    if (min <= least || max >= most) return QvProcessUtil::createParamDesc(name, type, QV_GUI_EDIT, label);
    return QvProcessUtil::createParamDesc(name, type, slider ? QV_GUI_SLIDER : QV_GUI_EDIT, label,
                                          ofType(type, min), ofType(type, max));
}

}  // namespace paramset

// As QvProcessUtil::createParamDesc makes them: numbers between two limits are sliders, flags check boxes,
// names that end with "filename" files.
template <class Settings>
AnyVector qvParamSet(std::span<const QvParamRow<Settings>> rows) {
    AnyVector set;
    for (const auto& row : rows) {
        if (!*row.description) continue;
        const Any described =
            paramset::describe(qvparam::kindOfRow(row), row.name, row.description, row.min, row.max);
        if (described.isValid()) set.append(described);
    }
    return set;
}
