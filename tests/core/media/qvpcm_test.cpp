#include "core/media/qvpcm.h"

#include <climits>
#include <functional>

#include "core/engine/status.h"
#include "tests/support/checks.h"

namespace {

using Bytes = std::vector<unsigned char>;

Bytes ramp(std::size_t count) {
    Bytes bytes(count);
    for (std::size_t i = 0; i < count; ++i) bytes[i] = static_cast<unsigned char>(i * 7 + 1);
    return bytes;
}

Bytes contents(const QvPcm& pcm) {
    return pcm.size() ? Bytes(pcm.ptr(0), pcm.ptr(0) + pcm.bytes()) : Bytes();
}

TEST(QvPcm, GrowsByWhatIsMissing) {
    QvPcm pcm;
    ASSERT_EQ(pcm.init(3, 2, 2, 48000), 0);
    const Bytes data = ramp(40);
    ASSERT_EQ(pcm.write(2, data.data()), 0);
    EXPECT_EQ(pcm.size(), 3);
    ASSERT_EQ(pcm.write(5, data.data() + 8), 0);
    EXPECT_EQ(pcm.size(), 7);
    EXPECT_EQ(pcm.erase(3), 0);
    EXPECT_EQ(contents(pcm), Bytes(data.begin() + 12, data.begin() + 28));
    EXPECT_TRUE(pcm.grow(2) == 9 && pcm.samples() == 4);
    EXPECT_TRUE(pcm.erase(4) == 0 && pcm.erase(100) == 0);
    EXPECT_TRUE(pcm.samples() == 0 && pcm.sizeBytes() == 36);
    EXPECT_EQ(pcm.grow(-20), QvStatus::outOfMemory);
}

TEST(QvPcm, AppendsFromItself) {
    QvPcm pcm;
    Bytes wanted = ramp(4);
    pcm.init(4, 1, 1, 8000);
    pcm.write(4, wanted.data());
    for (int i = 0; i < 10; ++i) {
        ASSERT_EQ(pcm.write(pcm.samples() - 1, pcm.ptr(1)), 0);
        const Bytes tail(wanted.begin() + 1, wanted.end());
        wanted.insert(wanted.end(), tail.begin(), tail.end());
    }
    EXPECT_EQ(contents(pcm), wanted);
}

TEST(QvPcm, SilenceDependsOnTheWidth) {
    for (int width = 1; width <= 4; ++width) {
        QvPcm pcm;
        pcm.init(2, 2, width, 44100);
        Bytes wanted = ramp(static_cast<std::size_t>(4 * width));
        pcm.write(2, wanted.data());
        for (int count : {0, -5, INT_MIN, 3}) EXPECT_EQ(pcm.addSilence(count), 0);
        wanted.insert(wanted.end(), static_cast<std::size_t>(6 * width), width == 1 ? 128 : 0);
        EXPECT_EQ(contents(pcm), wanted);
        pcm.clear();
        EXPECT_EQ(contents(pcm), Bytes(wanted.size(), 0));
    }
}

TEST(QvPcm, InterleavesAnyWidthAndChannelCount) {
    for (int width = 1; width <= 4; ++width)
        for (int channels : {1, 2, 6}) {
            constexpr int n = 5;
            const auto channelBytes = static_cast<std::size_t>(n * width);
            std::vector<Bytes> in, out;
            AnyVector from, to;
            for (int c = 0; c < channels; ++c) {
                in.push_back(ramp(channelBytes));
                in.back()[0] = static_cast<unsigned char>(200 + c);
                out.emplace_back(channelBytes + 4, 99);
            }
            for (auto& bytes : in) from.append(Any(static_cast<const void*>(bytes.data())));
            for (auto& bytes : out) to.append(Any(static_cast<const void*>(bytes.data())));
            QvPcm pcm;
            pcm.init(2, channels, width, 48000);
            pcm.addSilence(1);
            ASSERT_EQ(pcm.combineWrite(n, from), 0);
            ASSERT_EQ(pcm.samples(), n + 1);
            for (int i = 0; i < n * channels * width; ++i)
                ASSERT_EQ(pcm.ptr(1)[i],
                          in[static_cast<std::size_t>(i / width % channels)]
                            [static_cast<std::size_t>(i / (width * channels) * width + i % width)]);
            pcm.erase(1);
            ASSERT_EQ(pcm.combineRead(0, to), 0);
            EXPECT_EQ(out[0], Bytes(channelBytes + 4, 99));
            ASSERT_EQ(pcm.combineRead(n, to), 0);
            EXPECT_EQ(pcm.samples(), n);
            for (std::size_t c = 0; c < in.size(); ++c) {
                in[c].insert(in[c].end(), 4, 99);
                EXPECT_EQ(out[c], in[c]);
            }
            EXPECT_THROW(pcm.combineRead(n + 1, to), QvAssertFailure);
            to.append(to[0]);
            EXPECT_THROW(pcm.combineRead(n, to), QvAssertFailure);
            from.popBack();
            EXPECT_THROW(pcm.combineWrite(n, from), QvAssertFailure);
        }
    QvPcm wide;
    wide.init(1, 1, 8, 48000);
    EXPECT_THROW(wide.combineWrite(1, AnyVector(Any(static_cast<const void*>(&wide)))), QvAssertFailure);
}

TEST(QvPcm, CopiesShareTheBufferUntilOneGrows) {
    QvPcm owner, view;
    owner.init(4, 1, 2, 8000);
    owner.write(4, ramp(8).data());
    view = owner;
    *view.ptr(1) = 77;
    EXPECT_TRUE(view.ptr(0) == owner.ptr(0) && *owner.ptr(1) == 77);
    ASSERT_EQ(owner.write(2, ramp(4).data()), 0);
    EXPECT_TRUE(view.ptr(0) != owner.ptr(0) && *owner.ptr(1) == 77 && view.size() == 4);
    owner.destroy();
    view = static_cast<const QvPcm&>(view);
    EXPECT_EQ(*view.ptr(1), 77);
}

TEST(QvPcm, ConvertsUnits) {
    QvPcm pcm;
    pcm.init(10, 2, 3, 48000);
    EXPECT_TRUE(pcm.samples2bytes(7) == 42 && pcm.bytes2samples(47) == 7);
    EXPECT_EQ(pcm.ms2samples(40 * 1000 * 1000, 48), 1920000);
    EXPECT_TRUE(pcm.samples2ms(44100, 44100) == 1000 && pcm.samples2ms(44099, 44100) == 999);
    EXPECT_THROW(pcm.samples2ms(1, 0), QvAssertFailure);
}

TEST(QvPcm, CopiesMetaOnly) {
    QvPcm from, to;
    from.init(1, 1, 1, 96000);
    from.setPosition(1LL << 40);
    to.init(5, 2, 2, 48000);
    to.addSilence(3);
    to.copyMeta(from);
    EXPECT_TRUE(to.samplerate() == 96000 && to.position() == 1LL << 40 && to.samples() == 3 &&
                to.size() == 5 && to.channels() == 2 && to.bytesPerSample() == 2);
}

TEST(QvPcm, FailuresAreAssertionsOrStatuses) {
    QvPcm pcm;
    constexpr char invalid[] = "Invalid sample";
    const std::function<void()> needsAFormat[] = {
        [&] { pcm.ptr(0); },           [&] { pcm.clear(); },           [&] { pcm.bytes(); },
        [&] { pcm.sizeBytes(); },      [&] { pcm.write(0, nullptr); }, [&] { pcm.ms2samples(1, 1); },
        [&] { pcm.samples2ms(1, 1); }, [&] { pcm.samples2bytes(1); },  [&] { pcm.bytes2samples(1); }};
    for (const auto& operation : needsAFormat) EXPECT_EQ(failureOf(operation), "QvPcm not inited");

    const struct {
        int size, channels, width;
    } impossible[] = {{INT_MAX, 2, 2}, {-1, 2, 2}, {1, 0, 2}, {1, 2, -1}, {INT_MAX, INT_MAX, INT_MAX}};
    for (const auto& c : impossible) {
        EXPECT_EQ(pcm.init(c.size, c.channels, c.width, 48000), QvStatus::outOfMemory);
        EXPECT_FALSE(pcm.inited());
    }
    pcm.init(2, 1, 2, 48000);
    for (int sample : {-1, 2, INT_MAX}) EXPECT_EQ(failureOf([&] { pcm.ptr(sample); }), invalid);
    EXPECT_THROW(pcm.setSamples(3), QvAssertFailure);
    pcm.setSamples(2);
    // Nothing into a full buffer asks for the address behind its last sample.
    EXPECT_EQ(failureOf([&] { pcm.write(0, pcm.ptr(0)); }), invalid);
    LogCapture log;
    EXPECT_EQ(pcm.write(INT_MAX, pcm.ptr(0)), QvStatus::outOfMemory);
    EXPECT_TRUE(log.contains("[QvPcm] Out of memory"));
    EXPECT_EQ(pcm.addSilence(INT_MAX), QvStatus::outOfMemory);
    EXPECT_EQ(pcm.grow(INT_MAX), QvStatus::outOfMemory);
    EXPECT_EQ(pcm.samples(), 2);
}

}  // namespace
