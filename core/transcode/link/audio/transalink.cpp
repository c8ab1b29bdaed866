#include "core/transcode/link/audio/transalink.h"

#include <algorithm>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/qvutil.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/jobdescription.h"
#include "core/transcode/link/audio/audiomuxer.h"
#include "core/transcode/link/audio/channelmatrix_p.h"
#include "core/transcode/link/audio/sampleclock_p.h"
#include "core/transcode/link/audio/streammix_p.h"
#include "core/transcode/link/linkopen_p.h"
#include "core/transcode/link/steplog_p.h"

namespace {

MediaTime earlier(const MediaTime& a, const MediaTime& b) { return b < a ? b : a; }

// One element a stream of the decoder: its channels where the matrix names it and the decoder says, otherwise
// -1.
std::vector<int> inputChannels(const QvDecodePipe& decoder, const ChannelMatrix& matrix) {
    std::vector<int> channels(static_cast<std::size_t>(std::max(decoder.nrAudioStreams(), 0)), -1);
    for (const ChannelMatrix::Row& row : matrix.rows())
        for (const ChannelSource& source : row) {
            if (source.stream < 0 || source.stream >= static_cast<int>(channels.size())) continue;
            const Any name = Any::sprintf("audio%d/channels", source.stream);
            const Any answer = decoder.getParam(name.asString());
            if (answer.isInt32()) channels[static_cast<std::size_t>(source.stream)] = answer.asInt32();
        }
    return channels;
}

int channelsOf(const QvDecodePipe& decoder, int stream) {
    return decoder.getAudioParam(stream, "channels").asInt32(0);
}

std::vector<StreamMix::Part> partsOf(const QvDecodePipe& decoder, const AnyVector& streams) {
    std::vector<StreamMix::Part> parts;
    for (const Any& stream : streams)
        parts.push_back({stream.asInt32(), channelsOf(decoder, stream.asInt32())});
    return parts;
}

}  // namespace

TransALink::TransALink()
    : clock_(std::make_unique<SampleClock>()),
      matrix_(std::make_unique<ChannelMatrix>()),
      mix_(std::make_unique<StreamMix>()) {}

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

int TransALink::openWith(const LinkOpen& given) {
    if (opened_) return QvStatus::failed;
    audioPipe_.reset();
    smartRendering_ = false;
    padsEnd_ = given.conversion.padEnd;
    endedEarly_ = false;
    readLogProgress();
    if (given.frameNumbers) QV_FAIL("startFrame and stopFrame are deprecated. Use 'inOutPoints'.");
    AnyDict stream;
    _getInParams(stream);
    if (const int result = readFormats(stream)) return result;
    QV_ASSERT(decoder_->isSelected(qvAudioStream, decStreamNr_));
    if (const int result = takeRange(given)) return result;
    takeMatrix(given.connMatrix);
    MediaTime delay;
    if (const int result = buildPipe(given, delay)) return result;
    *clock_ = SampleClock(in_.samplerate, out_.samplerate);
    if (const int result = takeRange(given)) return result;
    shiftPoints(delay);
    computeRange();
    setupSmartRender(given.smartRender);
    if (const int result = openPipe()) return result;
    steps_ = 0;
    finished_ = isEmpty();
    worked_ = wasFinished_ = false;
    opened_ = true;
    return QvStatus::ok;
}

int TransALink::readFormats(const AnyDict& stream) {
    in_ = AudioFormat(stream);
    const auto ask = [this](const char* name) { return encoder_->getParam(_encPar(name).asString()); };
    out_ = AudioFormat();
    out_.samplerate = ask("samplerate").asInt32(0);
    out_.channels = ask("channels").asInt32(0);
    if (in_.samplerate < 1) return setError(QvStatus::failed, "Could not get 'samplerate' from decoder");
    if (in_.channels < 1) return setError(QvStatus::failed, "Could not get 'channels' from decoder");
    if (out_.samplerate < 1) return setError(QvStatus::failed, "Could not get 'samplerate' from encoder");
    if (out_.channels < 1) return setError(QvStatus::failed, "Could not get 'channels' from encoder");
    out_.bits = ask("bitsPerSample").asInt32(AudioFormat::defaultBits);
    return QvStatus::ok;
}

