#include "core/filter/audiochain_p.h"

#include <algorithm>
#include <string>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/qvutil.h"
#include "core/filter/chainfilters_p.h"
#include "core/filter/qvprocesspipe.h"
#include "core/job/jobdescription.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr int workBits = 32;
constexpr int silentChannel = -1;
constexpr double maxDelayMs = 1e9;  // far beyond any stream, and well inside a MediaTime

using AudioFilterPtr = std::unique_ptr<QvAudioFilter>;

void appendChannel(AnyVector& channels, const Any& source) {
    if (source.isDict() && source.asDict().get("channel").isInt32())
        channels.append(source.asDict().get("channel"));
}

// One entry an output channel: -1 for silence, or the vector of the input channels that are mixed.
AnyVector normaliseMatrix(const AnyVector& matrix) {
    AnyVector normal;
    for (int i = 0; i < matrix.size(); ++i) {
        const Any& entry = matrix.at(i);
        AnyVector channels;
        if (entry.isVector()) {
            for (int j = 0; j < entry.asVector().size(); ++j) appendChannel(channels, entry.asVector().at(j));
        } else {
            appendChannel(channels, entry);
        }
        if (!entry)
            normal.append(Any(silentChannel));
        else if (entry.isVector() || entry.isDict())
            normal.append(Any(channels));
        else
            normal.append(entry);
    }
    return normal;
}

bool namesOwnIndex(const Any& entry, int index) {
    if (entry.isInt32()) return entry.asInt32() == index;
    if (!entry.isVector() || entry.asVector().size() != 1) return false;
    return entry.asVector().at(0) == Any(index);
}

bool isIdentity(const AnyVector& matrix) {
    for (int i = 0; i < matrix.size(); ++i)
        if (!namesOwnIndex(matrix.at(i), i)) return false;
    return true;
}

// Of a setting that the caller chose.
void setValue(QvAudioFilter& filter, const char* name, const char* value) {
    if (qvSetOptionalParam(filter, name, value) == QvStatus::ok) return;
    const std::string refused = std::string(filter.name()) + " does not take " + name + "=" + value;
    QV_FAIL(*filter.errorDesc() ? filter.errorDesc() : refused.c_str());
}

AudioFilterPtr newRateConverter(const AudioJobDescription& job) {
    if (job.inSamplerate == job.outSamplerate) return nullptr;
    auto converter = qvchain::requireAudioFilter("srconvert");
    converter->setParam("inSamplerate", job.inSamplerate);
    converter->setParam("outSamplerate", job.outSamplerate);
    const std::string& quality = job.conversion.rateQuality;
    if (quality != AudioConversion().rateQuality) setValue(*converter, "quality", quality.c_str());
    return converter;
}

AudioFilterPtr newChannelConverter(const AudioJobDescription& job) {
    const AnyVector matrix = normaliseMatrix(job.connMatrix);
    if (job.inChannels == job.outChannels && isIdentity(matrix)) return nullptr;
    auto converter = qvchain::requireAudioFilter("chconvert");
    converter->setParam("connMatrix", Any(matrix));
    return converter;
}

AudioFilterPtr newQuantizer(int bits, const AudioConversion& conversion = {}) {
    auto quantizer = qvchain::requireAudioFilter("aquant");
    quantizer->setParam("outBitsPerSample", bits);
    const std::string& dither = conversion.dither;
    if (dither != AudioConversion().dither) setValue(*quantizer, "dither", dither.c_str());
    if (!conversion.clipWarning) qvSetOptionalParam(*quantizer, "clipWarning", 0);
    return quantizer;
}

// A delay that is not positive is no filter: the link skips that much input instead.
void takeOutDelays(qvchain::AudioFilters& filters, MediaTime& startOffset) {
    std::erase_if(filters, [&](const AudioFilterPtr& filter) {
        if (!qvModuleTraits(*filter).delays) return false;
        const Any delay = filter->getParam("delay");
        const double ms =
            delay.isInt() || delay.isFloat() ? std::clamp(delay.toDouble(), -maxDelayMs, maxDelayMs) : 0.0;
        if (ms > 0) return false;
        startOffset = MediaTime(-ms / 1000.0, MediaTime::defaultTimescale);
        return true;
    });
}

// A filter that has a highest number of channels can refuse more before the run begins.
void announceChannels(const qvchain::AudioFilters& filters, int channels) {
    for (const auto& filter : filters)
        if (filter->getParam("_maxChannels").isInt32()) qvSetOptionalParam(*filter, "_channels", channels);
}

void append(QvAProcessPipe& pipe, AudioFilterPtr filter) {
    if (filter) pipe.addFilter(filter.release(), -1);
}

}  // namespace

std::unique_ptr<QvAProcessPipe> qvchain::createAudioPipe(const AudioJobDescription& job,
                                                         MediaTime& delayOut) {
    AnyVector frontStates;
    AnyVector backStates;
    QvUtil::getSortedEffects(job.filters, frontStates, backStates, true);
    auto front = qvchain::restoreAudioFilters(frontStates);
    auto back = qvchain::restoreAudioFilters(backStates);
    takeOutDelays(front, delayOut);
    takeOutDelays(back, delayOut);

    announceChannels(front, job.inChannels);
    announceChannels(back, job.outChannels);

    auto rate = newRateConverter(job);
    auto channels = newChannelConverter(job);
    if (!rate && !channels && job.inBitsPerSample == job.outBitsPerSample && front.empty() && back.empty())
        return nullptr;

    std::unique_ptr<QvAProcessPipe> pipe(QvAProcessPipe::create());
    QV_ASSERT_MSG(pipe, "module 'aprocess' is not available");
    if (job.inBitsPerSample != workBits) append(*pipe, newQuantizer(workBits));
    for (auto& filter : front) append(*pipe, std::move(filter));
    // The rate converter costs most, so it runs on the side with fewer channels.
    if (job.outChannels > job.inChannels) append(*pipe, std::move(rate));
    append(*pipe, std::move(channels));
    append(*pipe, std::move(rate));
    for (auto& filter : back) append(*pipe, std::move(filter));
    append(*pipe, newQuantizer(job.outBitsPerSample, job.conversion));
    return pipe;
}
