#include "builtin/builtinmodule.h"

#include <algorithm>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/engine/modules/qvcodec.h"

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
    const QvBuiltinAttributes& more = row.attributes;
    if (more.exts) setAttr("exts", texts(more.exts));
    if (more.priority) setAttr("priority", more.priority);
    if (more.skipAuto) setAttr("skipAuto", 1);
    if (more.internal) setAttr("internal", 1);
    if (more.preroll) setAttr("preroll", more.preroll);
    if (more.inFourcc) setAttr("inFOURCC", fourccs(more.inFourcc));
}

QvCodec* QvBuiltinModule::create() {
    std::unique_ptr<QvCodec> codec(row_.create ? row_.create() : nullptr);
    if (!codec) return nullptr;
    _setAttrs(codec.get());
    return codec.release();
}