// The matrix of the job where it fits, otherwise the one that the codecs' layouts give.
void TransALink::takeMatrix(const AnyVector& given) {
    if (takesMatrix(given)) return;
    qv_dbg()->debug("Using default audio connection matrix");
    AudioMuxer muxer;
    AnyVector matrix;
    muxer.init(decoder_, audioEncoder(), out_.channels, nullptr, decStreamNr_);
    muxer.store(matrix);
    takesMatrix(matrix);
}

bool TransALink::takesMatrix(const AnyVector& given) {
    *matrix_ = ChannelMatrix(given, decStreamNr_);
    const std::string fault = matrix_->fault(out_.channels, inputChannels(*decoder_, *matrix_));
    qv_dbg()->debug("%s", fault.empty() ? "Audio channel map OK" : fault.c_str());
    for (int i = 0; fault.empty() && i < matrix_->size(); ++i)
        qv_dbg()->debug("%i <- %s", i, matrix_->describe(i).c_str());
    return fault.empty();
}

int TransALink::buildPipe(const LinkOpen& given, MediaTime& delay) {
    AudioJobDescription job;
    job.inBitsPerSample = in_.bits;
    job.inSamplerate = in_.samplerate;
    job.inChannels = in_.channels;
    job.outBitsPerSample = out_.bits;
    job.outSamplerate = out_.samplerate;
    job.outChannels = out_.channels;
    job.connMatrix = matrix_->entries();
    job.filters = given.audioFilters;
    job.conversion = given.conversion;
    try {
        audioPipe_.reset(QvProcessUtil::createAudioPipe(job, delay));
    } catch (const QvAssertFailure& failure) {
        return pipeFailed(failure);
    }
    return QvStatus::ok;
}

MediaTime TransALink::endOfInput() const { return qvInstantOf(in_.samples, QvRatio(in_.samplerate, 1)); }

int TransALink::takeRange(const LinkOpen& given) {
    qv_dbg()->debug("ALink.open: input stream has %lld samples", in_.samples);
    const bool points = takePoints(given, endOfInput());
    qv_dbg()->debug("%s", points ? "ALink.open: In/out points are set."
                                 : "ALink.open: In/out points constructed from duration.");
    if (points && outPoint() <= inPoint() && !padsEnd_)
        return setError(QvStatus::failed, "The out point is not after the in point");
    return QvStatus::ok;
}

// Sound that is to come earlier starts later in its input.
void TransALink::shiftPoints(const MediaTime& delay) {
    if (delay.value() <= 0) return;
    const MediaTime end = endOfInput();
    qv_dbg()->debug("ALink.open: In/out points shifted by negative delay %f.", delay.seconds());
    inOutPoints_.setInPoint(earlier(inPoint() + delay, end));
    inOutPoints_.setOutPoint(earlier(outPoint() + delay, end));
}

void TransALink::computeRange() {
    qv_dbg()->debug("ALink.open: in=%f, out=%f (seconds)", inPoint().seconds(), outPoint().seconds());
    clock_->setRange(inPoint(), outPoint());
    qv_dbg()->debug("ALink.open: In start sample= %lld, in end sample=%lld", clock_->inStart(),
                    clock_->inEnd());
    qv_dbg()->debug("ALink.open: Out start sample=%lld, out end sample=%lld", clock_->outStart(),
                    clock_->outEnd());
}

void TransALink::setupSmartRender(int mode) {
    auto& encoder = *audioEncoder();
    qvSetOptionalParam(encoder, "smartRender", 0);
    if (mode == 0) return;
    Any source = Pair(qvAudioStream, decStreamNr_);
    decoder_->getParam("srParams", source);
    if (!source.isDict()) return;
    source.asDict().set("sample0", clock_->inStart());
    Any answer = source;
    encoder.getParam("srPossible", answer);
    if (answer != Any(QvStatus::ok) && answer != Any(QvStatus::warning)) return;
    encoder.setParam("smartRender", mode);
    encoder.setParam("decoderStruct", source);
    smartRendering_ = true;
    clock_->passThrough();
}

// A range without a sample, in whose place there is silence.
bool TransALink::isEmpty() const { return padsEnd_ && clock_->inEnd() <= clock_->inStart(); }

