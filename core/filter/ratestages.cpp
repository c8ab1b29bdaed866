// Which converters change a frame rate, and whether they may run before the scaler.
#include <algorithm>
#include <limits>

#include "core/filter/chainfilters_p.h"
#include "core/measure/qvgeometry.h"
#include "core/measure/qvratio.h"

namespace {

std::unique_ptr<QvVideoFilter> newStage(const QvFramerate& in, const QvFramerate& out) {
    auto converter = qvchain::requireConverter("frconvert", "framerate converter");
    converter->setParam("inFramerate", in);
    converter->setParam("outFramerate", out);
    return converter;
}

// Two progressive frames weave into one interlaced frame, so their rate has to be the field rate.
qvchain::RateStages weave(const QvFramerate& in, const QvFramerate& out) {
    QvFramerate fieldRate = qvchain::scaledRate(out, 2, 1);
    fieldRate.setInterlaced(0);
    qvchain::RateStages stages;
    stages.afterScaler = true;
    if (!QvNum::equ(in.rate(), fieldRate.rate(), QvRatio::tolerance)) stages.pre = newStage(in, fieldRate);
    stages.main = newStage(fieldRate, out);
    stages.main->setParam("pulldown", 0);
    stages.main->setParam("interlace", out.interlaced() == 1 ? 1 : 2);
    return stages;
}

// 3:2 pulldown needs rates at exactly 4 to 5: film and NTSC meet at a rate between.
qvchain::RateStages pulldown(const QvFramerate& in, const QvFramerate& out) {
    qvchain::RateStages stages;
    stages.afterScaler = true;
    QvFramerate coded = in;
    if (in.is23p() && out.is60i()) coded = QvFramerate::f24p();
    if (in.is24p() && out.is59i()) coded = QvFramerate::f23p();
    if (!QvNum::equ(in.rate(), coded.rate(), QvRatio::tolerance)) stages.pre = newStage(in, coded);
    stages.main = newStage(coded, out);
    stages.main->setParam("pulldown", 1);
    return stages;
}

}  // namespace

namespace qvchain {

RateStages chooseRateStages(const QvFramerate& in, const QvFramerate& out) {
    constexpr double slack = 1e-8;
    const bool weaves = out.interlaced() != 0 && in.interlaced() == 0 &&
                        in.rate().ratio() >= 2.0 * out.rate().ratio() - slack;
    if (weaves) return weave(in, out);
    if ((in.is23p() || in.is24p()) && (out.is59i() || out.is60i())) return pulldown(in, out);
    RateStages stages;
    stages.main = newStage(in, out);
    return stages;
}

int rateFactor(const VideoFilters& filters) {
    constexpr int most = 1 << 10;
    int factor = 1;
    for (const auto& filter : filters)
        factor =
            std::clamp(factor * std::clamp(filter->getParam("_rateFactor").asInt32(1), 1, most), 1, most);
    return factor;
}

QvFramerate scaledRate(const QvFramerate& rate, int by, int over) {
    QvFramerate scaled = rate;
    long long num = static_cast<long long>(rate.rate().num) * by;
    long long den = static_cast<long long>(rate.rate().den) * over;
    QvRatio::reduce64(num, den);
    if (std::max(num, den) <= std::numeric_limits<int>::max())
        scaled.setRate(QvRatio(static_cast<int>(num), static_cast<int>(den)));
    else
        scaled.setRate(static_cast<double>(num) / static_cast<double>(den));
    return scaled;
}

}  // namespace qvchain
