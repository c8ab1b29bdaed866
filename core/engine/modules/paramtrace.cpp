#include <string>

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/qvutil.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr int setParamColumn = 40;

Any valueText(const Any& value) {
    switch (value.type()) {
        case Any::Invalid: return Any("= n/a");
        case Any::Int32: return Any::sprintf("= %d", value.asInt32());
        case Any::Int64: return Any::sprintf("= %lld", value.asInt64());
        case Any::Float: return Any::sprintf("= %f", value.asFloat());
        case Any::String:
        case Any::WString: return value.toString();
        case Any::Generic:
            return Any::sprintf("= 0x%016llX", static_cast<unsigned long long>(
                                                   reinterpret_cast<std::uintptr_t>(value.asGeneric())));
        case Any::Framerate: return Any::strcat(Any("= "), value.asFramerate().desc(true, true));
        case Any::Point: return Any::sprintf("= (%d, %d)", value.asPoint().x(), value.asPoint().y());
        case Any::Pair: return Any::sprintf("= (%d, %d)", value.asPair().first, value.asPair().second);
        case Any::Bitrate: return Any::strcat(Any("= "), value.asBitrate().desc());
        case Any::MediaTime: return Any::sprintf("= %fs", value.asMediaTime().seconds());
        default: return Any("= (value)");
    }
}

bool isContainer(const Any& value) { return value.isDict() || value.isVector(); }

std::string lineOf(const char* label, const Any& value, int indent, int column) {
    std::string line(static_cast<std::size_t>(std::max(indent, 0)) * 2, ' ');
    line.append(label ? label : "").append(" [").append(Any::typeName(value.type())).append("] ");
    if (isContainer(value)) return line;
    line.resize(std::max(line.size(), static_cast<std::size_t>(std::max(column, 0))), ' ');
    const Any text = valueText(value);
    return line + text.asString("");
}

}  // namespace

void QvUtil::debugOutAny(const char* label, const Any& value, int indent, int column, bool recurse) {
    if (!qv_dbg()->hasTarget()) return;
    qv_dbg()->logs(QvLogMask::debug, lineOf(label, value, indent, column).c_str());
    if (!recurse) return;
    if (value.isDict()) debugOutDict(value.asDict(), indent + 1, column);
    if (value.isVector()) debugOutVector(value.asVector(), indent + 1, column);
}

void QvUtil::debugOutDict(const AnyDict& dict, int indent, int column) {
    for (const auto& [key, value] : dict) debugOutAny(key, *value, indent, column);
}

void QvUtil::debugOutVector(const AnyVector& vector, int indent, int column) {
    for (int i = 0; i < vector.size(); ++i)
        debugOutAny(std::to_string(i).c_str(), vector.at(i), indent, column);
}

void QvUtil::debugOutSetParam(const QvCodec* codec, const char* name, const Any& value) {
    const Any label = Any::sprintf("%s.setParam: %s", codec ? codec->name() : "unnamed", name ? name : "");
    debugOutAny(label.asString(), value, 0, setParamColumn);
}
