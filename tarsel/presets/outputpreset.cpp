#include "tarsel/presets/outputpreset.h"

#include <string_view>

#include "tarsel/presets/extensions.h"
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

// The multiplexer with which a preset writes files of an extension; null if it does not.
const char* muxerFor(const QvPreset& preset, const PresetExtension& row) {
    for (const char* muxer : {row.muxer, row.otherMuxer})
        if (muxer && preset.muxerAllowed(muxer)) return muxer;
    return nullptr;
}

// By the symbol, or by the name of one that has none; -1 if it is not installed.
int indexOf(const QvPresetMgr& catalogue, const char* symbol) {
    if (const int profile = qvSymToProfile(symbol); profile >= 0) return catalogue.findByProfile(profile);
    const AnyVector& presets = catalogue.builtinPresets();
    for (int i = 0; i < presets.size(); ++i)
        if (presets.at(i).isDict() && presets.at(i).asDict().get("name") == symbol) return i;
    return -1;
}

std::shared_ptr<const OutputPreset> byExtension(const PresetExtension& row, const std::string& muxer,
                                                const std::string& output) {
    const QvPresetMgr& catalogue = *qvPresetMgr();
    for (const char* symbol : row.symbols) {
        const int index = symbol ? indexOf(catalogue, symbol) : -1;
        if (index < 0) continue;
        const QvPreset preset = catalogue.builtinPreset(index);
        if (const char* const own = muxerFor(preset, row))
            return std::make_shared<OutputPreset>(preset, muxer.empty() ? own : muxer);
    }
    throw failure(Msg::outputNoPreset, {output});  // none of them is installed
}

}  // namespace

bool isRawEncoderName(std::string_view name) { return name == "rawvenc" || name == "rawaenc"; }
bool isRawEncoder(const QvCodec& encoder) { return isRawEncoderName(encoder.name()); }

OutputPreset::OutputPreset(const QvPreset& preset, const std::string& muxer)
    : preset_(preset), muxer_(muxer.empty() ? defaultMuxer(preset) : muxer) {
    if (!preset_.isValid()) throw failure(Msg::presetInvalid, {name(), faultOf(preset_)});
    if (!muxer.empty() && !preset_.muxerAllowed(muxer.c_str()))
        throw failure(Msg::presetMuxer, {muxer, name(), namesOf(preset_.muxers())});
}

bool OutputPreset::has(int type) const {
    if (preset_.isCustom() && preset_.get("streams").isVector())
        return !preset_.streamParams(type, 0, nullptr).empty();
    return !preset_.getCompatible(muxer_.c_str(), encoderKind(type)).empty();
}

bool OutputPreset::isRaw() const {
    return preset_.videoCodecs().at(0) == "rawvenc" && (muxer_ == "rawmux" || muxer_ == "rawavimux");
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

QvEncoder& OutputPreset::addStream(QvEncodePipe& pipe, int type) const {
    const int number = pipe.addStream(type, Any());
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

std::shared_ptr<const OutputPreset> outputPreset(const std::string& name, const std::string& extension,
                                                 const std::string& muxer, const std::string& output) {
    if (name.empty()) {
        const PresetExtension* const row = presetExtension(extension);
        return row ? byExtension(*row, muxer, output) : nullptr;
    }
    const QvPreset preset = findPreset(name);
    const PresetExtension* const row =
        muxer.empty() && preset.isBuiltin() ? presetExtension(extension) : nullptr;
    const char* const own = row ? muxerFor(preset, *row) : nullptr;
    return std::make_shared<OutputPreset>(preset, own ? own : muxer);
}
