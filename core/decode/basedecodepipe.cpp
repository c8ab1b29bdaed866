#include "core/decode/basedecodepipe.h"

#include <cstring>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"

namespace {

constexpr QvParamRow<BaseDecodePipe> rows[] = {
    {.name = "filename", .flags = qvParamByHand, .help = "the file", .type = Any::String},
};

}  // namespace

DPipeStream::~DPipeStream() = default;

int DPipeStream::select() {
    selected = true;
    return QvStatus::ok;
}

int DPipeStream::deselect() {
    selected = false;
    return QvStatus::ok;
}

DPipeVideoStream::DPipeVideoStream() : DPipeStream(qvVideoStream) {}
DPipeVideoStream::~DPipeVideoStream() = default;

DPipeAudioStream::DPipeAudioStream() : DPipeStream(qvAudioStream) {}
DPipeAudioStream::~DPipeAudioStream() = default;

BaseDecodePipe::BaseDecodePipe(const QvModule* module) : QvDecodePipe(module) {}

BaseDecodePipe::~BaseDecodePipe() = default;

int BaseDecodePipe::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "filename") != 0) return QvDecodePipe::setParam(name, value);
    _traceParam(name, value);
    filename_ = value;
    return QvStatus::ok;
}

void BaseDecodePipe::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "filename") == 0)
        value = filename_;
    else if (!qvGetParamRow<BaseDecodePipe>(rows, *this, name, value))
        QvDecodePipe::getParam(name, value);
}

int BaseDecodePipe::close() {
    if (getState() != stateOpen) return QvStatus::ok;
    streams_.clear();
    return QvDecodePipe::close();
}

// --- Streams.

DPipeStream* BaseDecodePipe::findStream(int type, int nr) const {
    for (const auto& stream : streams_)
        if (stream->type == type && nr-- == 0) return stream.get();
    return nullptr;
}

DPipeStream& BaseDecodePipe::requireStream(int type, int nr) const {
    DPipeStream* stream = findStream(type, nr);
    QV_ASSERT_MSG(stream, "DecodePipe: invalid stream");
    return *stream;
}

int BaseDecodePipe::nrStreams(int type) const {
    int count = 0;
    for (const auto& stream : streams_)
        if (qvStreamTypeMatches(stream->type, type)) ++count;
    return count;
}

void BaseDecodePipe::getStreamParam(int type, int stream, const char* name, Any& value) const {
    const AnyDict& params = requireStream(type, stream).params;
    if (params.isSet(name)) value = params.get(name);
}

void BaseDecodePipe::getStreamParams(int type, int stream, AnyDict& params) const {
    params = requireStream(type, stream).params;
}

int BaseDecodePipe::select(int type, int nr) {
    DPipeStream* stream = findStream(type, nr);
    if (!stream) {
        setError(QvStatus::failed, "DecodePipe: invalid stream");
        QV_FAIL(errorDesc());
    }
    if (stream->selected) return QvStatus::ok;
    const int result = stream->select();
    if (result == QvStatus::ok) stream->selected = true;
    return result;
}

int BaseDecodePipe::deselect(int type, int nr) {
    DPipeStream* stream = findStream(type, nr);
    if (!stream) {
        setError(QvStatus::failed, "DecodePipe: invalid stream");
        QV_FAIL(errorDesc());
    }
    if (!stream->selected) return QvStatus::ok;
    const int result = stream->deselect();
    if (result == QvStatus::ok) stream->selected = false;
    return result;
}

int BaseDecodePipe::selected(AnyDict& dict) const {
    for (const int type : {qvVideoStream, qvAudioStream}) {
        AnyVector numbers;
        for (int i = 0; i < nrStreams(type); ++i) numbers.append(Any(i));
        dict.set(type == qvVideoStream ? "video" : "audio", numbers);
    }
    return QvStatus::ok;
}

bool BaseDecodePipe::isSelected(int type, int nr) const {
    const DPipeStream* stream = findStream(type, nr);
    return stream && stream->selected;
}

// --- Lengths.

namespace {

[[noreturn]] void failNotANumber() { QV_FAIL_PLAIN(); }

}  // namespace

int BaseDecodePipe::nrFrames(int stream) const {
    auto& self = const_cast<BaseDecodePipe&>(*this);
    if (getState() != stateOpen) {
        self.setError(QvStatus::illegalState, "%s: illegal state", "nrFrames");
        QV_FAIL(errorDesc());
    }
    const DPipeStream* found = findStream(qvVideoStream, stream);
    if (!found) {
        self.setError(QvStatus::failed, "invalid video stream number %d", stream);
        QV_FAIL(errorDesc());
    }
    const Any& frames = found->params["frames"];
    if (!frames.isInt()) failNotANumber();
    return frames.toInt32();
}

long long BaseDecodePipe::nrSamples(int stream) const {
    auto& self = const_cast<BaseDecodePipe&>(*this);
    if (getState() != stateOpen) {
        self.setError(QvStatus::illegalState, "%s: illegal state", "nrSamples");
        QV_FAIL(errorDesc());
    }
    const DPipeStream* found = findStream(qvAudioStream, stream);
    if (!found) {
        self.setError(QvStatus::failed, "invalid audio stream #%d", stream);
        QV_FAIL(errorDesc());
    }
    const Any& samples = found->params["samples"];
    if (!samples.isInt()) failNotANumber();
    return samples.toInt64();
}

// --- What a subclass replaces.

int BaseDecodePipe::seekToSample(long long, int) { QV_FAIL_PLAIN(); }

int BaseDecodePipe::seekToFrame(long long, int) { QV_FAIL_PLAIN(); }

int BaseDecodePipe::readFrame(int) { QV_FAIL_PLAIN(); }

int BaseDecodePipe::readSamples(int, int) { QV_FAIL_PLAIN(); }

QvFrame* BaseDecodePipe::getFramePtr(int) { QV_FAIL_PLAIN(); }

QvPcm* BaseDecodePipe::getAudioPtr(int) { QV_FAIL_PLAIN(); }

// --- Checks of a subclass.

int BaseDecodePipe::checkState(int state, const char* method) const {
    if (getState() == state) return QvStatus::ok;
    auto& self = const_cast<BaseDecodePipe&>(*this);
    self.setError(QvStatus::illegalState, "Invalid state %d in %s call", state, method ? method : "method");
    QV_FAIL(errorDesc());
}

int BaseDecodePipe::checkStream(int type, int stream, const char* method) const {
    const char* kind = nullptr;
    switch (type) {
        case qvVideoStream: kind = "video"; break;
        case qvAudioStream: kind = "audio"; break;
        case qvSubpicStream: kind = "subpic"; break;
        default: QV_FAIL_PLAIN();
    }
    if (stream >= 0 && stream < nrStreams(type)) return QvStatus::ok;
    auto& self = const_cast<BaseDecodePipe&>(*this);
    self.setError(QvStatus::invalidStructure, "Invalid stream %s#%d in %s call", kind, stream,
                  method ? method : "method");
    QV_FAIL(errorDesc());
}
