#include "tarsel/split/parttask.h"

#include <algorithm>

#include "tarsel/job/plan/timecodes.h"
#include "tarsel/job/task/divide.h"
#include "tarsel/job/task/storedtask.h"

namespace {

constexpr int kSide = 2;  // pixels: width and height of the placeholder picture, see soundTask

// Removes the other streams: sound if `video`, otherwise video.
void keepStreams(AnyDict& state, bool video) {
    AnyVector kept;
    for (const Any& stream : state.getVector("streams"))
        if ((stream.asDict().getInt32("type", 0) == qvVideoStream) == video) kept.append(stream);
    state.set("streams", kept);
}

// A part of a film is its recorded units; of other outputs, one raw file for each stream.
void setPartOutput(AnyDict& encoder, const JobPlan& plan) {
    std::string muxer = "rawmux";
    int profile = QvProfile::raw;
    if (isFilm(plan)) {
        muxer = recorderOf(plan);
        const QvModule* const module = qv_registry()->module(muxer.c_str());
        if (module) profile = module->getAttr("profile").asInt32(profile);
    }
    encoder.set("muxer", AnyDict("name", muxer.c_str()));
    encoder.set("profile", profile);
    encoder.remove("presetName");
}

void setOutput(AnyDict& state, AnyDict encoder, const std::string& output) {
    encoder.set("filename", output.c_str());
    state.set("encoder", encoder);
    state.set("filename", output.c_str());
    state.remove("postProcess");
    state.remove(kSplitKey);
}

// The time in the input of a frame of the output, a multiple of splitUnit: a frame of the input begins there.
MediaTime inputTimeOf(const JobPlan& plan, const PlannedStream& picture, long long frame) {
    const QvFramerate& in = plan.source(picture).picture.rate;
    const QvRatio from = in.rate(), to = picture.picture.rate.rate();
    const long long start = QvFrameRange(picture.part.in, picture.part.out, in).start;
    const long long frames = frame * from.num * to.den / (static_cast<long long>(from.den) * to.num);
    return qvInstantOf(start + frames, from);
}

// Fades count frames from the start of the output; in a part they have to count from there, too.
void moveFades(FiltersState& filters, long long first) {
    const AnyVector names = filters.names();
    for (int i = 0; i < filters.count(); ++i) {
        if (!(names.at(i) == "videofade")) continue;
        AnyDict filter = filters.filterAt(i);
        AnyDict state = filter.get("state").isDict() ? filter.get("state").asDict() : AnyDict();
        state.set("first_frame", Any(static_cast<int>(first + state.getInt32("first_frame", 0))));
        filter.set("state", state);
        filters.setFilterAt(i, filter);
    }
}

// Limits the process to the part: its in and out points, and what filters count from the start.
void divideProcess(ProcessParams& process, const JobPlan& plan, const SplitPlan& split, size_t part) {
    const PlannedStream& picture = pictureOf(plan);
    const long long first = split.first(part) - split.lead(part);
    const bool last = part + 1 == split.parts();
    const MediaTime in = first == 0 ? picture.part.in : inputTimeOf(plan, picture, first);
    const MediaTime out = last ? picture.part.out : inputTimeOf(plan, picture, split.points[part + 1]);
    process.setInOutPoints(InOutPoints(in, out));
    if (!last && process.holdLast()) process.setHoldLast(false);
    auto filters = process.filters();
    if (!filters) return;
    SegmentPlace place;
    place.before = first;
    place.rate = picture.picture.rate;
    place.ofCuts = true;  // times of texts and numbers of frames are those of the input
    moveTexts(*filters, place);
    moveFades(*filters, first);
    process.setFilters(*filters);
}

// For encoders that write a timecode into the stream: that of the part's first frame.
void moveTimecode(AnyDict& encoder, const PlannedStream& picture, long long first) {
    AnyVector streams = encoder.getVector("streams");
    AnyDict stream = streams.at(0).asDict();
    if (!stream.get("codec").isDict()) return;
    AnyDict codec = stream.get("codec").asDict();
    if (!codec.get("settingsDict").isDict()) return;
    AnyDict settings = codec.get("settingsDict").asDict();
    const std::string text = settings.get("timecode").asString("");
    if (text.empty()) return;
    const QvFramerate& rate = picture.picture.rate;
    const std::string moved = movedTimecode(text, rate, rate, [&](const QvFramerate&) { return first; });
    settings.set("timecode", moved.c_str());
    codec.set("settingsDict", settings);
    stream.set("codec", codec);
    streams.set(0, stream);
    encoder.set("streams", streams);
}

AnyDict placeholderFile(const PlannedStream& picture, const std::string& name) {
    AnyDict decoder("name", "rawdec", "FOURCC", "I420", "width", kSide, "height", kSide);
    decoder.set("framerate", Any(picture.picture.rate));
    return AnyDict("filename", name.c_str(), "decoder", Any(decoder));
}

AnyDict placeholderEncoder(const PlannedStream& picture) {
    AnyDict settings("type", static_cast<int>(QvFourcc::I420), "width", kSide, "height", kSide);
    settings.set("framerate", Any(picture.picture.rate));
    const AnyDict codec("name", "rawvenc", "settingsDict", Any(settings));
    return AnyDict("type", qvVideoStream, "codec", Any(codec), "stream", Any(AnyDict()));
}

}  // namespace

