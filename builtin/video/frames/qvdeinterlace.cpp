#include "builtin/video/frames/qvdeinterlace.h"

#include <algorithm>
#include <array>

#include "builtin/creators.h"
#include "builtin/video/samplelayout.h"
#include "core/measure/qvgeometry.h"
#include "core/media/pixelkernels_p.h"
#include "core/media/rows_p.h"

namespace {

enum Method { keep, top, bottom, reverse, bob };
constexpr std::array methodNames{"", "top", "bottom", "reverse", "bob"};
static_assert(methodNames.size() == bob + 1);

int numbered(int number) { return number >= keep && number <= bob ? number : keep; }

int named(const std::string& name) {
    for (int method = top; method <= bob; ++method)
        if (name == methodNames[static_cast<std::size_t>(method)]) return method;
    return keep;
}

int setMethod(DeinterlaceSettings& settings, const Any& value) {
    int number = 0;
    std::string name;
    if (qvparam::convert(value, number))
        settings.method = numbered(number);
    else if (value.isValid() && qvparam::convert(value, name))
        settings.method = named(name);
    else
        return QvStatus::invalidParam;
    return QvStatus::ok;
}

void getMethod(const DeinterlaceSettings& settings, Any& value) {
    value = methodNames[static_cast<std::size_t>(settings.method)];
}

constexpr QvParamRow<DeinterlaceSettings> rows[] = {
    {.name = "deinterlace",
     .member = QvParamAccess<DeinterlaceSettings>{setMethod, getMethod},
     .flags = qvParamStored,
     .help = "top or bottom: that field; bob: the mean of both; reverse: exchanges them; else unchanged"},
};
static_assert(qvParamTableOk<DeinterlaceSettings>(rows));

// Operations on frames take I422 for a format with half as many rows of chroma as of luma.
void finishChroma(QvFrame& to, const QvFrame& from, int method) {
    if (to.four_cc() != QvFourcc::I422) return;
    const int rows = to.height();
    for (int p = 1; p < 3; ++p) {
        const std::ptrdiff_t in = from.stride(p), out = to.stride(p), bytes = std::min(in, out);
        unsigned char* target = to.plane(p);
        const unsigned char* source = from.plane(p);
        const int pairs = rows / 2;
        switch (method) {
            case top: qvrows::copy(target, out, source, 2 * in, bytes, rows); break;
            case bottom: qvrows::copy(target, out, source + in, 2 * in, bytes, rows); break;
            case bob:
                for (int y = 0; y < rows; ++y, target += out, source += 2 * in)
                    qvpixels::averageBytes(target, source, source + in, static_cast<size_t>(bytes));
                break;
            default:
                qvrows::copy(target, 2 * out, source + in, 2 * in, bytes, pairs);
                qvrows::copy(target + out, 2 * out, source, 2 * in, bytes, pairs);
                qvrows::copy(target + out * 2 * pairs, out, source + in * 2 * pairs, in, bytes, rows % 2);
        }
    }
}

}  // namespace

QvCodec* newDeinterlace() { return new QvDeinterlace; }

QvDeinterlace::QvDeinterlace() : VideoEffectOf("deinterlace", rows) {}

int QvDeinterlace::fill(const QvFrame& frame) {
    const int method = settings_.method;
    int result = QvStatus::ok;
    switch (method) {
        case top: result = output_.copyDeinterlaced(frame, true); break;
        case bottom: result = output_.copyDeinterlaced(frame, false); break;
        case reverse: result = output_.copySwitched(frame); break;
        case bob: result = output_.copyBob(frame); break;
        default: result = takeShape(output_, frame);
    }
    if (result != QvStatus::ok)
        return setError(result, "no memory for a frame of %dx%d", frame.width(), frame.height());
    if (method == keep) {
        copySamples(output_, frame);
        output_.copyMeta(frame);
    } else {
        finishChroma(output_, frame, method);
    }
    return QvStatus::ok;
}
