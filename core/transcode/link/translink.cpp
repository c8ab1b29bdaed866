#include "core/transcode/link/translink.h"

#include <cstring>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/transcode/link/linkopen_p.h"

TransLink::TransLink() = default;

TransLink::TransLink(const TransLink& other)
    : decoder_(other.decoder_),
      encoder_(other.encoder_),
      decStreamNr_(other.decStreamNr_),
      encStreamNr_(other.encStreamNr_),
      decStreamName_(other.decStreamName_),
      encStreamName_(other.encStreamName_),
      processParams_(other.processParams_),
      inOutPoints_(other.inOutPoints_),
      logProgress_(other.logProgress_),
      errorDesc_(other.errorDesc_),
      errorCode_(other.errorCode_) {}

TransLink& TransLink::operator=(const TransLink& other) {
    if (this == &other) return *this;
    decoder_ = other.decoder_;
    encoder_ = other.encoder_;
    decStreamNr_ = other.decStreamNr_;
    encStreamNr_ = other.encStreamNr_;
    decStreamName_ = other.decStreamName_;
    encStreamName_ = other.encStreamName_;
    opened_ = finished_ = worked_ = false;
    processParams_ = other.processParams_;
    inOutPoints_ = other.inOutPoints_;
    logProgress_ = other.logProgress_;
    errorDesc_ = other.errorDesc_;
    errorCode_ = other.errorCode_;
    return *this;
}

TransLink::~TransLink() = default;

int TransLink::init(QvDecodePipe* decoder, int decStream, QvEncodePipe* encoder, int encStream) {
    if (opened_) close();
    decoder_ = decoder;
    encoder_ = encoder;
    decStreamNr_ = decStream;
    encStreamNr_ = encStream;
    opened_ = finished_ = worked_ = false;
    logProgress_ = false;
    errorCode_ = 0;
    errorDesc_ = "";
    return QvStatus::ok;
}

int TransLink::open(const AnyDict* params) { return openWith(LinkOpen(params)); }

QvFramerate TransLink::outFramerate() const { return QvFramerate::f24p(); }

long long TransLink::totalOutSamples() const { return 0; }

double TransLink::samplesPerFrame() const { QV_FAIL("TransLink::splsPerFrame - Not implemented"); }

long long TransLink::outSamplesPerFrames(int, const QvFramerate&) const { return 0; }

void TransLink::setProcessParams(const ProcessParams& params) {
    if (const auto points = params.inOutPoints()) processParams_.setInOutPoints(*points);
    if (const auto* chapters = params.chapterPoints()) processParams_.setChapterPoints(*chapters);
    if (const auto filters = params.filters()) processParams_.setFilters(*filters);
    if (const auto* map = params.audioChannelMap()) processParams_.setAudioChannelMap(*map);
    if (const auto conversion = params.audioConversion()) processParams_.setAudioConversion(*conversion);
    if (params.holdLast()) processParams_.setHoldLast(true);
    if (const auto logs = params.getQualityStatsSetup()) processParams_.setQualityLog(*logs);
}

int TransLink::addMetaSource(QvDecodePipe*, int, int, const MetaProcessParams&) { QV_FAIL_PLAIN(); }

int TransLink::nrMetaSources() const { return 0; }

QvDecodePipe* TransLink::metaSource(int) const { return nullptr; }

int TransLink::metaSourceStreamNr(int) const { return -1; }

void TransLink::_getInParams(AnyDict& params) const {
    const Any stream = decoder_->getParam(decStreamName_.asString(""));
    params.clear();
    if (stream.isDict()) params = stream.asDict();
}

int TransLink::_setOutParams(const AnyDict& params) {
    return encoder_->setParam(encStreamName_.asString(""), params);
}

int TransLink::copyFormat() {
    if (decStreamNr_ == -1 || encStreamNr_ == -1) return QvStatus::failed;
    AnyDict params;
    _getInParams(params);
    return _setOutParams(params);
}

const char* TransLink::errorDesc() const { return errorDesc_.asString(""); }

Any TransLink::_encPar(const char* name) const {
    return Any::sprintf("%s/%s", encStreamName_.asString(""), name);
}

int TransLink::setError(int code, const Any& text) {
    copyError(code, text);
    if (code != 0 && errorDesc_.size() > 0) qv_dbg()->log(QvLogMask::error, "%s", errorDesc());
    return code;
}

void TransLink::copyError(int code, const Any& text) {
    errorCode_ = code;
    errorDesc_ = code != 0 && text.isString() ? text : Any("");
}

int TransLink::pipeFailed(const QvException& failure) {
    // An assertion's text follows the line with its place.
    const char* text = std::strrchr(failure.what(), '\n');
    const bool noMemory = dynamic_cast<const QvMemoryFailure*>(&failure);
    setError(noMemory ? QvStatus::outOfMemory : QvStatus::failed, text ? text + 1 : failure.what());
    return QvStatus::failed;
}

// What failed before is the reason of the failure, if anything did.
int TransLink::closePipe(QvCodec& pipe) {
    const int closed = pipe.close();
    const int result = closed != QvStatus::ok ? closed : pipe.errorCode();
    if (result != QvStatus::ok && errorCode_ == QvStatus::ok) setError(result, pipe.errorDesc());
    return result;
}

void TransLink::nameStreams() {
    const char* kind = type() == qvVideoStream ? "video%d" : "audio%d";
    decStreamName_ = Any::sprintf(kind, decStreamNr_);
    encStreamName_ = Any::sprintf(kind, encStreamNr_);
}

void TransLink::readLogProgress() { logProgress_ = qv_registry()->getDbgOption("log_progress").isTrue(); }

bool TransLink::takePoints(const LinkOpen& given, const MediaTime& end) {
    inOutPoints_ = given.points.value_or(InOutPoints(MediaTime(), end));
    if (!given.points) return false;
    // What the setters write for the half of a pair that was not given.
    if (inOutPoints_.outPoint().value() == 0) inOutPoints_.setOutPoint(end);
    return true;
}

void TransLink::logEncoder(const QvCodec& encoder, std::initializer_list<const char*> names) const {
    for (const auto* name : names) QvUtil::debugOutAny(name, encoder.getParam(name));
    AnyDict state;
    encoder.store(state);
    if (!state.get("settingsDict").isDict()) return;
    qv_dbg()->debug("  settings:");
    QvUtil::debugOutDict(state.get("settingsDict").asDict(), 2);
}

void TransLink::logFilter(int number, const QvCodec& filter) {
    qv_dbg()->debug("  %d. %s ", number, filter.name());
    const Any info = filter.getParam("info");
    if (info.isDict()) QvUtil::debugOutDict(info.asDict(), 3);
}
