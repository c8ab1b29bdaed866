// Adding, exchanging and removing streams.
#include <algorithm>
#include <cstring>

#include "builtin/pipes/encodepipe2.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/qvutil.h"
#include "core/job/filtersstate.h"
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

bool isText(const Any& value) { return value.isText() && value.isTrue(); }

std::string narrow(const Any& text) { return text.toString().asString(""); }

}  // namespace

int EncodePipe2::addStream(int type, const Any& params) {
    if (const int result = refuseWhileOpen()) return result;
    switch (type) {
        case qvVideoStream:
        case qvAudioStream: return addCodecStream(type, params);
        case qvSubpicStream: return addSubpic(params);
        default: QV_FAIL("Invalid stream type");
    }
}

int EncodePipe2::addCodecStream(int type, const Any& params) {
    QV_ASSERT_MSG(muxer_, "EncodePipe: muxer is null.");
    const auto& texts = textsOf(type);
    if (canAddStreams(type) < 1) return setError(QvStatus::noStream, "%s", texts.full);
    Request request;
    if (const int result = decodeRequest(type, params, request)) return result;
    if (request.codec.empty()) return setError(QvStatus::noStream, "%s", texts.noCodec);
    auto encoder = newEncoder(type, request.codec);
    if (!encoder) return setError(QvStatus::failed, texts.notCreated, request.codec.c_str());
    if (const int result = setUpEncoder(*encoder, request.settings)) return takeError(*encoder, result);
    auto stream = std::make_unique<Stream>(type);
    stream->take(std::move(encoder));
    return addReady(std::move(stream), request.params, request.codec.c_str());
}

// Connects a complete encoder and appends its stream; the number within its type.
int EncodePipe2::addReady(std::unique_ptr<Stream> stream, const AnyDict& params, const char* name) {
    const int type = stream->type;
    if (const int result = joinMuxer(*stream, name)) return result;
    forward(stream->encoder, "adjustSettings", 1);
    auto& added = *streams_.emplace_back(std::move(stream));
    const int nr = numberOf(added);
    if (!params.empty()) muxer_->setStreamParams(type, nr, params);
    qv_dbg()->debug(type == qvVideoStream ? videoTexts.added : audioTexts.added, static_cast<void*>(this), nr,
                    name, static_cast<void*>(added.encoder), static_cast<void*>(added.bitstream));
    return nr;
}

int EncodePipe2::joinMuxer(Stream& stream, const char* name) {
    AnyDict about("codec", name);
    const Any extension = static_cast<const QvCodec*>(stream.encoder)->getParam("extension");
    if (extension.isValid()) about.set("extension", extension);
    stream.bitstream = muxer_->addStream(stream.type, about);
    if (!stream.bitstream) {
        setError(QvStatus::failed, "QvMuxer.addStream() failed");
        QV_FAIL("QvMuxer.addStream() failed");
    }
    const int result = stream.encoder->attachOutStream(stream.bitstream);
    if (result == QvStatus::ok) return result;
    takeError(*stream.encoder, result);
    muxer_->removeStream(stream.type, muxer_->nrStreams(stream.type) - 1);
    return result;
}

int EncodePipe2::addSubpic(const Any& params) {
    QV_ASSERT_MSG(muxer_, "EncodePipe: muxer is null.");
    const Any about = params.isDict() ? params.asDict().get("stream") : Any();
    auto stream = std::make_unique<Stream>(qvSubpicStream);
    stream->bitstream = muxer_->addStream(qvSubpicStream, about.isDict() ? about.asDict() : AnyDict());
    if (!stream->bitstream) {
        qv_dbg()->error("[EncodePipe %p] Failed to add subpic stream to muxer '%s'", static_cast<void*>(this),
                        muxer_->name());
        return setError(QvStatus::failed, "Failed to add subpic stream to muxer '%s'", muxer_->name());
    }
    auto& added = *streams_.emplace_back(std::move(stream));
    const int nr = numberOf(added);
    if (about.isDict()) muxer_->setStreamParams(qvSubpicStream, nr, about.asDict());
    qv_dbg()->debug("[EncodePipe %p] Added subpic #%d, bs=%p", static_cast<void*>(this), nr,
                    static_cast<void*>(added.bitstream));
    return nr;
}

