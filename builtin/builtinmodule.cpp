#include "builtin/builtinmodule.h"

#include <string>
#include <vector>

#include "core/engine/qvcodec.h"

namespace {

std::vector<std::string> words(std::string_view list) {
    std::vector<std::string> found;
    while (!list.empty()) {
        const auto end = std::min(list.find(' '), list.size());
        if (end > 0) found.emplace_back(list.substr(0, end));
        list.remove_prefix(std::min(end + 1, list.size()));
    }
    return found;
}

AnyVector texts(const char* list) {
    AnyVector vector;
    for (const auto& word : words(list)) vector.append(Any(word.c_str()));
    return vector;
}

// The first character in the lowest byte.
int fourcc(std::string_view name) {
    unsigned value = 0;
    for (std::size_t i = name.size(); i-- > 0;) value = value << 8 | static_cast<unsigned char>(name[i]);
    return static_cast<int>(value);
}

AnyVector fourccs(const char* list) {
    AnyVector vector;
    for (const auto& word : words(list)) vector.append(Any(fourcc(word)));
    return vector;
}

}  // namespace

QvBuiltinModule::QvBuiltinModule(const QvBuiltinRow& row)
    : QvModule(row.type, row.name, row.desc, row.displayName), row_(row) {
    if (row.exts) setAttr("exts", texts(row.exts));
    if (row.priority) setAttr("priority", row.priority);
    if (row.skipAuto) setAttr("skipAuto", 1);
    if (row.internal) setAttr("internal", 1);
    if (row.inFourcc) setAttr("inFOURCC", fourccs(row.inFourcc));
}

QvCodec* QvBuiltinModule::create() {
    QvCodec* codec = row_.create ? row_.create() : nullptr;
    return codec ? _setAttrs(codec) : nullptr;
}
