#include "builtin/decoders/testgenerator.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"

namespace {

constexpr QvParamRow<GeneratorPipe> rows[] = {
    {.name = "streams",
     .flags = qvParamByHand | qvParamWriteOnly,
     .help = "lists vids and auds with a dictionary for each stream, see qvtestgenerator.h",
     .type = Any::Dict},
    {.name = "mode",
     .flags = qvParamByHand | qvParamWriteOnly,
     .help = "graybar: a still picture of gray bars",
     .type = Any::String},
};
static_assert(qvParamTableOk<GeneratorPipe>(rows));

bool is(const char* name, const char* other) { return std::strcmp(name, other) == 0; }

int frameNumber(long long frame) {
    constexpr long long most = std::numeric_limits<int>::max();
    return static_cast<int>(std::clamp(frame, -most, most));
}

// A stream that can't be made of what is asked for is left out; one that only lacks the memory must not be.
bool isUsable(int result) {
    if (result == QvStatus::outOfMemory) throw std::bad_alloc();
    return result == QvStatus::ok;
}

}  // namespace

GeneratorPipe::~GeneratorPipe() { GeneratorPipe::close(); }

// --- Parameters.

int GeneratorPipe::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() >= stateInitialised, "testgen: not initialized");
    _traceParam(name, value);
    if (is(name, "filename")) return QvStatus::ok;
    if (is(name, "mode")) {
        mode_ = value;
        return QvStatus::ok;
    }
    if (is(name, "streams") && value.isDict()) {
        streams_ = value.asDict();
        return QvStatus::ok;
    }
    return QvDecodePipe::setParam(name, value);
}

void GeneratorPipe::getParam(const char* name, Any& value) const {
    if (is(name, "filename"))
        value = "generated_sequence";
    else if (is(name, "store"))
        value = AnyDict("streams", Any(streams_));
    else if (is(name, "isMeta"))
        value = 1;
    else if (!qvGetParamRow<GeneratorPipe>(rows, *this, name, value))
        QvDecodePipe::getParam(name, value);
}

int GeneratorPipe::restore(const AnyDict& state) {
    if (const int result = QvDecodePipe::restore(state); result != QvStatus::ok) return result;
    return state["streams"].isDict() ? setParam("streams", state["streams"]) : QvStatus::ok;
}

// --- Opening.

int GeneratorPipe::open() {
    if (getState() == stateOpen) close();
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Codec not inited");
    if (streams_.getVector("vids").empty() && streams_.getVector("auds").empty())
        return setError(QvStatus::invalidStructure, "Invalid initialization data - no streams defined");
    try {
        makeStreams();
    } catch (...) {
        dropStreams();
        throw;
    }
    return QvDecodePipe::open();
}

void GeneratorPipe::makeStreams() {
    for (const Any& element : streams_.getVector("vids")) {
        if (!element.isDict()) continue;
        AnyDict dict = element.asDict();
        dict.set("mode", mode_);
        auto stream = std::make_unique<VideoGenerator>();
        if (isUsable(stream->init(dict))) videos_.push_back(std::move(stream));
    }
    for (const Any& element : streams_.getVector("auds")) {
        if (!element.isDict()) continue;
        auto stream = std::make_unique<AudioGenerator>();
        if (isUsable(stream->init(element.asDict()))) audios_.push_back(std::move(stream));
    }
}

void GeneratorPipe::dropStreams() {
    for (auto& stream : videos_) stream->close();
    for (auto& stream : audios_) stream->close();
    videos_.clear();
    audios_.clear();
}

int GeneratorPipe::close() {
    if (getState() != stateOpen) return QvStatus::ok;
    dropStreams();
    return QvDecodePipe::close();
}

// --- Streams.

GeneratorStream* GeneratorPipe::find(int type, int stream) const {
    if (stream < 0 || stream >= nrStreams(type)) return nullptr;
    const auto at = static_cast<std::size_t>(stream);
    if (type == qvVideoStream) return videos_[at].get();
    return audios_[at].get();
}

int GeneratorPipe::nrStreams(int type) const {
    if (type == qvVideoStream) return static_cast<int>(videos_.size());
    if (type == qvAudioStream) return static_cast<int>(audios_.size());
    return 0;
}

void GeneratorPipe::getStreamParam(int type, int stream, const char* name, Any& value) const {
    const GeneratorStream* found = find(type, stream);
    if (found && found->params.isSet(name)) value = found->params.get(name);
}

void GeneratorPipe::getStreamParams(int type, int stream, AnyDict& params) const {
    if (const GeneratorStream* found = find(type, stream)) params = found->params;
}

int GeneratorPipe::select(int type, int stream) {
    GeneratorStream* found = find(type, stream);
    if (!found) return QvStatus::failed;
    found->selected = true;
    return QvStatus::ok;
}

