#include "core/transcode/push/pushencoder.h"

#include <algorithm>
#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <new>
#include <string>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"
#include "core/job/streamformat.h"
#include "core/stream/qvbufstrm.h"
#include "core/transcode/link/audio/transalink.h"
#include "core/transcode/link/linkopen_p.h"
#include "core/transcode/link/video/transvlink.h"
#include "core/transcode/push/pushfeed_p.h"
#include "core/transcode/push/pushinput_p.h"

namespace {

constexpr int stateClosed = 2;
constexpr int stateOpen = 3;
constexpr int defaultSamples = 48000;
constexpr int defaultFrames = 4;
constexpr int unknownFrames = 0xccccccc;  // a push stream has no known end
constexpr int highestSamplerate = 96000;

int bytesOfBits(int bits) {
    switch (bits) {
        case 8: return 1;
        case 16: return 2;
        case 20:
        case 24: return 3;
        default: QV_FAIL("Illegal bitsPerSample");
    }
}

bool isLegalWidth(int bits, int bytes) {
    return (bits == 8 || bits == 16 || bits == 20 || bits == 24 || bits == 32) && bytes == (bits + 7) / 8;
}

template <class Stream>
bool isAnyWaiting(const std::vector<std::unique_ptr<Stream>>& streams) {
    return std::any_of(streams.begin(), streams.end(),
                       [](const auto& stream) { return stream->waiting.load(std::memory_order_relaxed); });
}

template <class Stream>
bool isWaiting(const std::vector<std::unique_ptr<Stream>>& streams, int stream) {
    return stream >= 0 && stream < static_cast<int>(streams.size()) &&
           streams[static_cast<std::size_t>(stream)]->waiting.load(std::memory_order_relaxed);
}

}  // namespace

struct QvPushEncoder::PushEncoder_p final : IAVFeed {
    PushEncoder_p() : input(*this) { input.init(); }

    int readSamples(unsigned char* to, int count, int stream) override;
    int readFrame(QvFrame& to, int stream) override;

    int openLinks();
    int openVideoLink();
    int openAudioLink();
    int setError(int code, const std::string& text);

    void work();
    void loop();
    bool takeVideo(long long& frames);
    bool takeAudio(long long frames, bool videoFinished);
    void keep(int status, const char* why);
    void endAll();
    void reset();

    // A worker that waits for input gives up its turn here. `lock` is that of the stream's kind.
    template <class Ready>
    void await(PushStream& stream, std::unique_lock<std::mutex>& lock, std::condition_variable& event,
               Ready ready);
    void tellChange();

    template <class Stream>
    Stream& find(std::vector<std::unique_ptr<Stream>>& streams, int stream, const char* operation);

    QvEncodePipe* encoder = nullptr;
    PushInput input;
    TransVLink videoLink;
    TransALink audioLink;
    std::vector<std::unique_ptr<AStream>> audioStreams;
    std::vector<std::unique_ptr<VStream>> videoStreams;
    bool hasVideo = false;
    bool hasAudio = false;
    int state = stateClosed;
    std::string error;  // of the application's calls

    QVThreads::QvThread thread;
    std::atomic<bool> running{false};  // the worker is in its loop
    std::atomic<bool> stop{false};
    std::atomic<int> lastStatus{QvStatus::ok};  // the first failure of a link
    std::string workerError;                    // its text, fixed once the status is not 0
    std::mutex threadLock;
    std::condition_variable changed;  // of running, or of a waiting flag

    std::mutex videoLock, audioLock;
    std::condition_variable videoEvent, audioEvent;
    int totalInFrames = 0, totalOutFrames = 0;          // under the video lock
    long long totalInSamples = 0, totalOutSamples = 0;  // under the audio lock, but for the worker's own look
};

using PushEncoder = QvPushEncoder;

int PushEncoder::PushEncoder_p::setError(int code, const std::string& text) {
    error = text;
    return code;
}

void PushEncoder::PushEncoder_p::tellChange() {
    const std::lock_guard lock(threadLock);
    changed.notify_all();
}

