#include "core/transcode/task/taskstore_p.h"

#include <algorithm>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/transcode/link/translink.h"

namespace qvtaskstore {

namespace {

const char* printable(const Any& text, Any& holder) {
    holder = text.isWString() ? text.toString() : text;
    return holder.isString() ? holder.asString() : "";
}

// A decoder that joins others can't be opened from a file: their own entries stand in its place.
void appendFiles(const QvDecodePipe& decoder, AnyVector& files) {
    if (const Any joined = decoder.QvCodec::getParam("segmentFiles"); joined.isVector()) {
        files.extend(joined.asVector());
        return;
    }
    AnyDict file, own;
    file.set("filename", decoder.QvCodec::getParam("filename"));
    decoder.store(own);
    file.set("decoder", own);
    files.append(file);
}

// One for each segment of what is linked.
AnyVector storedSources(const TransLink& link) {
    if (link.decoder()->QvCodec::getParam("segmentSources").isVector()) {
        Any joined = Pair(link.type(), link.decStreamNr());
        link.decoder()->getParam("segmentSources", joined);
        return joined.asVector();
    }
    AnyDict source;
    source.set("file", link.decoder()->QvCodec::getParam("filename"));
    source.set("stream", Any(Pair(link.type(), link.decStreamNr())));
    source.set("process", static_cast<const AnyDict&>(link.processParams()));
    AnyVector sources;
    sources.append(source);
    return sources;
}

// The processing parameters of source 0 of the number-th stored stream of a type.
AnyDict storedProcessParams(const AnyVector& streams, int type, int number) {
    for (int i = 0; i < streams.size(); ++i) {
        if (!streams.at(i).isDict() || streams.at(i).asDict().getInt32("type", 0) != type) continue;
        if (number-- > 0) continue;
        const AnyVector sources = streams.at(i).asDict().getVector("sources");
        if (!sources.at(0).isDict()) break;
        return sources.at(0).asDict().getDict("process");
    }
    return AnyDict();
}

void removeSurplusStreams(QvEncodePipe& pipe, int type, int wanted) {
    while (pipe.nrStreams(type) > wanted) pipe.removeStream(type, pipe.nrStreams(type) - 1);
}

int openInputs(const AnyVector& files, QvDPipeList& opened, QvFileOpenCb* callback) {
    const int before = opened.size();
    for (int i = 0; i < files.size(); ++i) {
        if (!files.at(i).isDict()) continue;
        const AnyDict& file = files.at(i).asDict();
        Any name;
        if (std::unique_ptr<QvDecodePipe> decoder{openInput(file, callback)}) {
            opened.append(decoder.get());
            static_cast<void>(decoder.release());
        } else
            qv_dbg()->warning("Task.restore: failed to open %s", printable(file.get("filename"), name));
    }
    return opened.size() - before;
}

// While it is armed the task's output can still go with a failure, so nothing may point to it then.
class ForgetEncoder {
  public:
    explicit ForgetEncoder(QvTask& task) : task_(task) {}
    ForgetEncoder(const ForgetEncoder&) = delete;
    ForgetEncoder& operator=(const ForgetEncoder&) = delete;
    ~ForgetEncoder() {
        if (!armed_) return;
        task_.setEncoder(nullptr);
        task_.unlink();
    }
    void disarm() { armed_ = false; }

