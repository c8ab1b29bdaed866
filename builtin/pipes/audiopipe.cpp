#include "builtin/pipes/audiopipe.h"

#include <algorithm>
#include <cmath>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/status.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);
constexpr std::size_t noFilter = static_cast<std::size_t>(-1);
constexpr int minRequest = 16;  // a rate converter is never asked for less
constexpr double sameRate = 0.0001;
// Silence that filters may swallow at the end of the input before they count as stuck, in seconds.
constexpr int maxSwallowedSeconds = 60;

}  // namespace

QvAf::QvAf(const QvModule* module) : QvAProcessPipe(module) {}

QvAf::~QvAf() {
    if (getState() == stateOpen) QvAf::close();
}

int QvAf::init() {
    if (getState() != stateCreated) return QvCodec::init();  // which refuses
    for (const auto& member : filters_) {
        if (member.filter->getState() != stateCreated) continue;
        if (const int result = member.filter->init()) return result;
    }
    return QvCodec::init();
}

int QvAf::open() {
    if (getState() == stateOpen) return QvStatus::ok;
    readRatio_ = 1.0;
    for (auto& member : filters_) {
        auto& filter = *member.filter;
        if (const int result = filter.open())
            return setError(result, "%s: %s", filter.name(), filter.errorDesc());
        member.isRateConverter = qvModuleTraits(filter).convertsRate;
        member.wanted = 0;
        if (!member.isRateConverter) continue;
        const int in = filter.getParam("inSamplerate").asInt32(0);
        const int out = filter.getParam("outSamplerate").asInt32(0);
        if (in == 0 || out == 0) return setError(QvStatus::failed, "invalid samplerates (==0)");
        readRatio_ = static_cast<double>(in) / out;
    }
    setState(stateOpen);
    samplesIn_ = 0;
    samplesRead_ = 0;
    samplesOut_ = 0;
    inFormat_ = {};
    return QvStatus::ok;
}

int QvAf::close() {
    int result = QvStatus::ok;
    for (const auto& member : filters_) {
        const auto& filter = *member.filter;
        const int closed = member.filter->close();
        if (closed != QvStatus::ok && result == QvStatus::ok)
            setError(closed, "%s: %s", filter.name(), *filter.errorDesc() ? filter.errorDesc() : "it failed");
        result |= closed;
    }
    setState(stateInitialised);
    output_.destroy();
    outputInited_ = false;
    silence_.destroy();
    qv_dbg()->write("Closing audio processing pipe, read %lld samples, written %lld samples", samplesIn_,
                    samplesOut_);
    return result;
}

void QvAf::noteFormat(const QvPcm& pcm) {
    inFormat_ = {pcm.samplerate(), pcm.channels(), pcm.bytesPerSample() * 8};
}

int QvAf::write(QvPcm& pcm) {
    if (filters_.empty()) return setError(QvStatus::illegalState, "the pipe has no filter");
    noteFormat(pcm);
    samplesIn_ += pcm.samples();
    return filters_.front().filter->write(pcm);
}

int QvAf::erase(int n) { return outputInited_ ? output_.erase(n) : QvStatus::ok; }

std::size_t QvAf::lastFilled() const {
    for (std::size_t i = filters_.size(); i-- > 0;)
        if (filters_[i].filter->samples() > 0) return i;
    return noFilter;
}

void QvAf::askRateConverter(Member& member, int missing) {
    if (!member.isRateConverter) return;
    const int wanted = std::max(missing, minRequest);
    if (wanted == member.wanted) return;
    member.filter->setParam("splsToGet", wanted);
    member.wanted = wanted;
}

// All that a filter holds goes to the next one.
int QvAf::moveOn(std::size_t from, int missing) {
    auto& filter = *filters_[from].filter;
    auto& next = filters_[from + 1];
    askRateConverter(next, missing);
    const int count = filter.samples();
    const int result = next.filter->write(*filter.pcm());
    filter.erase(count);
    return result;
}

int QvAf::takeOutput(QvPcm& pcm) {
    const int count = filters_.back().filter->samples();
    if (!outputInited_) {
        if (output_.init(count, pcm.channels(), pcm.bytesPerSample(), pcm.samplerate()) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "no memory for %d samples", count);
        outputInited_ = true;
    }
    if (output_.channels() != pcm.channels() || output_.bytesPerSample() != pcm.bytesPerSample())
        return setError(QvStatus::failed, "%s changed its output format", filters_.back().filter->name());
    if (const int result = output_.write(count, pcm.ptr(0))) return result;
    output_.copyMeta(pcm);
    output_.setPosition(samplesOut_);
    samplesOut_ += count;
    filters_.back().filter->erase(count);
    return QvStatus::ok;
}

