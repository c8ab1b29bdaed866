#include <gtest/gtest.h>

#include <string>

#include "core/engine/qvexception.h"
#include "core/filter/qvprocessutil.h"

namespace {

AnyDict desc(int type, int control) { return QvProcessUtil::createParamDesc("gain", type, control, nullptr); }

AnyDict with(AnyDict dict, const char* key, const Any& value) {
    dict.set(key, value);
    return dict;
}

AnyDict range(const Any& min, const Any& max) { return AnyDict("min", min, "max", max); }

TEST(ParamDesc, HoldsWhatItIsMadeFrom) {
    const AnyDict full =
        QvProcessUtil::createParamDesc("gain", Any::Float, QV_GUI_SLIDER, "Gain", -6.0, 6.0, 0.5);
    EXPECT_EQ(full, AnyDict("name", "gain", "type", 1, "guiControl", 2, "description", "Gain", "range",
                            AnyDict("min", -6.0, "max", 6.0, "step", 0.5)));
    const AnyDict noStep =
        QvProcessUtil::createParamDesc("gain", Any::Float, QV_GUI_SLIDER, nullptr, -6.0, 6.0, 1);
    EXPECT_EQ(noStep.get("range").asDict(), range(-6.0, 6.0));
    EXPECT_EQ(noStep.getString("description", "?"), std::string());
    EXPECT_FALSE(QvProcessUtil::createParamDesc("gain", Any::Float, 1, "", 1, 2).isSet("range"));
    const AnyDict choice =
        QvProcessUtil::createParamDesc("gain", Any::String, QV_GUI_COMBOBOX, "", AnyVector("a", "b"));
    EXPECT_EQ(choice.get("allowed").asVector(), AnyVector("a", "b"));
    for (const auto& good : {full, noStep, choice}) EXPECT_TRUE(QvProcessUtil::checkParamDesc(good));
}

TEST(ParamDesc, MisuseAsserts) {
    const auto text = [](auto make) -> std::string {
        try {
            make();
        } catch (const QvAssertFailure& failure) {
            return failure.what();
        }
        return "";
    };
    using U = QvProcessUtil;
    const std::string order =
        "Both min and max values must be set, where min value is smaller than the max value";
    EXPECT_NE(text([] { U::createParamDesc(nullptr, Any::Int32, 1, ""); }).find("name"), std::string::npos);
    EXPECT_NE(
        text([] { U::createParamDesc("x", Any::Int64, 1, ""); }).find("int32, float, string  and wstring"),
        std::string::npos);
    EXPECT_NE(
        text([] { U::createParamDesc("x", Any::Int64, 1, "", AnyVector()); }).find("string, and wstring"),
        std::string::npos);
    EXPECT_NE(text([] { U::createParamDesc("x", Any::Int32, 1, "", 1, 1); }).find(order), std::string::npos);
    EXPECT_NE(text([] { U::createParamDesc("x", Any::Int32, 1, "", 1, 2.0); }).find(order),
              std::string::npos);
    EXPECT_NE(text([] { U::createParamDesc("x", Any::String, 1, "", "a", "b"); }).find("Range only possible"),
              std::string::npos);
    EXPECT_NE(text([] {
                  U::createParamDesc("x", Any::Int32, 1, "", AnyVector(1, 2.0));
              }).find("Invalid type in allowedValues vector"),
              std::string::npos);
}

TEST(ParamDesc, TheFirstFaultIsTold) {
    struct Row {
        AnyDict desc;
        const char* text;
    };
    const AnyDict number = desc(Any::Int32, QV_GUI_EDITBOX);
    const AnyDict word = desc(Any::String, QV_GUI_EDITBOX);
    const std::string longName(513, 'n');
    const Row rows[] = {
        {with(number, "name", 5), "missing 'name'"},
        {with(number, "name", Any(longName.c_str())), "missing 'name'"},
        {with(number, "type", "int"), "\"gain\":missing 'type'"},
        {with(number, "guiControl", 1.0), "\"gain\":missing 'guiControl'"},
        {with(number, "type", 6), "\"gain\":Currently only int32, float, string and wstring types supported"},
        {with(number, "guiControl", 0),
         "\"gain\":Invalid gui control type, must be one of QvGuiControl enum"},
        {with(number, "guiControl", 7),
         "\"gain\":Invalid gui control type, must be one of QvGuiControl enum"},
        {with(with(number, "range", range(1, 2)), "allowed", AnyVector()),
         "\"gain\":Can not have 'range' and 'allowed' at the same time"},
        {with(word, "range", range("a", "b")), "\"gain\":Can not have 'range' for strings"},
        {with(number, "range", range(3, 2)),
         "\"gain\":invalid range dict, must have 'min' and 'max' entries with type equal to param type, and "
         "min <= max"},
        {with(number, "range", 5),
         "\"gain\":invalid range dict, must have 'min' and 'max' entries with type equal to param type, and "
         "min <= max"},
        {with(number, "allowed", AnyVector(1, "x")),
         "\"gain\":invalid allowed vector, all elements must be of same type as param type"},
        {desc(Any::Int32, QV_GUI_FILESELECT_SAVE),
         "\"gain\":QV_GUI_FILESELECT_LOAD(SAVE) can be used only for string or wstring types"},
        {desc(Any::Float, QV_GUI_CHECKBOX), "\"gain\":QV_GUI_CHECKBOX can be used only for Any::INT32 type"},
        {desc(Any::WString, QV_GUI_SLIDER), "\"gain\":QV_GUI_SLIDER can not be used for string type"},
        {desc(Any::Int32, QV_GUI_SLIDER), "\"gain\":QV_GUI_SLIDER must have defined range"},
        {desc(Any::Int32, QV_GUI_COMBOBOX), "\"gain\":QV_GUI_COMBOBOX must have defined allowed values"},
    };
    for (const auto& row : rows) {
        Any error;
        EXPECT_FALSE(QvProcessUtil::checkParamDesc(row.desc, &error));
        EXPECT_TRUE(error == row.text) << error.asString("") << "\n" << row.text;
        EXPECT_FALSE(QvProcessUtil::checkParamDesc(row.desc));
    }
    const std::string edge(512, 'n');
    EXPECT_TRUE(QvProcessUtil::checkParamDesc(with(number, "name", Any(edge.c_str()))));
    EXPECT_TRUE(QvProcessUtil::checkParamDesc(with(number, "range", range(2, 2))));
}

}  // namespace
