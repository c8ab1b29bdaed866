#include "tarsel/job/plan/presetplan.h"

#include <string_view>
#include <utility>

#include "tarsel/job/plan/colours.h"
#include "tarsel/presets/encoderforms.h"
#include "tarsel/presets/ranges.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

QvEncoder& encoderOf(const QvEncodePipe& pipe, const PlannedStream& stream) {
    return *pipe.encoder(stream.type, stream.number);
}

// The display aspect ratio of the encoder's picture.
double aspectOf(const QvCodec& encoder, const PictureFormat& format) {
    try {
        const Any aspect = encoder.getParam("frameAspect");
        if (aspect.isFloat() && aspect.asDouble() > 0) return aspect.asDouble();
    } catch (const QvParamException&) {  // not one of its parameters
    }
    return isRawEncoder(encoder) ? static_cast<double>(format.width) / format.height : format.aspect;
}

void setPicture(QvEncoder& encoder, const PictureFormat& picture) {
    if (isRawEncoder(encoder)) setChecked(encoder, "type", static_cast<int>(picture.fourcc), "--pixel");
    for (const auto& [name, value] : {std::pair{"width", picture.width}, std::pair{"height", picture.height}})
        if (static_cast<QvCodec&>(encoder).setParam(name, value) != QvStatus::ok)
            throw failure(Msg::frameTooLarge,
                          {"--size", std::to_string(picture.width) + "x" + std::to_string(picture.height)});
    setChecked(encoder, "framerate", Any(picture.rate), "--rate");
}

void setSound(QvEncoder& encoder, const SoundFormat& sound) {
    setChecked(encoder, "samplerate", sound.samplerate, "--samplerate");
    setChecked(encoder, "channels", sound.channels, "--channels");
    setChecked(encoder, "bitsPerSample", sound.bits, "--bits");
}

// The sample rate, or the first one of the container if it does not hold this one.
int rateIn(const char* muxer, int samplerate) {
    const QvModule* const module = muxer ? qv_registry()->module(muxer) : nullptr;
    const Any rates = module ? module->getAttr("samplerates") : Any();
    if (!rates.isVector() || rates.asVector().empty()) return samplerate;
    for (const Any& rate : rates.asVector())
        if (rate == Any(samplerate)) return samplerate;
    return rates.asVector().at(0).asInt32(samplerate);
}

}  // namespace

void setFormat(QvEncoder& encoder, const PlannedStream& stream) {
    stream.isVideo() ? setPicture(encoder, stream.picture) : setSound(encoder, stream.sound);
}

PresetPlanner::PresetPlanner(JobPlan& plan, const PlanOptions& options, const EffectOptions& effects,
                             const KnownFormats* known)
    : plan_(plan), options_(options), effects_(effects), known_(known) {
    if (known) pictures_ = known->pictures;
    if (!plan.preset) return;
    pipe_ = plan.preset->makePipe(plan.output.muxer());
    bool asks = !pictures_.empty();
    std::vector<PictureFormat> formats = pictures_;
    for (PlannedStream& stream : plan.streams) {
        if (!stream.isVideo()) continue;
        takeEncoder(stream);
        if (static_cast<size_t>(stream.number) >= formats.size())
            formats.push_back(wanted(stream, encoderOf(*pipe_, stream), asks));
    }
    if (asks) pictures_ = std::move(formats);
}

void PresetPlanner::takeSounds() {
    if (!pipe_) return;
    for (PlannedStream& stream : plan_.streams) {
        if (stream.isVideo()) continue;
        takeEncoder(stream);
        if (!known_ || static_cast<size_t>(stream.number) >= known_->sounds.size())
            takeSound(stream, encoderOf(*pipe_, stream));
    }
}

void PresetPlanner::takeEncoder(PlannedStream& stream) {
    QvEncoder& encoder = plan_.preset->addStream(*pipe_, stream.type);
    stream.module = encoder.name();
    const size_t known = !known_ ? 0 : stream.isVideo() ? known_->pictures.size() : known_->sounds.size();
    if (options_.fit && static_cast<size_t>(stream.number) >= known)
        options_.fit(stream.type, stream.part.input, stream.part.stream, encoder);
    stream.set = options_.encoders.text(stream.type);
    setEncoder(encoder, stream.type, options_.encoders, plan_.output.name);
}

