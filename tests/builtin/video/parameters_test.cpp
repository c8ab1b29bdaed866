// The parameters of all effects: where they begin, what they take and refuse, and that a stored state brings
// them into another one.
#include <cmath>

#include "core/caption/subtitle/qvsubtitlefilter.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/filter/qvprocessutil.h"
#include "tests/builtin/video/effect_frames.h"

namespace {

std::unique_ptr<QvCodec> make(const std::string& module) {
    // Of these one is no module until an application adds it.
    if (module != "subtitle") return std::unique_ptr<QvCodec>(qv_registry()->newCodec(module.c_str()));
    EXPECT_EQ(qv_registry()->newCodec("subtitle"), nullptr);
    std::unique_ptr<QvCodec> codec(qvSubtitlePlugin()->module(0)->create());
    codec->init();
    return codec;
}

struct Row {
    const char* name;
    Any initial, good;
    std::vector<Any> refused;
};

struct Effect {
    const char* module;
    std::vector<Row> rows;
};

const int word = 0;

std::vector<Effect> effects() {
    const Any pointer(static_cast<const void*>(&word)), nothing(static_cast<const void*>(nullptr));
    const Any owned(static_cast<const void*>("\1\2\3\4\5\6\7"), 8);
    return {
        {"flipper", {{"flip", 1, 0, {"on"}}}},
        {"bobber", {{"alpha", 255, 7, {256, -1}}}},
        {"deinterlace", {{"deinterlace", "", "bob", {AnyVector()}}}},
        {"brightness",
         {{"brightness", 0.0, -1.0, {1.01, "1"}},
          {"contrast", 1.0, 2.0, {-0.1}},
          {"gamma", 1.0, 0.5, {0.0, std::nan("")}}}},
        {"logo",
         {{"filename", "", "a b.png", {1}},
          {"xpos", 0, -7, {"left", 1 << 21}},
          {"ypos", 0, 9, {Any()}},
          {"alpha", 1.0, 0.5, {1.5}}}},
        {"animatedlogo",
         {{"filename", "", "m.avi", {1}},
          {"decoder", "", "rawdec", {1}},
          {"decoderParams", AnyDict(), AnyDict("width", 4), {"width", "=5", "width=4;;", 1}},
          {"xpos", 0, -7, {"left"}},
          {"ypos", 0, 9, {"top"}},
          {"alpha", 1.0, 0.5, {-0.1}},
          {"scale", 100.0, 50.0, {0, 1001}},
          {"loop", 0, 1, {"yes"}}}},
        {"rawdump", {{"filename", "set me", "x.raw", {1}}}},
        {"videofade", {{"fade_in", 0, 4, {-1}}, {"fade_out", 0, 5, {-1}}, {"frames_count", 0, 9, {"all"}}}},
        {"userdata",
         {{"context", nothing, pointer, {owned, 5}},
          {"callback", nothing, pointer, {owned, 123456, "text"}}}},
        {"timecode",
         {{"mode", "Timecode", "Frame number", {"frames"}},
          {"start", "FirstInputFrame", "InPoint", {1, "Now"}},
          {"startOffset", 0, -5, {"x"}},
          {"dropFrame", -1, 1, {2, -2}},
          {"font_filename", "", "/a.ttf", {1}},
          {"colorR", 255, 1, {256}},
          {"colorG", 255, 0, {-1}},
          {"colorB", 255, 128, {"red"}},
          {"positionX", -1, 4, {"left"}},
          {"positionY", -1, 5, {Any()}},
          {"renderingOptions", AnyDict(), AnyDict("charSizePt", 20), {20}}}},
        {"subtitle",
         {{"subtitle_filename", "", "/a b.srt", {1}},
          {"font_filename", "", "/a.ttf", {1}},
          {"font_size", 32, 20, {0}},
          {"speed", 1.0, 0.5, {-1.0}},
          {"delay", 0.0, -20.5, {"soon"}},
          {"encoding", 0, 1252, {99999, -1}},
          {"framerate", Any(), QvFramerate(QvRatio(24, 1)), {0}},
          {"fontEffect", 0, 3, {4}},
          {"pixelAspect", 1.0, 2.0, {0.0}},
          {"color", 0xFFFFFF, 0x102030, {0x1000000}}}},
    };
}

}  // namespace

