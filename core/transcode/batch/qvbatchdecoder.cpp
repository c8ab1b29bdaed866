#include "core/transcode/batch/qvbatchdecoder.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/framewindow_p.h"
#include "core/transcode/batch/segmentaudio_p.h"
#include "core/transcode/batch/segmentvideo_p.h"
#include "core/transcode/batch/streamdescription_p.h"

namespace {

struct Segment {
    std::vector<std::unique_ptr<SegmentVideo>> videos;  // in the order of the output's
    std::vector<std::unique_ptr<SegmentAudio>> audios;
    MediaTime sound;  // how long its shortest sound is, since open
};

struct SoundOutput {
    QvPcm buffer;
    int segment = 0;  // that it reads
};

template <class T>
bool inRange(int index, const std::vector<T>& list) {
    return index >= 0 && static_cast<std::size_t>(index) < list.size();
}

template <class T>
auto& at(T& list, int index) {
    return list[static_cast<std::size_t>(index)];
}

template <class T>
int sizeOf(const std::vector<T>& list) {
    return static_cast<int>(list.size());
}

const QvIStream* inputOf(const Segment& segment, int type, int stream) {
    if (type == qvVideoStream && inRange(stream, segment.videos)) return &at(segment.videos, stream)->input();
    if (type == qvAudioStream && inRange(stream, segment.audios)) return &at(segment.audios, stream)->input();
    return nullptr;
}

bool hasPoints(const ProcessParams& params) {
    const auto points = params.inOutPoints();
    return points && points->count() > 0;
}

const char* typeName(int type) {
    return type == qvVideoStream ? "video" : type == qvAudioStream ? "audio" : "not used";
}

// Names that stand for the same in every file.
constexpr struct {
    const char* name;
    const char* answer;
} plainAnswers[] = {
    {"displayName", "Batch decoder"},
    {"typeName", "batch"},
    {"filename", "N/A"},
    {"decoder_name", "n/a"},
};

constexpr const char* ignoredNames[] = {"FOURCC", "fastAccess", "subpicMode", "subpicOverlay"};

}  // namespace

struct QvBatchDecoder::Private {
    std::vector<Segment> segments;
    std::vector<VideoJobDescription> videoJobs;
    std::vector<AudioJobDescription> audioJobs;
    AnyVector smartStreams;
    std::vector<FrameWindow> frames;  // one a video stream, as the next two since open
    std::vector<SoundOutput> sounds;
    std::vector<int> totalFrames;
    std::vector<long long> totalSamples;
    int current = 0;
    std::string why;  // of the failure at hand

    bool videoLeads() const;
    bool isSmart(int video) const { return smartStreams.contains(Any(video)); }
    int frameTotal(int stream) const;
    long long sampleTotal(int stream) const;
    int prepare();
    void makeOutputs();
    int startVideo(int segment, int stream);
    int startAudio(int segment, int stream);
    int startSegment();
    int stopSegment(int segment);
    void logCounts(int segment) const;
    void logStart() const;
    int nextSegment();
    int nextSound(int stream);
    long long owed(const Segment& segment, int stream) const;
    int fill(SegmentAudio& audio, int n, QvPcm& buffer, int segment);
    int readLedSound(int n, int stream);
    int readLeadingSound(int n, int stream);
    bool smartParams(const Pair& address, AnyDict& out) const;
    int restart(int stream, bool video);
};

QvBatchDecoder::QvBatchDecoder() : p_(std::make_unique<Private>()) {}

QvBatchDecoder::~QvBatchDecoder() {
    if (getState() == stateOpen) QvBatchDecoder::close();
}

const char* QvBatchDecoder::name() const { return "batchdec"; }

int QvBatchDecoder::init() {
    setState(stateInitialised);
    return QvStatus::ok;
}

// --- Setting up.

void QvBatchDecoder::addOutputVideoStream(const VideoJobDescription& job) {
    qv_dbg()->info("[QvBatchDecoder]adding output video stream, FCC=%d, dim= %dx%d, framerate = %s\n",
                   static_cast<int>(job.outFOURCC), job.outWidth, job.outHeight,
                   job.outFramerate.desc(true, true).asString());
    p_->videoJobs.push_back(job);
}

void QvBatchDecoder::addOutputAudioStream(const AudioJobDescription& job) {
    qv_dbg()->info("[QvBatchDecoder]adding output audio stream, Fs=%d, chnls=%d, bits/sample=%d\n",
                   job.outSamplerate, job.outChannels, job.outBitsPerSample);
    p_->audioJobs.push_back(job);
}