template <class Stream>
Stream& PushEncoder::PushEncoder_p::find(std::vector<std::unique_ptr<Stream>>& streams, int stream,
                                         const char* problem) {
    if (stream >= 0 && stream < static_cast<int>(streams.size()))
        return *streams[static_cast<std::size_t>(stream)];
    const Any text = Any::sprintf(problem, stream);
    qv_dbg()->error("%s", text.asString());
    QV_FAIL(text.asString());
}

// --- The worker's side.

template <class Ready>
void PushEncoder::PushEncoder_p::await(PushStream& stream, std::unique_lock<std::mutex>& lock,
                                       std::condition_variable& event, Ready ready) {
    while (!ready() && !stream.end) {
        stream.waiting.store(true, std::memory_order_relaxed);
        tellChange();
        event.wait(lock);
    }
    stream.waiting.store(false, std::memory_order_relaxed);
}

int PushEncoder::PushEncoder_p::readFrame(QvFrame& to, int number) {
    auto& stream = find(videoStreams, number, "[PushEncoder] readFrame() - invalid stream #%d");
    std::unique_lock lock(videoLock);
    await(stream, lock, videoEvent, [&] { return !stream.buffer.empty(); });
    if (stream.end) {
        qv_dbg()->debug("[PushEncoder] readFrame, got EOF");
        return QvStatus::endOfStream;
    }
    stream.buffer.read(to);
    to.frameNr = totalOutFrames++;
    return QvStatus::ok;
}

int PushEncoder::PushEncoder_p::readSamples(unsigned char* to, int count, int number) {
    auto& stream = find(audioStreams, number, "[PushEncoder] readSamples() - invalid stream #%d");
    std::unique_lock lock(audioLock);
    await(stream, lock, audioEvent, [&] { return stream.buffer.buffered() >= count; });
    count = std::min(count, stream.buffer.buffered());
    if (count == 0) {
        qv_dbg()->debug("[PushEncoder] readSamples, got EOF");
        return QvStatus::endOfStream;
    }
    stream.buffer.read(to, count);
    totalOutSamples += count;
    return count;
}

void PushEncoder::PushEncoder_p::keep(int status, const char* why) {
    if (status == QvStatus::ok || status == QvStatus::endOfStream || lastStatus != QvStatus::ok) return;
    try {
        workerError = why;  // before the status, which is what others look at
        qv_dbg()->error("[PushEncoder] the output failed: %s", why);
    } catch (const std::bad_alloc&) {
        // The status alone has to do.
    }
    lastStatus = status;
}

// True when the video has come to its end.
bool PushEncoder::PushEncoder_p::takeVideo(long long& frames) {
    const int status = videoLink.processFrame(0);
    keep(status, videoLink.errorDesc());
    frames = videoLink.outProcessed();
    // The step that finds the end counts as one, too, but has written no frame.
    if (videoLink.finished() && frames < videoLink.totalOutFrames()) --frames;
    return videoLink.finished();
}

bool PushEncoder::PushEncoder_p::takeAudio(long long frames, bool videoFinished) {
    long long due = 0;
    if (frames != 0) {
        const auto all = static_cast<int>(std::min<long long>(frames, INT32_MAX));
        due = audioLink.outSamplesPerFrames(all, videoLink.outFramerate()) - audioLink.outProcessed();
        const int status = audioLink.processFrame(static_cast<int>(std::clamp<long long>(due, 0, INT32_MAX)));
        // Sound that ends before it has begun is a failure for the link only.
        if (totalOutSamples > 0) keep(status, audioLink.errorDesc());
    }
    return (due == 0 || audioLink.finished()) && videoFinished;
}

void PushEncoder::PushEncoder_p::loop() {
    bool videoFinished = !hasVideo;
    bool audioFinished = !hasAudio;
    long long frames = 0;
    while (!(videoFinished && audioFinished)) {
        if (!videoFinished) videoFinished = takeVideo(frames);
        if (!audioFinished) {
            if (!hasVideo) ++frames;
            audioFinished = takeAudio(frames, videoFinished);
        }
        if (stop) return;
    }
}