int EncodePipe2::decodeRequest(int type, const Any& params, Request& request) {
    if (isText(params)) request.codec = narrow(params);
    if (params.isDict()) {
        for (const auto [key, value] : params.asDict()) {
            if (std::strcmp(key, "stream") == 0 && value->isDict()) {
                request.params = value->asDict();
            } else if (std::strcmp(key, "codec") != 0) {
                QV_FAIL("EncodePipe.addStream: unrecognized parameters supplied");
            } else if (value->isDict()) {
                QV_ASSERT_MSG(isText(value->asDict().get("name")),
                              "EncodePipe.addStream: 'codec' dict must contain 'name'");
                request.codec = narrow(value->asDict().get("name"));
                request.settings = value->asDict();
            } else {
                QV_ASSERT_MSG(isText(*value), "EncodePipe.addStream: 'codec' parameter has invalid type");
                request.codec = narrow(*value);
            }
        }
    }
    if (!request.codec.empty()) {
        const char* codec = request.codec.c_str();
        if (!qv_registry()->module(codec))
            return setError(QvStatus::failed, "Cannot add stream: encoder '%s' not loaded", codec);
        if (!compatible(codec))
            return setError(QvStatus::failed,
                            "Encoder %s not compatible with currently selected preset %s and/or muxer %s.",
                            codec, preset_.name(), muxer_->name());
    }
    return fillDefaults(type, request);
}

int EncodePipe2::fillDefaults(int type, Request& request) {
    if (request.codec.empty() && preset_.isBuiltin() && allowedCodecs(type).empty()) return QvStatus::ok;
    AnyDict defaults;
    const int result = _getStreamDefaults(type, nrStreams(type),
                                          request.codec.empty() ? nullptr : request.codec.c_str(), defaults);
    if (result != QvStatus::ok) return result;
    const auto& codec = defaults.get("codec");
    if (codec.isDict()) {
        if (request.codec.empty()) request.codec = narrow(codec.asDict().get("name"));
        if (request.settings.empty()) request.settings = codec.asDict();
    } else if (request.codec.empty() && codec.isText()) {
        request.codec = narrow(codec);
    }
    if (request.params.empty() && defaults.get("stream").isDict())
        request.params = defaults.get("stream").asDict();
    return QvStatus::ok;
}

// "codec" of the defaults is the settings of an encoder, or its name alone where nothing is stored for it.
int EncodePipe2::_getStreamDefaults(int type, int nr, const char* codec, AnyDict& defaults) const {
    QV_ASSERT_MSG(type == qvVideoStream || type == qvAudioStream,
                  "EncodePipe._getStreamDefaults: invalid 'type'");
    defaults.clear();
    const char* kind = qvStreamTypeName(type);
    if (preset_.isCustom()) {
        defaults = preset_.streamParams(type, nr, codec);
        if (!defaults.empty()) {
            const Any* name = defaults.descendant("codec.name");
            QV_ASSERT_MSG(!codec || (name && *name == codec), "EncodePipe._getStreamDefaults: 1");
            return QvStatus::ok;
        }
        qv_dbg()->warning(
            "EncodePipe._getStreamDefaults: cannot determine %s settings for custom preset '%s', "
            "codec '%s', stream %d",
            kind, preset_.name(), codec ? codec : "<not specified>", nr);
    }
    const auto& allowed = allowedCodecs(type);
    if (codec && !allowed.contains(Any(codec))) {
        qv_dbg()->error(
            "EncodePipe._getStreamDefaults: codec '%s' specified but it's not allowed by muxer '%s'", codec,
            muxer_->name());
        QvUtil::debugOutDict(preset_);
        qv_dbg()->error("---");
        QV_FAIL("EncodePipe._getStreamDefaults: 2");
    }
    if (!codec && allowed.empty()) {
        qv_dbg()->error("EncodePipe._getStreamDefaults: no allowed %s codecs for '%s'", kind, muxer_->name());
        QV_FAIL("EncodePipe._getStreamDefaults: 3");
    }
    defaults.set("codec", codec ? Any(codec) : allowed.front());
    return QvStatus::ok;
}

std::unique_ptr<QvEncoder> EncodePipe2::newEncoder(int type, const std::string& name) const {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(name.c_str()));
    if (!codec || !codec->getInterface(textsOf(type).encoderKind)) return nullptr;
    return std::unique_ptr<QvEncoder>(static_cast<QvEncoder*>(codec.release()));
}

int EncodePipe2::setUpEncoder(QvEncoder& encoder, const AnyDict& settings) const {
    if (!settings.empty()) return encoder.restore(settings);
    forward(&encoder, "profile", preset_.profile());
    return QvStatus::ok;
}

// Multiplexers for analysis and memory take what the preset has.
bool EncodePipe2::takesAllCodecs() const {
    return muxer_ &&
           (std::strcmp(muxer_->name(), "nullmux") == 0 || std::strcmp(muxer_->name(), "memmux") == 0);
}

