// The thread of a push encoder: it pulls from the queues through the links until both kinds of stream have
// ended.
#pragma once

#include <atomic>

#include "core/engine/threads/qvthreads.h"
#include "core/transcode/link/audio/transalink.h"
#include "core/transcode/link/video/transvlink.h"
#include "core/transcode/push/pushqueues_p.h"

class PushWorker {
  public:
    PushWorker(PushQueues& queues, PushChange& change, PushFailure& failure)
        : queues_(queues), change_(change), failure_(failure) {}

    // The links of the first streams; they are open during a run, if there is a stream.
    TransVLink& videoLink() { return videoLink_; }
    TransALink& audioLink() { return audioLink_; }

    bool start();                              // false without a thread
    bool running() const { return running_; }  // the thread is in its loop
    void stop() { stop_ = true; }              // after the step that it is in
    void wait() { thread_.wait(); }

  private:
    void work();
    void loop();
    bool takeVideo(long long& frames);
    bool takeAudio(long long frames, bool videoFinished);

    PushQueues& queues_;
    PushChange& change_;
    PushFailure& failure_;
    TransVLink videoLink_;
    TransALink audioLink_;
    QVThreads::QvThread thread_;
    std::atomic<bool> running_{false};
    std::atomic<bool> stop_{false};
};
