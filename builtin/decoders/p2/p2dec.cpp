#include "builtin/decoders/p2/p2dec.h"

#include <cstring>

#include "builtin/creators.h"
#include "builtin/shared/inputnesting.h"
#include "core/decode/decodefactory.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr QvParamRow<P2Dec::Settings> rows[] = {
    {.name = "joinSpans",
     .member = &P2Dec::Settings::joinSpans,
     .help = "1: all parts of a take that lies on several cards, 0: the one that is named"},
    {.name = "openParameters",
     .flags = qvParamByHand,
     .help = "with which the picture and the sounds are opened",
     .type = Any::Dict},
    {.name = "filename",
     .flags = qvParamByHand,
     .help = "the document of the clip, or a folder with one",
     .type = Any::String},
    {.name = "foreign",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "1: what did not open is no document of a clip",
     .type = Any::Int32},
    {.name = "clipName",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "the name of its files",
     .type = Any::String},
    {.name = "userClipName",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "given by its user",
     .type = Any::String},
    {.name = "startTimecode",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "of its first frame",
     .type = Any::String},
    {.name = "meta",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "the clip's names and timecode",
     .type = Any::Dict},
    {.name = "inputFiles",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "all files of the clip",
     .type = Any::Vector},
    {.name = "filesize",
     .flags = qvParamReadOnly | qvParamByHand,
     .unit = "bytes",
     .help = "picture and sounds together",
     .type = Any::Int64},
};
static_assert(qvParamTableOk<P2Dec::Settings>(rows));

std::string textOf(const Any& value) { return value.toString().asString(""); }

}  // namespace

P2Dec::P2Dec(const QvModule* module) : QvDecodePipe(module) {}

P2Dec::~P2Dec() = default;

int P2Dec::setParam(const char* name, const Any& value) {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    std::string fault;
    if (const auto result = source_.set(name, value, fault)) {
        _traceParam(name, value);
        return fault.empty() ? *result : setError(*result, "%s", fault.c_str());
    }
    if (is("settings")) {  // of a stored state
        if (!value.isDict()) return QvStatus::invalidParam;
        for (const char* key : {"joinSpans", "openParameters"})
            if (value.asDict().isSet(key)) setParam(key, value.asDict().get(key));
        return QvStatus::ok;
    }
    if (auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return QvDecodePipe::setParam(name, value);
}

void P2Dec::fillMeta(AnyDict& meta) const {
    if (take_.empty()) return;
    const P2Clip& first = take_.front();
    meta.set("clipName", first.name.c_str());
    meta.set("title", (first.userName.empty() ? first.name : first.userName).c_str());
    if (!first.userName.empty()) meta.set("userClipName", first.userName.c_str());
    if (first.startTimecode.empty()) return;
    for (const char* key : {"startTimecode", "timecode"}) meta.set(key, first.startTimecode.c_str());
}

void P2Dec::getParam(const char* name, Any& value) const {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    if (source_.get(name, value)) return;
    if (is("foreign")) {
        value = foreign_ ? 1 : 0;
    } else if (is("clipName") || is("userClipName") || is("startTimecode") || is("meta")) {
        AnyDict meta;
        fillMeta(meta);
        value = is("meta") ? Any(meta) : meta.get(name);
    } else if (is("inputFiles")) {
        value = AnyVector();
        for (const P2Clip& part : take_) {
            for (const Any* file : {&part.document, &part.picture}) value.asVector().append(*file);
            for (const Any& sound : part.sounds) value.asVector().append(sound);
        }
    } else if (is("filesize")) {
        long long bytes = 0;
        for (const auto& stream : streams_) bytes += stream->bytes();
        value.invalidate();
        if (!streams_.empty()) value = Any(bytes);
    } else if (is("store")) {
        AnyDict settings("joinSpans", settings_.joinSpans ? 1 : 0);
        if (!source_.openParams.empty()) settings.set("openParameters", source_.openParams);
        value = AnyDict("settings", settings);
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value)) {
        QvDecodePipe::getParam(name, value);
    }
}

// --- Opening.

int P2Dec::refuse(const P2Fault& fault) {
    streams_.clear();
    take_.clear();
    foreign_ = fault.foreign;
    if (!fault.foreign) InputNesting::noteFailure(fault.text);
    return setError(QvStatus::failed, "%s", fault.text.c_str());
}

int P2Dec::open() {
    if (getState() == stateOpen) close();
    foreign_ = false;
    if (!source_.filename.isValid()) return refuse({"open: open parameters not defined"});
    const InputNesting nesting(source_.filename);
    if (!nesting.fault().empty()) return refuse({nesting.fault()});
    Any document;
    if (const P2Fault fault = p2FindDocument(source_.filename, document); !fault.empty())
        return refuse(fault);
    if (const P2Fault fault = p2ReadTake(document, settings_.joinSpans, take_); !fault.empty())
        return refuse(fault);
    if (const std::string fault = openStreams(); !fault.empty()) return refuse({fault});
    source_.filename = document;
    return QvDecodePipe::open();
}

std::string P2Dec::openEssence(const Any& file, const P2Length& said, P2Stream& stream) const {
    const std::string name = "'" + textOf(file) + "': ";
    if (qv_registry()->decoders("mxf").empty())
        return name + "there is no decoder for MXF files here; a plug-in has to bring one";
    std::string reason;
    const Any params = source_.openParams;
    auto decoder = InputNesting::open(
        file,
        [&](QvFileOpenCb* callback) {
            return QvDecFactory::decodePipe(file, Any(), callback,
                                            source_.openParams.empty() ? nullptr : &params);
        },
        reason);
    if (!decoder) return name + (reason.empty() ? "it can't be opened" : reason);
    const std::string fault = stream.append(std::move(decoder), said);
    return fault.empty() ? fault : name + fault;
}

