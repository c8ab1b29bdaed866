#include "tarsel/job/task/join.h"

#include <algorithm>
#include <map>

#include "tarsel/job/task/divide.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

const PlannedStream* findStream(const JobPlan& plan, int type, int number) {
    const auto found = std::find_if(plan.streams.begin(), plan.streams.end(), [&](const PlannedStream& s) {
        return s.type == type && s.number == number;
    });
    return found == plan.streams.end() ? nullptr : &*found;
}

// The picture decides how long a segment is; without one the shortest sound does.
MediaTime lengthOf(const JobPlan& plan) {
    const PlannedStream* leading = nullptr;
    MediaTime shortest;
    for (const PlannedStream& stream : plan.streams) {
        if (leading && leading->isVideo() && !stream.isVideo()) continue;
        const QvRatio rate =
            stream.isVideo() ? stream.picture.rate.rate() : QvRatio(stream.sound.samplerate, 1);
        const MediaTime length = qvInstantOf(stream.isVideo() ? stream.expected : stream.own, rate);
        if (leading && leading->type == stream.type && shortest <= length) continue;
        leading = &stream;
        shortest = length;
    }
    return shortest;
}

// A part begins and ends with a frame of its picture, as it does in a job of one part; its sound goes with
// it.
void alignToFrames(const JobPlan& plan, StreamPart& part) {
    const PlannedStream* const video = findStream(plan, qvVideoStream, 0);
    if (!video || part.whole) return;
    const QvFramerate& rate = plan.source(*video).picture.rate;
    const QvFrameRange frames(video->part.in, video->part.out, rate);
    const auto aligned = [&](const MediaTime& point) {
        if (point == video->part.in) return qvInstantOf(frames.start, rate.rate());
        return point == video->part.out ? qvInstantOf(frames.stop + 1LL, rate.rate()) : point;
    };
    part.in = aligned(part.in);
    part.out = aligned(part.out);
}

class StateBuilder {
  public:
    StateBuilder(const Join& join) : join_(join), streams_(join.streams()) {
        for (const AnyDict& input : join.inputs) files_.append(input);
    }

    AnyDict build(const AnyDict& encoder, const std::string& output) {
        std::vector<AnyVector> sources(streams_.size());
        SegmentPlace place;
        place.ofCuts = join_.ofCuts;
        for (const JoinedSegment& segment : join_.segments) {
            for (size_t i = 0; i < streams_.size(); ++i)
                sources[i].append(sourceOf(segment, streams_[i], place));
            place.before += lengthInFrames(segment);
        }
        AnyVector streams;
        for (size_t i = 0; i < streams_.size(); ++i)
            streams.append(AnyDict("type", streams_[i].type, "sources", Any(sources[i])));
        return stateOf(encoder, output, streams);
    }

    AnyDict buildSound(int sound, const AnyDict& encoder) {
        const auto stream = std::find_if(streams_.begin(), streams_.end(),
                                         [&](const auto& s) { return !s.isVideo() && s.number == sound; });
        AnyVector sources;
        for (const JoinedSegment& segment : join_.segments) sources.append(soundOf(segment, *stream));
        AnyVector streams;
        streams.append(AnyDict("type", qvAudioStream, "sources", Any(sources)));
        return stateOf(encoder, "", streams);
    }

  private:
    AnyDict stateOf(const AnyDict& encoder, const std::string& output, const AnyVector& streams) const {
        AnyDict state("__version__", "2.0", "__class__", "TranscodeTask");
        state.set("encoder", encoder);
        if (!output.empty()) state.set("filename", output.c_str());
        state.set("files", files_);
        state.set("streams", streams);
        return state;
    }

    // At the rate of the output's first picture; 0 without one.
    long long lengthInFrames(const JoinedSegment& segment) const {
        if (const PlannedStream* const video = findStream(segment.plan, qvVideoStream, 0))
            return video->expected;
        const auto video =
            std::find_if(streams_.begin(), streams_.end(), [](const auto& s) { return s.isVideo(); });
        return video == streams_.end() ? 0 : blackFrames(lengthOf(segment.plan), video->picture.rate);
    }