int GeneratorPipe::deselect(int type, int stream) {
    GeneratorStream* found = find(type, stream);
    if (!found) return QvStatus::failed;
    found->selected = false;
    return QvStatus::ok;
}

int GeneratorPipe::selected(AnyDict& dict) const {
    for (const int type : {qvVideoStream, qvAudioStream}) {
        AnyVector numbers;
        for (int i = 0; i < nrStreams(type); ++i)
            if (isSelected(type, i)) numbers.append(Any(i));
        dict.set(type == qvVideoStream ? "video" : "audio", numbers);
    }
    return QvStatus::ok;
}

bool GeneratorPipe::isSelected(int type, int stream) const {
    const GeneratorStream* found = find(type, stream);
    return found && found->selected;
}

// --- Reading.

void GeneratorPipe::refuse(const char* problem, const char* operation) const {
    auto& self = const_cast<GeneratorPipe&>(*this);
    self.setError(QvStatus::failed, "%s.%s: %s", name(), operation, problem);
    QV_FAIL(errorDesc());
}

VideoGenerator& GeneratorPipe::video(int stream, const char* operation) const {
    if (getState() != stateOpen) refuse("stream not opened", operation);
    if (!find(qvVideoStream, stream)) refuse("invalid video stream #", operation);
    return *videos_[static_cast<std::size_t>(stream)];
}

AudioGenerator& GeneratorPipe::audio(int stream, const char* operation) const {
    if (getState() != stateOpen) refuse("stream not opened", operation);
    if (!find(qvAudioStream, stream)) refuse("invalid video stream #", operation);
    return *audios_[static_cast<std::size_t>(stream)];
}

int GeneratorPipe::readFrame(int stream) { return video(stream, "readFrame").readFrame(); }

int GeneratorPipe::readSamples(int count, int stream) {
    return audio(stream, "readSamples").readSamples(count);
}

int GeneratorPipe::seekToFrame(long long frame, int stream) {
    if (getState() != stateOpen) return setError(QvStatus::failed, "stream not opened");
    video(stream, "seekToFrame").seekToFrame(frameNumber(frame));
    return QvStatus::ok;
}

int GeneratorPipe::seekToSample(long long sample, int stream) {
    return audio(stream, "seekToSample").seekToSample(sample);
}

int GeneratorPipe::nrFrames(int stream) const { return video(stream, "nrFrames").frames(); }

long long GeneratorPipe::nrSamples(int stream) const { return audio(stream, "nrSamples").samples(); }

QvFrame* GeneratorPipe::getFramePtr(int stream) { return video(stream, "getFramePtr").head(); }

QvPcm* GeneratorPipe::getAudioPtr(int stream) { return audio(stream, "getAudioPtr").output(); }

// --- Overrides.

AnyVector GeneratorPipe::overridableParams(int type, int) {
    return type == qvVideoStream ? AnyVector("framerate", "frameAspect", "duration") : AnyVector();
}

int GeneratorPipe::setOverride(int type, int stream, const char* name, const Any& value) {
    if (const int result = QvDecodePipe::setOverride(type, stream, name, value); result != QvStatus::ok)
        return result;
    const Any wanted = override(type, stream, name);
    if (!wanted.isValid()) return QvStatus::failed;
    if (is(name, "duration")) return overrideDuration(wanted);
    return type == qvVideoStream ? overrideVideo(stream, name, wanted) : QvStatus::ok;
}

int GeneratorPipe::overrideVideo(int stream, const char* name, const Any& value) {
    VideoGenerator& generator = video(stream, "setOverride");
    if (is(name, "frameAspect")) {
        if (!value.isFloat() || !(value.asDouble() > 0)) return QvStatus::failed;
        generator.setFrameAspect(value.asDouble());
        return QvStatus::ok;
    }
    if (!is(name, "framerate")) return QvStatus::ok;
    const QvFramerate rate = value.isFramerate() ? value.asFramerate()
                             : value.isFloat()   ? QvFramerate(value.asDouble())
                                                 : QvFramerate(0.0);
    if (!(double(rate.rate()) > 0)) return QvStatus::failed;
    generator.setFramerate(rate);
    return seekAll(MediaTime()) == QvStatus::ok ? QvStatus::ok : QvStatus::failed;
}

int GeneratorPipe::overrideDuration(const Any& value) {
    MediaTime length;
    if (value.isMediaTime())
        length = value.asMediaTime();
    else if (value.isFloat())
        length = MediaTime(value.asDouble(), MediaTime::defaultTimescale);
    else
        return QvStatus::failed;
    const int result = seekAll(MediaTime());
    for (auto& stream : videos_) stream->setDuration(length);
    for (auto& stream : audios_) stream->setDuration(length);
    return result;
}

QvCodec* newTestgen() { return new GeneratorPipe; }
