#include <limits>

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"

namespace {

const std::string nullAssignment = "Attempt to assign to Any::null()";
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
    AnyVector vector(1, 2, 3), empty;
    for (int outside : {-1, 3, std::numeric_limits<int>::max(), std::numeric_limits<int>::min()}) {
        EXPECT_TRUE(vector.at(outside).isNull()) << outside;
        EXPECT_EQ(failureOf([&] { vector[outside] = 1; }), nullAssignment);
        EXPECT_EQ(failureOf([&] { vector.set(outside, 1); }), "");
        vector.remove(outside);
        if (outside != 3) vector.insert(9, outside);
        EXPECT_EQ(vector, AnyVector(1, 2, 3));
    }
    vector.set(1, "one");
    EXPECT_TRUE(empty.popBack() == Any() && vector.popBack() == 3);
    vector.resize(2);
    vector.resize(4);
    EXPECT_EQ(vector, AnyVector(1, "one", Any(), Any()));
}

TEST(AnyVector, mayBeAddedToItselfAndCopiesAreDeep) {
    AnyVector vector(1, 2);
    vector.extend(vector);
    vector.append(vector);
    vector.append(vector[0]);
    const AnyVector copy = vector;
    EXPECT_EQ(copy, AnyVector(1, 2, 1, 2, AnyVector(1, 2, 1, 2), 1));
    vector[4].asVector().append(3);
    vector = vector[4].asVector();
    EXPECT_EQ(vector, AnyVector(1, 2, 1, 2, 3));
    EXPECT_EQ(copy[4].asVector().size(), 4);
}

TEST(AnyVector, search) {
    const AnyVector vector(1, "1", 1.0, 1, 2.5, 1);
    const struct { int start, found; } ones[] = {{-1, 0}, {0, 3}, {3, 5}, {5, -1}, {-100, 0}};
    for (const auto& c : ones) EXPECT_EQ(vector.indexOf(1, c.start), c.found) << c.start;
    const struct {
        AnyVector list;
        Any to;
        int place;
    } nearest[] = {{{1, 2, 3}, 2.4, 1},    {{1, 2, 3}, 1.5, 0},  {{10LL, 2.0, -3}, -100, 2},
                   {{1, 5, "x", 9}, 9, 1},  // ends at what is no number
                   {{"x", 9}, 9, -1},      {AnyVector(), 1, -1}, {{1, 2}, "1", -1}};
    for (const auto& c : nearest) EXPECT_EQ(c.list.nearest(c.to), c.place);
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
}

TEST(AnyVector, removesManyByTheirOldPositions) {
    AnyVector vector(0, 1, 2, 3, 4, 5);
    vector.removeMany(AnyVector(1, 5.0, 3LL, 99, -1));
    EXPECT_EQ(vector, AnyVector(0, 2, 4));
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
        {"a\xC3\xA9!\xC3\xA8", "\xC3\xA9", AnyVector("a", "!\xC3\xA8")},
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
    EXPECT_EQ(AnyVector("a", 1, "", "b").join(", "), "a, , b");
    EXPECT_EQ(AnyVector("a", "b", "c").join("a long separator"), "aa long separatorba long separatorc");
    EXPECT_EQ(AnyVector("a", Any(u"b")).join("-"), Any(u"a-b"));
    for (const AnyVector& nothing : {AnyVector(), AnyVector(1, 2), AnyVector("", Any(u""))})
        EXPECT_EQ(nothing.join(","), Any());
}

TEST(AnyDict, orderOfKeys) {
    // Signed bytes: what is not ASCII goes first, but a shorter key always before its continuations.
    const Texts sorted = {"",           "\x80",     "\x80\x80",  "\xC3\xA9",     "\xFF",      "0",
                          "a",          "a\x80",    "a\x80\x80", "a\x80\x01",    "a\x01",     "aacd",
                          "ab",         "abcd",     "abcdefgh",  "abcdefgh\xC3", "abcdefgh!", "abcdefghi",
                          "abcdefghij", "abcdefgi", "b"};
    AnyDict dict;
    for (std::size_t i = 0; i < sorted.size(); ++i) {
        const std::string& key = sorted[i * 5 % sorted.size()];
        dict.set(key.c_str(), key.c_str());
    }
    Texts keys;
    for (auto [key, value] : dict) {
        EXPECT_EQ(*value, key);
        EXPECT_EQ(dict.get(key), key);
        keys.push_back(key);
    }
    EXPECT_EQ(keys, sorted);
}

TEST(AnyDict, longKeysAreCutWhenSetOnly) {
    const std::string key(41, 'k');
    AnyDict dict(key.c_str(), 1);
    dict.set((key + "other").c_str(), 2);
    dict.remove(key.c_str());
    EXPECT_FALSE(dict.isSet(key.c_str()));
    EXPECT_EQ(dict, AnyDict(key.substr(0, 40).c_str(), 2));
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
    outer.set("in", AnyDict("x", 1));
    outer = outer["in"].asDict();
    EXPECT_EQ(outer, AnyDict("x", 1));
}

