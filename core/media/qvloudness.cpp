#include "core/media/qvloudness.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <vector>

#include <ebur128.h>

#include "core/engine/status.h"
#include "core/media/qvpcm.h"

namespace {

constexpr int blockValues = 4096;  // converted at a time

double decibels(double amplitude) { return amplitude > 0 ? 20 * std::log10(amplitude) : QvLoudness::silence; }

struct Closed {
    void operator()(ebur128_state* state) const { ebur128_destroy(&state); }
};

// Places in a channel mask.
constexpr unsigned lowFrequency = 0x8, backs = 0x30, backCentre = 0x100, sides = 0x600, topBacks = 0x38000;
constexpr unsigned surrounds = backs | backCentre | sides | topBacks;

void mapByMask(ebur128_state& state, int channels, unsigned mask) {
    for (unsigned i = 0; i < static_cast<unsigned>(channels); ++i) {
        const unsigned place = mask & (~mask + 1);
        mask &= ~place;
        const int counted = place == lowFrequency ? EBUR128_UNUSED
                            : place & surrounds   ? EBUR128_LEFT_SURROUND
                                                  : EBUR128_CENTER;
        ebur128_set_channel(&state, i, counted);
    }
}

// Where the library's own order stops to know a channel, it would not count it at all.
void mapByNumber(ebur128_state& state, int channels) {
    if (channels <= 6) return;
    constexpr unsigned eight = 0x63F;  // left, right, centre, low frequency effects, backs, sides
    mapByMask(state, channels, channels == 8 ? eight : 0);
}

// One value of `width` bytes with full scale at 2^23.
template <int width>
int valueAt(const unsigned char* from) {
    if constexpr (width == 1) {
        return (from[0] - 128) * 65536;
    } else if constexpr (width == 2) {
        return static_cast<std::int16_t>(from[0] | from[1] << 8) * 256;
    } else if constexpr (width == 3) {
        return static_cast<std::int8_t>(from[2]) * 65536 + (from[1] << 8 | from[0]);
    } else {
        int value = 0;
        std::memcpy(&value, from, sizeof value);
        return value;
    }
}

struct Sums {
    double squares = 0;
    double peak = 0;
};

// Full scale becomes 1.
template <int width>
void convert(const unsigned char* from, float* to, int count, Sums& sums) {
    constexpr double scale = 1.0 / (1 << 23);
    double squares = 0, peak = 0;
    for (int i = 0; i < count; ++i, from += width) {
        const double value = valueAt<width>(from) * scale;
        squares += value * value;
        peak = std::max(peak, std::fabs(value));
        to[i] = static_cast<float>(value);
    }
    sums.squares += squares;
    sums.peak = std::max(sums.peak, peak);
}

using Convert = void (*)(const unsigned char*, float*, int, Sums&);
constexpr std::array<Convert, 4> conversions = {convert<1>, convert<2>, convert<3>, convert<4>};

}  // namespace

struct QvLoudness::State {
    std::unique_ptr<ebur128_state, Closed> meter;
    int channels = 0;
    long long samples = 0;
    Sums sums;
    std::vector<float> block;
};

QvLoudness::QvLoudness() : state_(std::make_unique<State>()) {}

QvLoudness::~QvLoudness() = default;

int QvLoudness::init(int channels, int samplerate, long long channelMask) {
    *state_ = {};
    if (channels < 1 || channels > maxChannels || samplerate < 1) return QvStatus::invalidArgument;
    constexpr int modes = EBUR128_MODE_I | EBUR128_MODE_LRA | EBUR128_MODE_TRUE_PEAK;
    errno = 0;  // the only reason that is given when there is no meter
    state_->meter.reset(
        ebur128_init(static_cast<unsigned>(channels), static_cast<unsigned long>(samplerate), modes));
    if (!state_->meter) return errno == ENOMEM ? QvStatus::outOfMemory : QvStatus::invalidArgument;
    if (const auto mask = static_cast<unsigned>(channelMask))
        mapByMask(*state_->meter, channels, mask);
    else
        mapByNumber(*state_->meter, channels);
    state_->channels = channels;
    const int whole = blockValues - blockValues % channels;
    state_->block.resize(static_cast<std::size_t>(whole));
    return QvStatus::ok;
}

int QvLoudness::add(const QvPcm& pcm) {
    State& s = *state_;
    if (!s.meter) return QvStatus::illegalState;
    const int width = pcm.bytesPerSample();
    if (pcm.channels() != s.channels || width < 1 || width > 4) return QvStatus::invalidArgument;
    const int most = static_cast<int>(s.block.size()) / s.channels;
    for (int done = 0; done < pcm.samples();) {
        const int count = std::min(most, pcm.samples() - done);
        conversions[static_cast<std::size_t>(width - 1)](pcm.ptr(done), s.block.data(), count * s.channels,
                                                         s.sums);
        if (ebur128_add_frames_float(s.meter.get(), s.block.data(), static_cast<std::size_t>(count)) !=
            EBUR128_SUCCESS)
            return QvStatus::outOfMemory;
        done += count;
        s.samples += count;
    }
    return QvStatus::ok;
}

long long QvLoudness::samples() const { return state_->samples; }

double QvLoudness::integrated() const {
    double loudness = silence;
    if (state_->meter) ebur128_loudness_global(state_->meter.get(), &loudness);
    return loudness;
}

double QvLoudness::range() const {
    double range = 0;
    if (state_->meter) ebur128_loudness_range(state_->meter.get(), &range);
    return range;
}

double QvLoudness::truePeak() const {
    double highest = state_->sums.peak;
    for (int i = 0; state_->meter && i < state_->channels; ++i) {
        double peak = 0;
        ebur128_true_peak(state_->meter.get(), static_cast<unsigned>(i), &peak);
        highest = std::max(highest, peak);
    }
    return decibels(highest);
}

double QvLoudness::samplePeak() const { return decibels(state_->sums.peak); }

double QvLoudness::rms() const {
    const double values = static_cast<double>(state_->samples) * state_->channels;
    return values > 0 ? decibels(std::sqrt(state_->sums.squares / values)) : silence;
}