bool EncodePipe2::compatible(const char* codec) const {
    return takesAllCodecs() || preset_.isCompatible(codec, muxer_->name());
}

const AnyVector& EncodePipe2::allowedCodecs(int type) const {
    return allowed_.getVector(type == qvVideoStream ? "vcodecs" : "acodecs");
}

void EncodePipe2::detach(Stream& stream) {
    if (stream.encoder) stream.encoder->detachOutStream();
}

void EncodePipe2::removeStream(QvOStream* wanted) {
    QV_ASSERT(wanted);
    if (refuseWhileOpen() != QvStatus::ok) return;
    const int index = indexOf(wanted);
    QV_ASSERT_MSG(index >= 0, "Invalid stream");
    auto& stream = *streams_[static_cast<size_t>(index)];
    const int type = stream.type;
    const int nr = numberOf(stream);
    detach(stream);
    if (muxer_) muxer_->removeStream(type, nr);
    stream.bitstream = nullptr;
    streams_.erase(streams_.begin() + index);
    qv_dbg()->debug("[EncodePipe %p] Removed %s #%d", static_cast<void*>(this), qvStreamTypeName(type), nr);
}

void EncodePipe2::removeStream(int type, int nr) {
    auto* found = find(type, nr);
    QV_ASSERT_MSG(found, "Invalid stream");
    removeStream(found);
}

void EncodePipe2::removeStreams(int mask) {
    if (refuseWhileOpen() != QvStatus::ok) return;
    // Those that go are gathered at the end, which takes no memory: a destructor comes here.
    auto kept = streams_.end();
    for (auto at = streams_.end(); at != streams_.begin();) {
        const auto& stream = *--at;
        if (!qvStreamTypeMatches(stream->type, mask)) continue;
        const int nr = numberOf(*stream);
        detach(*stream);
        stream->bitstream = nullptr;
        qv_dbg()->debug("[EncodePipe %p] Removed %s #%d", static_cast<void*>(this),
                        qvStreamTypeName(stream->type), nr);
        kept = std::rotate(at, at + 1, kept);
    }
    if (muxer_) muxer_->removeStreams(mask);
    streams_.erase(kept, streams_.end());
}

int EncodePipe2::setCodec(int type, int nr, const char* name, const AnyDict& params) {
    if (const int result = refuseWhileOpen()) return result;
    auto* stream = find(type, nr);
    if (!stream || !stream->encoder) {
        setError(QvStatus::invalidArgument, "[EncodePipe] setCodec: Invalid stream number %d", nr);
        QV_FAIL(errorDesc());
    }
    QV_ASSERT(name);
    if (!compatible(name))
        return setError(
            QvStatus::failed,
            "Video encoder '%s' not compatible with currently selectedpreset '%s' and/or muxer '%s'", name,
            preset_.name(), muxer_->name());
    auto fresh = newEncoder(type, name);
    if (!fresh) return setError(QvStatus::failed, "Could not create %s instance", name);
    AnyDict old;
    stream->encoder->store(old);
    saved_.set(stream->encoder->name(), old);
    detach(*stream);
    stream->take(std::move(fresh));
    if (const int result = stream->encoder->attachOutStream(stream->bitstream))
        return takeError(*stream->encoder, result);
    return configure(*stream->encoder, type, nr, params);
}

// The new encoder's settings: those given, or those it had before, or the preset's.
int EncodePipe2::configure(QvEncoder& encoder, int type, int nr, const AnyDict& params) {
    const char* name = encoder.name();
    int result = QvStatus::ok;
    if (!params.empty()) {
        AnyDict all = params;
        QV_ASSERT_MSG(!all.isSet("profile") || all.get("profile") == preset_.profile(),
                      "EncodePipe.setCodec: 'profile' is not that of the preset");
        all.set("profile", preset_.profile());
        result = encoder.setParamDict(all);
    } else if (saved_.get(name).isDict()) {
        result = encoder.restore(saved_.get(name).asDict());
    } else {
        AnyDict defaults;
        _getStreamDefaults(type, nr, name, defaults);
        const auto& settings = defaults.get("codec");
        result = setUpEncoder(encoder, settings.isDict() ? settings.asDict() : AnyDict());
        if (!settings.isDict() && adjustCodecToMuxer_ && hasTransportMuxer())
            forward(&encoder, "tsAdjust", 1);
    }
    forward(&encoder, "adjustSettings", 1);
    return result == QvStatus::ok ? result : takeError(encoder, result);
}
