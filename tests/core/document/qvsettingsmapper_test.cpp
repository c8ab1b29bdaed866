#include "core/document/qvsettingsmapper.h"

#include <cmath>
#include <cstddef>
#include <cstring>

#include "tests/support/checks.h"

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

    int set(const char* name, const Any& value) { return mapper.setFieldByName(&settings, name, value); }
    Any get(const char* name) { return mapper.getFieldByName(&settings, name); }
};

TEST_F(Mapper, TextsFitWithTheirZeroOrAreRefused) {
    EXPECT_EQ(set("preset", "1234567"), 0);
    EXPECT_EQ(set("preset", "12345678"), -1);
    EXPECT_TRUE(get("preset") == "1234567");
    EXPECT_EQ(set("preset", u"wide"), 0);
    EXPECT_TRUE(mapper.getField(&settings, rows[5]) == "wide");  // the row as the caller wrote it
    EXPECT_EQ(set("last", "x"), -1);                             // no field follows that would tell its size
    std::memset(settings.preset, 'z', sizeof settings.preset);
    EXPECT_TRUE(get("preset") == "zzzzzzzz");  // never read beyond the field
}

TEST_F(Mapper, VectorsSetWhatBothHave) {
    EXPECT_EQ(set("matrix", AnyVector(1, 2)), 0);
    EXPECT_TRUE(get("matrix") == Any(AnyVector(1, 2, 9)));
    EXPECT_EQ(set("matrix", AnyVector(4, 5, 6, 7)), 0);
    EXPECT_TRUE(get("matrix") == Any(AnyVector(4, 5, 6)));
    EXPECT_EQ(set("names", AnyVector("abc", "xyz")), 0);
    EXPECT_TRUE(get("names") == Any(AnyVector("abc", "xyz")));
    EXPECT_EQ(set("names", AnyVector("ok", "long")), -1);
    EXPECT_EQ(settings.guard, 77);
}

TEST_F(Mapper, WhatCannotBeIsRefused) {
    for (const char* name : {"absent", "odd", "matrix", static_cast<const char*>(nullptr)})
        EXPECT_EQ(set(name, 1), -1);
    EXPECT_FALSE(get("absent").isValid() || get("odds").isValid());
    for (const Any& value : {Any("text"), Any(std::nan("")), Any()}) EXPECT_EQ(set("gop", value), -1);
    EXPECT_EQ(settings.gop, 3);
}

TEST_F(Mapper, RecordsGoThroughADictionaryAndBack) {
    settings.matrix[1] = 42;
    AnyDict dict;
    mapper.structToDict(&settings, dict);
    EXPECT_TRUE(dict.get("preset") == "none");
    for (const char* name : {"odd", "odds", "last"}) dict.remove(name);
    Settings other;
    EXPECT_EQ(mapper.dictToStruct(dict, &other), 0);
    EXPECT_EQ(other.matrix[1], 42);
    dict.update(AnyDict("unknown", 1, "shift", -9));
    EXPECT_EQ(mapper.dictToStruct(dict, &other), -1);
}

}  // namespace
