#include "core/transcode/batch/joinedsegments_p.h"

#include <algorithm>
#include <limits>
#include <memory>
#include <set>
#include <string>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"

using qvlist::at;
using qvlist::inRange;
using qvlist::sizeOf;

namespace {

template <class Streams>
MediaTime shortest(const Streams& streams) {
    MediaTime length;
    for (const auto& stream : streams)
        if (stream == streams.front() || stream->span().duration() < length)
            length = stream->span().duration();
    return length;
}

}  // namespace

const QvIStream* BatchSegment::input(int type, int stream) const {
    if (type == qvVideoStream && inRange(stream, videos)) return &at(videos, stream)->input();
    if (type == qvAudioStream && inRange(stream, audios)) return &at(audios, stream)->input();
    return nullptr;
}

AnyVector JoinedSegments::storedFiles() const {
    AnyVector files;
    std::set<std::string> known;
    const auto add = [&](const QvIStream& input) {
        const Any name = input.filename().toString();
        if (!known.insert(name.asString("")).second) return;
        AnyDict decoder;
        input.decoder->store(decoder);
        files.append(AnyDict("filename", input.filename(), "decoder", Any(decoder)));
    };
    for (const BatchSegment& segment : segments) {
        for (const auto& video : segment.videos) add(video->input());
        for (const auto& audio : segment.audios) add(audio->input());
    }
    return files;
}

AnyVector JoinedSegments::storedSources(const Pair& address) const {
    AnyVector sources;
    for (const BatchSegment& segment : segments) {
        const QvIStream* input = segment.input(address.first, address.second);
        if (!input) return AnyVector();
        AnyDict source("file", input->filename(), "stream", Any(Pair(input->type, input->number)));
        source.set("process", static_cast<const AnyDict&>(input->params));
        sources.append(Any(source));
    }
    return sources;
}

// A conversion would be passed by.
bool JoinedSegments::smartParams(const Pair& address, AnyDict& out) const {
    const auto [type, stream] = address;
    AnyVector parts;
    Any name;
    for (const BatchSegment& segment : segments) {
        const QvIStream* from = segment.input(type, stream);
        if (!from) return false;
        const QvIStream& input = *from;
        const bool video = type == qvVideoStream;
        if (video && at(segment.videos, stream)->converts()) return false;
        const SegmentSpan span = video
                                     ? at(segment.videos, stream)->span(at(videoJobs, stream).outFramerate)
                                     : at(segment.audios, stream)->span(at(audioJobs, stream).outSamplerate);
        Any answer = Pair(type, input.number);
        input.decoder->getParam("srParams", answer);
        if (!answer.isDict() || answer.asDict().empty()) return false;
        AnyDict part = answer.asDict();
        if (!name.isValid())
            name = part.get("decoder_name").isText() ? part.get("decoder_name") : Any(input.decoder->name());
        part.set("frame0", Any(span.first));
        part.set("nrFrames", Any(span.count));
        parts.append(part);
    }
    if (parts.empty()) return false;
    out = AnyDict("join_decoder", 1, "decoder_name", name, "segments", parts);
    return true;
}

int JoinedSegments::frameTotal(int stream) const {
    long long total = 0;
    for (const BatchSegment& segment : segments)
        if (inRange(stream, segment.videos))
            total += at(segment.videos, stream)->span(at(videoJobs, stream).outFramerate).owed;
    return static_cast<int>(std::min<long long>(total, std::numeric_limits<int>::max()));
}

long long JoinedSegments::clippedSamples(int stream) const {
    long long total = 0;
    for (const BatchSegment& segment : segments)
        if (inRange(stream, segment.audios)) total += at(segment.audios, stream)->clipped();
    return total;
}

long long JoinedSegments::sampleTotal(int stream) const {
    long long total = 0;
    for (const BatchSegment& segment : segments)
        if (inRange(stream, segment.audios))
            total += at(segment.audios, stream)->span(at(audioJobs, stream).outSamplerate).owed;
    return total;
}

long long JoinedSegments::soundTotal(int stream) const {
    if (videoJobs.empty())
        return inRange(stream, totalSamples) ? at(totalSamples, stream) : sampleTotal(stream);
    long long most = 0;
    for (int i = 0; i < sizeOf(videoJobs); ++i) {
        const QvFramerate& rate = at(videoJobs, i).outFramerate;
        const int frames = inRange(i, totalFrames) ? at(totalFrames, i) : frameTotal(i);
        if (rate.rate().ratio() > 0)
            most =
                std::max(most, QvUtil::samplesForFrames(frames, rate, at(audioJobs, stream).outSamplerate));
    }
    return most;
}

