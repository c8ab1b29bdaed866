#include "builtin/sound/format/aquant.h"

#include <algorithm>
#include <array>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/sound/format/soundrows.h"
#include "builtin/sound/soundvalues.h"
#include "builtin/sound/wordparam.h"
#include "core/arch/qvassert.h"

namespace {

using Settings = AquantSettings;

constexpr std::array ditherNames{"none", "triangular"};

constexpr QvParamRow<Settings> rows[] = {
    {.name = "outBitsPerSample",
     .member = &Settings::outBits,
     .flags = qvParamStored,
     .unit = "bits",
     .help = "8, 16, 20, 24 or 32; 20 and 24 take 3 bytes"},
    {.name = "dither",
     .member = wordParam<Settings, &Settings::dither, ditherNames>,
     .flags = qvParamStored,
     .help = "none or triangular (noise before rounding to 8 or 16 bits)"},
    {.name = "clipWarning",
     .member = &Settings::clipWarning,
     .flags = qvParamStored,
     .help = "whether clipped values are warned of, once per open"},
    {.name = "clippedSamples",
     .member = &Settings::clipped,
     .flags = qvParamReadOnly,
     .unit = "values",
     .help = "what was clipped since the filter was opened"},
};
static_assert(qvParamTableOk<Settings>(rows));

constexpr int wideBytes = 4;

void widen(unsigned char* to, const QvPcm& pcm, size_t count) {
    auto* values = reinterpret_cast<int32_t*>(to);
    switch (pcm.bytesPerSample()) {
        case 1: return snd::widen8(values, pcm.ptr(0), count);
        case 2: return snd::widen16(values, pcm.ptr(0), count);
        default: return snd::widen24(values, pcm.ptr(0), count);
    }
}

// All widths have the same range. It is counted only where a row says that something was clipped.
long long countClipped(const int32_t* values, size_t count) {
    constexpr int32_t low = -(1 << 23), high = (1 << 23) - 1;
    return std::count_if(values, values + count, [](int32_t value) { return value < low || value > high; });
}

[[noreturn]] void failFor(const char* what, int bytes) {
    QV_FAIL(Any::sprintf("[aquant::writepcm] invalid %s %d", what, bytes).asString());
}

}  // namespace

QvCodec* newAquant() { return new QvAquant; }

QvAquant::QvAquant() : StoredFilterOf("aquant::writepcm", rows) {}

int QvAquant::open() {
    constexpr int widths[] = {8, 16, 20, 24, 32};
    if (std::find(std::begin(widths), std::end(widths), settings_.outBits) == std::end(widths))
        return setError(QvStatus::failed,
                        "Error Opening audio quantization converter, invalid out bits per sample (%d)",
                        settings_.outBits);
    clipReported_ = false;
    settings_.clipped = 0;
    ditherPlace_ = 0;
    return StoredFilterOf::open();
}

// True if a value was out of range.
bool QvAquant::narrow(unsigned char* to, const int32_t* from, size_t count, int bytes) {
    if (bytes == 3) return snd::narrow24(to, from, count);
    if (settings_.dither == Settings::none)
        return bytes == 1 ? snd::narrow8(to, from, count) : snd::narrow16(to, from, count);
    const uint32_t place = ditherPlace_;
    ditherPlace_ += static_cast<uint32_t>(count);
    return bytes == 1 ? snd::dither8(to, from, count, place) : snd::dither16(to, from, count, place);
}

int QvAquant::write(QvPcm& pcm) {
    requireOpened();
    if (pcm.samples() < 1) return QvStatus::ok;
    const int in = pcm.bytesPerSample();
    const int out = output_.inited() ? output_.bytesPerSample() : (settings_.outBits + 7) / 8;
    if (out < 1 || out > wideBytes) failFor("bytes per sample", out);
    if (in != out && in != wideBytes && out != wideBytes) failFor("input bytes per sample", in);
    unsigned char* room = nullptr;
    if (const int result = makeRoom({pcm.samplerate(), pcm.channels(), out * 8}, pcm.samples(), room))
        return result;
    const auto count = static_cast<size_t>(pcm.samples()) * static_cast<size_t>(pcm.channels());
    bool clipped = false;
    if (in == out)
        std::memcpy(room, pcm.ptr(0), count * static_cast<size_t>(in));
    else if (out == wideBytes)
        widen(room, pcm, count);
    else
        clipped = narrow(room, reinterpret_cast<const int32_t*>(pcm.ptr(0)), count, out);
    output_.copyMeta(pcm);
    if (clipped) settings_.clipped += countClipped(soundValues(pcm), count);
    if (clipped && settings_.clipWarning && !clipReported_) {
        clipReported_ = true;
        qv_log()->warning("Audio clipping detected. Please reduce audio processing gain");
    }
    return QvStatus::ok;
}