void PushEncoder::PushEncoder_p::work() {
    try {
        loop();
        qv_dbg()->debug("[PuhEncoder::loop] thread exiting");
    } catch (const std::bad_alloc&) {
        keep(QvStatus::outOfMemory, "Out of memory");
    } catch (const QvException& failure) {
        keep(QvStatus::failed, failure.what());
    } catch (const std::exception& failure) {
        keep(QvStatus::failed, failure.what());
    }
    running = false;
    tellChange();
}

void PushEncoder::PushEncoder_p::endAll() {
    {
        const std::lock_guard lock(videoLock);
        for (const auto& stream : videoStreams) stream->end = true;
        videoEvent.notify_all();
    }
    const std::lock_guard lock(audioLock);
    for (const auto& stream : audioStreams) stream->end = true;
    audioEvent.notify_all();
}

// What is left belongs to no run any more.
void PushEncoder::PushEncoder_p::reset() {
    {
        const std::lock_guard lock(videoLock);
        for (const auto& stream : videoStreams) {
            stream->buffer.clear();
            stream->end = false;
        }
        qv_dbg()->debug("[pushencoder] total in frames %d", totalInFrames);
        qv_dbg()->debug("[pushencoder] total out frames %d", totalOutFrames);
    }
    const std::lock_guard lock(audioLock);
    for (const auto& stream : audioStreams) {
        stream->buffer.clear();
        stream->end = false;
    }
    qv_dbg()->debug("[pushencoder] total in samples %lld", totalInSamples);
    qv_dbg()->debug("[pushencoder] total out samples %lld", totalOutSamples);
}

// --- Opening.

int PushEncoder::PushEncoder_p::openVideoLink() {
    input.select(qvVideoStream, 0);
    if (encoder->nrVideoStreams() == 0) return setError(QvStatus::failed, "The output has no video stream");
    if (const int result = videoLink.init(&input, 0, encoder, 0)) return result;
    encoder->videoStream(0)->setEnabled(true);
    LinkOpen open;
    if (const auto filters = videoStreams.front()->process.filters()) open.effects = *filters;
    const int result = videoLink.openWith(open);
    return result == QvStatus::ok ? result : setError(result, videoLink.errorDesc());
}

int PushEncoder::PushEncoder_p::openAudioLink() {
    input.select(qvAudioStream, 0);
    if (encoder->nrAudioStreams() == 0) return setError(QvStatus::failed, "The output has no audio stream");
    if (const int result = audioLink.init(&input, 0, encoder, 0)) return result;
    encoder->audioStream(0)->setEnabled(true);
    LinkOpen open;
    const auto& process = audioStreams.front()->process;
    if (const auto filters = process.filters()) open.takeAudioEffects(*filters);
    if (const auto* map = process.audioChannelMap()) open.connMatrix = *map;
    if (const auto conversion = process.audioConversion()) open.conversion = *conversion;
    const int result = audioLink.openWith(open);
    return result == QvStatus::ok ? result : setError(result, audioLink.errorDesc());
}

int PushEncoder::PushEncoder_p::openLinks() {
    videoLink.close();
    audioLink.close();
    if (input.getState() != QvCodec::stateInitialised) input.close();
    if (const int result = input.open()) return setError(result, input.errorDesc());
    int result = QvStatus::ok;
    if (hasVideo) result |= openVideoLink();
    if (hasAudio) result |= openAudioLink();
    return result;
}

// --- The application's side.

QvPushEncoder::QvPushEncoder() : p_(std::make_unique<PushEncoder_p>()) {}

QvPushEncoder::~QvPushEncoder() { close(true); }

int QvPushEncoder::setEncoder(QvEncodePipe* encoder) {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    p_->encoder = encoder;
    return QvStatus::ok;
}

