#include "tarsel/presets/outputpreset.h"

#include <string_view>

#include "tarsel/presets/presetsearch.h"
#include "tarsel/presets/presetwords.h"
#include "tarsel/words/messages.h"

namespace {

int encoderKind(int type) {
    return type == qvVideoStream ? QvModuleType::videoEncoder : QvModuleType::audioEncoder;
}

// Invalid for a parameter that the encoder does not have.
Any ask(const QvCodec& encoder, const char* name) {
    try {
        return encoder.getParam(name);
    } catch (const QvParamException&) {
        return Any();
    }
}

std::optional<int> positive(const Any& value) {
    return value.isInt() && value.toInt32() > 0 ? std::optional(value.toInt32()) : std::nullopt;
}

std::string defaultMuxer(const QvPreset& preset) {
    const Any muxer = preset.defaultMuxer();
    return muxer.isString() ? muxer.asString() : "";
}

// What a user's preset holds is for one multiplexer. For another one that it allows, its encoders stay.
QvPreset withMuxer(const QvPreset& preset, const char* muxer) {
    if (!preset.isCustom() || preset.defaultMuxer() == muxer || !preset.muxerAllowed(muxer)) return preset;
    QvPreset other = preset;
    other.set("muxer", AnyDict("name", muxer));
    other.remove("programs");
    if (Any& streams = other.get("streams"); streams.isVector())
        for (Any& stream : streams.asVector())
            if (stream.isDict()) stream.asDict().remove("stream");
    return other;
}

}  // namespace

bool isRawEncoderName(std::string_view name) { return name == "rawvenc" || name == "rawaenc"; }
bool isRawEncoder(const QvCodec& encoder) { return isRawEncoderName(encoder.name()); }

OutputPreset::OutputPreset(const QvPreset& preset, const std::string& muxer, const ChosenEncoders& encoders,
                           const std::string& reason)
    : preset_(preset),
      muxer_(muxer.empty() ? defaultMuxer(preset) : muxer),
      encoders_(encoders),
      reason_(reason) {
    if (!preset_.isValid()) throw failure(Msg::presetInvalid, {name(), faultOf(preset_)});
    if (!muxer.empty() && !preset_.muxerAllowed(muxer.c_str()))
        throw failure(Msg::presetMuxer, {muxer, name(), namesOf(preset_.muxers())});
}

bool OutputPreset::has(int type) const {
    if (!encoders_.of(type).empty()) return true;
    if (preset_.isCustom() && preset_.get("streams").isVector())
        return !preset_.streamParams(type, 0, nullptr).empty();
    return !preset_.getCompatible(muxer_.c_str(), encoderKind(type)).empty();
}

bool OutputPreset::isRaw() const {
    const std::string& video = encoders_.video;
    return (video.empty() ? preset_.videoCodecs().at(0) == "rawvenc" : video == "rawvenc") &&
           (muxer_ == "rawmux" || muxer_ == "rawavimux");
}

std::unique_ptr<QvEncodePipe> OutputPreset::makePipe(const char* muxer) const {
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    if (!pipe) throw failure(Msg::outputNoModule, {name()});
    if (pipe->applyPreset(withMuxer(preset_, muxer), 0) != QvStatus::ok)
        throw failure(Msg::presetInvalid, {name(), pipe->errorDesc()});
    pipe->clearStreams();
    const QvMuxer* const present = pipe->getMuxer();
    if (!(present && std::string_view(present->name()) == muxer) && pipe->setMuxer(muxer) != QvStatus::ok)
        throw failure(Msg::muxerUnusable, {muxer, pipe->errorDesc()});
    pipe->clearStreams();
    return pipe;
}

// The first encoder of a built-in preset whose streams the multiplexer takes; empty where it does not say.
std::string OutputPreset::usualEncoder(const QvMuxer& muxer, int type) const {
    const QvModule* const module = qv_registry()->module(muxer.name());
    const Any taken = module && !preset_.isCustom() ? module->getAttr("compatEncoders") : Any();
    if (!taken.isVector()) return "";
    const AnyVector allowed = preset_.getCompatible(muxer.name(), encoderKind(type));
    for (const Any& name : allowed)
        if (taken.asVector().contains(name)) return name.asString("");
    return "";
}

QvEncoder& OutputPreset::addStream(QvEncodePipe& pipe, int type) const {
    const std::string& chosen = encoders_.of(type);
    const std::string encoder = chosen.empty() ? usualEncoder(*pipe.getMuxer(), type) : chosen;
    const int number = pipe.addStream(type, encoder.empty() ? Any() : Any(encoder.c_str()));
    if (number < 0)
        throw failure(Msg::presetNoStream,
                      {name(), type == qvVideoStream ? "picture" : "sound", pipe.errorDesc()});
    return *pipe.encoder(type, number);
}

// A raw encoder takes what comes, so its defaults are nobody's wish.
bool OutputPreset::says(const QvCodec& encoder, int type, int number, const char* name, const char* range,
                        bool fitted) const {
    if (fitted && !ask(encoder, range).isValid()) return false;
    if (fitted || !isRawEncoder(encoder)) return true;
    return storedCodec(type, number).isSet(name);
}

AnyDict OutputPreset::storedCodec(int type, int number) const {
    if (!preset_.isCustom()) return AnyDict();
    const AnyDict stream = preset_.streamParams(type, number, nullptr);
    const AnyDict codec = stream.getDict("codec", AnyDict());
    const std::string& chosen = encoders_.of(type);
    if (!chosen.empty() && !(codec.get("name") == chosen.c_str())) return AnyDict();
    return codec.getDict("settingsDict", codec);
}

PresetPicture OutputPreset::picture(const QvCodec& encoder, int number, bool fitted) const {
    const auto asked = [&](const char* name, const char* range) {
        return says(encoder, qvVideoStream, number, name, range, fitted) ? ask(encoder, name) : Any();
    };
    PresetPicture picture;
    picture.width = positive(asked("width", "sizeRange"));
    picture.height = positive(asked("height", "sizeRange"));
    if (const Any rate = asked("framerate", "framerateRange"); rate.isFramerate())
        picture.rate = rate.asFramerate();
    // Only the raw encoder takes any format, and only a preset that names one asks for it.
    const bool raw = isRawEncoder(encoder);
    const Any format =
        raw ? says(encoder, qvVideoStream, number, "type", "", false) ? ask(encoder, "type") : Any()
            : ask(encoder, "FOURCC");
    if (format.isInt() && qvPixelFormat(static_cast<unsigned>(format.toInt32())))
        picture.fourcc = static_cast<unsigned>(format.toInt32());
    return picture;
}

PresetSound OutputPreset::sound(const QvCodec& encoder, int number, bool fitted) const {
    const auto asked = [&](const char* name, const char* range) {
        return says(encoder, qvAudioStream, number, name, range, fitted) ? positive(ask(encoder, name))
                                                                         : std::nullopt;
    };
    return {asked("samplerate", "samplerateRange"), asked("channels", "channelsRange"),
            asked("bitsPerSample", "bitsPerSampleRange")};
}