// Whatever the type of a part is, it may be copied or moved over the whole, or over what is between.
TEST(AnyContainers, aPartMayReplaceWhatHoldsIt) {
    const int framerate = 25;
    const Any parts[] = {Any(),
                         7,
                         7LL,
                         0.5,
                         "text",
                         Any("wide").toWString(),
                         AnyDict("a", "b"),
                         AnyVector(1, "two"),
                         Any(&framerate, 4),
                         Any(static_cast<const void*>(&framerate)),
                         QvFramerate(QvRatio(25, 1)),
                         QvPoint(1, 2),
                         QvRect(1, 2, 3, 4),
                         Pair(1, 2),
                         MediaTime(1, 25)};
    for (const Any& part : parts) {
        const auto nested = [&] { return Any(AnyVector(1, AnyDict("k", AnyVector("x", part)))); };
        const auto innermost = [](Any& value) -> Any& { return *value.asVector().descendant("1.k.1"); };
        Any copied = nested(), moved = nested();
        copied = innermost(copied);
        moved = std::move(innermost(moved));
        EXPECT_EQ(copied, part) << part.type();
        EXPECT_EQ(moved, part) << part.type();

        Any inDict = nested(), inVector = nested();
        AnyDict& dict = inDict.asVector()[1].asDict();
        EXPECT_EQ(dict.set("k", dict["k"].asVector()[1]), part) << part.type();
        inVector.asVector().set(1, innermost(inVector));
        EXPECT_EQ(inVector, Any(AnyVector(1, part))) << part.type();
        inVector.asVector().insert(inVector.asVector()[1], 0);
        EXPECT_EQ(inVector, Any(AnyVector(part, 1, part))) << part.type();
    }
}

TEST(AnyContainers, mayBePutIntoThemselves) {
    Any list(AnyVector(1, 2));
    list.asVector().append(std::move(list));
    EXPECT_EQ(list, Any(AnyVector(1, 2, AnyVector(1, 2))));
    list.asVector().insert(list, 1);
    EXPECT_EQ(list.asVector()[1], Any(AnyVector(1, 2, AnyVector(1, 2))));
    list.asVector().removeMany(list.asVector()[1].asVector()[2].asVector());
    EXPECT_EQ(list, Any(AnyVector(1, AnyVector(1, 2))));
    list.asVector()[1] = list;
    EXPECT_EQ(list, Any(AnyVector(1, AnyVector(1, AnyVector(1, 2)))));
    for (int i = 0; i < 100; ++i) list.asVector().append(list.asVector()[0]);  // while it grows
    EXPECT_EQ(list.asVector().back(), 1);

    Any whole(AnyDict("a", 1, "name", "b"));
    AnyDict& dict = whole.asDict();
    dict.set("whole", std::move(whole));
    EXPECT_EQ(whole, Any(AnyDict("a", 1, "name", "b", "whole", AnyDict("a", 1, "name", "b"))));
    dict["whole"] = whole;
    EXPECT_EQ(dict.descendant("whole.whole.a")->asInt32(), 1);
    dict.set(dict["name"].asString(), dict["name"]);  // the key of the entry is text of an entry
    dict.set(dict["name"].asString(), std::move(dict["name"]));
    EXPECT_EQ(dict["b"], "b");
    dict.remove(dict.getKey(0));
    EXPECT_FALSE(dict.isSet("a"));
    Any value;
    dict.getKeyVal(0, whole, value);
    EXPECT_TRUE(whole == "b" && value == "b");
    value = AnyVector("a", "b");
    value = value.asVector().join(value.asVector()[1]);
    EXPECT_EQ(value, "abb");
}

TEST(AnyContainers, nullSentinelsAreNeverWritten) {
    AnyVector &null = AnyVector::null(), a(1, 2), b;
    AnyDict& nullDict = AnyDict::null();
    EXPECT_EQ(failureOf([&] { null.append(1); }), "");
    EXPECT_EQ(failureOf([&] { null = AnyVector(1, 2); }), "");
    EXPECT_EQ(failureOf([&] { a.swap(null); }), "");
    EXPECT_EQ(failureOf([&] { nullDict.set("a", 1); }), "");
    EXPECT_EQ(failureOf([&] { nullDict = AnyDict("a", 1); }), "");
    const AnyVector stolen = std::move(null);
    a.swap(b);
    EXPECT_TRUE(a.empty() && b == AnyVector(1, 2));
}

TEST(Descendant, paths) {
    AnyDict dict("a", AnyVector(0, 1, AnyDict("b", "found", "", 5)), "n", 1, "", AnyDict("e", 6));
    const struct {
        const char *path, *type;  // type null: nothing there
    } cases[] = {{"a.2.b", "String"}, {"a.", "Vector"},     {"a", "Vector"},
                 {".e", "Int32"},     {"a.-1", nullptr},    {"a.3", nullptr},
                 {"n.x", nullptr},    {"", nullptr},        {"x", nullptr},
                 {"a.x", "Int32"},    {"a.+2.b", "String"}, {"a.99999999999999999999", nullptr}};
    for (const auto& c : cases) {
        const Any* const found = dict.descendant("%s", c.path);
        EXPECT_STREQ(found ? Any::typeName(found->type()) : nullptr, c.type) << c.path;
    }
    EXPECT_EQ(dict.descendant(nullptr), nullptr);
    AnyVector vector(AnyDict("k", AnyVector(7, 8)));
    *vector.descendant("%d.%s.%d", 0, "k", 1) = 9;
    EXPECT_EQ(vector, AnyVector(AnyDict("k", AnyVector(7, 9))));
    EXPECT_EQ(vector.descendant("k"), &vector[0]);  // no number reads as 0
}

}  // namespace
