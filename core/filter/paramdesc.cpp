#include "core/filter/paramdesc_p.h"

#include "core/arch/qvassert.h"
#include "core/filter/qvprocessutil.h"

namespace {

bool isDescribable(int type) {
    return type == Any::Int32 || type == Any::Float || type == Any::String || type == Any::WString;
}

bool isTextType(int type) { return type == Any::String || type == Any::WString; }

AnyDict baseDesc(const char* name, int type, int guiControl, const char* description) {
    AnyDict desc;
    desc.set("name", name);
    desc.set("type", type);
    desc.set("guiControl", guiControl);
    desc.set("description", description ? description : "");
    return desc;
}

bool isValidRange(const AnyDict& range, int type) {
    const Any& min = range.get("min");
    const Any& max = range.get("max");
    return min.type() == type && max.type() == type && !(min > max);
}

bool allOfType(const AnyVector& values, int type) {
    for (int i = 0; i < values.size(); ++i)
        if (values.at(i).type() != type) return false;
    return true;
}

// The first fault after a good name, or null.
const char* findFault(const AnyDict& desc) {
    if (!desc.get("type").isInt32()) return "missing 'type'";
    if (!desc.get("guiControl").isInt32()) return "missing 'guiControl'";
    const int type = desc.get("type").asInt32();
    const int control = desc.get("guiControl").asInt32();
    if (!isDescribable(type)) return "Currently only int32, float, string and wstring types supported";
    if (control < QV_GUI_EDITBOX || control > QV_GUI_COMBOBOX)
        return "Invalid gui control type, must be one of QvGuiControl enum";

    const bool range = desc.isSet("range");
    const bool allowed = desc.isSet("allowed");
    if (range && allowed) return "Can not have 'range' and 'allowed' at the same time";
    if (range && isTextType(type)) return "Can not have 'range' for strings";
    if (range && !(desc.get("range").isDict() && isValidRange(desc.get("range").asDict(), type)))
        return "invalid range dict, must have 'min' and 'max' entries with type equal to param type, and "
               "min <= max";
    if (allowed && !(desc.get("allowed").isVector() && allOfType(desc.get("allowed").asVector(), type)))
        return "invalid allowed vector, all elements must be of same type as param type";

    switch (control) {
        case QV_GUI_FILESELECT_LOAD:
        case QV_GUI_FILESELECT_SAVE:
            if (!isTextType(type))
                return "QV_GUI_FILESELECT_LOAD(SAVE) can be used only for string or wstring types";
            break;
        case QV_GUI_CHECKBOX:
            if (type != Any::Int32) return "QV_GUI_CHECKBOX can be used only for Any::INT32 type";
            break;
        case QV_GUI_SLIDER:
            if (isTextType(type)) return "QV_GUI_SLIDER can not be used for string type";
            if (!range) return "QV_GUI_SLIDER must have defined range";
            break;
        case QV_GUI_COMBOBOX:
            if (!allowed) return "QV_GUI_COMBOBOX must have defined allowed values";
            break;
    }
    return nullptr;
}

}  // namespace

AnyDict qvCreateParamDesc(const char* name, int type, int guiControl, const char* description, const Any& min,
                          const Any& max, const Any& step) {
    QV_ASSERT_MSG(name, "name");
    QV_ASSERT_MSG(isDescribable(type), "Currently only int32, float, string  and wstring types supported");
    AnyDict desc = baseDesc(name, type, guiControl, description);
    if (min.type() != type) return desc;
    QV_ASSERT_MSG(!isTextType(type), "Range only possible for numeric types");
    QV_ASSERT_MSG(max.type() == type && min < max,
                  "Both min and max values must be set, where min value is smaller than the max value");
    AnyDict range;
    range.set("min", min);
    range.set("max", max);
    if (step.type() == type) range.set("step", step);
    desc.set("range", range);
    return desc;
}

AnyDict qvCreateParamDesc(const char* name, int type, int guiControl, const char* description,
                          const AnyVector& allowed) {
    QV_ASSERT_MSG(name, "name");
    QV_ASSERT_MSG(isDescribable(type), "Currently only int32, float, string, and wstring types supported");
    QV_ASSERT_MSG(allOfType(allowed, type),
                  "Invalid type in allowedValues vector, not matching parameter type");
    AnyDict desc = baseDesc(name, type, guiControl, description);
    desc.set("allowed", allowed);
    return desc;
}

bool qvCheckParamDesc(const AnyDict& desc, Any* error) {
    constexpr int maxNameLength = 512;
    const Any& name = desc.get("name");
    if (!name.isString() || name.size() > maxNameLength) {
        if (error) *error = "missing 'name'";
        return false;
    }
    const char* fault = findFault(desc);
    if (fault && error) *error = Any::sprintf("\"%s\":%s", name.asString(), fault);
    return fault == nullptr;
}
