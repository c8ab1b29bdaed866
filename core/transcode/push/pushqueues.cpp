#include "core/transcode/push/pushqueues_p.h"

#include <algorithm>
#include <new>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"

namespace {

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

template <class Stream>
Stream& find(const std::vector<std::unique_ptr<Stream>>& streams, int stream, const char* problem) {
    if (stream >= 0 && stream < static_cast<int>(streams.size()))
        return *streams[static_cast<std::size_t>(stream)];
    const Any text = Any::sprintf(problem, stream);
    qv_dbg()->error("%s", text.asString());
    QV_FAIL(text.asString());
}

template <class Stream>
int append(std::vector<std::unique_ptr<Stream>>& streams, std::unique_ptr<Stream> stream) {
    streams.push_back(std::move(stream));
    return static_cast<int>(streams.size()) - 1;
}

}  // namespace

void PushChange::tell() {
    const std::lock_guard lock(mutex_);
    changed_.notify_all();
}

void PushFailure::keep(int code, const char* why) {
    if (code == QvStatus::ok || code == QvStatus::endOfStream || status != QvStatus::ok) return;
    try {
        text = why;  // before the status, which is what others look at
        qv_dbg()->error("[PushEncoder] the output failed: %s", why);
    } catch (const std::bad_alloc&) {
        // The status alone has to do.
    }
    status = code;
}

int PushQueues::add(std::unique_ptr<VStream> stream) { return append(videos_, std::move(stream)); }
int PushQueues::add(std::unique_ptr<AStream> stream) { return append(audios_, std::move(stream)); }

void PushQueues::startCounting() {
    inFrames_ = outFrames_ = 0;
    inSamples_ = outSamples_ = 0;
}

// --- Writers

int PushQueues::writeFrame(const QvFrame* frame, int number) {
    auto& stream = find(videos_, number, "[PushEncoder] writeFrame() - invalid stream #%d, not initialized");
    const std::lock_guard lock(videoLock_);
    int result = failure_.status;
    if (!frame) {
        qv_dbg()->debug("[PushEncoder] EOF on video stream #%d", number);
        stream.end = true;
        result = QvStatus::endOfStream;
    } else if (result == QvStatus::ok) {
        result = stream.buffer.fits(*frame) ? stream.buffer.write(*frame) : QvStatus::invalidArgument;
        if (result == QvStatus::ok)
            ++inFrames_;
        else
            qv_dbg()->error("[PushEncoder] a frame for video stream #%d is not taken (%d)", number, result);
    }
    // The worker has what it needs, even before it notices.
    if (stream.end || !stream.buffer.empty()) stream.waiting.store(false, std::memory_order_relaxed);
    videoEvent_.notify_all();
    return result;
}

int PushQueues::writeSamples(QvPcm* samples, int number) {
    auto& stream =
        find(audios_, number, "[PushEncoder] writeSamples() - invalid stream #%d, not initialized");
    const std::lock_guard lock(audioLock_);
    int result = failure_.status;
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
            inSamples_ += count;
        else
            qv_dbg()->error("[PushEncoder] samples for audio stream #%d are not taken (%d)", number, result);
    }
    stream.waiting.store(false, std::memory_order_relaxed);  // the worker looks again
    audioEvent_.notify_all();
    return result;
}

bool PushQueues::needsVideo(int stream) const { return isWaiting(videos_, stream); }
bool PushQueues::needsAudio(int stream) const { return isWaiting(audios_, stream); }
bool PushQueues::isAnyWaiting() const { return ::isAnyWaiting(videos_) || ::isAnyWaiting(audios_); }

void PushQueues::endAll() {
    {
        const std::lock_guard lock(videoLock_);
        for (const auto& stream : videos_) stream->end = true;
        videoEvent_.notify_all();
    }
    const std::lock_guard lock(audioLock_);
    for (const auto& stream : audios_) stream->end = true;
    audioEvent_.notify_all();
}

void PushQueues::clear() {
    {
        const std::lock_guard lock(videoLock_);
        for (const auto& stream : videos_) {
            stream->buffer.clear();
            stream->end = false;
        }
        qv_dbg()->debug("[pushencoder] total in frames %d", inFrames_);
        qv_dbg()->debug("[pushencoder] total out frames %d", outFrames_);
    }
    const std::lock_guard lock(audioLock_);
    for (const auto& stream : audios_) {
        stream->buffer.clear();
        stream->end = false;
    }
    qv_dbg()->debug("[pushencoder] total in samples %lld", inSamples_);
    qv_dbg()->debug("[pushencoder] total out samples %lld", outSamples_);
}

// --- The worker

template <class Ready>
void PushQueues::await(PushStream& stream, std::unique_lock<std::mutex>& lock, std::condition_variable& event,
                       Ready ready) {
    while (!ready() && !stream.end) {
        stream.waiting.store(true, std::memory_order_relaxed);
        change_.tell();
        event.wait(lock);
    }
    stream.waiting.store(false, std::memory_order_relaxed);
}

int PushQueues::readFrame(QvFrame& to, int number) {
    auto& stream = find(videos_, number, "[PushEncoder] readFrame() - invalid stream #%d");
    std::unique_lock lock(videoLock_);
    await(stream, lock, videoEvent_, [&] { return !stream.buffer.empty(); });
    if (stream.end) {
        qv_dbg()->debug("[PushEncoder] readFrame, got EOF");
        return QvStatus::endOfStream;
    }
    stream.buffer.read(to);
    to.frameNr = outFrames_++;
    return QvStatus::ok;
}

int PushQueues::readSamples(unsigned char* to, int count, int number) {
    auto& stream = find(audios_, number, "[PushEncoder] readSamples() - invalid stream #%d");
    std::unique_lock lock(audioLock_);
    await(stream, lock, audioEvent_, [&] { return stream.buffer.buffered() >= count; });
    count = std::min(count, stream.buffer.buffered());
    if (count == 0) {
        qv_dbg()->debug("[PushEncoder] readSamples, got EOF");
        return QvStatus::endOfStream;
    }
    stream.buffer.read(to, count);
    outSamples_ += count;
    return count;
}
