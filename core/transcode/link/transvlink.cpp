// The video link: its streams, its frame range and its conversion.
#include <algorithm>
#include <string>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/optionalparam_p.h"
#include "core/engine/qvutil.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "core/job/filtersstate.h"
#include "core/measure/qvnum.h"
#include "core/transcode/link/translink.h"

TransVLink::TransVLink() = default;

TransVLink::TransVLink(const TransVLink& other) : TransLink(other) { *this = other; }

TransVLink& TransVLink::operator=(const TransVLink& other) {
    if (this == &other) return *this;
    if (opened_) TransVLink::close();
    TransLink::operator=(other);
    qualitySetup_ = other.qualitySetup_;
    outFramerate_ = other.outFramerate_;
    nrFramesIn_ = other.nrFramesIn_;
    nrFramesOut_ = other.nrFramesOut_;
    pairCompleted_ = other.pairCompleted_;
    framesWritten_ = -1;
    startFrame_ = other.startFrame_;
    stopFrame_ = other.stopFrame_;
    decViews_ = other.decViews_;
    encViews_ = other.encViews_;
    metaSources_.clear();
    for (const auto& source : other.metaSources_)
        metaSources_.push_back(std::make_unique<MetaVHelper>(*source));
    return *this;
}

TransVLink::~TransVLink() {
    if (opened_) TransVLink::close();
}

int TransVLink::views(const Any& value) const { return std::max(value.asInt32(1), 1); }

int TransVLink::init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) {
    TransLink::init(decoder, decStream, encoder, encStream);
    if (!decoder->isSelected(qvVideoStream, decStream)) {
        qv_dbg()->log(QvLogMask::error, "Can not init translink video, decoder stream not selected");
        QV_FAIL_PLAIN();
    }
    if (encStream < 0) {
        qv_dbg()->log(QvLogMask::error, "Cannot link, encoder stream not available");
        QV_FAIL_PLAIN();
    }
    if (encStream >= encoder->nrVideoStreams()) {
        qv_dbg()->log(QvLogMask::error, "Invalid encoder video stream nr %d", encStream);
        return QvStatus::failed;
    }
    nameStreams();
    decViews_ = views(decoder->getVideoParam(decStream, "nrViews"));
    encViews_ = views(encoder->getParam(_encPar("nrViews").asString()));
    if (encViews_ > 1 && decViews_ < encViews_)
        qv_log()->warning("Multi-view: only %d views in input, encoder requires %d views", decViews_,
                          encViews_);
    if (decViews_ > encViews_)
        qv_log()->warning(
            "Multi-view: too many views in input for the encoder, excess views will be ignored.");
    return QvStatus::ok;
}

int TransVLink::open(const AnyDict* params) {
    if (opened_) return QvStatus::failed;
    releasePipe();
    readLogProgress();
    if (params && (params->isSet("startFrame") || params->isSet("stopFrame")))
        QV_FAIL("startFrame and stopFrame are deprecated. Use inOutPoints.");
    AnyDict stream;
    decoder_->getStreamParams(qvVideoStream, decStreamNr_, stream);
    const Any inRate = stream.get("framerate");
    if (!inRate.isFramerate() || inRate.asFramerate().rate().ratio() <= 0)
        return setError(QvStatus::failed, "Could not get 'framerate' from decoder");
    const Any outRate = encoder_->getParam(_encPar("framerate").asString());
    if (!outRate.isFramerate() || outRate.asFramerate().rate().ratio() <= 0)
        return setError(QvStatus::failed, "Could not get 'framerate' from encoder");
    job_ = VideoJobDescription();
    job_.inFramerate = inRate.asFramerate();
    job_.outFramerate = outFramerate_ = outRate.asFramerate();
    if (const int result = takeFrameRange(params, stream)) return result;
    const bool chapters = applyChapters(params);
    describeJob(params, stream);
    QV_ASSERT(decViews_ >= encViews_);
    if (const int result = buildPipe()) return result;
    QvProcessUtil::adjustVideoEncoder(job_, videoPipe_.get(), encoder_, encStreamNr_);
    setupSmartRender(params && params->get("smartRender").isTrue() && !chapters);
    for (const auto& source : metaSources_) {
        qvSetOptionalParam(*encoder_->videoEncoder(encStreamNr_), "ccMode",
                           static_cast<const AnyDict&>(source->params));
        // It is read once a frame, whatever rate its own times are written at.
        if (source->decoder != decoder_) qvSetOptionalParam(*source->decoder, "readRate", job_.inFramerate);
    }
    finished_ = false;
    framesWritten_ = 0;
    setupLogger(params);
    opened_ = true;
    return QvStatus::ok;
}

