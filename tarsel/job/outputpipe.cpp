#include "tarsel/job/outputpipe.h"

#include <string_view>
#include <utility>

#include "tarsel/job/plan/presetplan.h"
#include "tarsel/source/setting.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

void setOptional(QvCodec& codec, const char* name, const Any& value) {
    try {
        codec.setParam(name, value);
    } catch (const QvParamException&) {  // not one of its parameters
    }
}

// Whether a parameter is left to the multiplexer.
bool isOpen(const QvCodec& codec, const char* name) {
    try {
        return codec.getParam(name) == Any(-1);
    } catch (const QvParamException&) {  // not one of its parameters
        return false;
    }
}

void setStreamOptional(QvMuxer& muxer, const PlannedStream& stream, const char* name, const Any& value) {
    try {
        muxer.setStreamParam(stream.type, stream.number, name, value);
    } catch (const QvParamException&) {  // not one of its parameters
    }
}

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
    const bool toStream = output.isStream() || output.place == OutputPlace::nullDevice;
    if (output.splitChannels && !toStream) setChecked(m, "splitAudio", 1, "--split-channels");
    for (const auto& [key, value] : output.muxerSettings)
        setGuessed(m, key, value, std::string("--muxer ") + m.name());
}

void addStream(QvEncodePipe& pipe, const OutputForm& output, const PlannedStream& stream) {
    if (pipe.addStream(stream.type, Any(stream.encoder().c_str())) < 0)
        throw failure(Msg::outputNoStream, {output.name, stream.isVideo() ? "picture" : "sound"});
    setFormat(*pipe.encoder(stream.type, stream.number), stream);
}

// What a multiplexer has already, as that of a stored task, stays.
void setTags(QvEncodePipe& pipe, const JobPlan& plan) {
    if (plan.output.kind != OutputKind::module) return;
    QvMuxer& muxer = *pipe.getMuxer();
    if (plan.tags) setOptional(muxer, "tags", Any(*plan.tags));
    const Any timecode = plan.tags ? plan.tags->get("timecode").toString() : Any();
    for (const PlannedStream& stream : plan.streams)
        if (stream.isVideo() && timecode.isString())
            setOptional(*pipe.encoder(stream.type, stream.number), "timecode", timecode);
    for (const PlannedStream& stream : plan.streams)
        for (const auto& [name, text] :
             {std::pair{"language", &stream.language}, std::pair{"title", &stream.title}})
            if (!text->empty()) setStreamOptional(muxer, stream, name, Any(text->c_str()));
}

// The settings of the streams are those that the plan has found.
std::unique_ptr<QvEncodePipe> presetPipe(const JobPlan& plan) {
    auto pipe = plan.preset->makePipe(plan.output.muxer());
    setMuxer(*pipe, plan.output);
    for (const PlannedStream& stream : plan.streams) {
        QvEncoder& encoder = plan.preset->addStream(*pipe, stream.type);
        encoder.restore(stream.codec);
        setFormat(encoder, stream);
    }
    return pipe;
}

std::unique_ptr<QvEncodePipe> plainPipe(const JobPlan& plan) {
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
    return pipe;
}

}  // namespace

std::unique_ptr<QvEncodePipe> makeOutputPipe(const JobPlan& plan, bool acceptPartial) {
    auto pipe = plan.preset ? presetPipe(plan) : plainPipe(plan);
    fitToPlace(*pipe, plan, acceptPartial);
    return pipe;
}

void fitToPlace(QvEncodePipe& pipe, const JobPlan& plan, bool acceptPartial) {
    const bool toStream = plan.output.isStream();
    QvMuxer& muxer = *pipe.getMuxer();
    const bool raw = std::string_view(muxer.name()) == "rawmux";
    if (raw) muxer.setParam("exactName", toStream ? 1 : 0);
    // What was written to a stream can't be gone back to. A file is said to be one: a multiplexer that looks
    // by itself, and can't, would take it for a pipe.
    if (!raw && (toStream || (plan.output.isFiles() && isOpen(muxer, "seekable"))))
        setOptional(muxer, "seekable", toStream ? 0 : 1);
    setTags(pipe, plan);
    if (!raw || !toStream || acceptPartial) return;
    for (const PlannedStream& stream : plan.streams)
        if (!stream.isVideo())
            muxer.stream(stream.type, stream.number)->setParam("expectedSamples", Any(stream.expected));
}
