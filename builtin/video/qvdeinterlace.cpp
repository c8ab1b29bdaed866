#include "builtin/video/qvdeinterlace.h"

#include <array>

#include "builtin/creators.h"
#include "core/media/qvgeometry.h"

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
    {"deinterlace", QvParamAccess<DeinterlaceSettings>{setMethod, getMethod}, qvParamStored},
};
static_assert(qvParamTableOk<DeinterlaceSettings>(rows));

}  // namespace

QvCodec* newDeinterlace() { return new QvDeinterlace; }

QvDeinterlace::QvDeinterlace() : VideoEffectOf("deinterlace", rows) {}

int QvDeinterlace::fill(const QvFrame& frame) {
    switch (settings_.method) {
        case top: return output_.copyDeinterlaced(frame, true);
        case bottom: return output_.copyDeinterlaced(frame, false);
        case reverse: return output_.copySwitched(frame);
        case bob: return output_.copyBob(frame);
        default: return output_.copy(frame);
    }
}
