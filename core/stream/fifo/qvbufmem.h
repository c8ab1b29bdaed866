// Memory output: a bitstream and its side information become a queue of complete access units.
#pragma once

#include <memory>

#include "core/stream/qvbufstrm.h"

class BufMemOut;

// A handle to one queued item: an access unit with its info, or side information alone. Copies share the
// item, which ends with its last handle. Handles of one item may be in different threads.
class QV_API QvAuxinfoData {
  public:
    // Copies both areas. `info` may be null with infoSize 0; asserts sizes below 0, and infoSize above
    // MAX_AU_SIZE. With a null payload and payloadSize above 0 the payload is zeros.
    QvAuxinfoData(int id, void* info, int infoSize, unsigned char* payload, int payloadSize);
    QvAuxinfoData(const QvAuxinfoData& other);
    QvAuxinfoData& operator=(const QvAuxinfoData& other);
    virtual ~QvAuxinfoData();

    int infoId() const;
    int infoSize() const;  // bytes
    void* info() const;    // null if the size is 0
    int payloadSize() const;
    unsigned char* payload() const;  // null if the size is 0

  private:
    friend class BufMemOut;
    struct Record;
    explicit QvAuxinfoData(Record* record) : record_(record) {}
    static Record* allocate(int id, const void* info, int infoSize, int payloadSize);
    void release();

    Record* record_;
};

// What a polling consumer sees. Any thread.
class QV_API QvAuQueuePoll {
  public:
    virtual int hasData() const = 0;      // 1 if popData has something to return
    virtual QvAuxinfoData popData() = 0;  // the oldest item; asserts an empty queue
    virtual ~QvAuQueuePoll();
};

// Handover between an encoding thread and one consumer. Unbounded; each operation takes the lock.
class QV_API QvAuxinfoQueue : public QvAuQueuePoll {
  public:
    QvAuxinfoQueue();
    ~QvAuxinfoQueue() override;
    QvAuxinfoQueue(const QvAuxinfoQueue&) = delete;
    QvAuxinfoQueue& operator=(const QvAuxinfoQueue&) = delete;

    int hasData() const override;
    QvAuxinfoData popData() override;
    int pushData(const QvAuxinfoData& item);  // 0
    // The same lock, for a compound step.
    void lock();
    void unlock();

  private:
    struct Imp;
    std::unique_ptr<Imp> imp_;
};

// The stream that fills such a queue. VIDEO_AU_CODE and AUDIO_AU_CODE move as many bytes as their info says
// from the ring into one item; statistics and stream headers are ignored; any other identifier becomes an
// item without payload. Encoders write the bytes of an access unit before they report it.
class QV_API QvMemOutStream : public QvBufStream {
  public:
    explicit QvMemOutStream(QvCodec* owner = nullptr);
    ~QvMemOutStream() override;

    // Parameter "size" (Int32, bytes): an access unit may be that large; never below 2,097,152.

    // Sets the parameter "outputQueue". The queue is borrowed and must outlive the stream.
    void setOutputQueue(QvAuxinfoQueue* queue);

    using QvBufStream::init;
    int init(const AnyDict& params) override;  // QvStatus::illegalState without an output queue
    void destroy(int abort) override;
    bufstream* input() override;   // null before init
    bufstream* output() override;  // null

  private:
    std::unique_ptr<BufMemOut> out_;
};