    // Rounded up, so that none of the sound that goes with it is lost.
    static long long blackFrames(const MediaTime& length, const QvFramerate& rate) {
        const long long whole = length.position(rate);
        return std::max(1LL, qvInstantOf(whole, rate.rate()) < length ? whole + 1 : whole);
    }

    AnyDict sourceOf(const JoinedSegment& segment, const PlannedStream& stream, SegmentPlace place) {
        const PlannedStream* const own = findStream(segment.plan, stream.type, stream.number);
        if (!own) return generated(segment, stream);
        PlannedStream divided = *own;
        alignToFrames(segment.plan, divided.part);
        place.first = own->isVideo() ? own->part.in.position(own->picture.rate) : 0;
        place.rate = own->picture.rate;
        moveTexts(divided.filters, place);
        return read(segment, divided);
    }

    AnyDict soundOf(const JoinedSegment& segment, const PlannedStream& stream) {
        const PlannedStream* const own = findStream(segment.plan, qvAudioStream, stream.number);
        if (!own) return generated(segment, stream);
        PlannedStream alone = *own;
        alignToFrames(segment.plan, alone.part);
        alone.part.whole = false;
        alone.part.out = std::min(alone.part.out, alone.part.in + lengthOf(segment.plan));
        alone.conversion.dither = AudioConversion().dither;
        return read(segment, alone);
    }

    AnyDict read(const JoinedSegment& segment, const PlannedStream& stream) const {
        AnyDict source("file", inputOf(segment, stream).get("filename"));
        source.set("stream", Any(Pair(stream.type, stream.part.stream)));
        source.set("process", static_cast<const AnyDict&>(stream.params()));
        return source;
    }

    const AnyDict& inputOf(const JoinedSegment& segment, const PlannedStream& stream) const {
        return join_.inputs[static_cast<size_t>(segment.inputs[static_cast<size_t>(stream.part.input)])];
    }

    AnyDict generated(const JoinedSegment& segment, const PlannedStream& stream) {
        const MediaTime length = lengthOf(segment.plan);
        AnyDict content;
        if (stream.isVideo()) {
            const PictureFormat& format = stream.picture;
            content = AnyDict("content", "black", "width", format.width, "height", format.height);
            content.set("framerate", Any(format.rate));
            content.set("frameAspect", format.aspect);
            content.set("frames", Any(blackFrames(length, format.rate)));
        } else {
            const SoundFormat& format = stream.sound;
            content =
                AnyDict("content", "silence", "samplerate", format.samplerate, "channels", format.channels);
            content.set("bitsPerSample", std::max(format.bits, 16));
            content.set("duration", Any(length));
        }
        return AnyDict("file", generatedFile(stream, content).c_str(), "stream", Any(Pair(stream.type, 0)),
                       "process", Any(AnyDict()));
    }

    // One entry for each different content.
    std::string generatedFile(const PlannedStream& stream, const AnyDict& content) {
        for (const auto& [known, name] : generated_)
            if (known == content) return name;
        AnyVector one;
        one.append(content);
        const AnyDict streams(stream.isVideo() ? "vids" : "auds", Any(one));
        const std::string name =
            std::string(stream.isVideo() ? "black " : "silence ") + std::to_string(generated_.size() + 1);
        files_.append(AnyDict("filename", name.c_str(), "decoder",
                              Any(AnyDict("name", "testgen", "streams", Any(streams)))));
        generated_.emplace_back(content, name);
        return name;
    }

    const Join& join_;
    std::vector<PlannedStream> streams_;
    AnyVector files_;
    std::vector<std::pair<AnyDict, std::string>> generated_;
};

}  // namespace

std::vector<PlannedStream> Join::streams() const {
    std::map<std::pair<int, int>, const PlannedStream*> all;  // by type and number
    for (const JoinedSegment& segment : segments)
        for (const PlannedStream& stream : segment.plan.streams)
            all.try_emplace({stream.type, stream.number}, &stream);
    std::vector<PlannedStream> streams;
    for (const auto& [address, stream] : all) streams.push_back(*stream);
    return streams;
}

AnyDict joinedState(const Join& join, const AnyDict& encoder, const std::string& output) {
    return StateBuilder(join).build(encoder, output);
}

AnyDict joinedSoundState(const Join& join, int sound, const AnyDict& encoder) {
    return StateBuilder(join).buildSound(sound, encoder);
}
