#include "core/transcode/batch/qvbatchdecoder.h"

#include <algorithm>
#include <cstring>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/joinedsegments_p.h"
#include "core/transcode/batch/streamdescription_p.h"

using qvlist::at;
using qvlist::inRange;
using qvlist::sizeOf;

namespace {

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

struct QvBatchDecoder::Private : JoinedSegments {};

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
    BatchSegment made;
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
        value = std::any_of(p_->segments.begin(), p_->segments.end(), [&](const BatchSegment& segment) {
            return std::any_of(segment.videos.begin(), segment.videos.end(), says) ||
                   std::any_of(segment.audios.begin(), segment.audios.end(), says);
        });
    } else if (std::strcmp(name, "endedEarly") == 0) {
        AnyVector names;
        for (const BatchSegment& segment : p_->segments)
            for (const auto& audio : segment.audios)
                if (audio->endedEarly()) names.append(audio->input().filename());
        value = names;
    } else if (std::strcmp(name, "segmentFiles") == 0) {
        value = p_->storedFiles();
    } else if (std::strcmp(name, "segmentSources") == 0) {
        value = value.isPair() ? p_->storedSources(value.asPair()) : AnyVector();
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

int QvBatchDecoder::nrStreams(int type) const {
    const int mask = type == 0 ? qvAllStreams : type;
    return ((mask & qvVideoStream) ? sizeOf(p_->videoJobs) : 0) +
           ((mask & qvAudioStream) ? sizeOf(p_->audioJobs) : 0);
}

void QvBatchDecoder::getStreamParam(int type, int stream, const char* name, Any& value) const {
    if (type == qvAudioStream && inRange(stream, p_->audioJobs) && std::strcmp(name, "clippedSamples") == 0) {
        value = p_->clippedSamples(stream);
        return;
    }
    AnyDict params;
    getStreamParams(type, stream, params);
    if (params.isSet(name)) value = params.get(name);
}

void QvBatchDecoder::getStreamParams(int type, int stream, AnyDict& params) const {
    params.clear();
    if (type == qvVideoStream && inRange(stream, p_->videoJobs))
        qvDescribeVideo(at(p_->videoJobs, stream), nrFrames(stream), params);
    else if (type == qvAudioStream && inRange(stream, p_->audioJobs))
        qvDescribeAudio(at(p_->audioJobs, stream), p_->soundTotal(stream), params);
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
    for (const BatchSegment& segment : p_->segments) {
        const QvIStream* input = segment.input(type, stream);
        if (input && input->decoder->setReadUserData(type, input->number, on) == QvStatus::ok)
            result = QvStatus::ok;
    }
    return result;
}

bool QvBatchDecoder::readUserData(int type, int stream) const {
    return std::any_of(p_->segments.begin(), p_->segments.end(), [&](const BatchSegment& segment) {
        const QvIStream* input = segment.input(type, stream);
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

int QvBatchDecoder::close() {
    if (getState() != stateOpen) return QvStatus::ok;
    const int result = p_->stop();
    if (result != QvStatus::ok) setError(result, "%s", p_->why.c_str());
    QvDecodePipe::close();
    return result;
}

// --- Reading.

int QvBatchDecoder::readFrame(int stream) {
    if (getState() != stateOpen || !inRange(stream, p_->frames))
        return setError(QvStatus::illegalState, "readFrame: no open video stream %d", stream);
    const int result = p_->readFrame(stream);
    if (result == QvStatus::ok || result == QvStatus::endOfStream) return result;
    return setError(result, "%s", p_->why.c_str());
}

int QvBatchDecoder::readSamples(int count, int stream) {
    if (getState() != stateOpen || !inRange(stream, p_->sounds))
        return setError(QvStatus::illegalState, "readSamples: no open audio stream %d", stream);
    const int result = p_->readSamples(count, stream);
    if (result >= 0 || result == QvStatus::endOfStream) return result;
    return setError(result, "%s", p_->why.c_str());
}

int QvBatchDecoder::seekToFrame(long long frame, int stream) {
    QV_ASSERT(frame == 0);
    if (getState() != stateOpen || !inRange(stream, p_->frames))
        return setError(QvStatus::illegalState, "seekToFrame: no open video stream %d", stream);
    const int result = p_->restart(stream, true);
    return result == QvStatus::ok ? result : setError(result, "%s", p_->why.c_str());
}

int QvBatchDecoder::seekToSample(long long sample, int stream) {
    QV_ASSERT(sample == 0);
    if (getState() != stateOpen || !inRange(stream, p_->sounds))
        return setError(QvStatus::illegalState, "seekToSample: no open audio stream %d", stream);
    const int result = p_->restart(stream, false);
    return result == QvStatus::ok ? result : setError(result, "%s", p_->why.c_str());
}

QvFrame* QvBatchDecoder::getFramePtr(int stream) {
    return inRange(stream, p_->frames) ? &at(p_->frames, stream).frame() : nullptr;
}

QvPcm* QvBatchDecoder::getAudioPtr(int stream) {
    return inRange(stream, p_->sounds) ? &at(p_->sounds, stream).buffer : nullptr;
}
