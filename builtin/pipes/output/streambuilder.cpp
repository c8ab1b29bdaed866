#include "builtin/pipes/output/streambuilder.h"

#include "builtin/pipes/output/members/pipehost.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/stream/qvbufstrm.h"

namespace {

// What differs between the two kinds of stream that have an encoder.
struct KindTexts {
    int encoderKind;
    const char* full;
    const char* noCodec;
    const char* notCreated;
    const char* added;
};

constexpr KindTexts videoTexts = {
    QvModuleType::videoEncoder,
    "No (more) video streams allowed with currentlyselected preset / muxer.",
    "Codec not found for video stream",
    "Failed to create instance of %s",
    "[EncodePipe %p] Added video #%d, codec=%s (%p), bs=%p",
};
constexpr KindTexts audioTexts = {
    QvModuleType::audioEncoder,
    "No (more) audio streams allowed with currently selected preset / muxer.",
    "Codec not found for this audio stream",
    "Unknown audio module '%s'",
    "[EncodePipe %p] Added audio #%d, codec=%s (%p), bs=%p",
};

const KindTexts& textsOf(int type) { return type == qvVideoStream ? videoTexts : audioTexts; }

std::unique_ptr<QvEncoder> newEncoder(int type, const char* module) {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module));
    if (!codec || !codec->getInterface(textsOf(type).encoderKind)) return nullptr;
    return std::unique_ptr<QvEncoder>(static_cast<QvEncoder*>(codec.release()));
}

void detach(const OutputStream& stream) {
    if (stream.encoder) stream.encoder->detachOutStream();
}

}  // namespace

int StreamBuilder::room(int type) const {
    return end_.room(type, streams_.count(type), streams_.count(qvAllStreams));
}

int StreamBuilder::checkRoom(int type) {
    QV_ASSERT_MSG(end_.muxer(), "EncodePipe: muxer is null.");
    if (type == qvSubpicStream || room(type) >= 1) return QvStatus::ok;
    return host_.fail(QvStatus::noStream, "%s", textsOf(type).full);
}

int StreamBuilder::add(int type, const Any& argument) {
    QV_ASSERT_MSG(type == qvVideoStream || type == qvAudioStream || type == qvSubpicStream,
                  "Invalid stream type");
    if (const int result = checkRoom(type)) return result;
    if (type == qvSubpicStream) return buildSubpic(StreamRequest::readParams(argument));
    return build(type, StreamRequest::read(argument));
}

int StreamBuilder::add(int type, StreamRequest request) {
    if (const int result = checkRoom(type)) return result;
    return type == qvSubpicStream ? buildSubpic(request) : build(type, std::move(request));
}

int StreamBuilder::build(int type, StreamRequest request) {
    const auto& texts = textsOf(type);
    if (const int result = complete(type, request)) return result;
    const char* codec = request.codec.c_str();
    if (request.codec.empty()) return host_.fail(QvStatus::noStream, "%s", texts.noCodec);
    auto encoder = newEncoder(type, codec);
    if (!encoder) return host_.fail(QvStatus::failed, texts.notCreated, codec);
    if (const int result = setUp(*encoder, request.settings)) return host_.take(*encoder, result);
    auto stream = std::make_unique<OutputStream>(type);
    stream->take(std::move(encoder));
    return append(std::move(stream), request.params ? *request.params : AnyDict(), codec);
}

int StreamBuilder::complete(int type, StreamRequest& request) {
    const char* codec = request.codec.empty() ? nullptr : request.codec.c_str();
    const QvMuxer& muxer = *end_.muxer();
    if (codec) {
        if (!qv_registry()->module(codec))
            return host_.fail(QvStatus::failed, "Cannot add stream: encoder '%s' not loaded", codec);
        if (!preset_.takes(codec, muxer))
            return host_.fail(QvStatus::failed,
                              "Encoder %s not compatible with currently selected preset %s and/or muxer %s.",
                              codec, preset_.preset().name(), muxer.name());
    } else if (preset_.preset().isBuiltin() && preset_.codecs(type).empty()) {
        return QvStatus::ok;
    }
    request.complete(preset_.defaults(type, streams_.count(type), codec, muxer));
    return QvStatus::ok;
}

int StreamBuilder::setUp(QvEncoder& encoder, const AnyDict& settings) const {
    if (!settings.empty()) return encoder.restore(settings);
    qvOfferParam(encoder, "profile", preset_.preset().profile());
    return QvStatus::ok;
}

// Connects a complete encoder and appends its stream; the number within its type.
int StreamBuilder::append(std::unique_ptr<OutputStream> stream, const AnyDict& params, const char* name) {
    const int type = stream->type;
    if (const int result = join(*stream, name)) return result;
    qvOfferParam(*stream->encoder, "adjustSettings", 1);
    const auto& added = streams_.append(std::move(stream));
    const int nr = streams_.numberOf(added);
    if (!params.empty()) end_.muxer()->setStreamParams(type, nr, params);
    qv_dbg()->debug(textsOf(type).added, host_.pipe(), nr, name, static_cast<void*>(added.encoder),
                    static_cast<void*>(added.bitstream));
    return nr;
}