// What the encoder takes: its choice, or the input's format where it can, or the first that it names.
unsigned TransVLink::chooseFOURCC(unsigned inFOURCC) const {
    const Any selected = encoder_->getParam(_encPar("selectedFOURCC").asString());
    if (selected.isInt32()) return static_cast<unsigned>(selected.asInt32());
    Any list = encoder_->getParam(_encPar("inFOURCC").asString());
    if (!list.isVector()) {
        const auto* encoder = encoder_->videoEncoder(encStreamNr_);
        if (encoder && encoder->module()) list = encoder->getAttr("inFOURCC");
    }
    if (!list.isVector() || list.asVector().empty()) return inFOURCC;
    if (list.asVector().contains(Any(static_cast<int>(inFOURCC)))) return inFOURCC;
    // 16 bits go on as 16 bits, whatever the list says.
    if (inFOURCC == QvFourcc::W016) return QvFourcc::Y216;
    return static_cast<unsigned>(list.asVector().at(0).asInt32(static_cast<int>(inFOURCC)));
}

int TransVLink::takeFrameRange(const AnyDict* params, const AnyDict& stream) {
    const QvFramerate& inRate = job_.inFramerate;
    const MediaTime end(stream.getInt32("frames", 0), inRate, MediaTime::defaultTimescale);
    const bool given = takePoints(params, end);
    qv_dbg()->debug("%s", given ? "VLink.open: In/out points are set"
                                : "VLink.open: In/out points constructed from total duration");
    startFrame_ = static_cast<int>(inPoint().position(inRate));
    stopFrame_ = static_cast<int>(outPoint().position(inRate)) - 1;
    qv_dbg()->debug("VLink.open: in=%f, out=%f (sec)", inPoint().seconds(), outPoint().seconds());
    qv_dbg()->debug("VLink.open: Start frame=%d, end frame=%d", startFrame_, stopFrame_);
    if (given && stopFrame_ < startFrame_)
        return setError(QvStatus::failed, "The out point does not lie behind the in point");
    nrFramesIn_ = stopFrame_ - startFrame_ + 1;
    // Two frames go into each one when the rate is halved.
    pairCompleted_ = nrFramesIn_ % 2 != 0 && QvNum::equ(2.0 * outFramerate_.rate().ratio(),
                                                        inRate.rate().ratio(), QvRatio::tolerance);
    if (pairCompleted_) {
        ++stopFrame_;
        ++nrFramesIn_;
    }
    nrFramesOut_ =
        static_cast<int>(QvRatio::multyplyByRatio(nrFramesIn_, outFramerate_.rate(), inRate.rate()));
    return QvStatus::ok;
}

// True when the encoder got at least one chapter point.
bool TransVLink::applyChapters(const AnyDict* params) {
    const AnyVector& chapters = params ? params->getVector("chapters") : AnyVector::null();
    if (chapters.empty()) return false;
    AnyVector points;
    QvProcessUtil::rescaleTimePoints(chapters, job_.inFramerate, outFramerate_, &points);
    qv_dbg()->debug("Vlink.open: applying %d chapter points", points.size());
    qvSetOptionalParam(*encoder_->videoEncoder(encStreamNr_), "chapters", points);
    return true;
}

