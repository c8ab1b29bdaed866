#include "core/value/anycontainer.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <random>
#include <string>
#include <vector>

#include "tests/core/value/value_support.h"

namespace {

constexpr double nan = std::numeric_limits<double>::quiet_NaN();

TEST(AnyVector, referencesSurviveAppending) {
    AnyVector vector;
    Any& first = vector.append(1);
    AnyDict& dict = vector.append(AnyDict());
    for (int i = 0; i < 1000; ++i) vector << i;
    first = "one";
    dict.set("k", 2);
    EXPECT_EQ(vector[0], "one");
    EXPECT_EQ(vector[1], Any(AnyDict("k", 2)));
    vector.remove(0);
    EXPECT_EQ(&vector[0].asDict(), &dict);
}

TEST(AnyVector, positionsOutsideTheRange) {
    AnyVector vector(1, 2, 3);
    for (int outside : {-1, 3, std::numeric_limits<int>::max(), std::numeric_limits<int>::min()}) {
        EXPECT_TRUE(vector.at(outside).isNull()) << outside;
        EXPECT_EQ(failureOf([&] { vector[outside] = 1; }), nullAssignment);
        EXPECT_EQ(failureOf([&] { vector.set(outside, 1); }), "");
        vector.remove(outside);
        if (outside != 3) vector.insert(9, outside);
        EXPECT_EQ(vector, AnyVector(1, 2, 3));
    }
    vector.insert(4, 3);
    vector.insert(0, 0);
    vector.set(1, "one");
    EXPECT_EQ(vector, AnyVector(0, "one", 2, 3, 4));

    AnyVector empty;
    EXPECT_EQ(failureOf([&] { empty.front(); }), "");
    EXPECT_EQ(failureOf([&] { std::as_const(empty).back(); }), "");
    EXPECT_EQ(empty.popBack(), Any());
    EXPECT_EQ(vector.popBack(), 4);
    vector.resize(2);
    vector.resize(4);
    EXPECT_EQ(vector, AnyVector(0, "one", Any(), Any()));
    EXPECT_EQ(failureOf([&] { vector.resize(-1); }), "");
}

TEST(AnyVector, mayBeAddedToItself) {
    AnyVector vector(1, 2);
    vector.extend(vector);
    vector.append(vector);
    vector.append(vector[0]);
    EXPECT_EQ(vector, AnyVector(1, 2, 1, 2, AnyVector(1, 2, 1, 2), 1));
    vector.set(0, Any(vector));
    EXPECT_EQ(vector[0].size(), 6);
    vector = vector[0].asVector();
    EXPECT_EQ(vector.size(), 6);
}

TEST(AnyVector, copiesAreDeep) {
    AnyVector vector(AnyVector(1), AnyDict("a", 1));
    const AnyVector copy = vector;
    vector[0].asVector().append(2);
    vector[1].asDict().set("a", 2);
    EXPECT_EQ(copy, AnyVector(AnyVector(1), AnyDict("a", 1)));
}

TEST(AnyVector, search) {
    const AnyVector vector(1, "1", 1.0, 1, 2.5, 1);
    EXPECT_EQ(vector.indexOf(1, -1), 0);
    EXPECT_EQ(vector.indexOf(1, 0), 3);
    EXPECT_EQ(vector.find(1, 3), 5);
    EXPECT_EQ(vector.indexOf(1, 5), -1);
    EXPECT_EQ(vector.indexOf(1, -100), 0);
    EXPECT_TRUE(vector.contains(1.0));
    EXPECT_FALSE(vector.contains(Any(1LL)));
    EXPECT_EQ(vector.ffind(1.0, 0.0), -1);  // strictly below
    EXPECT_EQ(vector.ffind(2.4, 0.2), 4);

    EXPECT_EQ(AnyVector(1, 2, 3).nearest(2.4), 1);
    EXPECT_EQ(AnyVector(1, 2, 3).nearest(1.5), 0);
    EXPECT_EQ(AnyVector(10LL, 2.0, -3).nearest(-100), 2);
    EXPECT_EQ(AnyVector(1, 5, "x", 9).nearest(9), 1);  // ends at what is no number
    EXPECT_EQ(AnyVector("x", 9).nearest(9), -1);
    EXPECT_EQ(AnyVector().nearest(1), -1);
    EXPECT_EQ(AnyVector(1, 2).nearest("1"), -1);
}

TEST(AnyVector, sortsByTypeThenValue) {
    AnyVector vector("b", 2, nan, 1.0, "a", Any(), 1, nan, -1.0);
    vector.sort(false);
    EXPECT_EQ(vector[0], Any());
    EXPECT_EQ(AnyVector(vector[1], vector[2], vector[3], vector[4]), AnyVector(1, 2, -1.0, 1.0));
    EXPECT_TRUE(vector[5].asFloat() != vector[5].asFloat() && vector[6].asFloat() != vector[6].asFloat());
    EXPECT_EQ(vector[8], "b");
    vector = AnyVector(2, 3, 1);
    vector.sort(true);
    EXPECT_EQ(vector, AnyVector(3, 2, 1));

    AnyVector dicts(AnyDict("n", 2), AnyDict("x", 0), AnyDict("n", 1));
    dicts.sortDicts("n");
    EXPECT_EQ(dicts, AnyVector(AnyDict("x", 0), AnyDict("n", 1), AnyDict("n", 2)));
    dicts << 1;
    EXPECT_EQ(failureOf([&] { dicts.sortDicts("n"); }), "");
    EXPECT_EQ(dicts.size(), 4);
}

TEST(AnyVector, removesManyByTheirOldPositions) {
    AnyVector vector(0, 1, 2, 3, 4, 5);
    vector.removeMany(AnyVector(1, 5.0, 3LL, 99, -1));
    EXPECT_EQ(vector, AnyVector(0, 2, 4));
    vector.removeMany(AnyVector());
    EXPECT_EQ(vector.size(), 3);
}

TEST(AnyVector, splitAndJoin) {
    const struct {
        const char *text, *delimiter;
        AnyVector pieces;
    } cases[] = {
        {"a,,b,", ",", AnyVector("a", "", "b", "")},
        {"", ",", AnyVector(Any(""))},
        {",", ",", AnyVector("", "")},
        {"abc", "", AnyVector(Any("abc"))},
        {"a;,b", ",;", AnyVector("a;", "b")},
        {"a\xC3\xA9"
         "b\xC3\xA8",
         "\xC3\xA9", AnyVector("a", "b\xC3\xA8")},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(Any(c.text).split(c.delimiter), c.pieces) << c.text;
        const AnyVector wide = Any(c.text).toWString().split(c.delimiter);
        ASSERT_EQ(wide.size(), c.pieces.size()) << c.text;
        for (int i = 0; i < wide.size(); ++i) {
            EXPECT_EQ(wide[i].toString(), c.pieces[i]);
            EXPECT_EQ(wide[i].isString(), wide[i].size() == 0);
        }
    }
    EXPECT_EQ(failureOf([] { AnyVector::split(1, ","); }), "");
    EXPECT_EQ(failureOf([] { AnyVector::split("a", 1); }), "");

    EXPECT_EQ(AnyVector("a", 1, "", "b").join(", "), "a, , b");
    EXPECT_EQ(AnyVector("a", "b", "c").join("a long separator"), "aa long separatorba long separatorc");
    EXPECT_EQ(AnyVector("a", "b").join(Any()), "ab");
    EXPECT_EQ(AnyVector("a", Any(u"b")).join("-"), Any(u"a-b"));
    EXPECT_EQ(AnyVector("a", "b").join(Any(u"-")), Any(u"a-b"));
    for (const AnyVector& nothing : {AnyVector(), AnyVector(1, 2), AnyVector("", Any(u""))})
        EXPECT_EQ(nothing.join(","), Any());
}

TEST(AnyVector, nullSentinelIsNeverWritten) {
    AnyVector& null = AnyVector::null();
    EXPECT_TRUE(null.isNull() && null.empty());
    EXPECT_FALSE(AnyVector().isNull() || AnyVector(null).isNull());
    EXPECT_EQ(failureOf([&] { null.append(1); }), "");
    EXPECT_EQ(failureOf([&] { null.append(AnyDict()); }), "");
    EXPECT_EQ(failureOf([&] { null << 1; }), "");
    EXPECT_EQ(failureOf([&] { null = AnyVector(1, 2); }), "");
    EXPECT_EQ(failureOf([&] { null.resize(1); }), "");
    const AnyVector stolen = std::move(null);
    EXPECT_TRUE(AnyVector::null().isNull() && !stolen.isNull());

    AnyVector a(1, 2), b;
    EXPECT_EQ(failureOf([&] { a.swap(null); }), "");
    a.swap(b);
    EXPECT_TRUE(a.empty());
    EXPECT_EQ(b, AnyVector(1, 2));
}

TEST(AnyDict, orderOfKeys) {
    // Signed bytes: what is not ASCII goes first, but a shorter key always before its continuations.
    const std::vector<std::string> sorted = {
        "",          "\x80",      "\x80\x80",   "\xC3\xA9", "\xFF", "0",        "a",
        "a\x80",     "a\x80\x80", "a\x80\x01",  "a\x01",    "ab",   "abcdefgh", "abcdefgh\xC3",
        "abcdefgh!", "abcdefghi", "abcdefghij", "abcdefgi", "b"};
    std::mt19937 random(7);
    auto shuffled = sorted;
    std::ranges::shuffle(shuffled, random);
    AnyDict dict;
    for (const auto& key : shuffled) dict.set(key.c_str(), key.c_str());
    ASSERT_EQ(dict.size(), static_cast<int>(sorted.size()));
    int position = 0;
    for (auto [key, value] : dict) {
        EXPECT_EQ(key, sorted[static_cast<std::size_t>(position)]);
        EXPECT_EQ(*value, key);
        EXPECT_STREQ(dict.getKey(position), key);
        ++position;
    }
    for (const auto& key : sorted) EXPECT_EQ(dict.get(key.c_str()), key.c_str());
}

TEST(AnyDict, longKeysAreCutWhenSetOnly) {
    const std::string key(41, 'k');
    AnyDict dict;
    dict.set(key.c_str(), 1);
    dict.set((key + "other").c_str(), 2);
    EXPECT_EQ(dict.size(), 1);
    EXPECT_FALSE(dict.isSet(key.c_str()));
    EXPECT_EQ(dict.get(key.substr(0, 40).c_str()), 2);
    dict.remove(key.c_str());
    EXPECT_EQ(dict.size(), 1);
}

TEST(AnyDict, lookupsNeverInsert) {
    AnyDict dict("a", 1, "empty", Any());
    EXPECT_EQ(failureOf([&] { dict["b"].set(1); }), nullAssignment);
    EXPECT_EQ(failureOf([&] { dict["b"] = AnyDict(); }), nullAssignment);
    EXPECT_EQ(dict.size(), 2);
    EXPECT_TRUE(dict.isSet("empty") && !dict.isSet("b") && !dict.isSet(nullptr));
    EXPECT_TRUE(dict.get(nullptr).isNull());
    EXPECT_EQ(failureOf([&] { dict.set(nullptr, 1); }), "");
    dict["a"] = 5;
    dict.remove("b");
    EXPECT_EQ(dict, AnyDict("a", 5, "empty", Any()));
}

TEST(AnyDict, typedReadsAreExact) {
    const AnyDict dict("i", 1, "l", 2LL, "f", 3.0, "s", "t", "w", Any(u"u"), "v", AnyVector(1, 2), "d",
                       AnyDict("x", 1));
    EXPECT_EQ(dict.getInt32("i", 9), 1);
    EXPECT_EQ(dict.getInt64("i", 9), 9);
    EXPECT_EQ(dict.getInt64("l", 9), 2);
    EXPECT_EQ(dict.getInt32("f", 9), 9);
    EXPECT_EQ(dict.getFloat("f", 9), 3.0);
    EXPECT_EQ(dict.getDouble("i", 9), 9.0);
    EXPECT_STREQ(dict.getString("s", "z"), "t");
    EXPECT_STREQ(dict.getString("w", "z"), "z");
    EXPECT_EQ(dict.getWString("w")[0], 'u');
    EXPECT_EQ(dict.getVector("v").size(), 2);
    EXPECT_TRUE(dict.getVector("d").isNull());
    EXPECT_EQ(dict.getDict("d").getInt32("x"), 1);
    EXPECT_TRUE(dict.getDict("none").isNull());
}

TEST(AnyDict, valuesMayHoldTheDictionaryOrComeFromIt) {
    AnyDict dict("a", 1);
    dict.set("self", dict);
    EXPECT_EQ(dict, AnyDict("a", 1, "self", AnyDict("a", 1)));
    dict.set("self", Any(dict));
    dict["self"].asDict().set("whole", dict);
    EXPECT_EQ(dict.descendant("self.self.a")->asInt32(), 1);

    AnyDict outer("in", AnyDict("in", 7, "other", 8));
    outer.update(outer["in"].asDict());
    EXPECT_EQ(outer, AnyDict("in", 7, "other", 8));
    outer.update(outer);
    EXPECT_EQ(outer.size(), 2);
    AnyDict parent("child", AnyDict("x", 1));
    parent = parent["child"].asDict();
    EXPECT_EQ(parent, AnyDict("x", 1));
}

TEST(AnyDict, positions) {
    AnyDict dict("b", 2, "a", 1);
    EXPECT_STREQ(dict.getKey(0), "a");
    dict.getVal(1) = 22;
    EXPECT_EQ(dict["b"], 22);
    EXPECT_EQ(dict.find(22), 1);
    EXPECT_EQ(dict.find("22"), -1);
    Any key, value;
    dict.getKeyVal(1, key, value);
    EXPECT_TRUE(key == "b" && value == 22);
    for (int outside : {-1, 2}) {
        EXPECT_EQ(dict.getKey(outside), nullptr);
        EXPECT_TRUE(dict.getVal(outside).isNull());
        EXPECT_EQ(dict.at(outside).key, nullptr);
        EXPECT_TRUE(dict.getEntry(outside).value->isNull());
        dict.getKeyVal(outside, key, value);
        EXPECT_TRUE(key == Any() && value == Any());
    }
}

TEST(AnyDict, nullSentinelIsNeverWritten) {
    AnyDict& null = AnyDict::null();
    EXPECT_TRUE(null.isNull() && null.empty() && null.begin() == null.end());
    EXPECT_FALSE(AnyDict().isNull() || AnyDict(null).isNull());
    EXPECT_EQ(failureOf([&] { null.set("a", 1); }), "");
    EXPECT_EQ(failureOf([&] { null = AnyDict("a", 1); }), "");
    EXPECT_EQ(failureOf([&] { null.update(AnyDict("a", 1)); }), "");
    EXPECT_EQ(AnyDict(), AnyDict::null());
}

TEST(Descendant, paths) {
    AnyDict dict("a", AnyVector(0, 1, AnyDict("b", "found", "", 5)), "n", 1, "", AnyDict("e", 6));
    const struct {
        const char* path;
        const char* type;  // null: nothing there
    } cases[] = {
        {"a.2.b", "String"},
        {"a.", "Vector"},
        {"a", "Vector"},
        {"a.1", "Int32"},
        {"a.2.b.", "String"},
        {"a.2..", "Int32"},
        {".e", "Int32"},
        {"a.-1", nullptr},
        {"a.3", nullptr},
        {"n.x", nullptr},
        {"", nullptr},
        {"x", nullptr},
        {"a.2.b.c", nullptr},
        {".", "Dict"},
        {"a.1x", "Int32"},
        {"a.x", "Int32"},
        {"a.99999999999999999999", nullptr},
        {"a.+2.b", "String"},
    };
    for (const auto& c : cases) {
        const Any* found = dict.descendant("%s", c.path);
        ASSERT_EQ(found != nullptr, c.type != nullptr) << c.path;
        if (found) {
            EXPECT_STREQ(Any::typeName(found->type()), c.type) << c.path;
        }
    }
    EXPECT_EQ(dict.descendant(nullptr), nullptr);
    AnyVector vector(AnyDict("k", AnyVector(7, 8)));
    *vector.descendant("%d.%s.%d", 0, "k", 1) = 9;
    EXPECT_EQ(vector, AnyVector(AnyDict("k", AnyVector(7, 9))));
    EXPECT_EQ(vector.descendant("k"), &vector[0]);  // no number reads as 0
}

}  // namespace
