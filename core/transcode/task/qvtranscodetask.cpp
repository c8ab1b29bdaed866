#include "core/transcode/task/qvtranscodetask.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <new>

#include "core/arch/formattext_p.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/decode/qvinputstream.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/stream/qvbufstrm.h"
#include "core/transcode/link/audio/transalink.h"
#include "core/transcode/link/video/transvlink.h"
#include "core/transcode/task/postprocess_p.h"
#include "core/transcode/task/segmentdurations_p.h"
#include "core/transcode/task/taskcheck_p.h"
#include "core/transcode/task/taskstore_p.h"

namespace {

constexpr int kTypes[] = {qvVideoStream, qvAudioStream, qvSubpicStream};

int indexOfType(int type) { return type == qvVideoStream ? 0 : type == qvAudioStream ? 1 : 2; }

}  // namespace

QvTask::QvTask() = default;

QvTask::~QvTask() = default;

const char* QvTask::typeName(int type) {
    switch (type) {
        case qvVideoStream: return "video";
        case qvAudioStream: return "audio";
        case qvSubpicStream: return "subpic";
    }
    QV_FAIL_PLAIN();
}

int QvTask::setError(int code, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<ERRSIZ - 1> formatted(format, args);
    va_end(args);
    const char* const text = formatted.text();
    errorCode_ = code;
    try {
        errorText_ = text;
    } catch (const std::bad_alloc&) {
        errorText_.clear();  // a failure is never reported by throwing
    }
    qv_dbg()->log(QvLogMask::error, "Task: %s (%d)", text, code);
    return code;
}

// --- Linking ---------------------------------------------------------------------------------------

int QvTask::link(QvDecodePipe* decoder, int type, int decStream, int encStream) {
    QV_ASSERT_MSG(encoder_, "Transcoder.link: failed, encoder is not set");
    QV_ASSERT_MSG(decoder, "Transcoder.link: invalid argument: dp is 0");
    const int already = linkedTo(decoder, type, decStream);
    if (already >= 0) {
        if (already == encStream) return QvStatus::ok;
        return setError(QvStatus::failed, "Decoder (%p) %s#%d already linked to encoder %s#%d",
                        static_cast<void*>(decoder), typeName(type), decStream, typeName(type), already);
    }
    if (decoder->getState() != QvDecodePipe::stateOpen) {
        if (const int result = decoder->open(); result != QvStatus::ok) {
            qv_dbg()->log(QvLogMask::error, "Transcoder.link: failed to open %p",
                          static_cast<void*>(decoder));
            errorCode_ = result;
            errorText_ = decoder->errorDesc();
            return result;
        }
    }
    if (!decoder->isSelected(type, decStream) && decoder->select(type, decStream) != QvStatus::ok)
        return setError(QvStatus::failed, "Task.link: select() failed on (%p) %s#%d -> %d",
                        static_cast<void*>(decoder), typeName(type), decStream, encStream);
    return makeLink(decoder, type, decStream, encStream);
}

int QvTask::makeLink(QvDecodePipe* decoder, int type, int decStream, int encStream) {
    std::unique_ptr<TransLink> link;
    switch (type) {
        case qvVideoStream: link = std::make_unique<TransVLink>(); break;
        case qvAudioStream: link = std::make_unique<TransALink>(); break;
        case qvSubpicStream:
            qv_dbg()->warning("Task.link: don't know how to link subpic streams");
            return QvStatus::ok;
        default: QV_FAIL_PLAIN();
    }
    if (link->init(decoder, decStream, encoder_, encStream) != QvStatus::ok)
        return setError(QvStatus::failed, "Can not initialize link: decoder (%p) %s#%d -> %d",
                        static_cast<void*>(decoder), typeName(type), decStream, encStream);
    addDecoder(decoder);
    links_.push_back(std::move(link));
    updateBSEnabled();
    return nrLinks() - 1;
}

int QvTask::link(QvDecodePipe* decoder, int type, int decStream, int encStream, const ProcessParams& params) {
    const int index = link(decoder, type, decStream, encStream);
    if (index < 0) return index;
    ProcessParams own;
    for (const char* key : {"inOutPoints", "chapters", "audioChannelMap", "qualityStats"})
        if (params.get(key).isVector()) own.set(key, params.get(key));
    if (params.get("filters").isDict() && !params.get("filters").asDict().empty())
        own.set("filters", params.get("filters"));
    if (const auto conversion = params.audioConversion()) own.setAudioConversion(*conversion);
    if (params.holdLast()) own.setHoldLast(true);
    if (own.empty()) return index;
    if (TransLink* made = getLinkForInput(decoder, type, decStream)) made->setProcessParams(own);
    return index;
}

