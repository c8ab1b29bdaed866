#include "core/filter/qvfiltersetup.h"

#include <gtest/gtest.h>

#include "core/engine/qvexception.h"
#include "core/filter/filtersstate.h"
#include "core/media/qvgeometry.h"
#include "tests/support/fake_filters.h"
#include "tests/support/log_capture.h"

namespace {

class FilterSetup : public testing::Test {
  protected:
    FilterSetup() {
        for (const char* name :
             {"logo", "timecode", "brightness", "userdata", "flipper", "deinterlace", "cropper"})
            plugin_.video(name);
        plugin_.audio("avol");
    }
    static const AnyDict& paramsOf(const QvCodec* filter) {
        return dynamic_cast<const FakeVideoFilter&>(*filter).known;
    }
    FakePlugin plugin_;
    QvVFilterSetup setup_;
};

TEST_F(FilterSetup, ListsAreKeptInOrder) {
    auto* a = setup_.addFilter("logo", true);
    auto* b = setup_.addFilter("timecode", true);
    auto* c = setup_.addFilter("logo", false);
    EXPECT_EQ(setup_.nrFilters(true, false), 2);
    EXPECT_EQ(setup_.nrFilters(true, true), 3);
    EXPECT_EQ(setup_.nrFilters(false, false), 0);
    EXPECT_EQ(b->getParam("_position"), Any(2));
    EXPECT_EQ(c->getParam("_position"), Any(1));
    EXPECT_EQ(a->getParam("_front"), Any(1));
    EXPECT_EQ(setup_.filter("logo"), a);
    EXPECT_EQ(setup_.filter(0, false), c);
    EXPECT_EQ(setup_.filter(1, false), nullptr);
    EXPECT_EQ(setup_.filter(-1, true), nullptr);

    setup_.removeFilter(a);
    EXPECT_EQ(setup_.filter("logo"), c);
    setup_.removeFilter(a);
    EXPECT_EQ(setup_.nrFilters(true, true), 2);
    EXPECT_EQ(setup_.addFilter("logo", true)->getParam("_position"), Any(3));

    LogCapture log;
    EXPECT_EQ(setup_.addFilter("nosuch", true), nullptr);
    EXPECT_TRUE(log.contains("[QvFilterSetup::addFilter] Failed to add filter nosuch.", QvLogMask::error));
}

TEST_F(FilterSetup, ParametersOfTheEffects) {
    EXPECT_EQ(paramsOf(setup_.addLogo("a.png", 3, -4, true)),
              AnyDict("filename", "a.png", "xpos", 3, "ypos", -4));
    EXPECT_EQ(paramsOf(setup_.addTimecode(QV_TIMECODE_TIMECODE, Any(5), true)), AnyDict("mode", 1));
    EXPECT_TRUE(paramsOf(setup_.addTimecode(QV_TIMECODE_FRAME_NUMBER, "f.ttf", true)).get("font_filename") ==
                "f.ttf");
    EXPECT_EQ(paramsOf(setup_.addBrightness(0.1, 1.2, 0.9, false)),
              AnyDict("brightness", 0.1, "contrast", 1.2, "gamma", 0.9));
    int context = 0;
    EXPECT_EQ(paramsOf(setup_.addUserDataCallback(&setup_, &context, false)).get("context").asGeneric(),
              &context);
    QvAFilterSetup audio;
    auto* volume = audio.addVolume(-3.5, true, false);
    EXPECT_EQ(volume->getParam("volume"), Any(-3.5));
    EXPECT_EQ(volume->getParam("mute"), Any(1));
}

TEST_F(FilterSetup, SingleFiltersReplaceEachOther) {
    setup_.setFlip(true);
    EXPECT_EQ(paramsOf(setup_.flipFilter()), AnyDict("flip", 1));
    setup_.setFlip(false);
    EXPECT_EQ(setup_.flipFilter(), nullptr);
    setup_.setDeinterlace(QV_DEINTERLACE_BOB);
    EXPECT_EQ(paramsOf(setup_.deinterlaceFilter()), AnyDict("deinterlace", 4));
    EXPECT_EQ(setup_.filter("deinterlace"), nullptr);
    setup_.removeFilter(setup_.deinterlaceFilter());
    EXPECT_EQ(setup_.deinterlaceFilter(), nullptr);

    setup_.setCrop(4, 720, 576, QvRect(0, 0, 10, 10), 1, 2, 3, 4);
    EXPECT_EQ(paramsOf(setup_.cropFilter()), AnyDict("inputWidth", 720, "inputHeight", 576, "mode", 4));
    setup_.setCrop(1, 720, 576, QvRect(), 1, 2, 3, 4);
    EXPECT_EQ(paramsOf(setup_.cropFilter()).getInt32("padRight"), 4);
    EXPECT_FALSE(paramsOf(setup_.cropFilter()).isSet("cropWidth"));
    setup_.setCrop(2, 720, 576, QvRect(4, 6, 104, 86), 0, 0, 0, 0);
    EXPECT_EQ(paramsOf(setup_.cropFilter()).getInt32("cropHeight"), 80);
    EXPECT_TRUE(paramsOf(setup_.cropFilter()).get("moveCropBox") == Any(QvPoint(4, 6)));
    setup_.setCrop(0, 720, 576, QvRect(), 0, 0, 0, 0);
    EXPECT_EQ(setup_.cropFilter(), nullptr);
}

TEST_F(FilterSetup, StoresFrontBackAndSingleFilters) {
    setup_.addFilter("timecode", false);
    setup_.addFilter("logo", true);
    setup_.setFlip(true);
    FiltersState state;
    state.set("old", 1);
    setup_.store(state);
    EXPECT_EQ(state.names(true), AnyVector("flipper", "logo", "timecode"));
    EXPECT_FALSE(state.isSet("old"));
    EXPECT_EQ(state.findFilter("flipper")->getInt32("flip"), 1);
    EXPECT_THROW(setup_.restore(state), QvAssertFailure);
}

}  // namespace