TEST(EffectParameters, AreCheckedStoredAndRestored) {
    const EngineScope engine;
    for (const auto& effect : effects()) {
        SCOPED_TRACE(effect.module);
        const auto codec = make(effect.module), other = make(effect.module);
        for (const auto& row : effect.rows) {
            EXPECT_EQ(codec->getParam(row.name), row.initial) << row.name;
            EXPECT_EQ(codec->setParam(row.name, row.good), 0) << row.name;
            for (const Any& wrong : row.refused) {
                EXPECT_NE(codec->setParam(row.name, wrong), 0) << row.name;
                EXPECT_NE(std::string(codec->errorDesc()).find(row.name), std::string::npos);
            }
        }
        EXPECT_EQ(codec->setParam("_previewMode", 1) | codec->setParam("_position", 3), 0);
        EXPECT_THROW(codec->setParam("no such", 1), QvParamException);
        AnyDict stored;
        codec->store(stored);
        EXPECT_EQ(other->restore(stored), 0);
        EXPECT_EQ(other->getParam("_position"), Any(3));
        for (const auto& row : effect.rows) EXPECT_EQ(other->getParam(row.name), row.good) << row.name;
        // A state with one wrong value changes none, nor does one of another filter or of no form.
        AnyDict wrong = stored, initial, foreign = stored, formless = stored;
        make(effect.module)->store(initial);
        other->restore(initial);
        AnyDict state = stored.get("state").asDict();
        state.set(effect.rows.back().name, effect.rows.back().refused.front());
        wrong.set("state", state);
        EXPECT_NE(other->restore(wrong), 0);
        foreign.set("name", "cropper");
        formless.set("state", 7);
        EXPECT_EQ(other->restore(foreign) + other->restore(formless), -2);
        for (const auto& row : effect.rows) EXPECT_EQ(other->getParam(row.name), row.initial) << row.name;
    }
}

TEST(EffectParameters, OfferedOnesAreWellDescribedAndTaken) {
    const EngineScope engine;
    const std::pair<const char*, int> counts[] = {
        {"flipper", 1},  {"bobber", 1},       {"deinterlace", 0}, {"brightness", 3},
        {"logo", 4},     {"animatedlogo", 6}, {"rawdump", 1},     {"videofade", 3},
        {"userdata", 0}, {"timecode", 0},     {"subtitle", 8},
    };
    for (const auto& [module, count] : counts) {
        const auto codec = make(module);
        const Any set = codec->getParam("paramSet");
        const AnyVector rows = set.isVector() ? set.asVector() : AnyVector();
        EXPECT_EQ(rows.size(), count) << module;
        for (const Any& entry : rows) {
            const AnyDict& row = entry.asDict();
            Any fault;
            EXPECT_TRUE(QvProcessUtil::checkParamDesc(row, &fault)) << fault.asString("");
            const std::string name = row.getString("name", "");
            EXPECT_EQ(
                codec->setParam(name.c_str(), row.getInt32("type", 0) == Any::String ? Any("x") : Any(1)), 0);
            const bool file = name.ends_with("filename"), dump = module == std::string("rawdump");
            const int control = row.getInt32("guiControl", 0);
            EXPECT_EQ(control == QV_GUI_FILESELECT_LOAD, file && !dump) << module << name;
            EXPECT_EQ(control == QV_GUI_FILESELECT_SAVE, file && dump) << module << name;
        }
    }
    const auto subtitle = make("subtitle");
    EXPECT_EQ(subtitle->setParam("color", 0x102030), 0);
    EXPECT_EQ(subtitle->getParam("colorG"), Any(0x20));
    EXPECT_EQ(subtitle->getParam("format"), Any(0));
    EXPECT_EQ(subtitle->getParam("encodingRange").asVector().at(2).asDict().get("name"), Any("UTF-8"));
    EXPECT_EQ(subtitle->getParam("fontEffectRange").asVector().at(3).asDict().get("name"),
              Any("Outline w/ hard shadow"));
}
