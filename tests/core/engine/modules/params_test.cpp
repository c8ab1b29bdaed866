#include "core/engine/modules/params.h"

#include <climits>
#include <cmath>
#include <limits>

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"

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
    double level = 0;
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
    {"level", &Settings::level},
};
static_assert(qvParamTableOk<Settings>(rows));

std::optional<int> set(Settings& s, const char* name, const Any& value) {
    return qvSetParamRow<Settings>(rows, s, name, value);
}

Any get(const Settings& s, const char* name) {
    Any value;
    qvGetParamRow<Settings>(rows, s, name, value);
    return value;
}

TEST(Params, NumbersAreCheckedAtTheDoor) {
    const double infinity = std::numeric_limits<double>::infinity(), nan = std::nan("");
    const struct {
        const char* name;
        AnyVector accepted, refused;
    } cases[] = {
        {"frames", {1, 1000, 30LL, 30.9}, {0, 1001, (1LL << 32) + 30, 3e9, nan, "30", Any()}},
        {"offset", {LLONG_MAX, -2.9}, {9.3e18, -9.3e18}},
        {"mask", {0xFFFFFFFFLL, 0}, {-1, 4294967296.0}},
        {"gain", {8, 0}, {8.0001, infinity, nan}},
        {"level", {1e300, 5}, {nan, "1"}},
        {"invert", {2, 0.5}, {"false", Any()}},
        {"rate", {25, 29.97, QvFramerate(50.0)}, {0, -25.0, nan, infinity, 1e300, 1e-9}},
        {"extra", {AnyDict("a", 1), AnyDict()}, {1, Any()}},
        {"title", {Any(), "x"}, {5, AnyDict()}},
        {"double", {8, 0}, {"8", 1.0}},
    };
    for (const auto& c : cases) {
        Settings s;
        for (const Any& value : c.refused) {
            const Any before = get(s, c.name);
            EXPECT_EQ(set(s, c.name, value), QvStatus::invalidParam)
                << c.name << testing::PrintToString(value);
            EXPECT_EQ(get(s, c.name), before);
        }
        for (const Any& value : c.accepted)
            EXPECT_EQ(set(s, c.name, value), QvStatus::ok) << c.name << testing::PrintToString(value);
    }
}

TEST(Params, ValuesAreConverted) {
    Settings s;
    set(s, "frames", 30.9);
    set(s, "offset", -2.9);
    set(s, "title", Any(u"caf\u00E9"));
    set(s, "mask", 0xFFFFFFFFLL);
    EXPECT_TRUE(s.frames == 30 && s.offset == -2 && s.title == "caf\xC3\xA9" && s.mask == 0xFFFFFFFFu);
    EXPECT_EQ(get(s, "mask"), 0xFFFFFFFFLL);
    set(s, "title", Any());
    EXPECT_EQ(s.title, "");
}

TEST(Params, FlagsDecideWhoMayAsk) {
    Settings s;
    for (const char* none : {"unknown", "count", "view", static_cast<const char*>(nullptr)})
        EXPECT_EQ(set(s, none, 1), std::nullopt);
    EXPECT_EQ(set(s, "old", "anything"), QvStatus::ok);
    EXPECT_EQ(set(s, "secret", 3), QvStatus::ok);
    EXPECT_EQ(set(s, "double", 8), QvStatus::ok);
    EXPECT_TRUE(get(s, "count") == 4 && get(s, "double") == 8);
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
    EXPECT_TRUE(other.frames == 50 && other.half == 3 && other.offset == 9);
    EXPECT_EQ(qvRestoreParamRows<Settings>(rows, other, AnyDict("frames", 5000, "gain", 2.0)),
              QvStatus::invalidParam);
    EXPECT_TRUE(other.frames == 50 && other.gain == 2.0);
}

TEST(Params, RefusalSaysWhatIsTaken) {
    const struct {
        const char* name;
        Any value;
        const char* text;
    } cases[] = {
        {"frames", Any(5000), "'frames' takes an integer from 1 to 1000, not 5000"},
        {"invert", Any("yes"), "'invert' takes a flag (0 or 1), not \"yes\""},
    };
    for (const auto& c : cases) EXPECT_EQ(qvParamRefusal<Settings>(rows, c.name, c.value), c.text);
}

}  // namespace