AnyDict pictureTask(const AnyDict& whole, const JobPlan& plan, const SplitPlan& split, size_t part,
                    const std::string& output) {
    AnyDict state = whole;
    keepStreams(state, true);
    AnyVector streams = state.getVector("streams");
    AnyDict stream = streams.at(0).asDict();
    AnyVector sources = stream.getVector("sources");
    AnyDict source = sources.at(0).asDict();
    ProcessParams process(source.get("process").isDict() ? source.get("process").asDict() : AnyDict());
    divideProcess(process, plan, split, part);
    source.set("process", static_cast<const AnyDict&>(process));
    sources.set(0, source);
    stream.set("sources", sources);
    streams.set(0, stream);
    state.set("streams", streams);

    AnyDict encoder = state.get("encoder").asDict();
    keepStreams(encoder, true);
    moveTimecode(encoder, pictureOf(plan), split.first(part) - split.lead(part));
    if (plan.output.kind == OutputKind::pictures) {
        AnyDict muxer = encoder.get("muxer").asDict();
        muxer.set("firstPicture", static_cast<int>(split.first(part) - split.lead(part)));
        muxer.set("allPictures", static_cast<int>(pictureOf(plan).expected));
        encoder.set("muxer", muxer);
    } else {
        setPartOutput(encoder, plan);
    }
    setOutput(state, encoder, output);
    return state;
}

long long placeholderBytes(const JobPlan& plan) { return pictureOf(plan).expected * kSide * kSide * 3 / 2; }

AnyDict soundTask(const AnyDict& whole, const JobPlan& plan, const std::string& placeholder,
                  const std::string& output) {
    const PlannedStream& picture = pictureOf(plan);
    AnyDict state = whole;
    AnyVector files = state.getVector("files");
    files.append(placeholderFile(picture, placeholder));
    state.set("files", files);
    AnyVector streams;
    for (const Any& one : whole.getVector("streams")) {
        AnyDict stream = one.asDict();
        if (stream.getInt32("type", 0) == qvVideoStream) {
            AnyDict source("file", placeholder.c_str(), "stream", Any(Pair(qvVideoStream, 0)), "process",
                           Any(AnyDict()));
            AnyVector sources;
            sources.append(source);
            stream.set("sources", sources);
        }
        streams.append(stream);
    }
    state.set("streams", streams);

    AnyDict encoder = state.get("encoder").asDict();
    AnyVector encoders;
    for (const Any& one : encoder.getVector("streams"))
        encoders.append(one.asDict().getInt32("type", 0) == qvVideoStream ? Any(placeholderEncoder(picture))
                                                                          : one);
    encoder.set("streams", encoders);
    setPartOutput(encoder, plan);
    setOutput(state, encoder, output);
    return state;
}
