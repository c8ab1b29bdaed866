#include "core/engine/params.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <limits>
#include <string>

#include "core/media/qvgeometry.h"

namespace {

struct Settings {
    int frames = 25;
    bool invert = false;
    double gain = 1.0;
    long long offset = 0;
    unsigned mask = 0;
    std::string title = "none";
    QvFramerate rate;
    AnyDict extra;
    int secret = 0;
    int half = 0;
};

int setHalf(Settings& s, const Any& value) {
    if (!value.isInt32()) return QvStatus::invalidParam;
    s.half = value.asInt32() / 2;
    return QvStatus::ok;
}
void getHalf(const Settings& s, Any& value) { value = s.half * 2; }

constexpr QvParamRow<Settings> rows[] = {
    {"frames", &Settings::frames, qvParamStored, 1, 1000, "length of the fade in frames"},
    {"invert", &Settings::invert, qvParamStored},
    {"gain", &Settings::gain, qvParamStored, 0, 8},
    {"offset", &Settings::offset},
    {"mask", &Settings::mask},
    {"title", &Settings::title, qvParamStored},
    {"rate", &Settings::rate},
    {"extra", &Settings::extra},
    {"secret", &Settings::secret, qvParamWriteOnly},
    {"old", {}, qvParamIgnored},
    {"count", &Settings::half, qvParamReadOnly},
    {"double", QvParamAccess<Settings>{setHalf, getHalf}, qvParamStored},
    {"view", QvParamAccess<Settings>{nullptr, getHalf}},
};
static_assert(qvParamTableOk<Settings>(rows));

constexpr QvParamRow<Settings> twice[] = {{"frames", &Settings::frames}, {"frames", &Settings::half}};
constexpr QvParamRow<Settings> emptyRange[] = {{"frames", &Settings::frames, 0, 2, 1}};
static_assert(!qvParamTableOk<Settings>(twice));
static_assert(!qvParamTableOk<Settings>(emptyRange));

std::optional<int> set(Settings& s, const char* name, const Any& value) {
    return qvSetParamRow<Settings>(rows, s, name, value);
}

Any get(const Settings& s, const char* name) {
    Any value;
    qvGetParamRow<Settings>(rows, s, name, value);
    return value;
}

TEST(Params, NumbersAreCheckedAtTheDoor) {
    const double infinity = std::numeric_limits<double>::infinity();
    const struct {
        const char* name;
        Any value;
        bool accepted;
    } cases[] = {
        {"frames", Any(1), true},
        {"frames", Any(1000), true},
        {"frames", Any(0), false},
        {"frames", Any(1001), false},
        {"frames", Any(30LL), true},
        {"frames", Any((1LL << 32) + 30), false},  // its low half would fit
        {"frames", Any(30.9), true},
        {"frames", Any(3e9), false},
        {"frames", Any(std::nan("")), false},
        {"frames", Any("30"), false},
        {"frames", Any(), false},
        {"frames", Any(AnyVector(Any(1))), false},
        {"offset", Any(LLONG_MAX), true},
        {"offset", Any(9.3e18), false},
        {"offset", Any(-9.3e18), false},
        {"mask", Any(-1), false},
        {"mask", Any(0xFFFFFFFFLL), true},
        {"mask", Any(4294967296.0), false},
        {"gain", Any(8), true},
        {"gain", Any(8.0001), false},
        {"gain", Any(infinity), false},
        {"gain", Any(std::nan("")), false},
        {"invert", Any(2), true},
        {"invert", Any(0.5), true},
        {"invert", Any("false"), false},
        {"rate", Any(25), true},
        {"rate", Any(29.97), true},
        {"rate", Any(0), false},
        {"rate", Any(-25.0), false},
        {"rate", Any(std::nan("")), false},
        {"rate", Any(infinity), false},
        {"rate", Any(1e300), false},
        {"rate", Any(1e-9), false},
        {"rate", Any(QvFramerate(50.0)), true},
        {"extra", Any(AnyDict("a", 1)), true},
        {"extra", Any(1), false},
        {"title", Any(5), false},
        {"title", Any(), true},
        {"double", Any("8"), false},
    };
    for (const auto& c : cases) {
        Settings s;
        const Any before = get(s, c.name);
        EXPECT_EQ(set(s, c.name, c.value), c.accepted ? QvStatus::ok : QvStatus::invalidParam)
            << c.name << " case " << (&c - cases);
        EXPECT_TRUE(c.accepted || get(s, c.name) == before) << c.name << " case " << (&c - cases);
    }
}

TEST(Params, FloatsLoseTheirFraction) {
    Settings s;
    set(s, "frames", 30.9);
    set(s, "offset", -2.9);
    EXPECT_EQ(s.frames, 30);
    EXPECT_EQ(s.offset, -2);
}

TEST(Params, WideTextBecomesUtf8) {
    Settings s;
    set(s, "title", Any(u"caf\u00E9"));
    EXPECT_EQ(s.title, "caf\xC3\xA9");
    set(s, "title", Any());
    EXPECT_EQ(s.title, "");
}

TEST(Params, LargeUnsignedComesBackAsItWas) {
    Settings s;
    set(s, "mask", 0xFFFFFFFFLL);
    EXPECT_EQ(s.mask, 0xFFFFFFFFu);
    Settings copy;
    EXPECT_EQ(set(copy, "mask", get(s, "mask")), QvStatus::ok);
    EXPECT_EQ(copy.mask, s.mask);
}

TEST(Params, FlagsDecideWhoMayAsk) {
    Settings s;
    EXPECT_EQ(set(s, "unknown", 1), std::nullopt);
    EXPECT_EQ(set(s, nullptr, 1), std::nullopt);
    EXPECT_EQ(set(s, "count", 1), std::nullopt);
    EXPECT_EQ(set(s, "view", 1), std::nullopt);
    EXPECT_EQ(set(s, "old", "anything"), QvStatus::ok);
    EXPECT_EQ(set(s, "secret", 3), QvStatus::ok);
    EXPECT_EQ(set(s, "double", 8), QvStatus::ok);
    EXPECT_EQ(get(s, "count"), 4);
    EXPECT_EQ(get(s, "double"), 8);
    for (const char* hidden : {"unknown", "old", "secret"}) EXPECT_FALSE(get(s, hidden).isValid()) << hidden;
}

TEST(Params, StateHoldsStoredRowsOnly) {
    Settings s;
    set(s, "frames", 50);
    set(s, "double", 6);
    AnyDict state("foreign", 1);
    qvStoreParamRows<Settings>(rows, s, state);
    EXPECT_EQ(state,
              AnyDict("foreign", 1, "frames", 50, "invert", 0, "gain", 1.0, "title", "none", "double", 6));
    Settings other;
    other.offset = 9;
    EXPECT_EQ(qvRestoreParamRows<Settings>(rows, other, state), QvStatus::ok);
    EXPECT_EQ(other.frames, 50);
    EXPECT_EQ(other.half, 3);
    EXPECT_EQ(other.offset, 9);
    EXPECT_EQ(qvRestoreParamRows<Settings>(rows, other, AnyDict("frames", 5000, "gain", 2.0)),
              QvStatus::invalidParam);
    EXPECT_EQ(other.frames, 50);
    EXPECT_EQ(other.gain, 2.0);
}

TEST(Params, RefusalSaysWhatIsTaken) {
    const struct {
        const char* name;
        Any value;
        const char* text;
    } cases[] = {
        {"frames", Any(5000), "'frames' takes an integer from 1 to 1000, not 5000"},
        {"frames", Any("many"), "'frames' takes an integer from 1 to 1000, not \"many\""},
        {"gain", Any(-0.5), "'gain' takes a number from 0 to 8, not -0.5"},
        {"mask", Any(-1), "'mask' takes an integer from 0 to 4294967295, not -1"},
        {"offset", Any(), "'offset' takes an integer, not a value of type Invalid"},
        {"invert", Any("yes"), "'invert' takes a flag (0 or 1), not \"yes\""},
        {"title", Any(AnyDict()), "'title' takes a text, not a value of type Dict"},
        {"rate", Any("pal"), "'rate' takes a frame rate, not \"pal\""},
        {"extra", Any(3LL), "'extra' takes a dictionary, not 3"},
    };
    for (const auto& c : cases) EXPECT_EQ(qvParamRefusal<Settings>(rows, c.name, c.value), c.text);
}

TEST(Params, DescriptionTellsTypeRangeDefaultAndUse) {
    const AnyVector all = qvDescribeParamRows<Settings>(rows, Settings());
    ASSERT_EQ(all.size(), 12);  // the ignored row is nobody's business
    EXPECT_EQ(all.at(0), Any(AnyDict("name", "frames", "type", "Int32", "min", 1.0, "max", 1000.0, "default",
                                     25, "description", "length of the fade in frames")));
    EXPECT_EQ(all.at(1),
              Any(AnyDict("name", "invert", "type", "Int32", "min", 0.0, "max", 1.0, "default", 0)));
    EXPECT_EQ(all.at(8), Any(AnyDict("name", "secret", "type", "Int32", "writeOnly", 1)));
    EXPECT_EQ(all.at(9), Any(AnyDict("name", "count", "type", "Int32", "default", 0, "readOnly", 1)));
    EXPECT_EQ(all.at(11), Any(AnyDict("name", "view", "type", "Int32", "default", 0, "readOnly", 1)));
}

}  // namespace