std::string P2Dec::openStreams() {
    streams_.clear();
    const std::size_t sounds = take_.front().sounds.size();
    streams_.push_back(std::make_unique<P2Stream>(qvVideoStream));
    for (std::size_t i = 0; i < sounds; ++i) streams_.push_back(std::make_unique<P2Stream>(qvAudioStream));
    for (const P2Clip& part : take_) {
        if (part.sounds.size() != sounds)
            return "the part '" + part.name + "' has " + std::to_string(part.sounds.size()) +
                   " sounds, not " + std::to_string(sounds) + " as of the part before it";
        if (const std::string fault = openEssence(part.picture, part.length, *streams_.front());
            !fault.empty())
            return fault;
        for (std::size_t i = 0; i < sounds; ++i)
            if (const std::string fault = openEssence(part.sounds[i], part.length, *streams_[i + 1]);
                !fault.empty())
                return fault;
    }
    AnyDict meta;
    fillMeta(meta);
    for (const auto& stream : streams_) {
        if (stream->type() == qvAudioStream) stream->alignTo(*streams_.front());
        stream->describe();
    }
    streams_.front()->params().update(meta);
    return "";
}

int P2Dec::close() {
    streams_.clear();
    take_.clear();
    return getState() == stateOpen ? QvDecodePipe::close() : QvStatus::ok;
}

// --- Streams.

P2Stream* P2Dec::find(int type, int stream) const {
    if (getState() != stateOpen || stream < 0) return nullptr;
    const std::size_t index = static_cast<std::size_t>(stream) + (type == qvAudioStream ? 1 : 0);
    if ((type == qvVideoStream && stream > 0) || (type != qvVideoStream && type != qvAudioStream))
        return nullptr;
    return index < streams_.size() ? streams_[index].get() : nullptr;
}

int P2Dec::nrStreams(int type) const {
    if (getState() != stateOpen) return 0;
    int count = 0;
    for (const auto& stream : streams_) count += qvStreamTypeMatches(stream->type(), type);
    return count;
}

void P2Dec::getStreamParam(int type, int stream, const char* name, Any& value) const {
    const P2Stream* found = find(type, stream);
    value.invalidate();
    if (found) value = found->params().get(name);
}

void P2Dec::getStreamParams(int type, int stream, AnyDict& params) const {
    params.clear();
    if (const P2Stream* found = find(type, stream)) params = found->params();
}

int P2Dec::noStream(const char* operation) {
    return setError(QvStatus::invalidStructure, "%s: there is no such stream", operation);
}

int P2Dec::noted(int result, const P2Stream& stream) {
    if (result < 0 && result != QvStatus::endOfStream) setError(result, "%s", stream.failure().c_str());
    return result;
}

int P2Dec::seekToSample(long long sample, int stream) {
    P2Stream* found = find(qvAudioStream, stream);
    return found ? noted(found->seek(sample), *found) : noStream("seekToSample");
}

int P2Dec::seekToFrame(long long frame, int stream) {
    P2Stream* found = find(qvVideoStream, stream);
    return found ? noted(found->seek(frame), *found) : noStream("seekToFrame");
}

int P2Dec::readFrame(int stream) {
    P2Stream* found = find(qvVideoStream, stream);
    return found ? noted(found->readFrame(), *found) : noStream("readFrame");
}

int P2Dec::readSamples(int count, int stream) {
    P2Stream* found = find(qvAudioStream, stream);
    return found ? noted(found->readSamples(count), *found) : noStream("readSamples");
}

int P2Dec::nrFrames(int stream) const {
    const P2Stream* found = find(qvVideoStream, stream);
    return found ? found->params().getInt32("frames") : 0;
}

long long P2Dec::nrSamples(int stream) const {
    const P2Stream* found = find(qvAudioStream, stream);
    return found ? found->length() : 0;
}

QvFrame* P2Dec::getFramePtr(int stream) {
    P2Stream* found = find(qvVideoStream, stream);
    return found ? found->frame() : nullptr;
}

QvPcm* P2Dec::getAudioPtr(int stream) {
    P2Stream* found = find(qvAudioStream, stream);
    return found ? found->pcm() : nullptr;
}

int P2Dec::select(int type, int stream) {
    P2Stream* found = find(type, stream);
    return found ? noted(found->select(), *found) : noStream("select");
}

int P2Dec::deselect(int type, int stream) {
    P2Stream* found = find(type, stream);
    return found ? found->deselect() : noStream("deselect");
}

int P2Dec::selected(AnyDict& dict) const {
    AnyVector video, audio;
    for (int i = 0; i < nrVideoStreams(); ++i)
        if (isSelected(qvVideoStream, i)) video.append(Any(i));
    for (int i = 0; i < nrAudioStreams(); ++i)
        if (isSelected(qvAudioStream, i)) audio.append(Any(i));
    dict.set("video", video);
    dict.set("audio", audio);
    return QvStatus::ok;
}

bool P2Dec::isSelected(int type, int stream) const {
    const P2Stream* found = find(type, stream);
    return found && found->selected();
}

QvCodec* newP2dec() { return new P2Dec; }