void TransVLink::describeJob(const AnyDict* params, const AnyDict& stream) {
    job_.inFOURCC = static_cast<unsigned>(stream.getInt32("FOURCC", 0));
    job_.inFrameAspect = stream.getDouble("frameAspect", 1.0);
    job_.inWidth = stream.getInt32("width", 0);
    job_.inHeight = stream.getInt32("height", 0);
    job_.cancel = cancel_;
    job_.startFrame = startFrame_;
    job_.stopFrame = stopFrame_;
    const Any blanking = encoder_->getParam(_encPar("_needTopBlanking").asString());
    job_.topBlankingLines = blanking.isInt32() ? blanking.asInt32() : 0;
    job_.outFOURCC = chooseFOURCC(job_.inFOURCC);
    job_.outWidth = encoder_->getParam(_encPar("width").asString()).asInt32(0);
    job_.outHeight = encoder_->getParam(_encPar("height").asString()).asInt32(0);
    if (params && params->get("effects").isDict()) job_.filters = params->get("effects").asDict();
}

int TransVLink::buildPipe() {
    try {
        videoPipe_.reset(QvProcessUtil::createVideoPipeMV(job_, encViews_));
    } catch (const QvAssertFailure& failure) {
        return pipeFailed(failure);
    }
    _setTotalVDuration();
    return QvStatus::ok;
}

// Filters that fade or count need to know how many frames they will see.
void TransVLink::_setTotalVDuration() {
    if (!videoPipe_) return;
    const auto factor = [&](int i) {
        return std::max(1, videoPipe_->filter(i)->getParam("_rateFactor").asInt32(1));
    };
    const int filters = videoPipe_->nrFilters();
    long long total = nrFramesIn_, behind = 1;  // `behind`: frames that later filters make of one
    for (int i = 0; i < filters; ++i) behind *= factor(i);
    for (int i = 0; i < filters; ++i) {
        auto& filter = *videoPipe_->filter(i);
        if (filter.getParam("_isFramerateConverter").isTrue())
            total = nrFramesOut_ / behind;
        else
            qvSetOptionalParam(filter, "_totalFrames", static_cast<int>(total));
        total *= factor(i);
        behind /= factor(i);
    }
}

// A pipe rules smart rendering out unless it only makes room for what the encoder lays out differently.
bool TransVLink::pipeAllowsSmartRender() const {
    if (!videoPipe_) return true;
    if (videoPipe_->nrFilters() != 1 || Any(videoPipe_->filter(0)->name()) != "scaler") return false;
    const bool onlyBlanks =
        job_.topBlankingLines != 0 && job_.inWidth == job_.outWidth &&
        (job_.outHeight - job_.topBlankingLines == job_.inHeight || job_.outHeight == job_.inHeight);
    const bool sameFamily = Any(decoder_->name()) == "dvcamdec" &&
                            Any(encoder_->videoEncoder(encStreamNr_)->name()) == "dv100venc";
    const bool storedNarrow =
        (job_.inWidth == 960 && job_.outWidth == 1280) || (job_.inWidth == 1440 && job_.outWidth == 1920);
    return onlyBlanks || (sameFamily && storedNarrow);
}

void TransVLink::setupSmartRender(bool wanted) {
    auto* encoder = encoder_->videoEncoder(encStreamNr_);
    QV_ASSERT(encoder);
    qvSetOptionalParam(*encoder, "smartRender", 0);
    if (!wanted || !pipeAllowsSmartRender()) return;
    Any source = Pair(qvVideoStream, decStreamNr_);
    decoder_->getParam("srParams", source);
    if (!source.isDict() || source.asDict().empty()) return;
    source.asDict().set("frame0", startFrame_);
    source.asDict().set("nrFrames", stopFrame_ - startFrame_ + 1);
    Any possible = source;
    encoder->getParam("srPossible", possible);
    // An encoder that doesn't know the question leaves it as it was.
    if (possible.isDict() || !possible.isTrue()) return;
    encoder->setParam("smartRender", 1);
    encoder->setParam("decoderStruct", source);
    decoder_->setParam("smartRenderingOn", Pair(qvVideoStream, decStreamNr_));
}

