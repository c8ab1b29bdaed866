// The streams of a push encoder: writers fill them, the worker empties them.
#pragma once

#include <atomic>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "core/engine/status.h"
#include "core/transcode/push/pushfeed_p.h"

// Wakes the application when the worker begins to wait for input, or ends.
class PushChange {
  public:
    void tell();
    template <class Ready>
    void wait(Ready ready) {
        std::unique_lock lock(mutex_);
        changed_.wait(lock, ready);
    }

  private:
    std::mutex mutex_;
    std::condition_variable changed_;
};

// The first failure of the output. The worker keeps it, others read it.
struct PushFailure {
    std::atomic<int> status{QvStatus::ok};
    std::string text;  // fixed once the status is not 0

    void keep(int code, const char* why);  // not for 0 and the end of a stream
};

// Each operation on a stream that was not added is an assertion.
class PushQueues final : public IAVFeed {
  public:
    PushQueues(PushChange& change, const PushFailure& failure) : change_(change), failure_(failure) {}

    // --- Before a run. add returns the number of the stream.
    int add(std::unique_ptr<VStream> stream);
    int add(std::unique_ptr<AStream> stream);
    bool hasVideo() const { return !videos_.empty(); }
    bool hasAudio() const { return !audios_.empty(); }
    const ProcessParams& firstVideoProcess() const { return videos_.front()->process; }
    const ProcessParams& firstAudioProcess() const { return audios_.front()->process; }
    void startCounting();

    // --- Writers, as QvPushEncoder's operations of these names.
    int writeFrame(const QvFrame* frame, int stream);
    int writeSamples(QvPcm* samples, int stream);
    bool needsVideo(int stream) const;
    bool needsAudio(int stream) const;
    bool isAnyWaiting() const;
    void endAll();
    void clear();  // after a run, with its totals in the log

    // --- The worker.
    int readFrame(QvFrame& to, int stream) override;
    int readSamples(unsigned char* to, int count, int stream) override;
    bool soundWasRead() const { return outSamples_ > 0; }

  private:
    // A worker that waits for input gives up its turn here. `lock` is that of the stream's kind.
    template <class Ready>
    void await(PushStream& stream, std::unique_lock<std::mutex>& lock, std::condition_variable& event,
               Ready ready);

    PushChange& change_;
    const PushFailure& failure_;
    std::vector<std::unique_ptr<VStream>> videos_;
    std::vector<std::unique_ptr<AStream>> audios_;
    std::mutex videoLock_, audioLock_;
    std::condition_variable videoEvent_, audioEvent_;
    int inFrames_ = 0, outFrames_ = 0;          // under the video lock
    long long inSamples_ = 0, outSamples_ = 0;  // under the audio lock, but for the worker's own look
};
