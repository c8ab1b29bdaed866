#include "core/media/qvsoundbytes.h"

#include <zlib.h>

#include "tests/support/checks.h"

namespace {

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
        EXPECT_TRUE(samples == sounds[i].samples && format.samplerate == 44100);
        const std::unique_ptr<QvPcm> sound(QvSoundBytes::create(i));
        ASSERT_TRUE(sound);
        EXPECT_EQ(crc32(0, sound->ptr(0), static_cast<uInt>(sound->bytes())), sounds[i].crc) << i;
    }
}

}  // namespace