int StreamBuilder::join(OutputStream& stream, const char* name) {
    QvMuxer& muxer = *end_.muxer();
    AnyDict about("codec", name);
    const Any extension = static_cast<const QvCodec*>(stream.encoder)->getParam("extension");
    if (extension.isValid()) about.set("extension", extension);
    stream.bitstream = muxer.addStream(stream.type, about);
    if (!stream.bitstream) {
        host_.fail(QvStatus::failed, "QvMuxer.addStream() failed");
        QV_FAIL(host_.lastFailure());
    }
    const int result = stream.encoder->attachOutStream(stream.bitstream);
    if (result == QvStatus::ok) return result;
    host_.take(*stream.encoder, result);
    muxer.removeStream(stream.type, muxer.nrStreams(stream.type) - 1);
    return result;
}

int StreamBuilder::buildSubpic(const StreamRequest& request) {
    QvMuxer& muxer = *end_.muxer();
    auto stream = std::make_unique<OutputStream>(qvSubpicStream);
    stream->bitstream = muxer.addStream(qvSubpicStream, request.params ? *request.params : AnyDict());
    if (!stream->bitstream) {
        qv_dbg()->error("[EncodePipe %p] Failed to add subpic stream to muxer '%s'", host_.pipe(),
                        muxer.name());
        return host_.fail(QvStatus::failed, "Failed to add subpic stream to muxer '%s'", muxer.name());
    }
    const auto& added = streams_.append(std::move(stream));
    const int nr = streams_.numberOf(added);
    if (request.params) muxer.setStreamParams(qvSubpicStream, nr, *request.params);
    qv_dbg()->debug("[EncodePipe %p] Added subpic #%d, bs=%p", host_.pipe(), nr,
                    static_cast<void*>(added.bitstream));
    return nr;
}

void StreamBuilder::remove(const QvOStream* wanted) {
    const int place = streams_.placeOf(wanted);
    QV_ASSERT_MSG(place >= 0, "Invalid stream");
    auto& stream = streams_[static_cast<std::size_t>(place)];
    const int type = stream.type;
    const int nr = streams_.numberOf(stream);
    detach(stream);
    if (auto* muxer = end_.muxer()) muxer->removeStream(type, nr);
    stream.bitstream = nullptr;
    streams_.remove(static_cast<std::size_t>(place));
    qv_dbg()->debug("[EncodePipe %p] Removed %s #%d", host_.pipe(), qvStreamTypeName(type), nr);
}

void StreamBuilder::removeAll(int mask) {
    // A destructor comes here, so it gets by without memory.
    const std::size_t kept = streams_.gatherAtEnd(mask, [this](OutputStream& stream) {
        const int nr = streams_.numberOf(stream);
        detach(stream);
        stream.bitstream = nullptr;
        qv_dbg()->debug("[EncodePipe %p] Removed %s #%d", host_.pipe(), qvStreamTypeName(stream.type), nr);
    });
    if (auto* muxer = end_.muxer()) muxer->removeStreams(mask);
    streams_.cutTo(kept);
}

int StreamBuilder::setCodec(int type, int nr, const char* name, const AnyDict& params, bool adjustToMuxer) {
    auto* stream = streams_.find(type, nr);
    if (!stream || !stream->encoder) {
        host_.fail(QvStatus::invalidArgument, "[EncodePipe] setCodec: Invalid stream number %d", nr);
        QV_FAIL(host_.lastFailure());
    }
    QV_ASSERT(name);
    if (!preset_.takes(name, *end_.muxer()))
        return host_.fail(
            QvStatus::failed,
            "Video encoder '%s' not compatible with currently selectedpreset '%s' and/or muxer '%s'", name,
            preset_.preset().name(), end_.muxer()->name());
    auto fresh = newEncoder(type, name);
    if (!fresh) return host_.fail(QvStatus::failed, "Could not create %s instance", name);
    saved_.keep(*stream->encoder);
    detach(*stream);
    stream->take(std::move(fresh));
    if (const int result = stream->encoder->attachOutStream(stream->bitstream))
        return host_.take(*stream->encoder, result);
    return configure(*stream->encoder, type, nr, params, adjustToMuxer);
}

int StreamBuilder::configure(QvEncoder& encoder, int type, int nr, const AnyDict& params,
                             bool adjustToMuxer) {
    int result = QvStatus::ok;
    if (!params.empty()) {
        AnyDict all = params;
        const int profile = preset_.preset().profile();
        QV_ASSERT_MSG(!all.isSet("profile") || all.get("profile") == profile,
                      "EncodePipe.setCodec: 'profile' is not that of the preset");
        all.set("profile", profile);
        result = encoder.setParamDict(all);
    } else if (const AnyDict* before = saved_.of(encoder.name())) {
        result = encoder.restore(*before);
    } else {
        const auto defaults = preset_.defaults(type, nr, encoder.name(), *end_.muxer());
        result = setUp(encoder, defaults.settings);
        if (defaults.settings.empty() && adjustToMuxer && end_.traits().transportStream)
            qvOfferParam(encoder, "tsAdjust", 1);
    }
    qvOfferParam(encoder, "adjustSettings", 1);
    return result == QvStatus::ok ? result : host_.take(encoder, result);
}

void StreamBuilder::adjustForTransport() {
    if (end_.traits().transportStream) streams_.offer(qvVideoStream, "tsAdjust", 1);
}