int QvTask::link(QvDecodePipe* decoder) {
    QV_ASSERT_MSG(decoder, "Task.link: invalid argument");
    QV_ASSERT_MSG(encoder_, "Task.link: encoder not specified");
    unlink();
    for (int type : {qvVideoStream, qvAudioStream})
        if (const int result = linkAllOfType(decoder, type); result < 0) return result;
    updateBSEnabled();
    return QvStatus::ok;
}

int QvTask::linkAllOfType(QvDecodePipe* decoder, int type) {
    int next = 0;
    for (int stream = 0; stream < decoder->nrStreams(type); ++stream) {
        if (!decoder->isSelected(type, stream)) continue;
        if (next >= encoder_->nrStreams(type)) {
            setError(QvStatus::failed, "Invalid encoder stream %s#%d", typeName(type), next);
            QV_FAIL(errorDesc());
        }
        if (const int result = link(decoder, type, stream, next); result < 0) return result;
        ++next;
    }
    return QvStatus::ok;
}

int QvTask::linkMeta(QvDecodePipe* decoder, int type, int decStream, int encType, int encStream) {
    return linkMeta(decoder, type, decStream, encType, encStream, MetaProcessParams());
}

int QvTask::linkMeta(QvDecodePipe* decoder, int type, int decStream, int, int encStream,
                     const MetaProcessParams& params) {
    QV_ASSERT_MSG(encoder_, "Transcoder.linkMeta: failed, encoder is not set");
    QV_ASSERT_MSG(decoder, "Transcoder.linkMeta: invalid argument: dp is 0");
    QV_ASSERT_MSG(type == qvSubpicStream, "Transcoder.linkMeta: invalid argument: type is not QV_SUBPIC_CC");
    if (!decoder->isSelected(type, decStream) && decoder->select(type, decStream) != QvStatus::ok)
        return setError(QvStatus::failed, "Task.link: select() failed on (%p) %s#%d -> %d",
                        static_cast<void*>(decoder), typeName(type), decStream, encStream);
    TransLink* video = getLinkForOutput(qvVideoStream, encStream);
    QV_ASSERT_MSG(video,
                  "Transcoder.linkMeta: invalid state: Can not link meta before video stream is linked");
    addDecoder(decoder);
    return video->addMetaSource(decoder, type, decStream, params);
}

void QvTask::unlink() {
    links_.clear();
    decoders_.clear();
    updateBSEnabled();
}

void QvTask::addDecoder(QvDecodePipe* decoder) {
    if (!decoders_.contains(decoder)) decoders_.append(decoder);
}

// A stream that nothing feeds must never block the multiplexer.
void QvTask::updateBSEnabled() {
    if (!encoder_) return;
    for (int i = 0; i < encoder_->nrStreams(); ++i)
        if (QvBufStream* bytes = encoder_->streamAt(i)->bitstream) bytes->setEnabled(false);
    for (const auto& link : links_) {
        QvOStream* stream = encoder_->stream(link->type(), link->encStreamNr());
        if (stream && stream->bitstream) stream->bitstream->setEnabled(true);
    }
}

// --- Queries ---------------------------------------------------------------------------------------

int QvTask::nrLinks() const { return static_cast<int>(links_.size()); }

TransLink* QvTask::getLink(int index) const {
    QV_ASSERT_MSG(index >= 0 && index < nrLinks(), "TransLink.linkAt: index out of range");
    return links_[static_cast<size_t>(index)].get();
}

TransLink* QvTask::getLink(int type, int index) const {
    for (const auto& link : links_)
        if (link->type() == type && index-- == 0) return link.get();
    return nullptr;
}

TransLink* QvTask::getLinkForOutput(int type, int encStream) const {
    for (const auto& link : links_)
        if (link->type() == type && link->encStreamNr() == encStream) return link.get();
    return nullptr;
}

TransLink* QvTask::getLinkForOutput(QvDecodePipe* decoder, int type, int encStream) const {
    TransLink* link = getLinkForOutput(type, encStream);
    return link && link->decoder() == decoder ? link : nullptr;
}

