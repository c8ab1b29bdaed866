#include "builtin/shared/metainput.h"

#include <string_view>

#include "core/engine/status.h"

std::optional<int> MetaInput::set(const char* name, const Any& value, std::string& fault) {
    const std::string_view key = name;
    const bool isFile = key == "filename", isState = takesState_ && key == "metaState";
    if (!isFile && !isState && key != "openParameters") return std::nullopt;
    if (isFile ? !value.isText() : !value.isDict()) {
        if (!isFile && !isState) return QvStatus::invalidParam;
        fault = "Invalid value type for '" + std::string(key) + "'";
        return QvStatus::invalidStructure;
    }
    if (isFile) {
        filename = value;
        state.clear();
    } else if (isState) {
        state = value.asDict();
        if (!state.empty()) filename.invalidate();
    } else {
        openParams = value.asDict();
    }
    return QvStatus::ok;
}

bool MetaInput::get(const char* name, Any& value) const {
    const std::string_view key = name;
    if (key == "filename")
        value = filename;
    else if (takesState_ && key == "metaState")
        value = state;
    else
        return false;
    return true;
}
