#include "core/filter/qvfilter.h"

#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"

namespace {

// The contracts' own answers, for both kinds of filter.
template <class Fake, class Base>
struct Plain : Fake {
    using Fake::getParam;
    int setParam(const char* name, const Any& value) override { return Base::setParam(name, value); }
    void getParam(const char* name, Any& value) const override { Base::getParam(name, value); }
    int restore(const AnyDict& dict) override { return Base::restore(dict); }
    const char* name() const override { return "plain"; }
    void store(AnyDict& dict) const override {
        Base::store(dict);
        dict.set("amount", 3);
    }
};
using PlainVideo = Plain<FakeVideoFilter, QvVideoFilter>;
using PlainAudio = Plain<FakeAudioFilter, QvAudioFilter>;

template <class Filter>
class FilterContract : public testing::Test {};
using Kinds = testing::Types<PlainVideo, PlainAudio>;
TYPED_TEST_SUITE(FilterContract, Kinds);

TYPED_TEST(FilterContract, CommonParametersAndState) {
    TypeParam filter, other;
    filter.init();
    AnyDict state;
    filter.store(state);
    EXPECT_EQ(state, AnyDict("_on", 1, "_position", 0, "_front", 0, "name", "plain", "amount", 3));
    const LogCapture log;
    for (const char* name : {"_on", "_position", "_front"}) {
        EXPECT_EQ(filter.setParam(name, 4), 0);
        EXPECT_EQ(filter.getParam(name), Any(4));
    }
    for (const char* name : {"_previewMode", "_totalFrames"}) {
        EXPECT_EQ(filter.setParam(name, 1), 0);
        EXPECT_FALSE(filter.getParam(name).isValid());
    }
    EXPECT_THROW(filter.setParam("nonsense", 1), QvParamException);
    EXPECT_EQ(log.count("plain.setParam: "), 6) << "a line for each call";
    EXPECT_EQ(filter.getParam("info").asDict(), AnyDict("amount", 3, "name", "plain"));

    AnyDict taken("kept", 1);
    filter.store(taken);
    EXPECT_EQ(taken.getInt32("kept"), 1);
    taken.set("_on", "yes");
    EXPECT_EQ(other.restore(taken), 0);
    EXPECT_EQ(other.getParam("_on"), Any(1)) << "no integer";
    EXPECT_EQ(other.getParam("_front"), Any(4));
    for (const auto& name : {Any("other"), Any(5), Any()}) {
        state.set("name", name);
        EXPECT_EQ(other.restore(state), QvStatus::failed);
    }
    EXPECT_TRUE(log.contains("Invalid state dict, module name is other"));
}

TEST(FilterContract, OfOneKindAlone) {
    PlainVideo video;
    PlainAudio audio;
    EXPECT_EQ(audio.setParam("vf_base", 1), 0);
    QvFrame frame;
    EXPECT_FALSE(video.QvVideoFilter::applySupported());
    EXPECT_EQ(failureOf([&] { video.QvVideoFilter::apply(frame); }), "Apply not implemented");
}

}  // namespace
