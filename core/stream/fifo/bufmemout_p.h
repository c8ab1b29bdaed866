// The writer's side of a memory output.
#pragma once

#include <memory>

#include "core/stream/buf_impl_base.h"
#include "core/stream/fifo/bytefifo_p.h"
#include "core/stream/fifo/qvbufmem.h"

class BufMemOut : public Bufstream {
  public:
    // The ring has at least `size` bytes, so that an access unit of as many fits.
    explicit BufMemOut(QvAuxinfoQueue* queue, unsigned size = 0) : size_(size), queue_(queue) {}

    int init() override;  // QvStatus::outOfMemory without memory for the ring
    unsigned usable() override { return ring_->room(); }
    unsigned char* request(unsigned n) override;
    unsigned confirm(unsigned n) override;
    unsigned copybytes(unsigned char* p, unsigned n) override;
    unsigned chunksize() override { return ring_->start; }
    unsigned auxinfo(unsigned offset, unsigned id, void* info, unsigned size) override;
    unsigned split() override { return 0; }
    void done(int) override {}
    void free() override {}

  private:
    unsigned queueAccessUnit(unsigned id, const void* info, unsigned size);
    void queueInfo(unsigned id, void* info, unsigned size);
    void takePayload(unsigned char* target, unsigned bytes);

    unsigned size_;
    std::unique_ptr<bytefifo> ring_;
    QvAuxinfoQueue* queue_;
};
