// A bufstream record in front of a context object whose life ends with done(): afterwards the record answers
// with nothing until it is freed.
#pragma once

#include <memory>
#include <new>

#include "core/stream/bufstream.h"

template <class Context>
struct RecordOf {
    static Context* of(bufstream* bs) { return static_cast<Context*>(bs->context); }

    // Null without memory; the context ends then.
    static bufstream* make(std::unique_ptr<Context> context, unsigned flags) {
        if (!context) return nullptr;
        auto* record = new (std::nothrow) bufstream{};
        if (!record) return nullptr;
        record->usable = [](bufstream* bs) { return of(bs) ? of(bs)->usable() : 0u; };
        record->request = [](bufstream* bs, unsigned n) -> unsigned char* {
            return of(bs) ? of(bs)->request(n) : nullptr;
        };
        record->confirm = [](bufstream* bs, unsigned n) { return of(bs) ? of(bs)->confirm(n) : 0u; };
        record->copybytes = [](bufstream* bs, unsigned char* p, unsigned n) {
            return of(bs) ? of(bs)->copybytes(p, n) : 0u;
        };
        record->chunksize = [](bufstream* bs) { return of(bs) ? of(bs)->chunksize() : 0u; };
        record->auxinfo = [](bufstream* bs, unsigned offset, unsigned id, void* info, unsigned size) {
            return of(bs) ? of(bs)->auxinfo(bs, offset, id, info, size) : BUFSTREAM_FAILED;
        };
        if constexpr (requires { context->split(); })
            record->split = [](bufstream* bs) { return of(bs) ? of(bs)->split() : BUFSTREAM_FAILED; };
        record->done = done;
        record->free = [](bufstream* bs) {
            done(bs, 0);
            delete bs;
        };
        record->flags = flags;
        record->context = context.release();
        return record;
    }

    static void done(bufstream* bs, int abort) {
        const std::unique_ptr<Context> context(of(bs));
        bs->context = nullptr;
        if (context) context->done(abort);
    }
};