int QvPushEncoder::addAudioStream(AnyDict& params, ProcessParams* process) {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    int length = params.getInt32("bufferLength", defaultSamples);
    if (length < 1) length = defaultSamples;
    const int samplerate = params.getInt32("samplerate", 0);
    const int channels = params.getInt32("channels", 0);
    int bytes = params.getInt32("bytesPerSample", 0);
    int bits = params.getInt32("bitsPerSample", 0);
    if (bits == 0 && bytes > 0) bits = 8 * std::min(bytes, INT32_MAX / 8);
    if (bytes == 0 && bits != 0) bytes = bytesOfBits(bits);
    bool legal = true;
    const auto refuse = [&](const char* problem, int value) {
        p_->error = Any::sprintf(problem, value).asString();
        qv_dbg()->error("%s", p_->error.c_str());
        legal = false;
    };
    if (channels < 1) refuse("[PushEncoder] addAudioStream - invalid # of channels (%d)", channels);
    if (!isLegalWidth(bits, bytes)) refuse("[PushEncoder] addAudioStream - invalid bitsPerSample (%d)", bits);
    if (samplerate < 1 || samplerate > highestSamplerate)
        refuse("[PushEncoder] addAudioStream - invalid samplerate (%d)", samplerate);
    if (!legal) return QvStatus::failed;

    auto stream = std::make_unique<AStream>();
    stream->channels = channels;
    stream->bytesPerSample = bytes;
    if (process) {
        if (const auto filters = process->filters()) stream->process.setFilters(*filters);
        if (const auto* map = process->audioChannelMap()) stream->process.setAudioChannelMap(*map);
        if (const auto conversion = process->audioConversion())
            stream->process.setAudioConversion(*conversion);
    }
    const long long sampleBytes = static_cast<long long>(channels) * bytes;
    if (sampleBytes * length > INT32_MAX) return p_->setError(QvStatus::outOfMemory, "Out of memory");
    if (const int result = stream->buffer.init(length, static_cast<int>(sampleBytes)))
        return p_->setError(result, "Out of memory");
    AnyDict format(params);
    format.set("bufferLength", length);
    format.set("bitsPerSample", bits);
    format.set("bytesPerSample", bytes);
    p_->input.addAudio(format);
    p_->audioStreams.push_back(std::move(stream));
    p_->hasAudio = true;
    qv_dbg()->debug("[PushEncoder] Initialized audio stream %d",
                    static_cast<int>(p_->audioStreams.size()) - 1);
    QvUtil::debugOutDict(params);
    return QvStatus::ok;
}

int QvPushEncoder::addVideoStream(AnyDict& params, ProcessParams* process) {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    int length = params.getInt32("bufferLength", 0);
    if (length < 1) length = defaultFrames;
    const VideoFormat video(params);
    const bool hasRate = params["framerate"].isFramerate();
    if (!qvPixelFormat(video.fourcc) || video.width < 1 || video.height < 1 || !hasRate)
        return p_->setError(QvStatus::failed,
                            "The format of the video is not complete: FOURCC, width, height, framerate");
    auto stream = std::make_unique<VStream>();
    if (const int result =
            stream->buffer.init(length, video.fourcc, video.width, video.height, video.framerate))
        return p_->setError(result, "Out of memory");
    if (process)
        if (const auto filters = process->filters()) stream->process.setFilters(*filters);
    AnyDict format(params);
    format.remove("bufferLength");
    if (!format["frames"].isInt()) format.set("frames", unknownFrames);
    p_->input.addVideo(format);
    p_->videoStreams.push_back(std::move(stream));
    p_->hasVideo = true;
    qv_dbg()->debug("[PushEncoder] Initialized video stream %d",
                    static_cast<int>(p_->videoStreams.size()) - 1);
    QvUtil::debugOutDict(params);
    return QvStatus::ok;
}

int QvPushEncoder::open() {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    p_->lastStatus = QvStatus::ok;
    p_->error.clear();
    if (!p_->encoder) return p_->setError(QvStatus::failed, "No encode pipe is set");
    if (const int result = p_->openLinks()) return result;
    if (const int result = p_->encoder->open()) return p_->setError(result, p_->encoder->errorDesc());
    p_->totalInFrames = p_->totalOutFrames = 0;
    p_->totalInSamples = p_->totalOutSamples = 0;
    p_->state = stateOpen;
    return QvStatus::ok;
}

