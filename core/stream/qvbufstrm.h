// QvBufStream: the object that owns a bufstream record, base of FIFOs, files and memory outputs.
#pragma once

#include <memory>
#include <string>

#include "core/arch/api.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/bufstream.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"
#include "core/value/ptrlist.h"

class QvCancel;
class QvCodec;
class QvIoFailure;

namespace QVThreads {
class QvCriticalSection;
}

// Hears of each item of side information, in the thread that writes the stream.
class QV_API QvAuxInfoObserver {
  public:
    virtual ~QvAuxInfoObserver();
    virtual void auxInfo(unsigned offset, unsigned id, void* info, unsigned size) = 0;
};

// Life: parameters are set, init() makes the records, destroy() ends them; init() may follow again. A stream
// belongs to the thread that drives its writer; lock() and unlock() are for callers that share one, nothing
// here takes the lock by itself.
//
// Copying is memberwise: a copy names the same lock and the same open files, which end when either of the
// two ends them.
class QV_API QvBufStream {
  public:
    explicit QvBufStream(QvCodec* owner = nullptr);
    QvBufStream(const QvBufStream&);
    QvBufStream& operator=(const QvBufStream&);

    virtual ~QvBufStream();
    virtual int init();  // with the current parameters
    // Ends what is open, takes `params` as the parameters and starts anew. 0 or a status.
    virtual int init(const AnyDict& params);
    virtual void destroy(int abort);
    virtual void flush();
    // init() with "size" and "chunk" replaced, both in bytes. What was buffered is lost.
    virtual int resize(int size, int chunk);
    virtual bufstream* input() = 0;                 // to write to; valid until destroy
    virtual bufstream* output() = 0;                // to read from; likewise
    virtual const Any& getParam(const char* name);  // Any::invalid() if absent
    virtual int setParam(const char* name, const Any& value);
    virtual int setParamDict(const AnyDict& params);  // setParam for each entry
    // Observers are borrowed. Base: QvStatus::notSupported, and no list.
    virtual int registerObserver(QvAuxInfoObserver* observer);
    virtual int unregisterObserver(QvAuxInfoObserver* observer);
    virtual int unregisterAllObservers();
    virtual TPtrList<QvAuxInfoObserver>* observers();

    void reset();      // of an inited stream: destroy(0), init
    int size() const;  // the parameter "size" as it is stored; 0 if absent
    bool inited() const { return inited_; }
    bool enabled() const { return enabled_; }  // true at first; kept for the stream's user
    void setEnabled(bool on) { enabled_ = on; }
    // Both codecs are borrowed: the maker of the stream, and its writer.
    QvCodec* owner() const { return owner_; }
    void setOwner(QvCodec* owner) { owner_ = owner; }
    QvCodec* atachee() const { return atachee_; }
    void setAtachee(QvCodec* atachee) { atachee_ = atachee; }
    void lock();  // recursive
    void unlock();

    // The first failure to read or write since init, also of files that flush() or destroy() has closed: an
    // errno value, 0 if none, and a text that says what failed, for which file and why, "" if none. To be
    // asked after destroy(), before a file gets its final name.
    int ioError() const;
    std::string ioErrorText() const;
    // Bytes that the system has taken since init, in files that are closed again.
    unsigned long long ioTaken() const;

    // What ends a wait for the reader of a pipe, socket or terminal that is opened from now on; see
    // QvCancel. Null, as at first: nothing does. QvTranscoder gives its own to the streams of its output.
    void setCancel(std::shared_ptr<QvCancel> cancel) { cancel_ = std::move(cancel); }

  protected:
    AnyDict& params() { return params_; }
    const AnyDict& params() const { return params_; }
    void setInited(bool on) { inited_ = on; }
    // The entry as Int32; if it has another type or is absent, `fallback`, which is stored.
    int int32Param(const char* name, int fallback);
    const std::shared_ptr<QvIoFailure>& failure() const { return failure_; }
    const std::shared_ptr<QvCancel>& cancel() const { return cancel_; }
    // Failures of `inner`, to which this stream passes its data on, count as this one's, and what ends the
    // waits of this one ends those of `inner`.
    void shareFailure(QvBufStream& inner) const {
        inner.failure_ = failure_;
        inner.cancel_ = cancel_;
    }

  private:
    std::shared_ptr<QVThreads::QvCriticalSection> lock_;
    QvCodec* owner_;
    QvCodec* atachee_ = nullptr;
    bool inited_ = false;
    AnyDict params_;
    bool enabled_ = true;
    std::shared_ptr<QvIoFailure> failure_;
    std::shared_ptr<QvCancel> cancel_;
};
