#include "builtin/sound/format/soxrrate.h"

#include <cmath>

#ifdef QV_HAVE_SOXR
#include <soxr.h>
#endif

namespace snd {

#ifdef QV_HAVE_SOXR

bool SoxrRate::isBuiltIn() { return true; }

std::unique_ptr<SoxrRate> SoxrRate::create(int channels, int inRate, int outRate) {
    const soxr_io_spec_t io = soxr_io_spec(SOXR_INT32_I, SOXR_INT32_I);
    const soxr_quality_spec_t quality = soxr_quality_spec(SOXR_VHQ, 0);
    soxr_error_t error = nullptr;
    soxr_t state =
        soxr_create(inRate, outRate, static_cast<unsigned>(channels), &error, &io, &quality, nullptr);
    if (!state || error) {
        soxr_delete(state);
        return nullptr;
    }
    return std::unique_ptr<SoxrRate>(new SoxrRate(state, channels, double{1} * outRate / inRate));
}

SoxrRate::~SoxrRate() { soxr_delete(state_); }

long long SoxrRate::outputFor(long long count) const {
    constexpr int rounding = 16;
    return static_cast<long long>(std::ceil(static_cast<double>(count) * ratio_ + soxr_delay(state_))) +
           rounding;
}

long long SoxrRate::process(const int32_t* in, long long count, int32_t* out, long long room) {
    long long made = 0;
    for (;;) {
        size_t taken = 0, given = 0;
        if (soxr_process(state_, in, static_cast<size_t>(count), &taken, out + made * channels_,
                         static_cast<size_t>(room - made), &given))
            return -1;
        made += static_cast<long long>(given);
        in += static_cast<long long>(taken) * channels_;
        count -= static_cast<long long>(taken);
        if (count == 0) return made;
        if (taken == 0 && given == 0) return -1;
    }
}

#else

bool SoxrRate::isBuiltIn() { return false; }
std::unique_ptr<SoxrRate> SoxrRate::create(int, int, int) { return nullptr; }
SoxrRate::~SoxrRate() = default;
long long SoxrRate::outputFor(long long) const { return 0; }
long long SoxrRate::process(const int32_t*, long long, int32_t*, long long) { return -1; }

#endif

}  // namespace snd
