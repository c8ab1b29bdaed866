#include "core/media/qvsoundbytes.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>

#include <zlib.h>

#include "core/engine/qvexception.h"

namespace {

int valueAt(const QvPcm& pcm, int sample) {
    const unsigned char* p = pcm.ptr(sample);
    return static_cast<short>(p[0] | p[1] << 8);
}

TEST(SoundBytes, AreTheSameOnEveryMachine) {
    const struct {
        int samples;
        unsigned long crc;
    } sounds[] = {{32448, 3651749292}, {54408, 3369873097}, {73728, 317062252}, {66531, 3907280651}};
    ASSERT_EQ(QvSoundBytes::nrSounds(), 4);
    for (int i = 0; i < 4; ++i) {
        long long samples = 0;
        QvPcmFormat format;
        QvSoundBytes::getInfo(i, &samples, &format);
        EXPECT_EQ(samples, sounds[i].samples);
        EXPECT_EQ(format.samplerate, 44100);
        const std::unique_ptr<QvPcm> sound(QvSoundBytes::create(i));
        ASSERT_TRUE(sound);
        EXPECT_EQ(sound->samples(), sounds[i].samples);
        EXPECT_EQ(crc32(0, sound->ptr(0), static_cast<uInt>(sound->bytes())), sounds[i].crc) << i;
    }
    QvSoundBytes::getInfo(0, nullptr, nullptr);
    for (const int bad : {-1, 4}) {
        EXPECT_THROW(QvSoundBytes::getInfo(bad, nullptr, nullptr), QvAssertFailure);
        EXPECT_THROW(QvSoundBytes::create(bad), QvAssertFailure);
    }
}

TEST(SoundBytes, TheBeepIsOneKilohertzWithoutClicks) {
    const std::unique_ptr<QvPcm> beep(QvSoundBytes::create(0));
    int crossings = 0;
    int peak = 0;
    int step = 0;
    for (int i = 1; i < beep->samples(); ++i) {
        const int value = valueAt(*beep, i);
        const int before = valueAt(*beep, i - 1);
        if (before < 0 && value >= 0) ++crossings;
        peak = std::max(peak, std::abs(value));
        step = std::max(step, std::abs(value - before));
    }
    EXPECT_NEAR(crossings, 32448 / 44.1, 2);
    EXPECT_NEAR(peak, 8192, 8);
    EXPECT_LT(step, 1200) << "2 pi 1000 / 44100 of the peak";
    EXPECT_LT(std::abs(valueAt(*beep, 0)), 50);
    EXPECT_LT(std::abs(valueAt(*beep, 32447)), 50);
}

}  // namespace
