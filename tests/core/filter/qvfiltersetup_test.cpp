#include "core/filter/qvfiltersetup.h"

#include "core/job/filtersstate.h"
#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"

namespace {

class FilterSetup : public testing::Test {
  protected:
    FilterSetup() {
        for (const char* name : {"logo", "timecode", "brightness", "flipper", "deinterlace", "cropper"})
            plugin_.video(name);
        plugin_.audio("avol");
    }
    static const AnyDict& known(const QvCodec* filter) {
        return dynamic_cast<const FakeVideoFilter&>(*filter).known;
    }
    FakePlugin plugin_;
    QvVFilterSetup setup_;
};

TEST_F(FilterSetup, ListsAreKeptInOrder) {
    auto* a = setup_.addFilter("logo", true);
    auto* b = setup_.addFilter("timecode", true);
    auto* c = setup_.addFilter("logo", false);
    const auto counts = [&] {
        return std::tuple(setup_.nrFilters(true, false), setup_.nrFilters(false, true),
                          setup_.nrFilters(true, true));
    };
    EXPECT_EQ(counts(), std::tuple(2, 1, 3));
    EXPECT_EQ(b->getParam("_position"), Any(2));
    EXPECT_EQ(c->getParam("_position"), Any(1));
    EXPECT_EQ(a->getParam("_front"), Any(1));
    EXPECT_EQ(setup_.filter("logo"), a);
    EXPECT_EQ(setup_.filter(0, false), c);
    for (const int wrong : {1, -1}) EXPECT_EQ(setup_.filter(wrong, false), nullptr);
    for (int times = 0; times < 2; ++times) setup_.removeFilter(a);
    EXPECT_EQ(setup_.filter("logo"), c);
    EXPECT_EQ(counts(), std::tuple(1, 1, 2));
    EXPECT_EQ(setup_.addFilter("logo", true)->getParam("_position"), Any(3));
    const LogCapture log;
    EXPECT_EQ(setup_.addFilter("nosuch", true), nullptr);
    EXPECT_TRUE(log.contains("[QvFilterSetup::addFilter] Failed to add filter nosuch.", QvLogMask::error));
}

TEST_F(FilterSetup, ParametersOfTheEffects) {
    EXPECT_EQ(known(setup_.addLogo("a.png", 3, -4, true)),
              AnyDict("filename", "a.png", "xpos", 3, "ypos", -4));
    EXPECT_EQ(known(setup_.addTimecode(QV_TIMECODE_TIMECODE, Any(5), true)), AnyDict("mode", 1));
    EXPECT_EQ(known(setup_.addTimecode(QV_TIMECODE_FRAME_NUMBER, wide("f.ttf"), true)),
              AnyDict("font_filename", wide("f.ttf"), "mode", 0));
    EXPECT_EQ(known(setup_.addBrightness(0.1, 1.2, 0.9, false)),
              AnyDict("brightness", 0.1, "contrast", 1.2, "gamma", 0.9));
    QvAFilterSetup audio;
    auto* volume = audio.addVolume(-3.5, true, false);
    EXPECT_EQ(volume->getParam("volume"), Any(-3.5));
    EXPECT_EQ(volume->getParam("mute"), Any(1));
    FiltersState state;
    audio.store(state);
    EXPECT_EQ(state.names(true), AnyVector(Any("avol")));
}

TEST_F(FilterSetup, SingleFiltersReplaceEachOtherAndAreStoredByName) {
    setup_.addFilter("timecode", false);
    setup_.addFilter("logo", true);
    setup_.setFlip(true);
    EXPECT_EQ(known(setup_.flipFilter()), AnyDict("flip", 1));
    setup_.setDeinterlace(QV_DEINTERLACE_BOB);
    EXPECT_EQ(known(setup_.deinterlaceFilter()), AnyDict("deinterlace", 4));
    EXPECT_EQ(setup_.filter("deinterlace"), nullptr);
    setup_.setCrop(4, 720, 576, QvRect(0, 0, 10, 10), 1, 2, 3, 4);
    EXPECT_EQ(known(setup_.cropFilter()), AnyDict("inputWidth", 720, "inputHeight", 576, "mode", 4));
    setup_.setCrop(1, 720, 576, QvRect(), 1, 2, 3, 4);
    EXPECT_EQ(known(setup_.cropFilter()), AnyDict("inputWidth", 720, "inputHeight", 576, "mode", 1, "padTop",
                                                  1, "padLeft", 3, "padBottom", 2, "padRight", 4));
    setup_.setCrop(2, 720, 576, QvRect(4, 6, 104, 86), 0, 0, 0, 0);
    const AnyDict& crop = known(setup_.cropFilter());
    EXPECT_EQ(crop.getInt32("cropWidth"), 100);
    EXPECT_EQ(crop.getInt32("cropHeight"), 80);
    EXPECT_EQ(crop.get("moveCropBox"), Any(QvPoint(4, 6)));

    FiltersState state;
    state.set("old", 1);
    setup_.store(state);
    EXPECT_EQ(state.names(true), AnyVector("cropper", "deinterlace", "flipper", "logo", "timecode"));
    EXPECT_FALSE(state.isSet("old"));
    EXPECT_EQ(state.findFilter("flipper")->getInt32("flip"), 1);
    EXPECT_EQ(failureOf([&] { setup_.restore(state); }), "TODO");

    setup_.setFlip(false);
    setup_.setCrop(0, 720, 576, QvRect(), 0, 0, 0, 0);
    setup_.removeFilter(setup_.deinterlaceFilter());
    setup_.store(state);
    EXPECT_EQ(state.names(true), AnyVector("logo", "timecode"));
}

}  // namespace
