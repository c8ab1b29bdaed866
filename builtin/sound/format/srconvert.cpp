#include "builtin/sound/format/srconvert.h"

#include <algorithm>
#include <array>
#include <climits>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/sound/format/resampler.h"
#include "builtin/sound/format/samplefifo.h"
#include "builtin/sound/format/soxrrate.h"
#include "builtin/sound/soundvalues.h"
#include "builtin/sound/wordparam.h"
#include "core/arch/qvassert.h"

namespace {

using Settings = SrconvertSettings;
using snd::Resampler;

constexpr std::array qualityNames{"standard", "high"};

// clang-format off
constexpr QvParamRow<Settings> rows[] = {
    {.name = "inSamplerate", .member = &Settings::inRate, .flags = qvParamStored, .min = 0, .unit = "Hz",
     .help = "rate of the input"},
    {.name = "outSamplerate", .member = &Settings::outRate, .flags = qvParamStored, .min = 0, .unit = "Hz",
     .help = "rate of the output"},
    {.name = "splsToGet", .member = &Settings::batch, .min = 0, .unit = "samples",
     .help = "output is made in batches of so many; 0: all that the free room of the output takes"},
    {.name = "splsNeed", .flags = qvParamByHand | qvParamReadOnly, .unit = "samples",
     .help = "further input for one batch, while the filter is open", .type = Any::Int32},
    {.name = "quality", .member = wordParam<Settings, &Settings::quality, qualityNames>, .flags = qvParamStored,
     .help = "standard (16 taps, integers) or high (libsoxr)"},
};
// clang-format on
static_assert(qvParamTableOk<Settings>(rows));

// Input is taken in parts of so many values, so that they stay in the cache until they are used.
constexpr int partValues = 1 << 14;

constexpr int wideBytes = 4;
constexpr double spare = 1.02;  // room of the first output, as a share of what the input gives
constexpr int maxBufferRate = 192000, assumedRate = 48000;

}  // namespace

QvCodec* newSrconvert() { return new QvSamplerate2; }

QvSamplerate2::QvSamplerate2() : StoredFilterOf("srconvert::writepcm", rows) {}

QvSamplerate2::~QvSamplerate2() = default;

int QvSamplerate2::open() {
    if (settings_.inRate > Resampler::maxRate || settings_.outRate > Resampler::maxRate)
        return setError(QvStatus::failed,
                        "the sample rates %d and %d Hz can't be converted, the highest is %d",
                        settings_.inRate, settings_.outRate, Resampler::maxRate);
    if (settings_.quality == Settings::high && !snd::SoxrRate::isBuiltIn())
        return setError(QvStatus::failed, "the quality 'high' needs libsoxr, which this build does not have");
    qv_dbg()->info("Opening samplerate converter, %d->%d", settings_.inRate, settings_.outRate);
    samplesIn_ = samplesOut_ = 0;
    return StoredFilterOf::open();
}

int QvSamplerate2::close() {
    if (opened())
        qv_dbg()->debug("Closing samplerate converter, %lld samples in, %lld out", samplesIn_, samplesOut_);
    resampler_.reset();
    fifo_.reset();
    soxr_.reset();
    settings_.batch = Settings().batch;
    return StoredFilterOf::close();
}

int QvSamplerate2::missingInput() const {
    const bool equal = settings_.inRate == settings_.outRate;
    if (equal || settings_.batch == 0 || settings_.inRate < 1 || settings_.outRate < 1)
        return settings_.batch;
    const snd::RateNeed need{settings_.inRate, settings_.outRate};
    const long long missing = need.viewFor(settings_.batch) - (fifo_ ? fifo_->samples() : 0);
    return static_cast<int>(std::clamp<long long>(missing, 0, INT_MAX));
}

void QvSamplerate2::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "splsNeed") == 0 && opened())
        value = missingInput();
    else
        StoredFilterOf::getParam(name, value);
}

QvPcmFormat QvSamplerate2::outputFormat(const QvPcm& pcm) const {
    return {settings_.outRate, pcm.channels(), pcm.bytesPerSample() * 8};
}

int QvSamplerate2::noRoom(long long samples) {
    return setError(QvStatus::outOfMemory, "[srconvert::writepcm]failed to allocate space for %d samples",
                    static_cast<int>(std::min<long long>(samples, INT_MAX)));
}

int QvSamplerate2::startOutput(const QvPcm& pcm) {
    int rate = pcm.samplerate();
    if (rate < 1 || rate > maxBufferRate) {
        qv_dbg()->debug("invalid input samplerate");
        rate = assumedRate;
    }
    const double samples = static_cast<double>(settings_.outRate) / rate * spare * pcm.samples();
    if (samples < INT_MAX && output_.init(static_cast<int>(samples), pcm.channels(), pcm.bytesPerSample(),
                                          settings_.outRate) == QvStatus::ok)
        return QvStatus::ok;
    return noRoom(static_cast<long long>(samples));
}