int JoinedSegments::prepare() {
    why.clear();
    const BatchSegment* before = nullptr;
    for (int i = 0; i < sizeOf(segments); ++i) {
        BatchSegment& segment = at(segments, i);
        qv_dbg()->info("[BatchDecoder] Opening segment %d", i);
        if (segment.videos.size() != videoJobs.size() || segment.audios.size() != audioJobs.size()) {
            why = "The streams of a segment are not those of the output.";
            return QvStatus::invalidStructure;
        }
        for (int k = 0; k < sizeOf(videoJobs); ++k) {
            qv_dbg()->info("[BatchDecoder] Opening segment video stream %d", k);
            const SegmentVideo* like = before ? at(before->videos, k).get() : nullptr;
            if (const int result = at(segment.videos, k)->prepare(at(videoJobs, k), like, why)) return result;
        }
        for (int k = 0; k < sizeOf(audioJobs); ++k) {
            qv_dbg()->info("[BatchDecoder] Opening segment audio stream %d", k);
            const SegmentAudio* like = before ? at(before->audios, k).get() : nullptr;
            if (const int result = at(segment.audios, k)->prepare(at(audioJobs, k), like, why)) return result;
        }
        segment.length = segment.videos.empty() ? shortest(segment.audios) : shortest(segment.videos);
        before = &segment;
    }
    return QvStatus::ok;
}

void JoinedSegments::makeOutputs() {
    frames = std::vector<FrameWindow>(videoJobs.size());
    sounds = std::vector<SoundOutput>(audioJobs.size());
    totalFrames.clear();
    totalSamples.clear();
    for (int i = 0; i < sizeOf(videoJobs); ++i) totalFrames.push_back(frameTotal(i));
    for (int i = 0; i < sizeOf(audioJobs); ++i) {
        const AudioJobDescription& job = at(audioJobs, i);
        totalSamples.push_back(sampleTotal(i));
        at(sounds, i).buffer.init(job.outSamplerate, job.outChannels, (job.outBitsPerSample + 7) / 8,
                                  job.outSamplerate);
    }
    current = 0;
}

// Whether frames are read that say where a segment ends.
bool JoinedSegments::videoLeads() const {
    for (int i = 0; i < sizeOf(videoJobs); ++i)
        if (!isSmart(i)) return true;
    return false;
}

int JoinedSegments::startVideo(int segment, int stream) {
    return at(at(segments, segment).videos, stream)->start(why);
}

// Sound that lasts as long as the picture is there for the last fraction of a frame, too, so it has no end of
// its own, and a converter has what it looks ahead for; sound that the job cuts earlier has an end.
int JoinedSegments::startAudio(int segment, int stream) {
    BatchSegment& of = at(segments, segment);
    SegmentAudio& audio = *at(of.audios, stream);
    const bool bounded =
        of.videos.empty() || std::any_of(of.videos.begin(), of.videos.end(), [&](const auto& video) {
            return audio.span().duration() < video->span().duration();
        });
    return audio.start(bounded, why);
}

int JoinedSegments::startSegment() {
    for (int i = 0; i < sizeOf(videoJobs); ++i)
        if (!isSmart(i))
            if (const int result = startVideo(current, i)) return result;
    for (int i = 0; i < sizeOf(audioJobs); ++i) {
        if (const int result = startAudio(current, i)) return result;
        at(sounds, i).segment = current;
    }
    return QvStatus::ok;
}

int JoinedSegments::stopSegment(int segment) {
    int result = QvStatus::ok;
    const auto note = [&result](int stopped) {
        if (result == QvStatus::ok) result = stopped;
    };
    for (const auto& video : at(segments, segment).videos) note(video->stop(why));
    for (const auto& audio : at(segments, segment).audios) note(audio->stop(why));
    return result;
}

void JoinedSegments::logCounts(int segment) const {
    const BatchSegment& of = at(segments, segment);
    for (int i = 0; i < sizeOf(of.videos); ++i)
        if (!isSmart(i))
            qv_dbg()->info("[BatchDecoder]Segment %d, stream %d, frames read=%d", segment, i,
                           at(of.videos, i)->framesRead());
    for (int i = 0; i < sizeOf(of.audios); ++i)
        qv_dbg()->info("[BatchDecoder]Segment %d, stream %d, samples read=%lld", segment, i,
                       at(of.audios, i)->samplesRead());
}

void JoinedSegments::logStart() const {
    if (current >= sizeOf(segments))
        qv_dbg()->debug("[BatchDecoder] Last segment EOS");
    else
        qv_dbg()->info("[BatchDecoder] Starting new segment %d", current);
}

// The last segment stays open, because its last frame is still in use.
int JoinedSegments::nextSegment() {
    QV_ASSERT_MSG(current >= 0 && current < sizeOf(segments), "[BatchDecoder] _currentSegment out of range");
    logCounts(current);
    ++current;
    logStart();
    if (current >= sizeOf(segments)) return QvStatus::ok;
    for (FrameWindow& frame : frames) frame.forget();
    const int stopped = stopSegment(current - 1);
    const int started = startSegment();
    return stopped != QvStatus::ok ? stopped : started;
}

