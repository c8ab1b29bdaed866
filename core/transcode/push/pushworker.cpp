#include "core/transcode/push/pushworker_p.h"

#include <algorithm>
#include <cstdint>
#include <new>

#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"

bool PushWorker::start() {
    thread_.wait();  // for one that has come to its end
    stop_ = false;
    running_ = true;
    if (thread_.start([this] { work(); }) == 0) return true;
    running_ = false;
    return false;
}

void PushWorker::work() {
    try {
        loop();
        qv_dbg()->debug("[PuhEncoder::loop] thread exiting");
    } catch (const std::bad_alloc&) {
        failure_.keep(QvStatus::outOfMemory, "Out of memory");
    } catch (const QvException& failure) {
        failure_.keep(QvStatus::failed, failure.what());
    } catch (const std::exception& failure) {
        failure_.keep(QvStatus::failed, failure.what());
    }
    running_ = false;
    change_.tell();
}

void PushWorker::loop() {
    const bool hasVideo = queues_.hasVideo();
    bool videoFinished = !hasVideo;
    bool audioFinished = !queues_.hasAudio();
    long long frames = 0;
    while (!(videoFinished && audioFinished)) {
        if (!videoFinished) videoFinished = takeVideo(frames);
        if (!audioFinished) {
            if (!hasVideo) ++frames;
            audioFinished = takeAudio(frames, videoFinished);
        }
        if (stop_) return;
    }
}

// True when the video has come to its end.
bool PushWorker::takeVideo(long long& frames) {
    const int status = videoLink_.processFrame(0);
    failure_.keep(status, videoLink_.errorDesc());
    frames = videoLink_.outProcessed();
    // The step that finds the end counts as one, too, but has written no frame.
    if (videoLink_.finished() && frames < videoLink_.totalOutFrames()) --frames;
    return videoLink_.finished();
}

bool PushWorker::takeAudio(long long frames, bool videoFinished) {
    long long due = 0;
    if (frames != 0) {
        const auto all = static_cast<int>(std::min<long long>(frames, INT32_MAX));
        due = audioLink_.outSamplesPerFrames(all, videoLink_.outFramerate()) - audioLink_.outProcessed();
        const int status =
            audioLink_.processFrame(static_cast<int>(std::clamp<long long>(due, 0, INT32_MAX)));
        // Sound that ends before it has begun is a failure for the link only.
        if (queues_.soundWasRead()) failure_.keep(status, audioLink_.errorDesc());
    }
    return (due == 0 || audioLink_.finished()) && videoFinished;
}
