// A request to give up waiting for the reader of an output.
#pragma once

#include <atomic>
#include <memory>

#include "core/arch/api.h"

// One thread writes, with this at hand (QvBufStream::setCancel); any other may call request(). It ends a
// write into a pipe, socket or terminal that nobody reads, and the opening of a pipe that nobody has opened
// for reading: they fail with ECANCELED. A reader that still takes bytes gets `graceNs` for the rest. Regular
// files and discs are not affected.
class QV_API QvCancel {
  public:
    static constexpr long long graceNs = 50'000'000;

    QvCancel() = default;
    ~QvCancel();
    QvCancel(const QvCancel&) = delete;
    QvCancel& operator=(const QvCancel&) = delete;

    void request();
    bool requested() const { return at_.load() != 0; }
    // Takes the request back, before the next run. No wait may be under way.
    void clear();

    // For the writer. Nanoseconds of the grace that are left; all of it before a request.
    long long graceLeft() const;
    // Readable from a request on; made by the first call, so that a writer of regular files needs none. -1
    // with errno when the system has none left.
    int descriptor();
    // Whether a write or an opening was given up since clear().
    bool gaveUp() const { return gaveUp_.load(); }
    void noteGivenUp() { gaveUp_.store(true); }

  private:
    void wake(int descriptor) const;

    std::atomic<long long> at_{0};  // instant of the request, 0: none
    std::atomic<int> descriptor_{-1};
    std::atomic<bool> gaveUp_{false};
};

// For codecs that write an output of their own, other than those of the encode pipe; a filter that stores
// frames, for example. TransVLink gives a codec that also derives from it the run's QvCancel before open.
class QV_API QvCancellable {
  public:
    virtual ~QvCancellable();
    // Null: nothing ends a wait.
    virtual void setCancel(std::shared_ptr<QvCancel> cancel) = 0;
};
