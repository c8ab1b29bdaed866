#include "core/filter/qvfilter.h"

#include <gtest/gtest.h>

#include "core/engine/qvexception.h"
#include "tests/support/fake_filters.h"
#include "tests/support/log_capture.h"

namespace {

// The contracts' own answers, for both kinds of filter.
template <class Base>
class Plain : public Base {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    const char* name() const override { return "plain"; }
    void store(AnyDict& dict) const override {
        Base::store(dict);
        dict.set("amount", 3);
    }
};

class PlainVideo : public Plain<QvVideoFilter> {
  public:
    int write(QvFrame&) override { return 0; }
    int ready() const override { return 0; }
    QvFrame* frame() override { return nullptr; }
    int next() override { return 0; }
};

class PlainAudio : public Plain<QvAudioFilter> {
  public:
    int write(QvPcm&) override { return 0; }
    int samples() const override { return 0; }
    QvPcm* pcm() override { return nullptr; }
    int erase(int) override { return 0; }
};

template <class Filter>
class FilterContract : public testing::Test {};
using Kinds = testing::Types<PlainVideo, PlainAudio>;
TYPED_TEST_SUITE(FilterContract, Kinds);

TYPED_TEST(FilterContract, CommonParameters) {
    TypeParam filter;
    EXPECT_EQ(filter.getParam("_on"), Any(1));
    EXPECT_EQ(filter.getParam("_position"), Any(0));
    EXPECT_EQ(filter.getParam("_front"), Any(0));
    EXPECT_EQ(filter.setParam("_position", 4), 0);
    EXPECT_EQ(filter.getParam("_position"), Any(4));
    EXPECT_EQ(filter.setParam("_previewMode", 1), 0);
    EXPECT_EQ(filter.setParam("_totalFrames", 1), 0);
    EXPECT_FALSE(filter.getParam("_totalFrames").isValid());
    EXPECT_THROW(filter.setParam("nonsense", 1), QvParamException);
    EXPECT_EQ(filter.getParam("info").asDict(), AnyDict("amount", 3, "name", "plain"));
    filter.init();
    LogCapture log;
    filter.setParam("_on", 0);
    EXPECT_THROW(filter.setParam("nonsense", 1), QvParamException);
    EXPECT_EQ(log.count("plain.setParam: "), 2) << "a line for each call";
}

TYPED_TEST(FilterContract, StoreAddsAndRestoreChecks) {
    TypeParam filter;
    filter.setParam("_on", 0);
    filter.setParam("_front", 1);
    AnyDict state("kept", 1);
    filter.store(state);
    EXPECT_EQ(state.getInt32("kept"), 1);
    TypeParam other;
    EXPECT_EQ(other.restore(state), 0);
    EXPECT_EQ(other.getParam("_on"), Any(0));
    EXPECT_EQ(other.getParam("_front"), Any(1));

    state.set("_on", "yes");
    EXPECT_EQ(other.restore(state), 0);
    EXPECT_EQ(other.getParam("_on"), Any(0));

    LogCapture log;
    for (const auto& name : {Any("other"), Any(5), Any()}) {
        state.set("name", name);
        EXPECT_EQ(other.restore(state), -1);
    }
    EXPECT_TRUE(log.contains("Invalid state dict, module name is other"));
}

TEST(FilterContract, Interfaces) {
    PlainVideo video;
    PlainAudio audio;
    EXPECT_EQ(video.getInterface(12), &video);
    EXPECT_EQ(video.getInterface(13), nullptr);
    EXPECT_EQ(audio.getInterface(13), &audio);
    EXPECT_EQ(audio.getInterface(12), nullptr);
    EXPECT_EQ(audio.setParam("vf_base", 1), 0);
    EXPECT_FALSE(video.applySupported());
    QvFrame frame;
    EXPECT_THROW(video.apply(frame), QvAssertFailure);
}

}  // namespace
