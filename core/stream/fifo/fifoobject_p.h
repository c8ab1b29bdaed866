// The object of a FIFO: one block that starts with the records of both sides.
#pragma once

#include <cstddef>
#include <memory>
#include <new>
#include <type_traits>

#include "core/stream/bufstream.h"
#include "core/stream/fifo/bytefifo_p.h"
#include "core/stream/fifo/qvbuffifo.h"

static_assert(sizeof(void*) == 8, "the record's layout is that of 64-bit pointers");
static_assert(offsetof(bufstream, usable) == 0);
static_assert(offsetof(bufstream, request) == 8);
static_assert(offsetof(bufstream, confirm) == 16);
static_assert(offsetof(bufstream, copybytes) == 24);
static_assert(offsetof(bufstream, chunksize) == 32);
static_assert(offsetof(bufstream, auxinfo) == 40);
static_assert(offsetof(bufstream, split) == 48);
static_assert(offsetof(bufstream, done) == 56);
static_assert(offsetof(bufstream, free) == 64);
static_assert(offsetof(bufstream, reserved) == 72);
static_assert(offsetof(bufstream, flags) == 88);
static_assert(offsetof(bufstream, state) == 96);
static_assert(offsetof(bufstream, context) == 104);
static_assert(sizeof(bufstream) == 112);

struct FifoObject {
    bufstream in;
    bufstream out;
    bytefifo* ring;  // owned
    // Side information, before it goes to the output; null if nobody listens. `listener` is its context.
    void (*notify)(void* listener, unsigned offset, unsigned id, void* info, unsigned size);
    void* listener;
    void (*release)(FifoObject*);  // deletes the variant that this is
};
static_assert(offsetof(FifoObject, out) == 112);
static_assert(offsetof(FifoObject, ring) == 224);

inline FifoObject* fifoOf(bufstream* record) { return static_cast<FifoObject*>(record->context); }

// The operations of the plain FIFO, which the variants build on.
namespace FifoOps {
unsigned inUsable(bufstream*);
unsigned char* inRequest(bufstream*, unsigned);
unsigned inConfirm(bufstream*, unsigned);
unsigned inCopy(bufstream*, unsigned char*, unsigned);
unsigned chunksize(bufstream*);
unsigned inAux(bufstream*, unsigned, unsigned, void*, unsigned);
unsigned outUsable(bufstream*);
unsigned char* outRequest(bufstream*, unsigned);
unsigned outConfirm(bufstream*, unsigned);
unsigned outCopy(bufstream*, unsigned char*, unsigned);
unsigned outAux(bufstream*, unsigned, unsigned, void*, unsigned);
}  // namespace FifoOps

// Fills the fixed part of a new object and gives it its ring. False if there is none.
bool fifoInit(FifoObject& object, unsigned size, unsigned chunk);

// A variant has the FifoObject as its member `fifo`, at offset 0.
template <class Variant>
FifoObjectPtr fifoMake(unsigned size, unsigned chunk) {
    static_assert(std::is_standard_layout_v<Variant> && offsetof(Variant, fifo) == 0);
    auto* variant = new (std::nothrow) Variant{};
    if (!variant) return nullptr;
    variant->fifo.release = [](FifoObject* object) {
        std::unique_ptr<bytefifo> ring(object->ring);
        delete reinterpret_cast<Variant*>(object);
    };
    FifoObjectPtr owner(&variant->fifo);
    return fifoInit(variant->fifo, size, chunk) ? std::move(owner) : nullptr;
}