PictureFormat PresetPlanner::wanted(const PlannedStream& stream, const QvCodec& encoder, bool& asks) const {
    const bool png = plan_.output.kind == OutputKind::pictures;
    PictureFormat format = PictureEffects(effects_, stream.picture, png).out();
    const PresetPicture asked =
        plan_.preset->picture(encoder, stream.number, static_cast<bool>(options_.fit));
    if (!asked.any()) return format;
    asks = true;
    if (effects_.size.empty() && effects_.fit.empty() && (asked.width || asked.height)) {
        format.width = asked.width.value_or(format.width);
        format.height = asked.height.value_or(format.height);
        format.aspect = aspectOf(encoder, format);
    }
    if (effects_.rate.empty() && asked.rate) format.rate = *asked.rate;
    if (effects_.pixel.empty() && asked.fourcc) format.fourcc = *asked.fourcc;
    return format;
}

void PresetPlanner::takeSound(PlannedStream& stream, const QvCodec& encoder) const {
    const PresetSound asked = plan_.preset->sound(encoder, stream.number, static_cast<bool>(options_.fit));
    SoundFormat& sound = stream.sound;
    if (!options_.samplerate && asked.samplerate) sound.samplerate = *asked.samplerate;
    if (!options_.samplerate) sound.samplerate = rateIn(plan_.output.muxer(), sound.samplerate);
    if (!options_.channels && options_.sound.map.empty() && asked.channels) sound.channels = *asked.channels;
    if (!options_.bits && asked.bits) sound.bits = *asked.bits;
}

// Sets the colour description of the first segment of a join; later ones can only be compared with it.
void PresetPlanner::setColours(const PlannedStream& stream, QvCodec& encoder) const {
    const PictureFormat& in = plan_.source(stream).picture;
    const std::string& name = plan_.input(stream).name;
    if (known_ && static_cast<size_t>(stream.number) < known_->pictures.size()) {
        if (isWide(in.colours) != isWide(known_->pictures[static_cast<size_t>(stream.number)].colours))
            plan_.warnings.push_back(lineOf(Msg::coloursDiffer, {name}));
        return;
    }
    PictureFormat out = stream.picture;
    try {
        const Any taken = encoder.getParam("selectedFOURCC");
        if (taken.isInt()) out.fourcc = static_cast<unsigned>(taken.asInt32(0));
        const bool resized = out.width != in.width || out.height != in.height || out.fourcc != in.fourcc;
        const bool converted = resized || !stream.chain.empty();
        const Colours colours = effects_.matrix.empty() ? coloursOf(in, out, converted) : Colours{};
        if (isWide(in.colours) && !isWide(colours))
            plan_.warnings.push_back(lineOf(Msg::coloursLost, {name}));
        for (const auto& [key, value] :
             {std::pair{"colourPrimaries", colours.primaries}, std::pair{"colourTransfer", colours.transfer},
              std::pair{"colourSpace", colours.space}})
            encoder.setParam(key, value);
    } catch (const QvParamException&) {  // it has no such parameters
    }
}

void PresetPlanner::settle() {
    if (!pipe_) return;
    for (PlannedStream& stream : plan_.streams) {
        QvEncoder& encoder = encoderOf(*pipe_, stream);
        const QvPreset* const preset = &plan_.preset->preset();
        if (stream.isVideo())
            checkPictureRanges(preset, encoder, stream.picture.width, stream.picture.height,
                               stream.picture.rate);
        else
            checkSoundRanges(preset, encoder, stream.sound.samplerate, stream.sound.channels,
                             stream.sound.bits);
        if (stream.isVideo() && !options_.encoders.sets("type"))
            takeForm(encoder, stream.picture.fourcc, !effects_.pixel.empty());
        setFormat(encoder, stream);
        if (stream.isVideo()) {
            setColours(stream, encoder);
            checkQuality(encoder);
        } else {
            setSoundRate(encoder, options_.encoders);
        }
        encoder.store(stream.codec);
    }
}
