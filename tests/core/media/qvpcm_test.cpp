#include "core/media/qvpcm.h"

#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/pictures.h"

namespace {

int write(QvPcm& pcm, int samples, const std::string& bytes) {
    return pcm.write(samples, reinterpret_cast<const unsigned char*>(bytes.data()));
}

TEST(QvPcm, GrowsByWhatIsMissing) {
    QvPcm pcm;
    ASSERT_EQ(pcm.init(3, 2, 2, 48000), 0);
    const std::string data = patternBytes(40);
    ASSERT_EQ(write(pcm, 2, data), 0);
    EXPECT_EQ(pcm.size(), 3);
    ASSERT_EQ(write(pcm, 5, data.substr(8)), 0);
    EXPECT_EQ(pcm.size(), 7);
    EXPECT_EQ(pcm.erase(3), 0);
    EXPECT_EQ(soundBytes(pcm), data.substr(12, 16));
    EXPECT_TRUE(pcm.grow(2) == 9 && pcm.samples() == 4);
    EXPECT_TRUE(pcm.erase(4) == 0 && pcm.erase(100) == 0);
    EXPECT_TRUE(pcm.samples() == 0 && pcm.sizeBytes() == 36);
    EXPECT_EQ(pcm.grow(-20), QvStatus::outOfMemory);
}

TEST(QvPcm, AppendsFromItself) {
    QvPcm pcm;
    std::string wanted = patternBytes(4);
    pcm.init(4, 1, 1, 8000);
    write(pcm, 4, wanted);
    for (int i = 0; i < 10; ++i) {
        ASSERT_EQ(pcm.write(pcm.samples() - 1, pcm.ptr(1)), 0);
        wanted += wanted.substr(1);
    }
    EXPECT_EQ(soundBytes(pcm), wanted);
}

TEST(QvPcm, SilenceDependsOnTheWidth) {
    for (int width = 1; width <= 4; ++width) {
        QvPcm pcm;
        pcm.init(2, 2, width, 44100);
        std::string wanted = patternBytes(static_cast<std::size_t>(4 * width));
        write(pcm, 2, wanted);
        for (int count : {0, -5, INT_MIN, 3}) EXPECT_EQ(pcm.addSilence(count), 0);
        wanted.append(static_cast<std::size_t>(6 * width), width == 1 ? '\x80' : '\0');
        EXPECT_EQ(soundBytes(pcm), wanted);
        pcm.clear();
        EXPECT_EQ(soundBytes(pcm), std::string(wanted.size(), 0));
    }
}

TEST(QvPcm, InterleavesAnyWidth) {
    const std::string mixed[] = {"aAbBcC", "abABcdCDefEF", "abcABCdefDEFghiGHI", "abcdABCDefghEFGHijklIJKL"};
    for (int width = 1; width <= 4; ++width) {
        std::string small = "abcdefghijkl", large = "ABCDEFGHIJKL";
        AnyVector channels(Any(static_cast<const void*>(small.data())),
                           Any(static_cast<const void*>(large.data())));
        QvPcm pcm;
        pcm.init(2, 2, width, 48000);
        pcm.addSilence(1);
        ASSERT_EQ(pcm.combineWrite(3, channels), 0);
        const std::string& wanted = mixed[width - 1];
        EXPECT_EQ(std::string(pcm.ptr(1), pcm.ptr(1) + 6 * width), wanted);
        pcm.erase(1);
        small.assign(12, '.'), large.assign(12, '.');
        ASSERT_EQ(pcm.combineRead(3, channels), 0);
        const auto bytes = static_cast<std::size_t>(3 * width);
        EXPECT_EQ(small, std::string("abcdefghijkl").substr(0, bytes) + std::string(12 - bytes, '.'));
        EXPECT_EQ(large.substr(0, bytes), std::string("ABCDEFGHIJKL").substr(0, bytes));
    }
}

TEST(QvPcm, CopiesShareTheBufferUntilOneGrows) {
    QvPcm owner, view;
    owner.init(4, 1, 2, 8000);
    write(owner, 4, patternBytes(8));
    view = owner;
    *view.ptr(1) = 77;
    EXPECT_TRUE(view.ptr(0) == owner.ptr(0) && *owner.ptr(1) == 77);
    ASSERT_EQ(write(owner, 2, patternBytes(4)), 0);
    EXPECT_TRUE(view.ptr(0) != owner.ptr(0) && *owner.ptr(1) == 77 && view.size() == 4);
    owner.destroy();
    view = static_cast<const QvPcm&>(view);
    EXPECT_EQ(*view.ptr(1), 77);
}

TEST(QvPcm, FailuresAreAssertionsOrStatuses) {
    QvPcm pcm;
    const struct {
        int size, channels, width;
    } impossible[] = {{INT_MAX, 2, 2}, {-1, 2, 2}, {1, 0, 2}, {1, 2, -1}, {INT_MAX, INT_MAX, INT_MAX}};
    for (const auto& c : impossible) {
        EXPECT_EQ(pcm.init(c.size, c.channels, c.width, 48000), QvStatus::outOfMemory);
        EXPECT_FALSE(pcm.inited());
    }
    pcm.init(2, 1, 2, 48000);
    for (int sample : {-1, 2, INT_MAX}) EXPECT_THROW(pcm.ptr(sample), QvAssertFailure);
    EXPECT_THROW(pcm.setSamples(3), QvAssertFailure);
    pcm.setSamples(2);
    EXPECT_EQ(pcm.write(INT_MAX, pcm.ptr(0)), QvStatus::outOfMemory);
    EXPECT_EQ(pcm.addSilence(INT_MAX), QvStatus::outOfMemory);
    EXPECT_EQ(pcm.grow(INT_MAX), QvStatus::outOfMemory);
    EXPECT_EQ(pcm.samples(), 2);
}

}  // namespace