// Where sound leads, each stream goes to the next segment by itself.
int JoinedSegments::nextSound(int stream) {
    int& segment = at(sounds, stream).segment;
    const int stopped = at(at(segments, segment).audios, stream)->stop(why);
    if (++segment > current) {
        logCounts(current);
        current = segment;
        logStart();
    }
    const int started = segment < sizeOf(segments) ? startAudio(segment, stream) : QvStatus::ok;
    return stopped != QvStatus::ok ? stopped : started;
}

int JoinedSegments::readFrame(int stream) {
    // A task that has passed its pictures on in one run may encode them in the next.
    if (isSmart(stream)) smartStreams.remove(smartStreams.indexOf(Any(stream)));
    while (current < sizeOf(segments)) {
        QvFrame* frame = nullptr;
        int result = at(at(segments, current).videos, stream)->read(frame, why);
        if (result == QvStatus::ok) {
            result = at(frames, stream).show(*frame);
            if (result != QvStatus::ok) why = "The segment gives no picture";
            return result;
        }
        if (result == QvStatus::endOfStream) result = nextSegment();
        if (result != QvStatus::ok) return result;
    }
    return QvStatus::endOfStream;
}

int JoinedSegments::readSamples(int n, int stream) {
    QvPcm& buffer = at(sounds, stream).buffer;
    buffer.setSamples(0);
    if (const int result = videoLeads() ? readLedSound(n, stream) : readLeadingSound(n, stream))
        return result;
    buffer.setPosition(buffer.position() + buffer.samples());
    return buffer.samples();
}

// Brings the buffer to n samples more; what the segment does not have is silence.
int JoinedSegments::fill(SegmentAudio& audio, int n, QvPcm& buffer, int segment) {
    const int before = buffer.samples();
    if (!audio.ended())
        if (const int result = audio.read(n, buffer, why)) return result;
    const int missing = n - (buffer.samples() - before);
    audio.count(n);
    if (missing < 1) return QvStatus::ok;
    qv_dbg()->debug("Inserting silence at the end of %d segment, %d samples", segment, missing);
    audio.end();
    return buffer.addSilence(missing);
}

// Video says when a segment ends; until then there are as many samples as are asked for.
int JoinedSegments::readLedSound(int n, int stream) {
    if (current >= sizeOf(segments)) return QvStatus::endOfStream;
    return fill(*at(at(segments, current).audios, stream), n, at(sounds, stream).buffer, current);
}

// Samples that a segment gives to a stream where sound leads: those of a picture that is passed on, else all
// streams end with the shortest.
long long JoinedSegments::owed(const BatchSegment& segment, int stream) const {
    const SegmentSpan& span = at(segment.audios, stream)->span();
    if (span.duration() == segment.length) return span.owed;
    return segment.length.position(at(audioJobs, stream).outSamplerate);
}

int JoinedSegments::readLeadingSound(int n, int stream) {
    SoundOutput& sound = at(sounds, stream);
    while (sound.buffer.samples() < n && sound.segment < sizeOf(segments)) {
        const BatchSegment& segment = at(segments, sound.segment);
        SegmentAudio& audio = *at(segment.audios, stream);
        const long long left = owed(segment, stream) - audio.samplesRead();
        int result = QvStatus::ok;
        if (left < 1 || (audio.ended() && segment.videos.empty()))
            result = nextSound(stream);
        else
            result = fill(audio, static_cast<int>(std::min<long long>(left, n - sound.buffer.samples())),
                          sound.buffer, sound.segment);
        if (result != QvStatus::ok) return result;
    }
    return sound.buffer.samples() > 0 ? QvStatus::ok : QvStatus::endOfStream;
}

// The later segments begin anew when their turn comes. Where video leads, all streams have left the first
// segment together and go back together, because a caller that has read the picture alone seeks nothing else.
int JoinedSegments::restart(int stream, bool video) {
    if (video) {
        at(frames, stream).forget();
        at(frames, stream).restart();
    } else {
        SoundOutput& sound = at(sounds, stream);
        sound.buffer.setSamples(0);
        sound.buffer.setPosition(-1);
        sound.segment = 0;
    }
    const bool together = videoLeads() && current != 0;
    for (int i = 1; i < sizeOf(segments); ++i) {
        BatchSegment& segment = at(segments, i);
        if (together)
            stopSegment(i);
        else if (video)
            at(segment.videos, stream)->stop(why);
        else
            at(segment.audios, stream)->stop(why);
    }
    current = 0;
    if (segments.empty()) return QvStatus::ok;
    if (together) {
        for (FrameWindow& frame : frames) frame.forget();
        return startSegment();
    }
    return video ? startVideo(0, stream) : startAudio(0, stream);
}

int JoinedSegments::stop() {
    int result = QvStatus::ok;
    std::string first;
    if (current < sizeOf(segments)) logCounts(current);
    for (int i = 0; i < sizeOf(segments); ++i) {
        const int stopped = stopSegment(i);
        if (stopped != QvStatus::ok && result == QvStatus::ok) first = why;
        result |= stopped;
    }
    why = first;
    frames.clear();
    sounds.clear();
    totalFrames.clear();
    totalSamples.clear();
    smartStreams.clear();
    current = 0;
    return result;
}
