#include <algorithm>

#include "core/engine/modules/optionalparam_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/link/video/totalframes_p.h"

void qvSetTotalFrames(QvVProcessPipe& pipe, long long in, long long out) {
    const auto factor = [&](int i) {
        return std::max(1, pipe.filter(i)->getParam("_rateFactor").asInt32(1));
    };
    const int filters = pipe.nrFilters();
    long long total = in, later = 1;  // `later`: frames that the filters to come make of one
    for (int i = 0; i < filters; ++i) later *= factor(i);
    for (int i = 0; i < filters; ++i) {
        auto& filter = *pipe.filter(i);
        if (filter.getParam("_isFramerateConverter").isTrue())
            total = out / later;
        else
            qvSetOptionalParam(filter, "_totalFrames", static_cast<int>(total));
        total *= factor(i);
        later /= factor(i);
    }
    AnyVector both;
    both.append(Any(in));
    both.append(Any(out));
    qvSetOptionalParam(pipe, qvTotalFramesOfViews, both);
}
