#include "builtin/sound/effects/audiodelay.h"

#include <climits>

#include "tests/builtin/sound/sounds.h"

namespace {

using Delay = OpenedSound<QvADelay>;

TEST(QvADelay, TheInputComesLaterAndItsEndIsLost) {
    struct {
        int ms, rate, silence;
    } const rows[] = {{100, 48000, 4800}, {1, 44100, 44},       {7, 8000, 56},
                      {1000, 3000, 3000}, {1, 100, 0},          {0, 48000, 0},
                      {-20, 48000, 0},    {60000, 48000, 6000}, {INT_MAX, 48000, 6000},
                      {125, 48000, 6000}, {1, 48000, 48}};
    for (const auto& [ms, rate, silence] : rows) {
        const Values in = noise(2 * 6000, 1);
        Values expected(static_cast<std::size_t>(2 * silence), 0);
        expected.insert(expected.end(), in.begin(), in.end() - 2 * silence);
        EXPECT_EQ(throughBlocks<QvADelay>(AnyDict("delay", ms), in, 2, rate), expected)
            << ms << " at " << rate;
    }
}

TEST(QvADelay, SilenceIsThatOfTheWidth) {
    for (const int bytes : {1, 2, 3, 4}) {
        Delay delay(AnyDict("delay", 1));
        QvPcm in;
        in.init(60, 1, bytes, 48000);
        in.setSamples(60);
        std::memset(in.ptr(0), 77, static_cast<std::size_t>(in.bytes()));
        in.setPosition(1234);
        ASSERT_EQ(delay.write(in), 0);
        const QvPcm& out = *delay.pcm();
        ASSERT_EQ(out.samples(), 60);
        EXPECT_EQ(out.position(), 1234);
        EXPECT_EQ(out.ptr(47)[0], bytes == 1 ? 128 : 0);
        EXPECT_EQ(out.ptr(48)[0], 77);
    }
}

TEST(QvADelay, OpenedAgainItStartsWithSilence) {
    Delay delay(AnyDict("delay", 1));
    const Values in(100, 5);
    const Values first = throughFilter(delay, in, 1, {30});
    EXPECT_EQ(delay.close(), 0);
    EXPECT_EQ(delay.open(), 0);
    EXPECT_EQ(throughFilter(delay, in, 1, {100}), first);
    QvPcm other = soundOf(in, 2);
    ASSERT_EQ(delay.write(other), QvStatus::failed) << "the ring is of the first format";
}

TEST(QvADelay, StoresItsDelay) {
    QvADelay delay;
    EXPECT_EQ(failureOf([&] { delay.setParam("delay", 5); }), "Not inited");
    delay.init();
    QvPcm pcm = soundOf({1}, 1);
    EXPECT_EQ(failureOf([&] { delay.write(pcm); }), "Not opened");
    EXPECT_EQ(delay.setParam("delay", 250), 0);
    AnyDict state;
    delay.store(state);
    EXPECT_EQ(state.get("delay"), Any(250));
    state.set("delay", 80);
    EXPECT_EQ(delay.restore(state), 0);
    state.set("delay", 90.0);
    EXPECT_EQ(delay.restore(state), 0);
    EXPECT_EQ(delay.getParam("delay"), Any(80)) << "only an integer is taken";
}

}  // namespace
