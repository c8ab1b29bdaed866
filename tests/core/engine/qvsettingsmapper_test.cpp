#include "core/engine/qvsettingsmapper.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstddef>
#include <cstring>
#include <string>

#include "tests/support/log_capture.h"

namespace {

struct Settings {
    unsigned char level = 1;
    short shift = 2;
    int gop = 3;
    double quality = 4;
    long long bytes = 5;
    char preset[8] = "none";
    int matrix[3] = {7, 8, 9};
    char names[2][4] = {"a", "b"};
    int guard = 77;
    char last[4] = "end";
};

constexpr ParamSpec rows[] = {
    {"level", ParamSpec::typeByte, offsetof(Settings, level)},
    {"shift", ParamSpec::typeShort, offsetof(Settings, shift), 1},
    {"gop", ParamSpec::typeInt, offsetof(Settings, gop)},
    {"quality", ParamSpec::typeDbl, offsetof(Settings, quality)},
    {"bytes", ParamSpec::typeLoad, offsetof(Settings, bytes)},
    {"preset", ParamSpec::typeStr, offsetof(Settings, preset)},
    {"matrix", ParamSpec::typeInt, offsetof(Settings, matrix), 3},
    {"names", ParamSpec::typeStr, offsetof(Settings, names), 2, 4},
    {"guard", ParamSpec::typeInt, offsetof(Settings, guard)},
    {"last", ParamSpec::typeStr, offsetof(Settings, last)},
    {"odd", 9, offsetof(Settings, gop)},
    {"odds", 9, offsetof(Settings, gop), 2},
    {},
};

class Mapper : public testing::Test {
  protected:
    QvSettingsMapper mapper{rows};
    Settings settings;
    LogCapture log;

    int set(const char* name, const Any& value) { return mapper.setFieldByName(&settings, name, value); }
    Any get(const char* name) { return mapper.getFieldByName(&settings, name); }
};

TEST_F(Mapper, NumbersTakeTheFieldsWidth) {
    EXPECT_EQ(set("level", 200), 0);
    EXPECT_TRUE(get("level") == Any(200));
    EXPECT_EQ(set("shift", -5), 0);
    EXPECT_TRUE(get("shift") == Any(-5));
    EXPECT_EQ(set("gop", Any(12LL)), 0);
    EXPECT_EQ(set("gop", 13.9), 0);
    EXPECT_TRUE(get("gop") == Any(13));
    EXPECT_EQ(set("bytes", 1LL << 40), 0);
    EXPECT_TRUE(get("bytes") == Any(1LL << 40));
    EXPECT_EQ(set("quality", 5), 0);
    EXPECT_TRUE(get("quality") == Any(5.0));
    EXPECT_EQ(set("quality", 0.25), 0);
    EXPECT_EQ(settings.quality, 0.25);
    EXPECT_EQ(set("bytes", 1e300), 0);
    EXPECT_GT(settings.bytes, LLONG_MAX - 2000);
}

TEST_F(Mapper, TextsFitWithTheirZeroOrAreRefused) {
    EXPECT_EQ(set("preset", "1234567"), 0);
    EXPECT_TRUE(get("preset") == "1234567");
    EXPECT_EQ(set("preset", "12345678"), -1);
    EXPECT_TRUE(get("preset") == "1234567");
    EXPECT_EQ(set("preset", u"wide"), 0);
    EXPECT_TRUE(get("preset") == "wide");
    EXPECT_TRUE(mapper.getField(&settings, rows[5]) == "wide");  // the row as the caller wrote it
    EXPECT_EQ(set("last", "x"), -1);                             // no field follows that would tell its size
    std::memset(settings.preset, 'z', sizeof settings.preset);
    EXPECT_TRUE(get("preset") == "zzzzzzzz");  // never read beyond the field
}

TEST_F(Mapper, VectorsSetWhatBothHaveAndWarn) {
    EXPECT_EQ(set("matrix", AnyVector(1, 2)), 0);
    EXPECT_TRUE(
        log.contains("[SettingsMapper]  Vector shorter than parameter matrix specification. Only first 2 of "
                     "3 el",
                     4));
    EXPECT_TRUE(get("matrix") == Any(AnyVector(1, 2, 9)));
    EXPECT_EQ(set("matrix", AnyVector(4, 5, 6, 7)), 0);
    EXPECT_TRUE(log.contains(
        "[SettingsMapper]  Vector longer than parameter matrix specification. It will be truncated to", 4));
    EXPECT_TRUE(get("matrix") == Any(AnyVector(4, 5, 6)));
    EXPECT_EQ(set("names", AnyVector("abc", "xyz")), 0);
    EXPECT_TRUE(get("names") == Any(AnyVector("abc", "xyz")));
    EXPECT_EQ(set("names", AnyVector("ok", "long")), -1);
    EXPECT_EQ(settings.guard, 77);
}

TEST_F(Mapper, WhatCannotBeIsALineInTheLog) {
    EXPECT_EQ(set(nullptr, 1), -1);
    EXPECT_EQ(set("absent", 1), -1);
    EXPECT_FALSE(get("absent").isValid());
    EXPECT_EQ(set("odd", 1), -1);
    EXPECT_EQ(set("matrix", 1), -1);
    EXPECT_FALSE(get("odds").isValid());
    EXPECT_EQ(set("gop", "text"), -1);
    EXPECT_EQ(set("gop", std::nan("")), -1);
    EXPECT_EQ(set("gop", Any()), -1);
    for (const char* line : {"[SettingsMapper] Can not set, unknown field (absent)",
                             "[SettingsMapper] Can not get, unknown field (absent)",
                             "[SettingsMapper] read field of unsupported type (odd)",
                             "[SettingsMapper] read vector field which is not a vector (matrix)",
                             "[SettingsMapper] read vector field of unsupported type (odds)"})
        EXPECT_TRUE(log.contains(line)) << line;
    EXPECT_EQ(settings.gop, 3);
}

TEST_F(Mapper, RecordsGoThroughADictionaryAndBack) {
    settings.matrix[1] = 42;
    AnyDict dict;
    mapper.structToDict(&settings, dict);
    EXPECT_TRUE(dict.get("preset") == "none");
    dict.remove("odd");
    dict.remove("odds");
    dict.remove("last");
    Settings other;
    EXPECT_EQ(mapper.dictToStruct(dict, &other), 0);
    EXPECT_EQ(other.matrix[1], 42);
    dict.set("unknown", 1);
    dict.set("zgop", 1);
    dict.set("shift", -9);
    EXPECT_EQ(mapper.dictToStruct(dict, &other), -1);
    EXPECT_EQ(other.shift, -9);
    AnyVector names;
    mapper.getNames(names);
    EXPECT_EQ(names.size(), 12);
}

}  // namespace
