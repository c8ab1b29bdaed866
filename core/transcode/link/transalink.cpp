// The audio link: its format, its range of samples and its conversion.
#include <limits>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/qvutil.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/transcode/link/audiomuxer.h"
#include "core/transcode/link/translink.h"

namespace {

constexpr long long unknownLength = 92233720368547LL;  // samples of a stream that does not tell
constexpr int defaultBits = 16;

int bytesOf(int bits) { return (bits + 7) / 8; }

// An instant within the sample. Not every rate divides the timescale: where a tick before it is meant, the
// next one is, since its position would otherwise be the sample before.
MediaTime sampleTime(long long sample, int samplerate) {
    const MediaTime time(sample, samplerate, MediaTime::defaultTimescale);
    return time.position(samplerate) < sample ? time + MediaTime(1) : time;
}

MediaTime earlier(const MediaTime& a, const MediaTime& b) { return b < a ? b : a; }

}  // namespace

TransALink::TransALink() = default;

TransALink::~TransALink() {
    if (opened_) TransALink::close();
}

int TransALink::init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) {
    TransLink::init(decoder, decStream, encoder, encStream);
    if (!decoder->isSelected(qvAudioStream, decStream)) {
        qv_dbg()->log(QvLogMask::error, "ALink.init: Failed, decoder stream not selected");
        QV_FAIL_PLAIN();
    }
    if (encStream < 0) QV_FAIL("ALink.init: Failed, refuse to add new audio stream");
    if (encStream >= encoder->nrAudioStreams()) {
        qv_dbg()->log(QvLogMask::error, "ALink.init: Invalid encoder audio stream nr %d, nrAudioStreams=%d",
                      encStream, encoder->nrAudioStreams());
        QV_FAIL_PLAIN();
    }
    nameStreams();
    return QvStatus::ok;
}

QvAudioEncoder* TransALink::audioEncoder() const {
    auto* encoder = encoder_->audioEncoder(encStreamNr_);
    QV_ASSERT(encoder);
    return encoder;
}

int TransALink::open(const AnyDict* params) {
    if (opened_) return QvStatus::failed;
    audioPipe_.reset();
    smartRendering_ = false;
    readLogProgress();
    if (params && (params->isSet("startFrame") || params->isSet("stopFrame")))
        QV_FAIL("startFrame and stopFrame are deprecated. Use 'inOutPoints'.");
    AnyDict stream;
    _getInParams(stream);
    if (const int result = readFormat(stream)) return result;
    QV_ASSERT(decoder_->isSelected(qvAudioStream, decStreamNr_));
    takeMatrix(params);
    MediaTime delay;
    if (const int result = buildPipe(params, delay)) return result;

    const long long samples = stream.getInt64("samples", unknownLength);
    qv_dbg()->debug("ALink.open: input stream has %lld samples", samples);
    const MediaTime end = sampleTime(samples, inSamplerate_);
    const bool given = takePoints(params, end);
    qv_dbg()->debug("%s", given ? "ALink.open: In/out points are set."
                                : "ALink.open: In/out points constructed from duration.");
    if (given && outPoint() <= inPoint())
        return setError(QvStatus::failed, "The out point does not lie behind the in point");
    shiftPoints(delay, end);
    computeRange();
    setupSmartRender(params);
    if (audioPipe_) {
        QvProcessUtil::applyStreamReport(audioPipe_.get(), decoder_, decStreamNr_, inStart_, inEnd_);
        if (audioPipe_->open() != QvStatus::ok) {
            setError(QvStatus::failed, audioPipe_->errorDesc());
            audioPipe_.reset();
            return QvStatus::failed;
        }
    }
    processed_ = -1;
    steps_ = 0;
    finished_ = silenceLogged_ = worked_ = false;
    opened_ = true;
    return QvStatus::ok;
}

int TransALink::readFormat(const AnyDict& stream) {
    inSamplerate_ = stream.getInt32("samplerate", 0);
    inChannels_ = stream.getInt32("channels", 0);
    outSamplerate_ = encoder_->getParam(_encPar("samplerate").asString()).asInt32(0);
    outChannels_ = encoder_->getParam(_encPar("channels").asString()).asInt32(0);
    if (inSamplerate_ < 1) return setError(QvStatus::failed, "Could not get 'samplerate' from decoder");
    if (inChannels_ < 1) return setError(QvStatus::failed, "Could not get 'channels' from decoder");
    if (outSamplerate_ < 1) return setError(QvStatus::failed, "Could not get 'samplerate' from encoder");
    if (outChannels_ < 1) return setError(QvStatus::failed, "Could not get 'channels' from encoder");
    inBits_ = stream.getInt32("bitsPerSample", defaultBits);
    outBits_ = encoder_->getParam(_encPar("bitsPerSample").asString()).asInt32(defaultBits);
    inBytesPerSample_ = bytesOf(inBits_);
    outBytesPerSample_ = bytesOf(outBits_);
    return QvStatus::ok;
}

// The matrix of the job where it fits, otherwise the one that the codecs' layouts give.
void TransALink::takeMatrix(const AnyDict* params) {
    connMatrix_.clear();
    if (params && params->get("connMatrix").isVector()) connMatrix_ = params->get("connMatrix").asVector();
    if (_verifyConnMatrix()) return;
    qv_dbg()->debug("Using default audio connection matrix");
    AudioMuxer muxer;
    muxer.init(decoder_, audioEncoder(), outChannels_, nullptr, decStreamNr_);
    muxer.store(connMatrix_);
    _verifyConnMatrix();
}

