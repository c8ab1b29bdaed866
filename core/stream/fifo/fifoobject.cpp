#include "core/stream/fifo/fifoobject_p.h"

namespace FifoOps {

unsigned inUsable(bufstream* bs) { return fifoOf(bs)->ring->room(); }
unsigned char* inRequest(bufstream* bs, unsigned n) { return fifoOf(bs)->ring->requestWrite(n); }
unsigned inConfirm(bufstream* bs, unsigned n) { return fifoOf(bs)->ring->confirmWrite(n); }
unsigned inCopy(bufstream* bs, unsigned char* p, unsigned n) { return fifoOf(bs)->ring->copyIn(p, n); }
unsigned chunksize(bufstream* bs) { return fifoOf(bs)->ring->start; }

unsigned inAux(bufstream* bs, unsigned offset, unsigned id, void* info, unsigned size) {
    FifoObject* fifo = fifoOf(bs);
    if (fifo->notify) fifo->notify(fifo->listener, offset, id, info, size);
    return fifo->out.auxinfo(&fifo->out, offset, id, info, size);
}

unsigned outUsable(bufstream* bs) { return fifoOf(bs)->ring->data(); }
unsigned char* outRequest(bufstream* bs, unsigned n) { return fifoOf(bs)->ring->requestRead(n); }
unsigned outConfirm(bufstream* bs, unsigned n) { return fifoOf(bs)->ring->confirmRead(n); }
unsigned outCopy(bufstream* bs, unsigned char* p, unsigned n) { return fifoOf(bs)->ring->copyOut(p, n); }
unsigned outAux(bufstream*, unsigned, unsigned, void*, unsigned) { return 0; }

}  // namespace FifoOps

bool fifoInit(FifoObject& object, unsigned size, unsigned chunk) {
    object.in = {.usable = FifoOps::inUsable,
                 .request = FifoOps::inRequest,
                 .confirm = FifoOps::inConfirm,
                 .copybytes = FifoOps::inCopy,
                 .chunksize = FifoOps::chunksize,
                 .auxinfo = FifoOps::inAux,
                 .split = nullptr,
                 .done = [](bufstream*, int) {},
                 .free = nullptr,
                 .reserved = {},
                 .flags = BUFSTREAM_WRITER,
                 .state = nullptr,
                 .context = &object};
    object.out = object.in;
    object.out.usable = FifoOps::outUsable;
    object.out.request = FifoOps::outRequest;
    object.out.confirm = FifoOps::outConfirm;
    object.out.copybytes = FifoOps::outCopy;
    object.out.auxinfo = FifoOps::outAux;
    object.ring = bytefifo::make(size, chunk).release();
    return object.ring != nullptr;
}

void FifoObjectDeleter::operator()(FifoObject* object) const { object->release(object); }
