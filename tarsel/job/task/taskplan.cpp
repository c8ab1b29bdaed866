#include "tarsel/job/task/taskplan.h"

#include <algorithm>
#include <cstring>

#include "tarsel/job/plan/filmtags.h"
#include "tarsel/job/plan/lengths.h"
#include "tarsel/job/plan/soundplan.h"
#include "tarsel/presets/outputpreset.h"
#include "tarsel/words/messages.h"

namespace {

bool has(const QvEncodePipe& pipe, int type) { return pipe.nrStreams(type) > 0; }

// Encoders of a plug-in may write their own files through the multiplexer of raw ones.
bool isRaw(const QvEncodePipe& pipe) {
    for (int i = 0; i < pipe.nrStreams(); ++i) {
        const QvCodec* const encoder = pipe.streamAt(i)->encoder;
        if (encoder && !isRawEncoder(*encoder)) return false;
    }
    return true;
}

bool isOn(const QvCodec& codec, const char* param) {
    try {
        return codec.getParam(param).isTrue();
    } catch (const QvParamException&) {  // not one of its parameters
        return false;
    }
}

void readPicture(const QvCodec& encoder, PictureFormat& format) {
    const auto ask = [&](const char* name) { return encoder.getParam(name); };
    format.width = ask("width").asInt32(format.width);
    format.height = ask("height").asInt32(format.height);
    if (const Any rate = ask("framerate"); rate.isFramerate()) format.rate = rate.asFramerate();
    const Any type = std::strcmp(encoder.name(), "rawvenc") == 0 ? ask("type") : ask("FOURCC");
    format.fourcc = static_cast<unsigned>(type.asInt32(static_cast<int>(format.fourcc)));
}

void readSound(const QvCodec& encoder, SoundFormat& format) {
    const auto ask = [&](const char* name, int otherwise) {
        return encoder.getParam(name).asInt32(otherwise);
    };
    format = {ask("samplerate", format.samplerate), ask("channels", format.channels),
              ask("bitsPerSample", format.bits)};
}

// Sound that ends after its stream is sound that comes later.
void readPoints(const ProcessParams& params, const MediaTime& length, PlannedStream& stream) {
    StreamPart& part = stream.part;
    part.out = length;
    const auto points = params.inOutPoints();
    if (!points || points->count() == 0) return;
    part.whole = false;
    part.in = points->inPoint();
    const MediaTime out = points->outPoint();
    const bool held = stream.isVideo() && params.holdLast();
    if (out > MediaTime() && (out < length || held)) part.out = out;
    if (out > length && !stream.isVideo()) stream.delayed = out - length;
}

void readFilters(PlannedStream& stream, FilterFiles& files) {
    stream.chain = describe(stream.filters);
    changeFilterFiles(stream.filters, [&](const std::string& file, const char* filter, bool writes) {
        if (writes)
            files.written.push_back({file, filter});
        else
            files.read.push_back(file);
        return file;
    });
}

PlannedStream plannedStream(JobPlan& plan, const TransLink& link, int input) {
    PlannedStream stream;
    stream.type = link.type();
    stream.number = link.encStreamNr();
    stream.part.input = input;
    stream.part.stream = link.decStreamNr();
    const InputStream& source = plan.source(stream);
    const QvCodec& encoder = *link.encoder()->encoder(stream.type, stream.number);
    stream.module = encoder.name();
    stream.picture = source.picture;
    stream.sound = source.sound;
    stream.isVideo() ? readPicture(encoder, stream.picture) : readSound(encoder, stream.sound);
    if (stream.isVideo() && isOn(encoder, "twoPass")) stream.set = "two passes";
    const ProcessParams& params = link.processParams();
    readPoints(params, source.end(), stream);
    stream.hold = params.holdLast();
    if (params.audioChannelMap()) stream.channelMap = *params.audioChannelMap();
    if (const auto conversion = params.audioConversion()) stream.conversion = *conversion;
    if (const auto filters = params.filters()) stream.filters = *filters;
    readFilters(stream, plan.filterFiles);
    if (stream.isVideo() || stream.filters.empty()) return stream;
    const AnyVector filters = stream.filters.getVector("customFilters");
    stream.skipped = skippedSound(filters, source.sound, stream.sound);
    for (const Any& filter : filters)
        if (filter.isDict()) checkChannels(filter.asDict(), source.sound, stream.sound);
    return stream;
}

bool hasTags(const StoredTask& task) {
    try {
        return task.task().encoder()->getMuxer()->QvCodec::getParam("tags").isDict();
    } catch (const QvParamException&) {  // not one of its parameters
        return false;
    }
}

}  // namespace

OutputKind taskOutputKind(const StoredTask& task) {
    const QvEncodePipe& pipe = *task.task().encoder();
    const QvMuxer* const muxer = pipe.getMuxer();
    const std::string name = muxer ? muxer->name() : "nullmux";
    if (name == "nullmux") return OutputKind::nothing;
    if (name == "rawavimux") return OutputKind::avi;
    if (name != "rawmux" || !isRaw(pipe)) return OutputKind::module;
    if (!has(pipe, qvVideoStream)) return OutputKind::wav;
    return isOn(*muxer, "rawAsPng") ? OutputKind::pictures : OutputKind::raw;
}

JobPlan planTask(const StoredTask& task, const OutputForm& output, std::vector<JobInput> inputs,
                 bool acceptPartial) {
    JobPlan plan;
    plan.output = output;
    plan.inputs = std::move(inputs);
    checkDamage(plan, acceptPartial);
    if (output.takesOneStream() && task.task().nrLinks() != 1)
        throw failure(Msg::taskManyStreams, {output.name, std::to_string(task.task().nrLinks())});
    const QvDPipeList& decoders = task.task().decoders();
    for (const TransLink* const link : task.task().links())
        plan.streams.push_back(plannedStream(plan, *link, decoders.indexOf(link->decoder())));
    if (plan.streams.empty()) throw failure(Msg::taskRefused, {task.name(), "nothing feeds its output"});
    planFrames(plan);
    planSamples(plan);
    if (task.isJoin()) plan.notes.clear();  // silence may be anywhere
    if (output.kind == OutputKind::module && !task.isJoin() && !hasTags(task))
        plan.tags = filmTags({&plan}, {});
    return plan;
}