int TransALink::buildPipe(const AnyDict* params, MediaTime& delay) {
    AudioJobDescription job;
    job.inBitsPerSample = inBits_;
    job.inSamplerate = inSamplerate_;
    job.inChannels = inChannels_;
    job.outBitsPerSample = outBits_;
    job.outSamplerate = outSamplerate_;
    job.outChannels = outChannels_;
    job.connMatrix = connMatrix_;
    if (params) job.filters = params->getDict("audioEffects").getVector("customFilters");
    try {
        audioPipe_.reset(QvProcessUtil::createAudioPipe(job, delay));
    } catch (const QvAssertFailure& failure) {
        return pipeFailed(failure);
    }
    return QvStatus::ok;
}

// Sound that is to come earlier starts later in its input.
void TransALink::shiftPoints(const MediaTime& delay, const MediaTime& end) {
    if (delay.value() <= 0) return;
    qv_dbg()->debug("ALink.open: In/out points shifted by negative delay %f.", delay.seconds());
    inOutPoints_.setInPoint(earlier(inPoint() + delay, end));
    inOutPoints_.setOutPoint(earlier(outPoint() + delay, end));
}

void TransALink::computeRange() {
    qv_dbg()->debug("ALink.open: in=%f, out=%f (seconds)", inPoint().seconds(), outPoint().seconds());
    inStart_ = inPoint().position(inSamplerate_);
    inEnd_ = outPoint().position(inSamplerate_);
    qv_dbg()->debug("ALink.open: In start sample= %lld, in end sample=%lld", inStart_, inEnd_);
    const long long outStart = inPoint().position(outSamplerate_);
    const long long outEnd = MediaTime(inEnd_, inSamplerate_).position(outSamplerate_);
    qv_dbg()->debug("ALink.open: Out start sample=%lld, out end sample=%lld", outStart, outEnd);
    totalInSamples_ = inEnd_ - inStart_;
    totalOutSamples_ = outEnd - outStart;
}

void TransALink::setupSmartRender(const AnyDict* params) {
    auto& encoder = *audioEncoder();
    qvSetOptionalParam(encoder, "smartRender", 0);
    const int mode = params ? params->getInt32("smartRender", 0) : 0;
    if (mode == 0) return;
    Any source = Pair(qvAudioStream, decStreamNr_);
    decoder_->getParam("srParams", source);
    if (!source.isDict()) return;
    source.asDict().set("sample0", inStart_);
    Any answer = source;
    encoder.getParam("srPossible", answer);
    if (answer != Any(QvStatus::ok) && answer != Any(QvStatus::warning)) return;
    encoder.setParam("smartRender", mode);
    encoder.setParam("decoderStruct", source);
    smartRendering_ = true;
    outSamplerate_ = inSamplerate_;
    totalOutSamples_ = totalInSamples_;
}

int TransALink::close() {
    if (!opened_) return QvStatus::ok;
    const int result = audioPipe_ ? closePipe(*audioPipe_) : QvStatus::ok;
    audioPipe_.reset();
    qv_dbg()->debug("ALink @ %p: closed, %lld samples written", static_cast<void*>(this), processed_ + 1);
    for (const Any& stream : selectedStreams_) decoder_->deselect(qvAudioStream, stream.toInt32());
    connMatrix_.clear();
    selectedStreams_.clear();
    muxStreams_.clear();
    muxChannels_.clear();
    silence_.destroy();
    muxBuffer_.destroy();
    opened_ = false;
    return result;
}

int TransALink::totalOutFrames() const { QV_FAIL_PLAIN(); }

double TransALink::samplesPerFrame() const { QV_FAIL_PLAIN(); }

double TransALink::completed() const {
    if (totalInSamples_ < 1) return 0.0;
    return static_cast<double>(processed_) * 100.0 / static_cast<double>(totalInSamples_) * inSamplerate_ /
           outSamplerate_;
}

long long TransALink::outSamplesPerFrames(int n, const QvFramerate& rate) const {
    return QvUtil::samplesForFrames(n, rate, outSamplerate_);
}

QvCodec* TransALink::filter(const char* name, int index) const {
    return audioPipe_ ? audioPipe_->filter(name, index) : nullptr;
}

void TransALink::log() {
    if (!decoder_ || !encoder_) {
        qv_dbg()->debug("Missing components");
        return;
    }
    qv_dbg()->debug("--- ALink @ %p ---", static_cast<void*>(this));
    qv_dbg()->debug("Input: '%s' @ %p audio #%d:", decoder_->name(), static_cast<void*>(decoder_),
                    decStreamNr_);
    AnyDict stream;
    decoder_->getStreamParams(qvAudioStream, decStreamNr_, stream);
    QvUtil::debugOutDict(stream);
    qv_dbg()->debug("---");
    const auto* encoder = encoder_->audioEncoder(encStreamNr_);
    if (!encoder) {
        qv_dbg()->debug("No audio encoder?");
        return;
    }
    qv_dbg()->debug("Output: '%s' @ %p audio #%d", encoder->name(), static_cast<const void*>(encoder),
                    encStreamNr_);
    logEncoder(*encoder, {"profile", "type", "samplerate", "channels", "bitrate"});
    if (!audioPipe_ || audioPipe_->nrFilters() == 0) return;
    qv_dbg()->debug("---");
    qv_dbg()->debug("Processing:");
    for (int i = 0; i < audioPipe_->nrFilters(); ++i) logFilter(i + 1, *audioPipe_->filter(i));
}