void QvBatchDecoder::clearOutputStreams(int typeMask) {
    if (typeMask & qvVideoStream) p_->videoJobs.clear();
    if (typeMask & qvAudioStream) p_->audioJobs.clear();
}

void QvBatchDecoder::clearSegments() {
    if (getState() == stateOpen) close();
    p_->segments.clear();
}

int QvBatchDecoder::insertSegment(const InputSegment& segment, int position) {
    const int count = sizeOf(p_->segments);
    if (getState() == stateOpen) return setError(QvStatus::illegalState, "The batch decoder is open.");
    if (position < -1 || position > count)
        return setError(QvStatus::invalidArgument, "Invalid position of a segment: %d.", position);
    const int index = position < 0 ? count : position;
    qv_dbg()->info("[BatchDecoder]Inserting segment %d", index);
    InOutPoints points = segment.points;
    const bool pointed = points.count() > 0;
    if (pointed)
        qv_dbg()->info("[BatchDecoder] Segment in point=%f, out point =%f", points.inPoint().seconds(),
                       points.outPoint().seconds());
    Segment made;
    int number = 0;
    for (const QvIStream* given : segment.streams) {
        qv_dbg()->info("[BatchDecoder]Segment %d stream %d: %s", index, number++, typeName(given->type));
        if (!given->decoder) return setError(QvStatus::failed, "A stream of the segment has no decoder.");
        QvIStream stream = *given;
        if (pointed && !hasPoints(stream.params)) {
            QV_ASSERT_MSG(points.duration().value() != 0,
                          "insertSegment: invalid segment.inOutPoints, duration = 0");
            const MediaTime whole = stream.duration();
            if (points.duration() > whole) {
                qv_dbg()->warning(
                    "insertSegment: invalid segment.inOutPoints, specified duration of %f s "
                    "exceeds stream duration of %f s, reducing.",
                    points.duration().seconds(), whole.seconds());
                points.setDuration(whole);
            }
            stream.params.setInOutPoints(points);
        }
        if (stream.type == qvVideoStream) made.videos.push_back(std::make_unique<SegmentVideo>(stream));
        if (stream.type == qvAudioStream) made.audios.push_back(std::make_unique<SegmentAudio>(stream));
    }
    if (made.videos.size() != p_->videoJobs.size())
        return setError(QvStatus::failed, "Invalid number of video streams in segment.");
    if (made.audios.size() != p_->audioJobs.size())
        return setError(QvStatus::failed, "Invalid number of audio streams in segment.");
    p_->segments.insert(p_->segments.begin() + index, std::move(made));
    return QvStatus::ok;
}

// --- Parameters.

int QvBatchDecoder::setParam(const char* name, const Any& value) {
    _traceParam(name, value);
    for (const char* ignored : ignoredNames)
        if (std::strcmp(name, ignored) == 0) return QvStatus::ok;
    if (std::strcmp(name, "smartRenderingOn") == 0 && value.isPair()) {
        const Pair address = value.asPair();
        if (address.first == qvVideoStream && !p_->isSmart(address.second))
            p_->smartStreams.append(Any(address.second));
    }
    return _raiseInvalidParam(name);
}

void QvBatchDecoder::getParam(const char* name, Any& value) const {
    for (const auto& [known, answer] : plainAnswers) {
        if (std::strcmp(name, known) != 0) continue;
        value = answer;
        return;
    }
    if (std::strcmp(name, "currentSegment") == 0) {
        value = p_->current;
    } else if (std::strcmp(name, "notSeekable") == 0) {
        const auto says = [](const auto& stream) {
            return stream->input().decoder->getParam("notSeekable").isTrue();
        };
        value = std::any_of(p_->segments.begin(), p_->segments.end(), [&](const Segment& segment) {
            return std::any_of(segment.videos.begin(), segment.videos.end(), says) ||
                   std::any_of(segment.audios.begin(), segment.audios.end(), says);
        });
    } else if (std::strcmp(name, "srParams") == 0) {
        AnyDict params;
        if (value.isPair() && p_->smartParams(value.asPair(), params))
            value = params;
        else
            value = Any();
    } else {
        QvDecodePipe::getParam(name, value);
    }
}