// How many input samples make `missing` output samples.
int QvAf::inputFor(int missing) const {
    if (std::fabs(readRatio_ - 1.0) < sameRate) return missing;
    return std::max(static_cast<int>(missing * readRatio_ + 0.5), minRequest);
}

int QvAf::give(QvPcm& pcm, int missing) {
    askRateConverter(filters_.front(), missing);
    return filters_.front().filter->write(pcm);
}

int QvAf::readInput(QvDecodePipe& decoder, int stream, int missing, bool& eof) {
    const int result = decoder.readSamples(inputFor(missing), stream);
    if (result < 0 && result != QvStatus::endOfStream)
        return setError(result, "can not read samples: %s", decoder.errorDesc());
    auto* pcm = decoder.getAudioPtr(stream);
    const int count = pcm && pcm->inited() ? pcm->samples() : 0;
    if (result == QvStatus::endOfStream || count < 1) eof = true;
    if (count < 1) return QvStatus::ok;
    samplesIn_ += count;
    samplesRead_ += count;
    noteFormat(*pcm);
    return give(*pcm, missing);
}

// Silence in place of input makes the filters give out what they hold back.
int QvAf::writeSilence(int missing) {
    if (inFormat_.channels == 0) return setError(QvStatus::failed, "the input stream has no samples");
    const int count = inputFor(missing);
    const int bytes = inFormat_.bitsPerSample / 8;
    if (!silence_.inited() || silence_.channels() != inFormat_.channels ||
        silence_.bytesPerSample() != bytes || silence_.samplerate() != inFormat_.samplerate) {
        if (silence_.init(count, inFormat_.channels, bytes, inFormat_.samplerate) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "no memory for %d samples", count);
    }
    silence_.setSamples(0);
    if (const int result = silence_.addSilence(count)) return result;
    silence_.setPosition(samplesIn_);
    const int result = give(silence_, missing);
    samplesIn_ += count;
    return result;
}

int QvAf::process(QvDecodePipe* decoder, int stream, int want) {
    if (samples() >= want) return QvStatus::ok;
    if (filters_.empty()) return setError(QvStatus::illegalState, "the pipe has no filter");
    bool eof = false;
    long long swallowed = 0;  // samples of silence since output last came
    while (samples() < want) {
        const int missing = want - samples();
        const std::size_t filled = lastFilled();
        int result = QvStatus::ok;
        if (filled == noFilter) {
            if (!decoder) return QvStatus::endOfStream;
            if (!eof) {
                result = readInput(*decoder, stream, missing, eof);
            } else {
                result = writeSilence(missing);
                swallowed += inputFor(missing);
                if (swallowed >
                    static_cast<long long>(maxSwallowedSeconds) * std::max(inFormat_.samplerate, 1))
                    return setError(QvStatus::failed, "the audio filters give no samples");
            }
        } else if (filled + 1 == filters_.size()) {
            result = takeOutput(*filters_.back().filter->pcm());
            swallowed = 0;
        } else {
            result = moveOn(filled, missing);
        }
        if (result != QvStatus::ok) return result;
    }
    return eof && isPadded(want) ? QvStatus::endOfStream : QvStatus::ok;
}

// Filters that look ahead meet the end of the input before all of it has come out. The stream ends where
// silence comes out that was written to bring out the rest.
bool QvAf::isPadded(int taken) const {
    const long long out = samplesOut_ - output_.samples() + taken;
    return static_cast<double>(out) > std::ceil(static_cast<double>(samplesRead_) / readRatio_);
}

bool QvAf::validPosition(int position) const { return position >= 0 && position < nrFilters(); }

int QvAf::addFilter(QvAudioFilter* filter, int position) {
    const auto where = validPosition(position) ? filters_.begin() + position : filters_.end();
    filters_.insert(where, Member{std::unique_ptr<QvAudioFilter>(filter)});
    return QvStatus::ok;
}

int QvAf::removeFilter(int position) {
    QV_ASSERT_MSG(validPosition(position), "unknown pos");
    filters_.erase(filters_.begin() + position);
    return QvStatus::ok;
}

int QvAf::clear() {
    filters_.clear();
    return QvStatus::ok;
}

QvAudioFilter* QvAf::filter(int position) const {
    return validPosition(position) ? filters_[static_cast<std::size_t>(position)].filter.get() : nullptr;
}

QvAudioFilter* QvAf::filter(const char* name, int index) const {
    for (const auto& member : filters_)
        if (Any(member.filter->name()) == name && index-- == 0) return member.filter.get();
    return nullptr;
}

QvCodec* newAprocess() { return new QvAf; }
