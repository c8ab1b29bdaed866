// QvUtil::matchParams: settings of a source that its output takes over.
#include <cmath>
#include <limits>
#include <string>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/qvutil.h"
#include "core/measure/qvframerate.h"

namespace {

bool sameScan(const QvFramerate& a, const QvFramerate& b) {
    return (a.interlaced() == 0) == (b.interlaced() == 0);
}

// The place of the nearest rate, of equally near ones the first of the same scan; -1 if there is no rate.
int nearestOf(const AnyVector& rates, const QvFramerate& wanted) {
    int best = -1;
    double bestDistance = std::numeric_limits<double>::infinity();
    for (int i = 0; i < rates.size(); ++i) {
        if (!rates.at(i).isFramerate()) continue;
        const QvFramerate& rate = rates.at(i).asFramerate();
        const double distance = std::abs(double(rate.rate()) - double(wanted.rate()));
        const bool better =
            distance < bestDistance || (best >= 0 && distance == bestDistance && sameScan(rate, wanted) &&
                                        !sameScan(rates.at(best).asFramerate(), wanted));
        if (!better) continue;
        best = i;
        bestDistance = distance;
    }
    return best;
}

// What the encoder allows of the rate: a match of rate and kind, else the nearest; the rate itself if the
// encoder names none.
QvFramerate allowedRate(const QvEncoder& encoder, const QvFramerate& wanted) {
    const Any range = encoder.getParam("framerateRange");
    if (!range.isVector()) return wanted;
    const AnyVector& rates = range.asVector();
    int place = wanted.findInVector(rates, true, true);
    if (place < 0) place = wanted.findInVector(rates, true, false);
    if (place < 0) place = wanted.findInVector(rates, false, true);
    if (place < 0) place = nearestOf(rates, wanted);
    return place < 0 ? wanted : rates.at(place).asFramerate();
}

void matchParam(const Any& value, QvEncoder& encoder, const char* name) {
    if (value.isFramerate() && Any(name) == "framerate")
        qvSetOptionalParam(encoder, name, allowedRate(encoder, value.asFramerate()));
    else
        qvSetOptionalParam(encoder, name, value);
}

}  // namespace

void QvUtil::matchParams(const QvDecodePipe* decoder, int type, QvEncodePipe* pipe, const AnyVector& names) {
    if (!decoder || !pipe) return;
    QV_ASSERT(type == qvVideoStream || type == qvAudioStream);
    const char* const kind = type == qvVideoStream ? "video" : "audio";
    if (decoder->nrStreams(type) < 1) {
        qv_dbg()->error("QvUtil::matchParams Invalid %s stream nr", kind);
        return;
    }
    QvEncoder* const encoder = pipe->nrStreams(type) > 0 ? pipe->encoder(type, 0) : nullptr;
    if (!encoder) {
        qv_dbg()->error("QvUtil::matchParams - No encoder");
        return;
    }
    const std::string prefix = std::string(kind) + "0/";
    for (const Any& name : names) {
        const Any param = name.toString();
        const Any value = param.isString() ? decoder->getParam((prefix + param.asString()).c_str()) : Any();
        if (value.isValid())
            matchParam(value, *encoder, param.asString());
        else
            qv_dbg()->warning("Can not match param:%s", param.asString(""));
    }
}