int QvPushEncoder::start() {
    QV_ASSERT_MSG(p_->state == stateOpen, "Invalid state");
    QV_ASSERT_MSG(!p_->running, "Thread already running!");
    p_->thread.wait();  // for one that has come to its end
    p_->stop = false;
    p_->running = true;
    if (p_->thread.start([this] { p_->work(); }) == 0) return QvStatus::ok;
    p_->running = false;
    qv_dbg()->error("[PushEncoder] Failed to start thread");
    return p_->setError(QvStatus::failed, "[PushEncoder] Failed to start thread");
}

int QvPushEncoder::writeFrame(QvFrame* frame, int number) {
    auto& stream = p_->find(p_->videoStreams, number,
                            "[PushEncoder] writeFrame() - invalid stream #%d, not initialized");
    const std::lock_guard lock(p_->videoLock);
    int result = p_->lastStatus;
    if (!frame) {
        qv_dbg()->debug("[PushEncoder] EOF on video stream #%d", number);
        stream.end = true;
        result = QvStatus::endOfStream;
    } else if (result == QvStatus::ok) {
        result = stream.buffer.fits(*frame) ? stream.buffer.write(*frame) : QvStatus::invalidArgument;
        if (result == QvStatus::ok)
            ++p_->totalInFrames;
        else
            qv_dbg()->error("[PushEncoder] a frame for video stream #%d is not taken (%d)", number, result);
    }
    // It has what it lacked: it stands still no more, though it may not have noticed yet.
    if (stream.end || !stream.buffer.empty()) stream.waiting.store(false, std::memory_order_relaxed);
    p_->videoEvent.notify_all();
    return result;
}

int QvPushEncoder::writeSamples(QvPcm* samples, int number) {
    auto& stream = p_->find(p_->audioStreams, number,
                            "[PushEncoder] writeSamples() - invalid stream #%d, not initialized");
    const std::lock_guard lock(p_->audioLock);
    int result = p_->lastStatus;
    if (!samples) {
        qv_dbg()->debug("[PushEncoder] EOF on audio stream #%d", number);
        stream.end = true;
        result = QvStatus::ok;
    } else if (result == QvStatus::ok) {
        const bool fits = samples->inited() && samples->channels() == stream.channels &&
                          samples->bytesPerSample() == stream.bytesPerSample;
        const int count = fits ? samples->samples() : 0;
        result = !fits       ? QvStatus::invalidArgument
                 : count > 0 ? stream.buffer.write(samples->ptr(0), count)
                             : QvStatus::ok;
        if (result == QvStatus::ok)
            p_->totalInSamples += count;
        else
            qv_dbg()->error("[PushEncoder] samples for audio stream #%d are not taken (%d)", number, result);
    }
    stream.waiting.store(false, std::memory_order_relaxed);  // the worker looks again
    p_->audioEvent.notify_all();
    return result;
}

bool QvPushEncoder::needsVideo(int stream) const { return isWaiting(p_->videoStreams, stream); }

bool QvPushEncoder::needsAudio(int stream) const { return isWaiting(p_->audioStreams, stream); }

int QvPushEncoder::process() {
    std::unique_lock lock(p_->threadLock);
    p_->changed.wait(lock, [this] {
        return !p_->running || isAnyWaiting(p_->videoStreams) || isAnyWaiting(p_->audioStreams);
    });
    return QvStatus::ok;
}

bool QvPushEncoder::running() const { return p_->running; }

int QvPushEncoder::close(bool abort) {
    if (p_->state != stateOpen) return QvStatus::ok;
    if (p_->running) {
        if (abort) p_->stop = true;
        p_->endAll();
    }
    p_->thread.wait();
    p_->state = stateClosed;
    p_->reset();
    return p_->lastStatus;
}

QvEncodePipe* QvPushEncoder::encodePipe() const { return p_->encoder; }

const char* QvPushEncoder::errorDesc() const {
    return (p_->lastStatus != QvStatus::ok ? p_->workerError : p_->error).c_str();
}