int TransALink::openPipe() {
    if (isEmpty()) audioPipe_.reset();
    if (!audioPipe_) return QvStatus::ok;
    if (!QvProcessUtil::applyStreamReport(audioPipe_.get(), decoder_, decStreamNr_, clock_->inStart(),
                                          clock_->inEnd(), readWatch_)) {
        audioPipe_.reset();
        return setError(QvStatus::failed, "Stopped while the sound was measured");
    }
    if (audioPipe_->open() == QvStatus::ok) return QvStatus::ok;
    setError(QvStatus::failed, audioPipe_->errorDesc());
    audioPipe_.reset();
    return QvStatus::failed;
}

int TransALink::close() {
    if (!opened_) return QvStatus::ok;
    const int result = audioPipe_ ? closePipe(*audioPipe_) : QvStatus::ok;
    audioPipe_.reset();
    qv_dbg()->debug("ALink @ %p: closed, %lld samples written", static_cast<void*>(this), clock_->written());
    for (const Any& stream : selectedStreams_) decoder_->deselect(qvAudioStream, stream.toInt32());
    selectedStreams_.clear();
    *matrix_ = ChannelMatrix();
    *mix_ = StreamMix();
    silence_.destroy();
    opened_ = false;
    return result;
}

int TransALink::totalOutFrames() const { QV_FAIL_PLAIN(); }

double TransALink::samplesPerFrame() const { QV_FAIL_PLAIN(); }

double TransALink::completed() const { return clock_->percent(); }

long long TransALink::outSamplesPerFrames(int n, const QvFramerate& rate) const {
    return clock_->samplesFor(n, rate);
}

long long TransALink::outProcessed() const { return clock_->written(); }

long long TransALink::totalOutSamples() const { return clock_->totalOut(); }

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

// --- One step.

int TransALink::processFrame(int n) {
    QV_ASSERT(n != -1);
    QV_STEP_LOG("ALink", "processFrame");
    if (n < 1) {
        QV_STEP_LOG("ALink", "nothing to process");
        return QvStatus::ok;
    }
    if (smartRendering_) return smartStep(n);
    if (finished_ && !(padsEnd_ && audioPipe_)) {
        QV_STEP_LOG("ALink", "silence samples=%d", n);
        return _insertSilence(n);
    }
    return audioPipe_ ? pipeStep(n) : directStep(n);
}

int TransALink::smartStep(int n) {
    QV_STEP_LOG("ALink", "writeFrame sample =%d...", n);
    const int result = audioEncoder()->writePcm(nullptr, n);
    if (result != QvStatus::ok) copyError(result, audioEncoder()->errorDesc());
    clock_->wrote(n);
    finished_ = clock_->complete();
    ++steps_;
    if (finished_) logDone("Audio smart rendering done");
    return result;
}

// From the decoder's buffer straight to the encoder.
int TransALink::directStep(int n) {
    auto* pcm = decoder_->getAudioPtr(decStreamNr_);
    QV_STEP_LOG("ALink", "read samples %d", n);
    const int read = decoder_->readSamples(n, decStreamNr_);
    QV_STEP_LOG("ALink", "read samples done, result=%d", read);
    const bool isSound = read >= 0 || read == QvStatus::endOfStream;
    if (read < n) {
        finished_ = true;
        if (!isSound) {
            endedEarly_ = true;
            padsEnd_ = false;  // what has failed is not asked again
        }
        if (!worked_ && !padsEnd_) return readFailed();
    }
    int result = QvStatus::ok;
    const bool holds = pcm && pcm->inited() && pcm->samples() > 0;
    const long long before = clock_->written();
    if (holds && isSound) {
        QV_STEP_LOG("ALink", "writePcm samples=%d", pcm->samples());
        result = audioEncoder()->writePcm(pcm, -1);
        QV_STEP_LOG("ALink", "writePcm done result=%d", result);
        clock_->wrote(pcm->samples());
    }
    if (finished_ && !clock_->complete()) endedEarly_ = true;
    if (padsEnd_ && result == QvStatus::ok)
        result = fillStep(n - static_cast<int>(clock_->written() - before));
    return endStep(result);
}

int TransALink::fillStep(int count) { return count > 0 ? _insertSilence(count) : QvStatus::ok; }

