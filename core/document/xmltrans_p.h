// The names of the types in documents, shared by both forms of dictionaries.
#pragma once

#include <cstring>
#include <optional>

#include "core/value/any.h"

struct QvXmlType {
    int type;
    const char* element;
};

inline constexpr QvXmlType qvXmlTypes[] = {
    {Any::Invalid, "inv"}, {Any::Int32, "i32"},           {Any::Int64, "i64"},           {Any::Float, "fl"},
    {Any::String, "str"},  {Any::WString, "wstr"},        {Any::Generic, "gen"},         {Any::Dict, "dict"},
    {Any::Vector, "vec"},  {Any::Framerate, "framerate"}, {Any::Bitrate, "bitrate"},     {Any::Point, "pt"},
    {Any::Rect, "rect"},   {Any::Pair, "pair"},           {Any::MediaTime, "mediatime"},
};

inline std::optional<int> qvXmlTypeOf(const char* element) {
    if (!element) return std::nullopt;
    for (const QvXmlType& row : qvXmlTypes)
        if (std::strcmp(row.element, element) == 0) return row.type;
    return std::nullopt;
}

inline const char* qvXmlElementOf(int type) {
    for (const QvXmlType& row : qvXmlTypes)
        if (row.type == type) return row.element;
    return qvXmlTypes[0].element;
}

// A version as the text of an attribute; invalid for what is neither text nor number.
Any qvXmlVersionText(const Any& version);

// The text of a node's data, for what takes a plain C string. `scratch` keeps it alive.
const char* qvXmlDataText(const class XmlNode& node, Any& scratch);
