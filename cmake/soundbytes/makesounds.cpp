// Computes the built-in sounds and writes them as zlib-compressed C++ arrays: makesounds OUTPUT.
//
// All are 16-bit stereo at 44100 Hz, little-endian, with equal channels unless said otherwise:
//
//     0  32448 samples  beep of 1000 Hz
//     1  54408 samples  two strokes of a bell, 880 Hz and 660 Hz
//     2  73728 samples  sweep from 100 Hz to 8 kHz on the left and back on the right
//     3  66531 samples  chord that builds up from C to the C an octave above
//
// Only integers are used, so that every machine computes the same bytes.
#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <vector>

#include <zlib.h>

namespace {

constexpr int rate = 44100;

using Sound = std::vector<std::int16_t>;  // left, right, left, ...

// Sine of a phase whose 32 bits are one turn, as 16-bit fraction: -65536 .. 65536. In the first quarter, with
// x from 0 to 1, it is x * (1.5707 - x^2 * (0.6432 - x^2 * 0.0727)), off by less than 1 in 4000.
int sine(std::uint32_t phase) {
    const std::uint32_t quarter = phase >> 30;
    std::int64_t x = (phase & 0x3FFFFFFF) >> 14;  // 0 .. 65535
    if (quarter & 1) x = 65536 - x;
    const std::int64_t square = x * x >> 16;
    std::int64_t value = 42153 - (square * 4764 >> 16);
    value = 102936 - (square * value >> 16);
    value = std::min<std::int64_t>(x * value >> 16, 65536);
    return static_cast<int>(quarter & 2 ? -value : value);
}

class Oscillator {
  public:
    // Hertz as 16-bit fraction.
    int next(std::int64_t hertz) {
        phase_ += static_cast<std::uint32_t>((hertz << 16) / rate);
        return sine(phase_);
    }

  private:
    std::uint32_t phase_ = 0;
};

constexpr std::int64_t hz(int whole, int hundredths = 0) {
    return (static_cast<std::int64_t>(whole) << 16) + (static_cast<std::int64_t>(hundredths) << 16) / 100;
}

// Weight in 0 .. 65536 of sample i of n: a short rise at the start and a fall at the end, without clicks.
int fade(int i, int n, int rise, int fall) {
    std::int64_t weight = 65536;
    if (i < rise) weight = weight * i / rise;
    if (n - i < fall) weight = weight * (n - i) / fall;
    return static_cast<int>(weight);
}

// A struck bell: falls by half each `half` samples, in straight pieces.
int stroke(int i, int half) {
    const int halves = i / half;
    if (halves > 15) return 0;
    const std::int64_t top = 65536 >> halves;
    return static_cast<int>(top - top / 2 * (i % half) / half);
}

std::int16_t level(std::int64_t value, std::int64_t weight, int peak) {
    return static_cast<std::int16_t>((value * weight >> 16) * peak >> 16);
}

void put(Sound& sound, int i, std::int16_t left, std::int16_t right) {
    const auto at = static_cast<std::size_t>(i) * 2;
    sound[at] = static_cast<std::int16_t>(sound[at] + left);
    sound[at + 1] = static_cast<std::int16_t>(sound[at + 1] + right);
}

Sound silence(int samples) { return Sound(static_cast<std::size_t>(samples) * 2); }

Sound beep(int samples) {
    Sound sound = silence(samples);
    Oscillator tone;
    for (int i = 0; i < samples; ++i) {
        const auto value = level(tone.next(hz(1000)), fade(i, samples, 220, 882), 8192);
        put(sound, i, value, value);
    }
    return sound;
}

void strike(Sound& sound, int from, int half, std::int64_t hertz, int peak) {
    const int samples = static_cast<int>(sound.size() / 2);
    Oscillator ground;
    Oscillator third;
    for (int i = from; i < samples; ++i) {
        const std::int64_t value = ground.next(hertz) * 3 / 4 + third.next(hertz * 3) / 4;
        const std::int64_t weight =
            static_cast<std::int64_t>(stroke(i - from, half)) * fade(i - from, samples - from, 60, 2205) >>
            16;
        const auto sample = level(value, weight, peak);
        put(sound, i, sample, sample);
    }
}

Sound bell(int samples) {
    Sound sound = silence(samples);
    strike(sound, 0, 6000, hz(880), 12000);
    strike(sound, 22050, 6000, hz(660), 12000);
    return sound;
}

Sound sweep(int samples) {
    Sound sound = silence(samples);
    Oscillator up;
    Oscillator down;
    for (int i = 0; i < samples; ++i) {
        const std::int64_t step = (hz(8000) - hz(100)) / samples * i;
        const int weight = fade(i, samples, 441, 441);
        put(sound, i, level(up.next(hz(100) + step), weight, 8192),
            level(down.next(hz(8000) - step), weight, 8192));
    }
    return sound;
}

Sound chord(int samples) {
    Sound sound = silence(samples);
    strike(sound, 0, 12000, hz(523, 25), 6000);
    strike(sound, 11025, 12000, hz(659, 26), 6000);
    strike(sound, 22050, 12000, hz(783, 99), 6000);
    strike(sound, 33075, 12000, hz(1046, 50), 6000);
    return sound;
}

std::vector<unsigned char> compressed(const Sound& sound) {
    std::vector<unsigned char> bytes;
    bytes.reserve(sound.size() * 2);
    for (const std::int16_t value : sound) {
        bytes.push_back(static_cast<unsigned char>(value & 255));
        bytes.push_back(static_cast<unsigned char>(value >> 8 & 255));
    }
    uLongf size = compressBound(static_cast<uLong>(bytes.size()));
    std::vector<unsigned char> packed(size);
    if (compress2(packed.data(), &size, bytes.data(), static_cast<uLong>(bytes.size()), 9) != Z_OK) return {};
    packed.resize(size);
    return packed;
}

bool write(std::FILE* to, int index, const Sound& sound) {
    const std::vector<unsigned char> packed = compressed(sound);
    std::fprintf(to, "constexpr unsigned char sound%d[] = {", index);
    for (std::size_t i = 0; i < packed.size(); ++i) std::fprintf(to, "%s%d,", i % 24 ? "" : "\n", packed[i]);
    std::fprintf(to, "\n};\n");
    return !packed.empty();
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) return 2;
    std::FILE* to = std::fopen(argv[1], "w");
    if (!to) return 1;
    const std::array<Sound, 4> sounds = {beep(32448), bell(54408), sweep(73728), chord(66531)};
    bool good = true;
    for (int i = 0; i < 4; ++i) good = write(to, i, sounds[static_cast<std::size_t>(i)]) && good;
    return std::fclose(to) == 0 && good ? 0 : 1;
}