void TransVLink::setupLogger(const AnyDict* params) {
    const AnyVector& logs = params ? params->getVector("qualityStats") : AnyVector::null();
    if (logs.empty()) return;
    auto& encoder = *encoder_->videoEncoder(encStreamNr_);
    qvSetOptionalParam(encoder, "getQualityStats", 1);
    if (!encoder.getParam("getQualityStats").isTrue()) {
        qv_log()->error("Encoder %s does not support PSNR logging.", encoder.name());
        return;
    }
    qualitySetup_ = QvEncodingQualityStatsSetup(logs);
    psnrLogger_ = std::make_unique<QvPSNRLogger>();
    auto* muxer = encoder_->getMuxer();
    const bool hasStream = muxer && encStreamNr_ < muxer->nrStreams(qvVideoStream);
    auto* stream = hasStream ? muxer->stream(qvVideoStream, encStreamNr_) : nullptr;
    if (psnrLogger_->startLogging(stream, qualitySetup_) == QvStatus::ok) return;
    qvSetOptionalParam(encoder, "getQualityStats", 0);
    qv_log()->error("Can not start logging.");
    psnrLogger_.reset();
}

void TransVLink::writeLog() {
    if (!psnrLogger_) return;
    if (auto* encoder = encoder_->videoEncoder(encStreamNr_))
        qvSetOptionalParam(*encoder, "getQualityStats", 0);
    psnrLogger_->writeLog();
    psnrLogger_->stopLogging();
}

void TransVLink::releasePipe() { videoPipe_.reset(); }

int TransVLink::close() {
    if (!opened_) return QvStatus::ok;
    writeLog();
    psnrLogger_.reset();
    const int result = videoPipe_ ? closePipe(*videoPipe_) : QvStatus::ok;
    releasePipe();
    qv_dbg()->debug("VLink @ %p: closed, %d frames written", static_cast<void*>(this), framesWritten_);
    framesWritten_ = -1;
    opened_ = false;
    return result;
}

double TransVLink::completed() const {
    return nrFramesOut_ > 0 ? framesWritten_ * 100.0 / nrFramesOut_ : 0.0;
}

QvCodec* TransVLink::filter(const char* name, int index) const {
    return videoPipe_ ? videoPipe_->filter(name, index) : nullptr;
}

int TransVLink::addMetaSource(QvDecodePipe* decoder, int, int stream, const MetaProcessParams& params) {
    metaSources_.push_back(std::make_unique<MetaVHelper>(MetaVHelper{decoder, stream, params}));
    return QvStatus::ok;
}

int TransVLink::nrMetaSources() const { return static_cast<int>(metaSources_.size()); }

QvDecodePipe* TransVLink::metaSource(int index) const {
    if (index < 0 || index >= nrMetaSources()) return nullptr;
    return metaSources_[static_cast<std::size_t>(index)]->decoder;
}

int TransVLink::metaSourceStreamNr(int index) const {
    if (index < 0 || index >= nrMetaSources()) return -1;
    return metaSources_[static_cast<std::size_t>(index)]->stream;
}

void TransVLink::log() {
    if (!decoder_ || !encoder_) {
        qv_dbg()->debug("missing components");
        return;
    }
    qv_dbg()->debug("--- VLink @ %p ---", static_cast<void*>(this));
    qv_dbg()->debug("Input: '%s' @ %p video #%d:", decoder_->name(), static_cast<void*>(decoder_),
                    decStreamNr_);
    AnyDict stream;
    decoder_->getStreamParams(qvVideoStream, decStreamNr_, stream);
    QvUtil::debugOutDict(stream);
    qv_dbg()->debug("---");
    const auto* encoder = encoder_->videoEncoder(encStreamNr_);
    if (!encoder) {
        qv_dbg()->debug("No video encoder?");
        return;
    }
    qv_dbg()->debug("Output: '%s' @ %p video #%d", encoder->name(), static_cast<const void*>(encoder),
                    encStreamNr_);
    logEncoder(*encoder, {"profile", "type", "pal", "width", "height", "frameAspect", "bitrate",
                          "quantization", "framerate", "N", "M", "chroma"});
    if (!videoPipe_ || videoPipe_->nrFilters() == 0) return;
    qv_dbg()->debug("---");
    qv_dbg()->debug("Processing:");
    for (int i = 0; i < videoPipe_->nrFilters(); ++i) logFilter(i + 1, *videoPipe_->filter(i));
}
