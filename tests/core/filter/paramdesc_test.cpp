#include "core/filter/qvprocessutil.h"
#include "tests/support/checks.h"

namespace {

using U = QvProcessUtil;

AnyDict desc(int type, int control, const char* key = nullptr, const Any& value = {}) {
    AnyDict dict = U::createParamDesc("gain", type, control, nullptr);
    if (key) dict.set(key, value);
    return dict;
}

AnyDict range(const Any& min, const Any& max) { return AnyDict("min", min, "max", max); }

TEST(ParamDesc, HoldsWhatItIsMadeFrom) {
    const AnyDict full = U::createParamDesc("gain", Any::Float, QV_GUI_SLIDER, "Gain", -6.0, 6.0, 0.5);
    EXPECT_EQ(full, AnyDict("name", "gain", "type", 1, "guiControl", 2, "description", "Gain", "range",
                            AnyDict("min", -6.0, "max", 6.0, "step", 0.5)));
    const AnyDict noStep = U::createParamDesc("gain", Any::Float, QV_GUI_SLIDER, nullptr, -6.0, 6.0, 1);
    EXPECT_EQ(noStep, AnyDict("name", "gain", "type", 1, "guiControl", 2, "description", "", "range",
                              range(-6.0, 6.0)));
    const AnyDict choice = U::createParamDesc("gain", Any::String, QV_GUI_COMBOBOX, "", AnyVector("a", "b"));
    EXPECT_EQ(choice, AnyDict("name", "gain", "type", 2, "guiControl", 6, "description", "", "allowed",
                              AnyVector("a", "b")));
    for (const auto& good : {full, noStep, choice}) EXPECT_TRUE(U::checkParamDesc(good));
    EXPECT_FALSE(U::createParamDesc("gain", Any::Float, 1, "", 1, 2).isSet("range"));

    const std::string order =
        "Both min and max values must be set, where min value is smaller than the max value";
    EXPECT_EQ(failureOf([] { U::createParamDesc(nullptr, Any::Int32, 1, ""); }), "name");
    EXPECT_EQ(failureOf([] { desc(Any::Int64, 1); }),
              "Currently only int32, float, string  and wstring types supported");
    EXPECT_EQ(failureOf([] { U::createParamDesc("x", Any::Int64, 1, "", AnyVector()); }),
              "Currently only int32, float, string, and wstring types supported");
    for (const Any& max : {Any(1), Any(2.0), Any()})
        EXPECT_EQ(failureOf([&] { U::createParamDesc("x", Any::Int32, 1, "", 1, max); }), order);
    EXPECT_EQ(failureOf([] { U::createParamDesc("x", Any::String, 1, "", "a", "b"); }),
              "Range only possible for numeric types");
    EXPECT_EQ(failureOf([] { U::createParamDesc("x", Any::Int32, 1, "", AnyVector(1, 2.0)); }),
              "Invalid type in allowedValues vector, not matching parameter type");
}

TEST(ParamDesc, TheFirstFaultIsTold) {
    const auto name = [](std::size_t length) { return Any(std::string(length, 'n').c_str()); };
    const char* badRange =
        "invalid range dict, must have 'min' and 'max' entries with type equal to param type, and min <= max";
    AnyDict both = desc(0, 1, "range", range(1, 2));
    both.set("allowed", AnyVector());
    const std::pair<AnyDict, const char*> rows[] = {
        {desc(0, 1, "name", 5), nullptr},
        {desc(0, 1, "name", name(513)), nullptr},
        {desc(0, 1, "type", "int"), "missing 'type'"},
        {desc(0, 1, "guiControl", 1.0), "missing 'guiControl'"},
        {desc(0, 0, "type", 6), "Currently only int32, float, string and wstring types supported"},
        {desc(0, 0), "Invalid gui control type, must be one of QvGuiControl enum"},
        {desc(0, 7), "Invalid gui control type, must be one of QvGuiControl enum"},
        {both, "Can not have 'range' and 'allowed' at the same time"},
        {desc(2, 1, "range", range("a", "b")), "Can not have 'range' for strings"},
        {desc(0, 1, "range", range(3, 2)), badRange},
        {desc(0, 1, "range", range(3, 4.0)), badRange},
        {desc(0, 1, "range", 5), badRange},
        {desc(0, 4, "allowed", AnyVector(1, "x")),
         "invalid allowed vector, all elements must be of same type as param type"},
        {desc(0, 5), "QV_GUI_FILESELECT_LOAD(SAVE) can be used only for string or wstring types"},
        {desc(1, 3), "QV_GUI_CHECKBOX can be used only for Any::INT32 type"},
        {desc(3, 2), "QV_GUI_SLIDER can not be used for string type"},
        {desc(0, 2), "QV_GUI_SLIDER must have defined range"},
        {desc(0, 6), "QV_GUI_COMBOBOX must have defined allowed values"},
    };
    for (const auto& [dict, text] : rows) {
        Any error;
        EXPECT_FALSE(U::checkParamDesc(dict, &error));
        EXPECT_EQ(error, Any(text ? (std::string("\"gain\":") + text).c_str() : "missing 'name'"));
        EXPECT_FALSE(U::checkParamDesc(dict));
    }
    EXPECT_TRUE(U::checkParamDesc(desc(0, 1, "name", name(512))));
    EXPECT_TRUE(U::checkParamDesc(desc(0, 1, "range", range(2, 2))));
}

}  // namespace
