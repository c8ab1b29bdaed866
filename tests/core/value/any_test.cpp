#include "core/value/any.h"

#include <limits>

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"

namespace {

constexpr int lowestInt = std::numeric_limits<int>::min();
constexpr int highestInt = std::numeric_limits<int>::max();
const std::string nullAssignment = "Attempt to assign to Any::null()";
constexpr const void* noBytes = nullptr;
constexpr double nan = std::numeric_limits<double>::quiet_NaN();

template <class... T>
std::vector<Any> anys(const T&... values) {
    return {Any(values)...};
}

// One value of each type, in the order of the type numbers.
std::vector<Any> oneOfEach() {
    return anys(Any(), -5, 2.5, "text", u"w\u00efde", AnyDict("k", 1), AnyVector(1, "b"), 1LL << 40,
                static_cast<const void*>("borrowed"), QvFramerate::f59i(), QvPoint(1, 2), QvRect(1, 2, 3, 4),
                QvBitrate(1, 2, 3, 4, 5), Pair(6, 7), MediaTime(9, 25));
}

TEST(Any, copiesAndMovesOfEachTypeOverEachType) {
    for (const Any& from : oneOfEach())
        for (const Any& over : oneOfEach()) {
            Any copied = over, source = from, moved = over;
            copied = from;
            moved = std::move(source);
            EXPECT_TRUE(copied == from && moved == from) << Any::typeName(over.type());
            moved.invalidate();
            EXPECT_EQ(moved, Any());
        }
}

TEST(Any, aPartOfAValueMayReplaceTheWhole) {
    Any value(AnyDict("inner", AnyDict("text", "deep")));
    value = value.asDict()["inner"];
    EXPECT_EQ(value, Any(AnyDict("text", "deep")));
    value = std::move(value.asDict()["text"]);
    EXPECT_EQ(value, "deep");
    value = value.asString() + 2;
    EXPECT_EQ(value, "ep");
    Any list(AnyVector(AnyVector(1, 2), 3));
    list = list.asVector()[0];
    EXPECT_EQ(list, Any(AnyVector(1, 2)));
}

TEST(Any, sharedNullRefusesEveryKindOfAssignment) {
    Any& null = Any::null();
    EXPECT_TRUE(null.isNull() && !null.isValid() && &null == &Any::invalid());
    for (const Any& value : oneOfEach())
        EXPECT_EQ(failureOf([&] { null = value; }), nullAssignment) << Any::typeName(value.type());
    EXPECT_EQ(failureOf([&] { null.invalidate(); }), nullAssignment);
    const Any copy = null, moved = std::move(null);
    EXPECT_FALSE(copy.isNull() || moved.isNull());
    EXPECT_TRUE(Any::null().isNull() && Any::null() != Any() && copy == Any());
}

TEST(Any, textLengthsAndPadding) {
    Any text("abcdef", 3);
    EXPECT_EQ(text, "abc");
    const char* const buffer = text.asString();
    text = "xy";
    EXPECT_TRUE(text.asString() == buffer && text.size() == 2);
    text.set("ab", 5);
    EXPECT_EQ(std::string(text.asString(), 6), std::string("ab\0\0\0\0", 6));
    EXPECT_TRUE(text.size() == 5 && Any(text).size() == 2 && Any(std::move(text)).size() == 2);
    EXPECT_EQ(failureOf([] { Any(static_cast<const char*>(nullptr)); }), "");
    EXPECT_EQ(failureOf([] { Any("x", -1); }), "");

    const std::vector<unsigned short> units(70000, 'w');  // a copy measures 65,536 of them
    Any wideText(units.data(), 70000);
    EXPECT_TRUE(wideText.size() == 70000 && Any(wideText).size() == 65536);
    const Any moved = std::move(wideText);
    EXPECT_TRUE(moved.size() == 65536 && moved.asWString()[65536] == 0);
}

TEST(Any, genericOwnsBytesOrBorrowsAPointer) {
    char bytes[] = "abcd";
    Any owned(bytes, 4);
    EXPECT_NE(owned.asGeneric(), bytes);
    bytes[0] = 'X';
    EXPECT_EQ(std::string(static_cast<char*>(owned.asGeneric()), 4), "abcd");
    EXPECT_NE(Any(owned).asGeneric(), owned.asGeneric());
    owned.set(noBytes, 4);
    EXPECT_EQ(owned, Any(static_cast<const void*>("\0\0\0\0"), 4));
    const Any borrowed(static_cast<const void*>(bytes));
    EXPECT_EQ(failureOf([&] { Any(static_cast<const void*>(bytes), -4); }), "");
}

TEST(Any, numbersIntoOneAnother) {
    const struct {
        Any value;
        int as32;
        long long as64;
        double asDouble;
    } cases[] = {
        {Any(0x1'0000'0002LL), 2, 0x1'0000'0002LL, 4294967298.0},
        {Any(-1.5), -1, -1, -1.5},
        {Any(1e30), highestInt, std::numeric_limits<long long>::max(), 1e30},
        {Any(-1e30), lowestInt, std::numeric_limits<long long>::min(), -1e30},
        {Any(2147483648.0), highestInt, 2147483648LL, 2147483648.0},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(c.value.toInt32(), c.as32) << c.asDouble;
        EXPECT_EQ(c.value.toInt64(), c.as64) << c.asDouble;
        EXPECT_EQ(c.value.toFloat(), c.asDouble);
    }
    EXPECT_EQ(Any(nan).toInt32(), 0);
    EXPECT_EQ(Any(nan).toInt64(), 0);
    for (const Any& value : oneOfEach()) {
        if (value.isInt() || value.isFloat()) continue;
        EXPECT_EQ(failureOf([&] { value.toInt32(); }), "") << Any::typeName(value.type());
        EXPECT_EQ(failureOf([&] { value.toInt64(); }), "") << Any::typeName(value.type());
        EXPECT_EQ(failureOf([&] { value.toDouble(); }), "") << Any::typeName(value.type());
    }
}

TEST(Any, readsOfAnotherTypeNeverReachForeignMemory) {
    for (const Any& value : oneOfEach()) {
        if (value.isGeneric()) continue;
        SCOPED_TRACE(Any::typeName(value.type()));
        EXPECT_EQ(value.asString() != nullptr, value.isText());
        EXPECT_EQ(value.asDict().isNull(), !value.isDict());
        EXPECT_EQ(value.asVector().isNull(), !value.isVector());
        EXPECT_EQ(failureOf([&] { value.asRect(); }), value.isRect() ? "no failure" : "");
        EXPECT_EQ(failureOf([&] { value.asMediaTime(); }), value.isMediaTime() ? "no failure" : "");
    }
    EXPECT_EQ(Any(1.0).asInt64(), 0x3FF0'0000'0000'0000LL);
    EXPECT_EQ(Any(5).asFloat(9.0), 9.0);
    EXPECT_STREQ(Any(u"x").asString("other"), "other");
}

TEST(Any, equalityNeedsTypeSizeAndValue) {
    const auto values = oneOfEach();
    for (std::size_t i = 0; i < values.size(); ++i)
        for (std::size_t j = 0; j < values.size(); ++j) EXPECT_EQ(values[i] == values[j], i == j) << i << j;

    EXPECT_NE(Any(nan), Any(nan));
    EXPECT_EQ(Any(0.0), Any(-0.0));
    EXPECT_NE(Any("ab"), Any("abc"));
    EXPECT_NE(Any(static_cast<const void*>("ab"), 2), Any(static_cast<const void*>("ac"), 2));
    EXPECT_NE(Any(MediaTime(1, 25)), Any(MediaTime(2, 50)));
}

TEST(Any, orderGoesByTypeOnlyForLess) {
    for (const Any& a : oneOfEach())
        for (const Any& b : oneOfEach())
            EXPECT_TRUE(a.type() == b.type() || ((a < b) == (a.type() < b.type()) && !(a > b))) << a.type();
    EXPECT_TRUE(Any(-1) < Any(1) && Any(1) > Any(-1) && !(Any(1) < Any(1)));
    EXPECT_TRUE(Any("a") < Any("ab") && Any("z") < Any("\xC3\xA4") && Any("b") > Any("ab"));
    EXPECT_TRUE(Any(u"\u00FF") < Any(u"\u0100") && Any(u"\uFFFF") > Any(u"a"));
    EXPECT_FALSE(Any(Pair(1, 1)) < Any(Pair(2, 2)) || Any(Pair(2, 2)) > Any(Pair(1, 1)));
}

TEST(Any, narrowAndWide) {
    EXPECT_EQ(Any("a\xC3\xA9\xF0\x9F\x8E\xAC").toWString(), Any(u"a\u00e9\U0001F3AC"));
    EXPECT_EQ(Any(u"a\u00e9\U0001F3AC").toString(), "a\xC3\xA9\xF0\x9F\x8E\xAC");
    for (const char* odd : {"\xFF", "a\xC3", "\xED\xA0\x80x", "\xC0\xAF"})
        EXPECT_EQ(Any(odd).toWString().toString(), odd);
}

TEST(Any, substr) {
    const struct {
        int start, end;
        const char* result;  // null: out of range
    } cases[] = {{1, -1, "ello"},  {-2, -1, "lo"},  {0, 5, "hello"},  {0, 1, "h"},
                 {-5, -5, "h"},    {2, 2, nullptr}, {3, 1, nullptr},  {0, 6, nullptr},
                 {-6, 3, nullptr}, {5, 5, nullptr}, {0, -7, nullptr}, {lowestInt, highestInt, nullptr}};
    for (const auto& c : cases) {
        for (const Any& text : anys("hello", u"hello")) {
            Any part;
            const auto failure = failureOf([&] { part = text.substr(c.start, c.end); });
            EXPECT_EQ(failure, c.result ? "no failure" : "Any.substr: index out of range")
                << c.start << c.end;
            EXPECT_TRUE(!c.result || (part.toString() == c.result && part.type() == text.type())) << c.start;
        }
    }
    EXPECT_TRUE(Any("").substr(0, 5) == "" && Any(u"").substr(3, 2) == Any(u""));
    EXPECT_EQ(failureOf([] { Any(1).substr(0, 1); }), "Any.substr: invalid type");
}

TEST(Any, replace) {
    const struct {
        std::string text, find, with, result;
    } cases[] = {
        {"aaa", "aa", "b", "ba"},
        {"xaab", "ab", "b", "xb"},  // each step makes the next occurrence
        {"baab", "ba", "ab", "aabb"},
        {"xay", "a", "ab", ("xa" + repeated("b", 5000)).substr(0, 4095)},
        {"q", "", "12", repeated("12", 2048).substr(0, 4095)},
        {repeated("a", 5000), "a", "bb", repeated("b", 4095)},
        {repeated("a", 9000) + "b", "aaa", "", "b"},
        {repeated("a", 40) + "b", "ab", "bba", repeated("b", 4095)},  // doubles with each "a"
    };
    for (const auto& c : cases) {
        const Any narrow = Any(c.text.c_str()).replace(c.find.c_str(), c.with.c_str());
        EXPECT_EQ(narrow, c.result.c_str()) << c.text.substr(0, 20) << ' ' << c.find;
        const Any wide =
            Any(c.text.c_str()).toWString().replace(Any(c.find.c_str()).toWString(), c.with.c_str());
        EXPECT_EQ(wide, Any(c.result.c_str()).toWString()) << c.text.substr(0, 20) << ' ' << c.find;
    }
    EXPECT_EQ(Any("\xE4-").replace(Any(u"-"), "\xC3\xA9"), Any(u"\u00e4\u00e9"));
    EXPECT_EQ(failureOf([] { Any("1").replace(Any(1), "2"); }), "");
}

TEST(Any, strcatAndSprintf) {
    EXPECT_EQ(Any::strcat(Any(), Any()), Any(u""));
    EXPECT_EQ(Any::sprintf("%s", std::string(3000, 'x').c_str()).size(), 2047);
}

}  // namespace