  private:
    QvTask& task_;
    bool armed_ = true;
};

TaskFault damaged(const char* text) { return {QvStatus::invalidStructure, text}; }

TaskFault linkStoredStream(QvTask& task, const AnyDict& entry, int index, const QvDPipeList& decoders) {
    QvEncodePipe& pipe = *task.encoder();
    QvOStream* stream = pipe.streamAt(index);
    const int number = pipe.streamNr(stream);
    QV_ASSERT(entry.empty() || entry.getInt32("type", 0) == stream->type);
    const AnyVector sources = entry.getVector("sources");
    if (sources.empty() || !sources.at(0).isDict()) {
        qv_dbg()->warning("QvTask::restore: No source(s) defined for stream %d", index);
        return {};
    }
    const AnyDict& source = sources.at(0).asDict();
    QV_ASSERT(source.get("file").isText() && source.get("stream").isPair());
    const Pair address = source.get("stream").asPair();
    QV_ASSERT(address.first == stream->type);
    QvDecodePipe* decoder = decoders.findByFilename(source.get("file"), nullptr);
    while (decoder && task.linkedTo(decoder, address.first, address.second) >= 0)
        decoder = decoders.findByFilename(source.get("file"), decoder);
    QV_ASSERT_MSG(decoder, "no available decoders, decoder must be cloned...");
    // A decoder would only assert it, without the name of the file.
    if (address.second < 0 || address.second >= decoder->nrStreams(address.first)) {
        Any name;
        return {QvStatus::failed, std::string(printable(source.get("file"), name)) + " has no " +
                                      QvTask::typeName(address.first) + " stream " +
                                      std::to_string(address.second)};
    }
    if (!decoder->isSelected(address.first, address.second)) decoder->select(address.first, address.second);
    ProcessParams params;
    params.update(source.getDict("process"));
    const int result = task.link(decoder, address.first, address.second, number, params);
    return {std::min(result, 0), ""};
}

}  // namespace

QvDecodePipe* openInput(const AnyDict& file, QvFileOpenCb* callback) {
    const AnyDict settings = file.getDict("decoder");
    if (!settings.get("name").isString())
        return QvDecFactory::decodePipe(file.get("filename"), Any(), callback, nullptr);
    try {
        return QvDecFactory::restoreDecoder(file.get("filename"), settings, callback);
    } catch (const QvMemoryFailure&) {
        throw;
    } catch (const QvAssertFailure&) {
        return nullptr;
    }
}

void store(const QvTask& task, AnyDict& dict) {
    dict.clear();
    dict.set("__version__", "2.0");
    dict.set("__class__", "TranscodeTask");
    const QvDPipeList& decoders = task.decoders();
    AnyVector files;
    for (const QvDecodePipe* const decoder : decoders) appendFiles(*decoder, files);
    dict.set("files", files);
    if (task.postprocessCommand().isValid()) dict.set("postProcess", task.postprocessCommand());
    QvEncodePipe* pipe = task.encoder();
    if (!pipe) return;
    AnyDict encoder;
    pipe->store(encoder);
    dict.set("encoder", encoder);
    dict.set("filename", pipe->getFilename());
    AnyVector streams;
    for (int i = 0; i < pipe->nrStreams(); ++i) {
        QvOStream* stream = pipe->streamAt(i);
        const int number = pipe->streamNr(stream);
        AnyDict entry;
        entry.set("type", stream->type);
        if (const TransLink* link = task.getLinkForOutput(stream->type, number)) {
            QV_ASSERT(link->encStreamNr() == number);
            entry.set("sources", storedSources(*link));
        }
        streams.append(entry);
    }
    dict.set("streams", streams);
}

bool isTask(const AnyDict& state) {
    return state.get("__version__").isString() && state.get("__class__") == "TranscodeTask";
}

TaskFault restore(QvTask& task, const AnyDict& state, QvDPipeList& decoders, QvEncodePipe** encoderOut,
                  QvFileOpenCb* callback) {
    const Any& settings = state.get("encoder");
    const AnyVector streams = state.getVector("streams");
    const char* noStreams = "Task.restore: Invalid task state structure - no output streams";
    if (streams.empty()) return damaged(noStreams);
    if (!settings.isDict() || settings.asDict().empty()) {
        QvUtil::debugOutDict(state);
        return damaged("Task.restore: Invalid task state structure - missing encoder settings");
    }
    if (settings.asDict().getVector("streams").empty()) return damaged(noStreams);
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    QV_ASSERT_MSG(pipe, "Task.restore: could not create EncodePipe");
    if (const int result = pipe->restore(settings.asDict()); result != QvStatus::ok)
        return {result, std::string("Task.restore: ") + pipe->errorDesc()};
    if (state.get("filename").isText()) pipe->setFilename(state.get("filename"));
    const AnyVector& files = state.getVector("files");
    if (files.empty())
        return damaged("Task.restore: invalid task state structure - no input file(s) specified");
    if (openInputs(files, decoders, callback) == 0)
        return {QvStatus::cannotParse, "Task.restore: no input file(s) successfully opened"};
    task.setEncoder(pipe.get());
    ForgetEncoder forget(task);
    for (int i = 0; i < pipe->nrStreams(); ++i) {
        const AnyDict entry = streams.at(i).isDict() ? streams.at(i).asDict() : AnyDict();
        if (TaskFault fault = linkStoredStream(task, entry, i, decoders); fault.code < 0) return fault;
    }
    task.setPostprocessCommand(state.get("postProcess"));
    forget.disarm();
    QvEncodePipe* made = pipe.release();
    if (encoderOut) *encoderOut = made;
    return {};
}

std::unique_ptr<QvTask> fromTemplate(const AnyDict& state, QvDecodePipe* decoder, int typeMask) {
    QV_ASSERT(decoder);
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    QV_ASSERT_MSG(pipe, "Task.restore: could not create EncodePipe");
    if (pipe->restore(state.getDict("encoder")) != QvStatus::ok) return nullptr;
    for (int type : {qvVideoStream, qvAudioStream})
        removeSurplusStreams(*pipe, type, decoder->nrStreams(type));
    auto task = std::make_unique<QvTask>();
    task->setEncoder(pipe.get());
    const AnyVector streams = state.getVector("streams");
    for (int type : {qvVideoStream, qvAudioStream, qvSubpicStream}) {
        const int given = decoder->nrStreams(type), wanted = pipe->nrStreams(type);
        if (qvStreamTypeMatches(type, typeMask) && wanted > 0 && given == 0) {
            qv_log()->error("Can not create task, input file does not contain enough streams");
            return nullptr;
        }
        if (given > wanted)
            qv_dbg()->warning(
                "[Task] fromStateWithSource - input contains more streams than required by output.");
        for (int k = 0; k < std::min(given, wanted); ++k) {
            decoder->select(type, k);
            if (task->link(decoder, type, k, k) < 0) return nullptr;
            const AnyDict params = storedProcessParams(streams, type, k);
            ProcessParams own;
            if (params.get("filters").isDict()) own.set("filters", params.get("filters"));
            TransLink* const link = task->getLinkForOutput(type, k);
            if (!link) continue;  // a subpicture
            link->setProcessParams(own);
            link->setSmartRender(params.getInt32("smartRender", 0));
        }
        removeSurplusStreams(*pipe, type, std::min(given, wanted));
    }
    task->setPostprocessCommand(state.get("postProcess"));
    pipe.release();
    return task;
}

}  // namespace qvtaskstore