// What the pipe has beyond the samples that are due stays in it.
int TransALink::pipeStep(int n) {
    QV_STEP_LOG("ALink", "aprocess samples=%d", n);
    const int processed = audioPipe_->process(decoder_, decStreamNr_, n);
    QV_STEP_LOG("ALink", "aprocess done, result=%d", processed);
    const bool padded = padsEnd_ && processed == QvStatus::endOfStream;
    if (processed != QvStatus::ok && !padded) {
        finished_ = true;
        padsEnd_ = false;  // what has failed is not asked again
        if (processed != QvStatus::endOfStream) endedEarly_ = true;
        if (!worked_) return readFailed();
    }
    auto* pcm = audioPipe_->pcm();
    const int count = std::min(audioPipe_->samples(), n);
    int result = QvStatus::ok;
    if (pcm && count > 0) {
        QV_STEP_LOG("ALink", "writePcm samples=%d", count);
        result = audioEncoder()->writePcm(pcm, count);
        QV_STEP_LOG("ALink", "writePcm done, result=%d", result);
        clock_->wrote(count);
        audioPipe_->erase(count);
    }
    return endStep(result);
}

int TransALink::endStep(int result) {
    if (result != QvStatus::ok) copyError(result, audioEncoder()->errorDesc());
    if (clock_->complete()) finished_ = true;
    ++steps_;
    if (finished_ && !wasFinished_) logDone("Audio processing done");
    wasFinished_ = finished_;
    worked_ = true;
    QV_STEP_LOG("ALink", "processFrame done, result=%d", result);
    return result == QvStatus::endOfStream ? QvStatus::ok : result;
}

int TransALink::readFailed() {
    constexpr const char* reason = "Audio error, can not read samples";
    qv_dbg()->log(QvLogMask::error, "ALink @ %p: %s", static_cast<void*>(this), reason);
    copyError(QvStatus::failed, reason);
    return QvStatus::failed;
}

void TransALink::logDone(const char* what) const {
    qv_dbg()->debug("ALink @ %p: %s, transcoded %lld samples (%lld was expected), last video frame is %d",
                    static_cast<const void*>(this), what, clock_->written(), clock_->totalOut(), steps_);
}

bool TransALink::prepareSilence(int n) {
    const bool fits = silence_.inited() && silence_.channels() == out_.channels &&
                      silence_.bytesPerSample() == out_.bytesPerSample() && silence_.size() >= n;
    if (!fits && silence_.init(n, out_.channels, out_.bytesPerSample(), clock_->outRate()) != QvStatus::ok)
        return false;
    if (silence_.samples() == n) return true;
    silence_.setSamples(0);
    return silence_.addSilence(n) == QvStatus::ok;
}

int TransALink::_insertSilence(int n) {
    QV_ASSERT(n != -1);
    if (n < 1) return QvStatus::ok;
    if (!prepareSilence(n)) return setError(QvStatus::outOfMemory, "no memory for silence");
    audioEncoder()->writePcm(&silence_, -1);
    if (clock_->wroteSilence(n))
        qv_log()->info("Audio stream shorter than the video stream, inserting silence at the end.");
    return QvStatus::ok;
}

// --- Several input streams.

AnyVector TransALink::_getNeededInputStreams(const AnyVector& matrix, AnyVector& newlySelected, bool select) {
    AnyVector streams;
    for (const int stream : ChannelMatrix(matrix, decStreamNr_).streams()) streams.append(Any(stream));
    if (!select) return streams;
    for (const Any& stream : streams) {
        if (decoder_->isSelected(qvAudioStream, stream.asInt32())) continue;
        if (decoder_->select(qvAudioStream, stream.asInt32()) == QvStatus::ok)
            newlySelected.append(stream);
        else
            qv_dbg()->log(QvLogMask::error, "ALink.open: Can not select stream %d", stream.asInt32());
    }
    selectedStreams_.extend(newlySelected);
    *mix_ = StreamMix(partsOf(*decoder_, streams));
    return streams;
}

int TransALink::_filterChannelNr(const AnyVector& streams, int stream, int channel) const {
    return StreamMix(partsOf(*decoder_, streams)).channelNr(stream, channel);
}

AnyVector TransALink::_connMatrixToFilter(const AnyVector& matrix) const {
    return mix_->numbered(ChannelMatrix(matrix, decStreamNr_));
}

QvPcm* TransALink::_muxStreams() {
    std::vector<const QvPcm*> inputs;
    for (const StreamMix::Part& part : mix_->parts()) inputs.push_back(decoder_->getAudioPtr(part.stream));
    return mix_->interleave(inputs);
}
