// The pipe itself: life, lookups, writing, programs.
#include "builtin/pipes/encodepipe2.h"

#include <algorithm>
#include <new>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvpresetmgr.h"

EncodePipe2::~EncodePipe2() {
    if (getState() == qvStateOpen) finish(true);
    setState(stateInitialised);
    removeStreams(qvAllStreams);
    try {
        dropMuxer();
    } catch (const std::bad_alloc&) {
        muxer_.reset();  // what it could not reset is in the sink, which goes as well
    }
}

int EncodePipe2::init() {
    if (getState() != stateCreated) {
        qv_dbg()->warning("EncodePipe.init: Already initialized");
        return QvStatus::ok;
    }
    const auto& presets = qvPresetMgr()->builtinPresets();
    if (presets.empty()) return setError(QvStatus::failed, "There are no presets");
    preset_ = presets.preset(0);
    if (setSink("filesink") != 0) return setError(QvStatus::failed, "Can not create file sink module.");
    adjustCodecToMuxer_ = true;
    if (const int result = applyPreset(preset_, 0)) return result;
    setState(stateInitialised);
    return QvStatus::ok;
}

void* EncodePipe2::getInterface(int kind) const {
    auto* self = const_cast<EncodePipe2*>(this);
    if (kind == qvProgramSetupInterface) return static_cast<QvIProgramSetup*>(self);
    return kind == QvModuleType::encodePipe ? static_cast<QvEncodePipe*>(self) : nullptr;
}

int EncodePipe2::nrStreams(int mask) const {
    return static_cast<int>(std::count_if(streams_.begin(), streams_.end(), [mask](const auto& stream) {
        return qvStreamTypeMatches(stream->type, mask);
    }));
}

EncodePipe2::Stream* EncodePipe2::find(int type, int nr) const {
    if (nr < 0) return nullptr;
    for (const auto& stream : streams_)
        if (stream->type == type && nr-- == 0) return stream.get();
    return nullptr;
}

int EncodePipe2::numberOf(const Stream& wanted) const {
    int nr = 0;
    for (const auto& stream : streams_) {
        if (stream.get() == &wanted) return nr;
        if (stream->type == wanted.type) ++nr;
    }
    return -1;
}

QvOStream* EncodePipe2::stream(int type, int nr) const { return find(type, nr); }

QvOStream* EncodePipe2::streamAt(int index) const {
    QV_ASSERT_MSG(index >= 0 && index < static_cast<int>(streams_.size()), "Invalid stream index");
    return streams_[static_cast<size_t>(index)].get();
}

TPtrList<QvOStream> EncodePipe2::streams(int type) const {
    TPtrList<QvOStream> found;
    for (const auto& stream : streams_)
        if (type == -1 || stream->type == type) found.append(stream.get());
    return found;
}

int EncodePipe2::indexOf(QvOStream* wanted) const {
    const auto place = std::find_if(streams_.begin(), streams_.end(),
                                    [wanted](const auto& stream) { return stream.get() == wanted; });
    return place == streams_.end() ? -1 : static_cast<int>(place - streams_.begin());
}

int EncodePipe2::streamNr(QvOStream* wanted) const {
    const int index = indexOf(wanted);
    return index < 0 ? -1 : numberOf(*streams_[static_cast<size_t>(index)]);
}

QvEncoder* EncodePipe2::encoder(int type, int nr) const {
    const auto* stream = find(type, nr);
    return stream ? stream->encoder : nullptr;
}

QvEncoder* EncodePipe2::encoder(int index) const {
    if (index < 0 || index >= static_cast<int>(streams_.size())) return nullptr;
    return streams_[static_cast<size_t>(index)]->encoder;
}

QvVideoEncoder* EncodePipe2::videoEncoder(int nr) const {
    return static_cast<QvVideoEncoder*>(encoder(qvVideoStream, nr));
}

QvAudioEncoder* EncodePipe2::audioEncoder(int nr) const {
    return static_cast<QvAudioEncoder*>(encoder(qvAudioStream, nr));
}

int EncodePipe2::writeFrame(QvFrame* frame, int stream) {
    auto* target = videoEncoder(stream);
    QV_ASSERT_MSG(target, "Invalid video stream");
    const int result = target->writeFrame(frame);
    return result == QvStatus::ok ? result : takeError(*target, result);
}

int EncodePipe2::writePcm(QvPcm* pcm, int stream) {
    auto* target = audioEncoder(stream);
    QV_ASSERT_MSG(target, "Invalid audio stream");
    const int result = target->writePcm(pcm);
    return result == QvStatus::ok ? result : takeError(*target, result);
}

// A member's failure becomes the pipe's, with its text; the result stays as it was.
int EncodePipe2::takeError(const QvCodec& member, int result) {
    const int code = member.errorCode() != 0 ? member.errorCode() : result;
    setError(code, "%s", member.errorDesc());
    return result;
}

int EncodePipe2::refuseWhileOpen() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    return setError(QvStatus::illegalState, "Not possible while the output is open");
}

// A target that does not know the name is passed over, whichever way it says so.
int EncodePipe2::forward(QvCodec* target, const char* name, const Any& value) const {
    try {
        const int result = target->setParam(name, value);
        return result == QvStatus::invalidParam ? QvStatus::ok : result;
    } catch (const QvParamException&) {
        return QvStatus::ok;
    }
}

int EncodePipe2::forwardToEncoders(int mask, const char* name, const Any& value) {
    int result = 0;
    for (const auto& stream : streams_)
        if (stream->encoder && qvStreamTypeMatches(stream->type, mask))
            result |= forward(stream->encoder, name, value);
    return result;
}

int EncodePipe2::forwardToMuxer(const char* name, const Any& value) {
    return muxer_ ? forward(muxer_.get(), name, value) : QvStatus::ok;
}

QvIProgramSetup* EncodePipe2::programs() const {
    return muxer_ ? static_cast<QvIProgramSetup*>(muxer_->getInterface(qvProgramSetupInterface)) : nullptr;
}

int EncodePipe2::nrPrograms() const {
    auto* setup = programs();
    return setup ? setup->nrPrograms() : 0;
}

int EncodePipe2::addProgram(const QvProgram& program) {
    auto* setup = programs();
    return setup ? setup->addProgram(program) : QvStatus::failed;
}

int EncodePipe2::removeProgram(int index) {
    QV_ASSERT_MSG(index >= 0 && index < nrPrograms(), "EncodePipe2.removeProgram: invalid program index");
    return programs()->removeProgram(index);
}

int EncodePipe2::getProgram(int index, QvProgram& program) const {
    auto* setup = programs();
    return setup ? setup->getProgram(index, program) : QvStatus::failed;
}

int EncodePipe2::setProgram(int index, const QvProgram& program) {
    auto* setup = programs();
    return setup ? setup->setProgram(index, program) : QvStatus::failed;
}

int EncodePipe2::getProgramStreams(int index, AnyVector& streams) const {
    streams.clear();
    auto* setup = programs();
    if (!setup) return QvStatus::failed;
    AnyVector pairs;
    if (const int result = setup->getProgramStreams(index, pairs)) return result;
    for (const auto& element : pairs) {
        if (!element.isPair()) continue;
        const Pair& pair = element.asPair();
        qv_dbg()->debug("[encpipe] getprogramstreams, type=%d, no=%d", pair.first, pair.second);
        if (auto* found = stream(pair.first, pair.second))
            streams.append(Any(static_cast<const void*>(found)));
    }
    return QvStatus::ok;
}

QvCodec* newEncpipe() { return new EncodePipe2; }
