#include "core/engine/qviniparser.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

class Ini : public testing::Test {
  protected:
    TempFolder temp;
    QvIniParser ini;
    std::vector<std::string> errors;

    int load(std::string_view text) {
        AnyVector found("left over");
        const int status = ini.load(Any(temp.write("x.ini", text).c_str()), &found);
        errors.clear();
        for (const Any& error : found) errors.push_back(error.asString(""));
        return status;
    }
    std::string value(const char* section, const char* key) {
        const Any found = ini.getValue(section, key);
        return found.isString() ? found.asString() : "(invalid)";
    }
};

using Messages = std::vector<std::string>;

TEST_F(Ini, LinesAreTakenApartAtTheirFirstSeparator) {
    EXPECT_EQ(load("# comment\r\n! comment\n\n \t\n[one]\nk = v \nc: d\nb=1:2\nm:x=y\n\tlong key =  a  "
                   "b\t\r\n[two] rest\n"
                   "a=b"),
              0);
    EXPECT_EQ(errors, Messages{});
    EXPECT_EQ(ini.nrSections(), 2);
    EXPECT_TRUE(ini.section(1) == "two");
    EXPECT_FALSE(ini.section(2).isValid());
    EXPECT_EQ(value("one", "k"), "v");
    EXPECT_EQ(value("one", "c"), "d");
    EXPECT_EQ(value("one", "b"), "1:2");
    EXPECT_EQ(value("one", "m:x"), "y");
    EXPECT_EQ(value("one", "long key"), "a  b");
    EXPECT_EQ(value("two", "a"), "b");
    EXPECT_EQ(value("two", "k"), "(invalid)");
    EXPECT_EQ(value("three", "a"), "(invalid)");
}

TEST_F(Ini, EachFaultHasItsMessageAndStatus) {
    const struct {
        std::string text;
        int status;
        Messages messages;
    } cases[] = {
        {"a", 0, {"line 1: line too short"}},
        {"[s]\nab", 0, {"line 2: line too short"}},
        {"[s]\na=", -15, {"line 2: value too short"}},
        {"[s]\na= \t", -15, {"line 2: value too short"}},
        {"[s]\n = b", -15, {"line 2: key too short"}},
        {"[s]\nabc", -15, {"line 2: can't parse line"}},
        {"k=v", -15, {"line 1: data outside section"}},
        {"[s", -15, {"line 1: unterminated or empty section"}},
        {"[]", -15, {"line 1: unterminated or empty section"}},
        {"[]x=y", -15, {"line 1: unterminated or empty section"}},
        {std::string("[s]\nk=a\0b", 9), -15, {"line 2: can't parse line"}},
        {"[s]\nabc\nk=v\na", -15, {"line 2: can't parse line", "line 4: line too short"}},
        {"", 0, {}},
        {"\xEF\xBB\xBF[s]\nk=v", 0, {}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(load(c.text), c.status) << c.text;
        EXPECT_EQ(errors, c.messages) << c.text;
    }
}

TEST_F(Ini, FaultsDoNotStopTheReading) {
    EXPECT_EQ(load("lost=1\n[s]\nk=v\n[\nl=w\n???\n[t]\nm=x\n"), -15);
    EXPECT_EQ(errors.size(), 3u);
    EXPECT_EQ(value("s", "k"), "v");
    EXPECT_EQ(value("s", "l"), "w");
    EXPECT_EQ(value("t", "m"), "x");
}

TEST_F(Ini, RepeatedSectionsAndKeysAnswerWithTheFirst) {
    EXPECT_EQ(load("[s]\na=1\na=2\n[t]\nz=0\n[s]\na=3\nb=4\n"), 0);
    EXPECT_EQ(ini.nrSections(), 3);
    EXPECT_EQ(value("s", "a"), "1");
    EXPECT_EQ(value("s", "b"), "4");
    AnyDict items("left over", 1);
    EXPECT_EQ(ini.getSectionItems("s", &items), 0);
    EXPECT_TRUE(items == AnyDict("a", "1", "b", "4"));
    EXPECT_EQ(ini.getSectionItems("none", &items), -1);
    EXPECT_EQ(items.size(), 0);
}

TEST_F(Ini, NumbersAreWholeOrTheDefaultWithAMessage) {
    LogCapture log;
    load(
        "[n]\ni=-42\np=+7\nbig=3000000000\nhuge=99999999999999999999\nf=2.5e3\ntext=abc\ntail=12abc\nsign=+-"
        "1\n");
    EXPECT_EQ(ini.getInt32Value("n", "i", 1), -42);
    EXPECT_EQ(ini.getInt32Value("n", "p", 1), 7);
    EXPECT_EQ(ini.getInt64Value("n", "big", 1), 3000000000LL);
    EXPECT_EQ(ini.getFloatValue("n", "f", 1), 2500);
    EXPECT_EQ(ini.getInt32Value("n", "absent", 1), 1);
    EXPECT_EQ(ini.errors().size(), 0);
    EXPECT_EQ(ini.getInt32Value("n", "big", 1), 1);
    EXPECT_EQ(ini.getInt32Value("n", "tail", 2), 2);
    EXPECT_EQ(ini.getInt32Value("n", "sign", 2), 2);
    EXPECT_EQ(ini.getInt64Value("n", "huge", 3), 3);
    EXPECT_EQ(ini.getFloatValue("n", "text", 4), 4);
    EXPECT_EQ(ini.errors().size(), 5);
    for (const char* line :
         {"Couldn't read int value", "Couldn't read int64_t value", "Couldn't read double value"})
        EXPECT_TRUE(log.contains(line)) << line;
}

TEST_F(Ini, LongLinesKeepTheirStartAndSaySo) {
    EXPECT_EQ(load("[s]\nk=" + std::string(1022, 'v') + "\r\n"), 0);
    EXPECT_EQ(value("s", "k").size(), 1022u);
    EXPECT_EQ(load("[s]\nk=" + std::string(5000, 'v') + "=x\nl=1\n"), -15);
    EXPECT_EQ(errors, Messages{"line 2: line too long, cut to 1024 characters"});
    EXPECT_EQ(value("s", "k").size(), 1022u);
    EXPECT_EQ(value("s", "l"), "1");
    EXPECT_EQ(load("[s]\n" + std::string(60, 'k') + "=1\n"), 0);
    EXPECT_EQ(value("s", std::string(60, 'k').c_str()), "1");
}

TEST_F(Ini, WhatCannotBeReadLeavesNothingBehind) {
    load("[s]\nk=v\n");
    AnyVector found;
    for (const Any& name : {Any(temp.file("absent").c_str()), Any(temp.path().c_str()), Any(5), Any("")}) {
        EXPECT_EQ(ini.load(name, &found), -9);
        ASSERT_EQ(found.size(), 1);
        EXPECT_TRUE(found.at(0) == "Failed to open file");
        EXPECT_EQ(ini.nrSections(), 0);
    }
    EXPECT_EQ(ini.load("/proc/self/mem", nullptr), -9);  // opens, and fails at the first byte
    ASSERT_EQ(ini.errors().size(), 1);
    EXPECT_TRUE(ini.errors().at(0) == "line 1: read failed");
}

}  // namespace
