#include "tarsel/job/outputpipe.h"

#include <string_view>
#include <utility>

#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

void setMuxer(QvEncodePipe& pipe, const OutputForm& output) {
    const char* muxer = output.muxer();
    if (std::string_view(pipe.getMuxer() ? pipe.getMuxer()->name() : "") != muxer &&
        pipe.setMuxer(muxer) != QvStatus::ok)
        throw failure(Msg::muxerUnusable, {muxer, pipe.errorDesc()});
    QvMuxer& m = *pipe.getMuxer();
    if (output.kind == OutputKind::pictures && !output.writesNothing()) {
        m.setParam("splitVideo", 1);
        m.setParam("rawAsPng", 1);
    }
    const bool toStream = output.takesOneStream() || output.place == OutputPlace::nullDevice;
    if (output.splitChannels && !toStream) setChecked(m, "splitAudio", 1, "--split-channels");
}

void setPicture(QvEncoder& encoder, const PictureFormat& picture) {
    setChecked(encoder, "type", static_cast<int>(picture.fourcc), "--pixel");
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

void addStream(QvEncodePipe& pipe, const OutputForm& output, const PlannedStream& stream) {
    if (pipe.addStream(stream.type, Any(stream.encoder().c_str())) < 0)
        throw failure(Msg::outputNoStream, {output.name, stream.isVideo() ? "picture" : "sound"});
    QvEncoder& encoder = *pipe.encoder(stream.type, stream.number);
    stream.isVideo() ? setPicture(encoder, stream.picture) : setSound(encoder, stream.sound);
}

}  // namespace

std::unique_ptr<QvEncodePipe> makeOutputPipe(const JobPlan& plan, bool acceptPartial) {
    const OutputForm& output = plan.output;
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    if (!pipe) throw failure(Msg::outputNoModule, {output.name});
    // The first preset, with which a pipe begins, may be one of a plug-in.
    const bool toAvi = output.kind == OutputKind::avi && !output.writesNothing();
    if (toAvi && !qvPresetMgr()->profileAvailable(QvProfile::aviRaw))
        throw failure(Msg::aviNoModule, {output.name});
    pipe->applyPreset(toAvi ? QvProfile::aviRaw : QvProfile::raw, 0);
    pipe->clearStreams();
    setMuxer(*pipe, output);
    for (const PlannedStream& stream : plan.streams) addStream(*pipe, output, stream);
    fitToPlace(*pipe, plan, acceptPartial);
    return pipe;
}

void fitToPlace(QvEncodePipe& pipe, const JobPlan& plan, bool acceptPartial) {
    const bool toStream = plan.output.takesOneStream();
    QvMuxer& muxer = *pipe.getMuxer();
    if (std::string_view(muxer.name()) == "rawmux") muxer.setParam("exactName", toStream ? 1 : 0);
    if (!toStream || acceptPartial) return;
    for (const PlannedStream& stream : plan.streams)
        if (!stream.isVideo())
            muxer.stream(stream.type, stream.number)->setParam("expectedSamples", Any(stream.expected));
}