int QvSamplerate2::startResampler(int channels) {
    const auto isRate = [](int rate) { return rate > 0 && rate <= Resampler::maxRate; };
    const bool rates = isRate(settings_.inRate) && isRate(settings_.outRate);
    if (rates && settings_.quality == Settings::high)
        soxr_ = snd::SoxrRate::create(channels, settings_.inRate, settings_.outRate);
    else if (rates) {
        resampler_ = std::make_unique<Resampler>(channels, channels, settings_.inRate, settings_.outRate);
        fifo_ = std::make_unique<snd::SampleFifo>(channels, Resampler::padding);
        if (!fifo_->reserve(resampler_->need().viewFor(std::max(settings_.batch, 1)) +
                            partValues / channels)) {
            fifo_.reset();
            resampler_.reset();
        }
    }
    if (soxr_ || resampler_) return QvStatus::ok;
    return setError(QvStatus::failed, "[srconvert::writepcm]failed to allocate samplerate converter");
}

int QvSamplerate2::write(QvPcm& pcm) {
    requireOpened();
    if (pcm.samples() < 1) return QvStatus::ok;
    const bool equal = !resampler_ && !soxr_ && settings_.inRate == settings_.outRate;
    QV_ASSERT_MSG(equal || pcm.bytesPerSample() == wideBytes, "Only 32 bit samples supported");
    if (!equal && !resampler_ && !soxr_)
        if (const int result = startResampler(pcm.channels())) return result;
    if (!output_.inited())
        if (const int result = startOutput(pcm)) return result;
    const int before = output_.samples();
    const int result = equal                 ? writeEqual(pcm)
                       : soxr_               ? writeHigh(pcm)
                       : settings_.batch > 0 ? writeStandard(pcm)
                                             : writeWhole(pcm);
    if (result != QvStatus::ok) return result;
    samplesIn_ += pcm.samples();
    samplesOut_ += output_.samples() - before;
    output_.setPosition(samplesOut_);
    return QvStatus::ok;
}

int QvSamplerate2::writeEqual(const QvPcm& pcm) {
    unsigned char* room = nullptr;
    if (const int result = makeRoom(outputFormat(pcm), pcm.samples(), room)) return result;
    std::memcpy(room, pcm.ptr(0), static_cast<size_t>(pcm.bytes()));
    return QvStatus::ok;
}

// Makes what the samples in the fifo are enough for. Returns how many samples.
long long QvSamplerate2::makeBatches(int32_t* room) {
    const int batch = settings_.batch;
    const long long need = resampler_->need().viewFor(batch);
    long long made = 0;
    while (fifo_->samples() >= need) {
        resampler_->make(fifo_->view(), fifo_->samples(), room + made * resampler_->outChannels(), batch);
        fifo_->drop(resampler_->consume());
        made += batch;
    }
    return made;
}

int QvSamplerate2::writeStandard(const QvPcm& pcm) {
    const int filled = output_.samples(), channels = pcm.channels();
    const snd::RateNeed rates = resampler_->need();  // those of the settings may have changed since
    const long long batch = settings_.batch, need = rates.viewFor(batch);
    const long long part = std::min(pcm.samples(), std::max(partValues / channels, 1));
    const long long all = fifo_->samples() + pcm.samples();
    const long long most = all * rates.outRate / rates.inRate + Resampler::taps + 4 * batch;
    unsigned char* room = nullptr;
    if (!fifo_->reserve(std::min(all, std::max(fifo_->samples(), need) + part))) return noRoom(all);
    if (most > INT_MAX) return noRoom(most);
    if (const int result = makeRoom(outputFormat(pcm), static_cast<int>(most), room)) return result;

    long long made = 0;
    for (int at = 0; at < pcm.samples(); at += static_cast<int>(part)) {
        fifo_->append(soundValues(pcm, at), std::min<long long>(part, pcm.samples() - at));
        made += makeBatches(reinterpret_cast<int32_t*>(room) + made * channels);
    }
    output_.setSamples(filled + static_cast<int>(made));
    return QvStatus::ok;
}

// What fits into the free room of the output, from all input that there is.
int QvSamplerate2::writeWhole(const QvPcm& pcm) {
    const int filled = output_.samples(), free = output_.size() - filled;
    unsigned char* room = nullptr;
    if (!fifo_->reserve(fifo_->samples() + pcm.samples())) return noRoom(fifo_->samples() + pcm.samples());
    if (const int result = makeRoom(outputFormat(pcm), free, room)) return result;
    fifo_->append(soundValues(pcm), pcm.samples());
    const int made =
        resampler_->makeAll(fifo_->view(), fifo_->samples(), reinterpret_cast<int32_t*>(room), free);
    fifo_->drop(std::min(resampler_->consume(), fifo_->samples()));
    output_.setSamples(filled + made);
    return QvStatus::ok;
}

int QvSamplerate2::writeHigh(const QvPcm& pcm) {
    const int filled = output_.samples();
    const long long most = soxr_->outputFor(pcm.samples());
    unsigned char* room = nullptr;
    if (most > INT_MAX) return noRoom(most);
    if (const int result = makeRoom(outputFormat(pcm), static_cast<int>(most), room)) return result;
    const long long made =
        soxr_->process(soundValues(pcm), pcm.samples(), reinterpret_cast<int32_t*>(room), most);
    output_.setSamples(filled + static_cast<int>(std::max(made, 0LL)));
    return made < 0 ? setError(QvStatus::failed, "the samplerate converter of high quality failed")
                    : QvStatus::ok;
}
