#include "core/document/qviniparser.h"

#include <malloc.h>

#include "tests/support/checks.h"

namespace {

class Ini : public testing::Test {
  protected:
    TempFolder temp;
    QvIniParser ini;
    Texts errors;

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

TEST_F(Ini, LinesAreTakenApartAtTheirFirstSeparator) {
    EXPECT_EQ(
        load("# comment\r\n! comment\n\n \t\n[one]\nk = v \nc: d\nb=1:2\nm:x=y\n\tlong key =  a  b\t\r\n"
             "[two] rest\na=b"),
        0);
    EXPECT_EQ(errors, Texts{});
    EXPECT_TRUE(ini.nrSections() == 2 && ini.section(1) == "two" && !ini.section(2).isValid());
    AnyDict items("left over", 1);
    EXPECT_EQ(ini.getSectionItems("one", &items), 0);
    EXPECT_EQ(items, AnyDict("k", "v", "c", "d", "b", "1:2", "m:x", "y", "long key", "a  b"));
    EXPECT_EQ(value("two", "a") + value("two", "k") + value("three", "a"), "b(invalid)(invalid)");
}

TEST_F(Ini, EachFaultHasItsMessageAndStatus) {
    const struct {
        std::string text;
        int status;
        Texts messages;
    } cases[] = {
        {"a", 0, {"line 1: line too short"}},
        {"[s]\na=", -15, {"line 2: value too short"}},
        {"[s]\nabc", -15, {"line 2: can't parse line"}},
        {"k=v", -15, {"line 1: data outside section"}},
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

TEST_F(Ini, RepeatedSectionsAndKeysAnswerWithTheFirst) {
    EXPECT_EQ(load("[s]\na=1\na=2\n[t]\nz=0\n[s]\na=3\nb=4\n"), 0);
    EXPECT_EQ(value("s", "a") + value("s", "b"), "14");
    AnyDict items;
    EXPECT_EQ(ini.getSectionItems("s", &items), 0);
    EXPECT_EQ(items, AnyDict("a", "1", "b", "4"));
    EXPECT_EQ(ini.getSectionItems("none", &items), -1);
    EXPECT_EQ(items.size(), 0);
}

// Short lines in great numbers. (A sanitizer counts no memory here.)
TEST_F(Ini, MemoryStaysInProportionToTheFile) {
    for (const char* line : {"a=1\n", "[s]\n", "[s]\na=1\n", "a\n", "=1\n", "[s\n"}) {
        std::string text = "[s]\n";
        while (text.size() < 400'000) text += line;
        const auto before = mallinfo2();
        load(text);
        const auto after = mallinfo2();
        errors.clear();
        EXPECT_LT(after.uordblks + after.hblkhd, before.uordblks + before.hblkhd + 60 * text.size()) << line;
        ini = {};
    }
}

TEST_F(Ini, MessagesEndWithOneThatSaysSo) {
    const int most = QvIniParser::maxErrors;
    for (const int more : {0, 1, 5}) {
        std::string text = "[s]\n";
        for (int i = 0; i < most + more; ++i) text += "bad\n";
        EXPECT_EQ(load(text + "k=v"), -15);
        EXPECT_EQ(std::ssize(errors), most + (more ? 1 : 0));
        const int last = most + (more ? 2 : 1);
        EXPECT_EQ(errors.back(), "line " + std::to_string(last) +
                                     (more ? ": further messages are left out" : ": can't parse line"));
        EXPECT_EQ(value("s", "k"), "v");
    }
}

TEST_F(Ini, NumbersAreWholeOrTheDefaultWithAMessage) {
    load(
        "[n]\ni=-42\np=+7\nbig=3000000000\nhuge=99999999999999999999\nf=2.5e3\ntext=abc\ntail=12abc\nsign=+-"
        "1\n");
    EXPECT_TRUE(ini.getInt32Value("n", "i", 1) == -42 && ini.getInt32Value("n", "p", 1) == 7);
    EXPECT_TRUE(ini.getInt64Value("n", "big", 1) == 3000000000LL && ini.getFloatValue("n", "f", 1) == 2500);
    EXPECT_EQ(ini.getInt32Value("n", "absent", 1), 1);
    EXPECT_EQ(ini.errors().size(), 0);
    for (const char* bad : {"big", "tail", "sign"}) EXPECT_EQ(ini.getInt32Value("n", bad, 1), 1) << bad;
    EXPECT_TRUE(ini.getInt64Value("n", "huge", 3) == 3 && ini.getFloatValue("n", "text", 4) == 4);
    EXPECT_EQ(ini.errors().size(), 5);
}

TEST_F(Ini, LongLinesKeepTheirStartAndSaySo) {
    EXPECT_EQ(load("[s]\n" + std::string(60, 'k') + "=" + std::string(963, 'v') + "\r\n"), 0);
    EXPECT_EQ(value("s", std::string(60, 'k').c_str()).size(), 963u);
    EXPECT_EQ(load("[s]\nk=" + std::string(5000, 'v') + "=x\nl=1\n"), -15);
    EXPECT_EQ(errors, Texts{"line 2: line too long, cut to 1024 characters"});
    EXPECT_EQ(value("s", "k"), std::string(1022, 'v'));
    EXPECT_EQ(value("s", "l"), "1");
}

TEST_F(Ini, WhatCannotBeReadLeavesNothingBehind) {
    load("[s]\nk=v\n");
    AnyVector found;
    for (const Any& name : {Any(temp.file("absent").c_str()), Any(temp.path().c_str()), Any(5), Any("")}) {
        EXPECT_EQ(ini.load(name, &found), -9);
        EXPECT_EQ(found, AnyVector(Any("Failed to open file")));
        EXPECT_EQ(ini.nrSections(), 0);
    }
    EXPECT_EQ(ini.load("/proc/self/mem", nullptr), -9);  // opens, and fails at the first byte
    EXPECT_EQ(ini.errors(), AnyVector(Any("line 1: read failed")));
}

}  // namespace
