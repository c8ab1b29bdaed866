#include "core/engine/modules/params.h"

#include <climits>
#include <cmath>
#include <limits>
#include <map>

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

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

struct BaseSettings {
    int depth = 8, frames = 7;
};
constexpr QvParamRow<BaseSettings> baseRows[] = {
    {"depth", &BaseSettings::depth, qvParamNeeded, 8, 16, "", "bits", "of a sample"},
    {"frames", &BaseSettings::frames},
    {.name = "byHand", .flags = qvParamByHand | qvParamWriteOnly, .help = "elsewhere", .type = Any::String},
    {.name = "toRead", .flags = qvParamByHand | qvParamReadOnly},
};

class BaseCodec : public QvCodec {
  public:
    int setParam(const char* name, const Any& value) override { return QvCodec::setParam(name, value); }
    void getParam(const char* name, Any& value) const override {
        if (!qvGetParamRow<BaseSettings>(baseRows, base_, name, value)) QvCodec::getParam(name, value);
    }
    int open() override { return 0; }
    int close() override { return 0; }
    void* getInterface(int) const override { return nullptr; }
    using QvCodec::getParam;

  private:
    BaseSettings base_;
};

class DerivedCodec : public BaseCodec {
  public:
    void getParam(const char* name, Any& value) const override {
        if (!qvGetParamRow<Settings>(rows, settings_, name, value)) BaseCodec::getParam(name, value);
    }

  private:
    Settings settings_;
};

// A manual is made of it: each name once, as the class has it, with what its bases add.
TEST(Params, OfACodecAreThoseOfAllItsTables) {
    EngineScope engine;
    LogCapture log;
    std::map<std::string, AnyDict> found;
    for (const Any& row : qvParameters(DerivedCodec())) {
        const AnyDict& described = row.asDict();
        EXPECT_TRUE(found.emplace(described.getString("name", ""), described).second);
    }
    EXPECT_EQ(found.size(), std::size(rows) - 1 + std::size(baseRows) - 1) << "one is ignored, one in both";
    EXPECT_FALSE(found.count("old"));
    EXPECT_EQ(found["frames"].getInt32("default", 0), 25) << "of the derived class";
    const AnyDict depth("name", "depth", "default", 8, "type", "Int32");
    for (const auto [key, value] : depth) EXPECT_TRUE(found["depth"].get(key) == *value) << key;
    EXPECT_TRUE(found["depth"].get("unit") == "bits" && found["depth"].get("help") == "of a sample");
    EXPECT_TRUE(found["depth"].isSet("needed") && found["depth"].get("max").toInt32() == 16);
    EXPECT_TRUE(found["byHand"].get("type") == "String" && !found["byHand"].isSet("readOnly"));
    EXPECT_TRUE(found["toRead"].isSet("readOnly"));
    // Described or not, a name by hand is the codec's own affair.
    BaseSettings base;
    Any value;
    EXPECT_FALSE(qvSetParamRow<BaseSettings>(baseRows, base, "byHand", Any("x")));
    EXPECT_FALSE(qvGetParamRow<BaseSettings>(baseRows, base, "toRead", value));
    EXPECT_FALSE(log.contains("correctly", QvLogMask::warning));
}

}  // namespace