TransLink* QvTask::getLinkForInput(QvDecodePipe* decoder, int type, int decStream) const {
    for (const auto& link : links_)
        if (link->decoder() == decoder && link->type() == type && link->decStreamNr() == decStream)
            return link.get();
    return nullptr;
}

int QvTask::indexOfLink(const TransLink* wanted) const {
    const auto found =
        std::find_if(links_.begin(), links_.end(), [&](const auto& l) { return l.get() == wanted; });
    return found == links_.end() ? -1 : static_cast<int>(found - links_.begin());
}

int QvTask::linkedTo(QvDecodePipe* decoder, int type, int decStream) const {
    QV_ASSERT_MSG(decoder, "Task.linkedTo: invalid argument");
    const TransLink* link = getLinkForInput(decoder, type, decStream);
    return link ? link->encStreamNr() : -1;
}

TPtrList<TransLink> QvTask::links() const {
    TPtrList<TransLink> list;
    for (const auto& link : links_) list.append(link.get());
    return list;
}

void QvTask::debugOutLinks() const {
    for (const auto& link : links_)
        qv_dbg()->debug("  %s #%d of '%s' -> %s #%d", typeName(link->type()), link->decStreamNr(),
                        link->decoder()->name(), typeName(link->type()), link->encStreamNr());
}

// --- Processing parameters -------------------------------------------------------------------------

ProcessParams& QvTask::paramsOf(int type) { return params_[indexOfType(type)]; }

const ProcessParams& QvTask::processParams(int type) const {
    typeName(type);  // asserts what is no stream type
    return params_[indexOfType(type)];
}

int QvTask::setProcessParams(const ProcessParams& params, int typeMask) {
    for (int type : kTypes) {
        if (!qvStreamTypeMatches(type, typeMask)) continue;
        ProcessParams& own = paramsOf(type);
        if (params.get("inOutPoints").isVector()) own.set("inOutPoints", params.get("inOutPoints"));
        if (params.get("filters").isDict()) {
            QV_ASSERT_MSG(typeMask == type,
                          "QvTask.setProcessParams: cannot apply filters for ALL stream types");
            own.set("filters", params.get("filters"));
        }
        if (params.get("chapters").isVector()) {
            QV_ASSERT_MSG(type == qvVideoStream,
                          "QvTask.setProcessParams: cannot apply chapterPoints to non-video stream");
            own.set("chapters", params.get("chapters"));
        }
        if (params.get("audioChannelMap").isVector()) {
            QV_ASSERT_MSG(type == qvAudioStream,
                          "QvTask.setProcessParams: cannot apply channelMap to non-audio stream");
            own.set("audioChannelMap", params.get("audioChannelMap"));
        }
        if (const auto conversion = params.audioConversion()) {
            QV_ASSERT_MSG(type == qvAudioStream,
                          "QvTask.setProcessParams: cannot apply audioConversion to non-audio stream");
            own.setAudioConversion(*conversion);
        }
        if (params.holdLast() && type == qvVideoStream) own.setHoldLast(true);
        if (params.getInt32("smartRender", 0) != 0) own.set("smartRender", params.get("smartRender"));
    }
    return QvStatus::ok;
}

void QvTask::clearProcessParams(int typeMask) {
    for (int type : kTypes)
        if (qvStreamTypeMatches(type, typeMask)) paramsOf(type).clear();
}

namespace {

// What a stream's parameters give to the opening of its link.
struct OpenRow {
    const char* key;
    const char* openKey;
    bool (*given)(const Any&);
    int types;  // of streams
};

bool isVector(const Any& value) { return value.isVector(); }
bool isDict(const Any& value) { return value.isDict(); }
bool isMode(const Any& value) { return value.isInt32() && value.asInt32() != 0; }

constexpr int allButAudio = qvVideoStream | qvSubpicStream;
constexpr OpenRow openRows[] = {
    {"inOutPoints", "inOutPoints", isVector, qvAllStreams},
    {"smartRender", "smartRender", isMode, qvAllStreams},
    {"filters", "audioEffects", isDict, qvAudioStream},
    {"filters", "effects", isDict, allButAudio},
    {"qualityStats", "qualityStats", isVector, qvAllStreams},
    {"audioChannelMap", "connMatrix", isVector, qvAudioStream},
    {"audioConversion", "audioConversion", isDict, qvAudioStream},
    {"chapters", "chapters", isVector, qvVideoStream},
    {"holdLast", "holdLast", isMode, qvVideoStream},
};

}  // namespace