// What an encoder needs to take over coded frames; false unless every segment can give it. A conversion would
// be passed by.
bool QvBatchDecoder::Private::smartParams(const Pair& address, AnyDict& out) const {
    const auto [type, stream] = address;
    AnyVector parts;
    Any name;
    for (const Segment& segment : segments) {
        const QvIStream* from = inputOf(segment, type, stream);
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

int QvBatchDecoder::nrStreams(int type) const {
    const int mask = type == 0 ? qvAllStreams : type;
    return ((mask & qvVideoStream) ? sizeOf(p_->videoJobs) : 0) +
           ((mask & qvAudioStream) ? sizeOf(p_->audioJobs) : 0);
}

void QvBatchDecoder::getStreamParam(int type, int stream, const char* name, Any& value) const {
    AnyDict params;
    getStreamParams(type, stream, params);
    if (params.isSet(name)) value = params.get(name);
}

void QvBatchDecoder::getStreamParams(int type, int stream, AnyDict& params) const {
    params.clear();
    if (type == qvVideoStream && inRange(stream, p_->videoJobs))
        qvDescribeVideo(at(p_->videoJobs, stream), nrFrames(stream), params);
    else if (type == qvAudioStream && inRange(stream, p_->audioJobs))
        qvDescribeAudio(at(p_->audioJobs, stream), nrSamples(stream), params);
}

int QvBatchDecoder::Private::frameTotal(int stream) const {
    long long total = 0;
    for (const Segment& segment : segments)
        if (inRange(stream, segment.videos))
            total += at(segment.videos, stream)->span(at(videoJobs, stream).outFramerate).owed;
    return static_cast<int>(std::min<long long>(total, std::numeric_limits<int>::max()));
}

long long QvBatchDecoder::Private::sampleTotal(int stream) const {
    long long total = 0;
    for (const Segment& segment : segments)
        if (inRange(stream, segment.audios))
            total += at(segment.audios, stream)->span(at(audioJobs, stream).outSamplerate).owed;
    return total;
}

int QvBatchDecoder::nrFrames(int stream) const {
    if (inRange(stream, p_->totalFrames)) return at(p_->totalFrames, stream);
    return inRange(stream, p_->videoJobs) ? p_->frameTotal(stream) : 0;
}

long long QvBatchDecoder::nrSamples(int stream) const {
    if (inRange(stream, p_->totalSamples)) return at(p_->totalSamples, stream);
    return inRange(stream, p_->audioJobs) ? p_->sampleTotal(stream) : 0;
}

int QvBatchDecoder::select(int, int) { return QvStatus::ok; }

int QvBatchDecoder::deselect(int, int) { return QvStatus::ok; }

int QvBatchDecoder::selected(AnyDict&) const { QV_FAIL_PLAIN(); }

bool QvBatchDecoder::isSelected(int, int) const { return true; }

int QvBatchDecoder::setReadUserData(int type, int stream, bool on) {
    int result = QvStatus::failed;
    for (const Segment& segment : p_->segments) {
        const QvIStream* input = inputOf(segment, type, stream);
        if (input && input->decoder->setReadUserData(type, input->number, on) == QvStatus::ok)
            result = QvStatus::ok;
    }
    return result;
}

bool QvBatchDecoder::readUserData(int type, int stream) const {
    return std::any_of(p_->segments.begin(), p_->segments.end(), [&](const Segment& segment) {
        const QvIStream* input = inputOf(segment, type, stream);
        return input && input->decoder->readUserData(type, input->number);
    });
}

// --- Opening and closing.

int QvBatchDecoder::open() {
    if (getState() == stateOpen) return QvStatus::ok;
    setError(QvStatus::ok);
    const int result = p_->prepare();
    if (result != QvStatus::ok) {
        setError(result, "%s", p_->why.c_str());
        close();
        return result;
    }
    p_->makeOutputs();
    QvDecodePipe::open();
    for (int i = 0; i < nrStreams(qvVideoStream); ++i)
        if (const int sought = seekToFrame(0, i)) return close(), sought;
    for (int i = 0; i < nrStreams(qvAudioStream); ++i)
        if (const int sought = seekToSample(0, i)) return close(), sought;
    return QvStatus::ok;
}

// Each conversion is built once to see that it can be, and again when its segment begins.
int QvBatchDecoder::Private::prepare() {
    why.clear();
    const Segment* before = nullptr;
    for (int i = 0; i < sizeOf(segments); ++i) {
        Segment& segment = at(segments, i);
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
            const MediaTime length = at(segment.audios, k)->span().duration();
            segment.sound = k == 0 ? length : std::min(segment.sound, length);
        }
        before = &segment;
    }
    return QvStatus::ok;
}

void QvBatchDecoder::Private::makeOutputs() {
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

int QvBatchDecoder::close() {
    if (getState() != stateOpen) return QvStatus::ok;
    int result = QvStatus::ok;
    if (p_->current < sizeOf(p_->segments)) p_->logCounts(p_->current);
    for (int i = 0; i < sizeOf(p_->segments); ++i) {
        const int stopped = p_->stopSegment(i);
        if (stopped != QvStatus::ok && result == QvStatus::ok) setError(stopped, "%s", p_->why.c_str());
        result |= stopped;
    }
    p_->frames.clear();
    p_->sounds.clear();
    p_->totalFrames.clear();
    p_->totalSamples.clear();
    p_->smartStreams.clear();
    p_->current = 0;
    QvDecodePipe::close();
    return result;
}

// --- From segment to segment.

// Whether frames are read that say where a segment ends.
bool QvBatchDecoder::Private::videoLeads() const {
    for (int i = 0; i < sizeOf(videoJobs); ++i)
        if (!isSmart(i)) return true;
    return false;
}

int QvBatchDecoder::Private::startVideo(int segment, int stream) {
    return at(at(segments, segment).videos, stream)->start(why);
}

// Sound that lasts as long as the picture is there for the last fraction of a frame, too, so it has no end of
// its own; sound that the job cuts earlier has.
int QvBatchDecoder::Private::startAudio(int segment, int stream) {
    Segment& of = at(segments, segment);
    SegmentAudio& audio = *at(of.audios, stream);
    bool bounded = !videoLeads();
    for (int i = 0; i < sizeOf(of.videos) && !bounded; ++i)
        bounded = !isSmart(i) && audio.span().duration() < at(of.videos, i)->span().duration();
    return audio.start(bounded, why);
}

int QvBatchDecoder::Private::startSegment() {
    for (int i = 0; i < sizeOf(videoJobs); ++i)
        if (!isSmart(i))
            if (const int result = startVideo(current, i)) return result;
    for (int i = 0; i < sizeOf(audioJobs); ++i) {
        if (const int result = startAudio(current, i)) return result;
        at(sounds, i).segment = current;
    }
    return QvStatus::ok;
}

int QvBatchDecoder::Private::stopSegment(int segment) {
    int result = QvStatus::ok;
    const auto note = [&result](int stopped) {
        if (result == QvStatus::ok) result = stopped;
    };
    for (const auto& video : at(segments, segment).videos) note(video->stop(why));
    for (const auto& audio : at(segments, segment).audios) note(audio->stop(why));
    return result;
}

void QvBatchDecoder::Private::logCounts(int segment) const {
    const Segment& of = at(segments, segment);
    for (int i = 0; i < sizeOf(of.videos); ++i)
        if (!isSmart(i))
            qv_dbg()->info("[BatchDecoder]Segment %d, stream %d, frames read=%d", segment, i,
                           at(of.videos, i)->framesRead());
    for (int i = 0; i < sizeOf(of.audios); ++i)
        qv_dbg()->info("[BatchDecoder]Segment %d, stream %d, samples read=%lld", segment, i,
                       at(of.audios, i)->samplesRead());
}

void QvBatchDecoder::Private::logStart() const {
    if (current >= sizeOf(segments))
        qv_dbg()->debug("[BatchDecoder] Last segment EOS");
    else
        qv_dbg()->info("[BatchDecoder] Starting new segment %d", current);
}

// The last segment stays as it is, for its last frame is still in use.
int QvBatchDecoder::Private::nextSegment() {
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
int QvBatchDecoder::Private::nextSound(int stream) {
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

// --- Reading.

int QvBatchDecoder::readFrame(int stream) {
    if (getState() != stateOpen || !inRange(stream, p_->frames))
        return setError(QvStatus::illegalState, "readFrame: no open video stream %d", stream);
    while (p_->current < sizeOf(p_->segments)) {
        QvFrame* frame = nullptr;
        int result = at(at(p_->segments, p_->current).videos, stream)->read(frame, p_->why);
        if (result == QvStatus::ok) {
            result = at(p_->frames, stream).show(*frame);
            return result == QvStatus::ok ? result : setError(result, "No frame to show.");
        }
        if (result == QvStatus::endOfStream) result = p_->nextSegment();
        if (result != QvStatus::ok) return setError(result, "%s", p_->why.c_str());
    }
    return QvStatus::endOfStream;
}

int QvBatchDecoder::readSamples(int count, int stream) {
    if (getState() != stateOpen || !inRange(stream, p_->sounds))
        return setError(QvStatus::illegalState, "readSamples: no open audio stream %d", stream);
    QvPcm& buffer = at(p_->sounds, stream).buffer;
    buffer.setSamples(0);
    const int result =
        p_->videoLeads() ? p_->readLedSound(count, stream) : p_->readLeadingSound(count, stream);
    if (result == QvStatus::endOfStream) return result;
    if (result != QvStatus::ok) return setError(result, "%s", p_->why.c_str());
    buffer.setPosition(buffer.position() + buffer.samples());
    return buffer.samples();
}

// Brings the buffer to n samples more; what the segment does not have is silence.
int QvBatchDecoder::Private::fill(SegmentAudio& audio, int n, QvPcm& buffer, int segment) {
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
int QvBatchDecoder::Private::readLedSound(int n, int stream) {
    if (current >= sizeOf(segments)) return QvStatus::endOfStream;
    return fill(*at(at(segments, current).audios, stream), n, at(sounds, stream).buffer, current);
}

// Samples that a segment gives to a stream where sound leads: all streams end with the shortest.
long long QvBatchDecoder::Private::owed(const Segment& segment, int stream) const {
    const SegmentSpan& span = at(segment.audios, stream)->span();
    if (span.duration() <= segment.sound) return span.owed;
    return std::min(span.owed, segment.sound.position(at(audioJobs, stream).outSamplerate));
}

int QvBatchDecoder::Private::readLeadingSound(int n, int stream) {
    SoundOutput& sound = at(sounds, stream);
    while (sound.buffer.samples() < n && sound.segment < sizeOf(segments)) {
        const Segment& segment = at(segments, sound.segment);
        SegmentAudio& audio = *at(segment.audios, stream);
        const long long left = owed(segment, stream) - audio.samplesRead();
        int result = QvStatus::ok;
        if (left < 1 || audio.ended())
            result = nextSound(stream);
        else
            result = fill(audio, static_cast<int>(std::min<long long>(left, n - sound.buffer.samples())),
                          sound.buffer, sound.segment);
        if (result != QvStatus::ok) return result;
    }
    return sound.buffer.samples() > 0 ? QvStatus::ok : QvStatus::endOfStream;
}

QvFrame* QvBatchDecoder::getFramePtr(int stream) {
    return inRange(stream, p_->frames) ? &at(p_->frames, stream).frame() : nullptr;
}

QvPcm* QvBatchDecoder::getAudioPtr(int stream) {
    return inRange(stream, p_->sounds) ? &at(p_->sounds, stream).buffer : nullptr;
}

// --- Back to the start.

// Each stream goes back by itself; the later segments begin anew when their turn comes.
int QvBatchDecoder::Private::restart(int stream, bool video) {
    for (int i = 1; i < sizeOf(segments); ++i) {
        Segment& segment = at(segments, i);
        if (video)
            at(segment.videos, stream)->stop(why);
        else
            at(segment.audios, stream)->stop(why);
    }
    current = 0;
    if (segments.empty()) return QvStatus::ok;
    return video ? startVideo(0, stream) : startAudio(0, stream);
}

int QvBatchDecoder::seekToFrame(long long frame, int stream) {
    QV_ASSERT(frame == 0);
    if (getState() != stateOpen || !inRange(stream, p_->frames))
        return setError(QvStatus::illegalState, "seekToFrame: no open video stream %d", stream);
    at(p_->frames, stream).forget();
    at(p_->frames, stream).restart();
    const int result = p_->restart(stream, true);
    return result == QvStatus::ok ? result : setError(result, "%s", p_->why.c_str());
}

int QvBatchDecoder::seekToSample(long long sample, int stream) {
    QV_ASSERT(sample == 0);
    if (getState() != stateOpen || !inRange(stream, p_->sounds))
        return setError(QvStatus::illegalState, "seekToSample: no open audio stream %d", stream);
    SoundOutput& sound = at(p_->sounds, stream);
    sound.buffer.setSamples(0);
    sound.buffer.setPosition(-1);
    sound.segment = 0;
    const int result = p_->restart(stream, false);
    return result == QvStatus::ok ? result : setError(result, "%s", p_->why.c_str());
}