void QvTask::makeOpenParams(const QvTask& task, const TPtrList<TransLink>& links, AnyVector& out) {
    out.clear();
    for (const TransLink* link : links) {
        const AnyDict& own = link->processParams();
        const AnyDict& common = task.processParams(link->type());
        AnyDict params;
        for (const OpenRow& row : openRows) {
            if (!(row.types & link->type())) continue;
            const Any& value = row.given(own.get(row.key)) ? own.get(row.key) : common.get(row.key);
            if (row.given(value)) params.set(row.openKey, value);
        }
        out.append(params);
    }
}

// --- What is decided elsewhere ---------------------------------------------------------------------

Any QvTask::currentPostprocessCommand() const {
    return qvPostprocessCommand(postprocess_, decoders_, encoder_);
}

int QvTask::checkStreams() {
    const TaskFault fault = TaskCheck(encoder_, links()).streams();
    return fault.code == QvStatus::ok ? fault.code : setError(fault.code, "%s", fault.text.c_str());
}

int QvTask::checkLegal(AnyVector& messages) {
    return TaskCheck(encoder_, links()).legal(processParams(qvAudioStream), messages);
}

int QvTask::checkDurations() {
    std::vector<QvIStream> streams;
    for (const auto& link : links_) {
        streams.emplace_back(link->decoder(), link->type(), link->decStreamNr());
        const Any& own = link->processParams().get("inOutPoints");
        const Any& points = own.isVector() ? own : processParams(link->type()).get("inOutPoints");
        if (points.isVector()) streams.back().params.set("inOutPoints", points);
    }
    if (streams.empty()) return QvStatus::ok;
    QvIStreamList list;
    for (QvIStream& stream : streams) list.append(&stream);
    qvAdjustSegmentDurations(list);
    for (std::size_t i = 0; i < streams.size(); ++i) {
        TransLink& link = *links_[i];
        QV_ASSERT(streams[i].decoder == link.decoder() && streams[i].type == link.type() &&
                  streams[i].number == link.decStreamNr());
        const auto points = streams[i].params.inOutPoints();
        if (!points) continue;
        ProcessParams own;
        own.setInOutPoints(*points);
        link.setProcessParams(own);
    }
    return QvStatus::ok;
}

int QvTask::checkMultiPass(TPtrList<TransLink>* list) const {
    return TaskCheck(encoder_, links()).multiPass(list);
}

int QvTask::checkSmartRender(AnyDict* dict) const { return TaskCheck(encoder_, links()).smartRender(dict); }

void QvTask::store(AnyDict& dict, int) const { qvtaskstore::store(*this, dict); }

int QvTask::restore(const AnyDict& state, QvDPipeList& decoders, QvEncodePipe** encoderOut, int,
                    QvFileOpenCb* callback) {
    unlink();
    if (!qvtaskstore::isTask(state)) {
        setError(QvStatus::invalidStructure, "Task.restore: Invalid task state structure");
        QV_FAIL(errorDesc());
    }
    const TaskFault fault = qvtaskstore::restore(*this, state, decoders, encoderOut, callback);
    if (!fault.text.empty()) setError(fault.code, "%s", fault.text.c_str());
    return fault.code;
}

QvTask* QvTask::fromState(const AnyDict& state, QvDPipeList& decoders, QvEncodePipe** encoderOut, int options,
                          QvFileOpenCb* callback, Any* error) {
    auto task = std::make_unique<QvTask>();
    QvEncodePipe* pipe = nullptr;
    int result = QvStatus::ok;
    try {
        result = task->restore(state, decoders, &pipe, options, callback);
    } catch (const QvException&) {
        if (error && *task->errorDesc()) *error = Any(task->errorDesc());
        throw;
    }
    if (result == QvStatus::ok || result == QvStatus::warning) {
        if (encoderOut) *encoderOut = pipe;
        return task.release();
    }
    if (error) *error = Any(task->errorDesc());
    task.reset();
    delete pipe;
    decoders.deleteAll();
    return nullptr;
}

QvTask* QvTask::fromStateWithSource(const AnyDict& state, QvDecodePipe* decoder, int typeMask) {
    return qvtaskstore::fromTemplate(state, decoder, typeMask).release();
}
