#include "core/stream/buf_impl_base.h"

#include "core/arch/qvassert.h"
#include "core/engine/status.h"

namespace {

Bufstream* self(bufstream* bs) { return static_cast<Bufstream*>(bs->context); }

}  // namespace

Bufstream::Bufstream() : m_bs{} {}

Bufstream::~Bufstream() = default;

int Bufstream::init() {
    m_bs = {
        .usable = [](bufstream* bs) { return self(bs)->usable(); },
        .request = [](bufstream* bs, unsigned n) { return self(bs)->request(n); },
        .confirm = [](bufstream* bs, unsigned n) { return self(bs)->confirm(n); },
        .copybytes = [](bufstream* bs, unsigned char* p, unsigned n) { return self(bs)->copybytes(p, n); },
        .chunksize = [](bufstream* bs) { return self(bs)->chunksize(); },
        .auxinfo = [](bufstream* bs, unsigned offset, unsigned id, void* info,
                      unsigned size) { return self(bs)->auxinfo(offset, id, info, size); },
        .split = [](bufstream* bs) { return self(bs)->split(); },
        .done = [](bufstream* bs, int abort) { self(bs)->done(abort); },
        .free = [](bufstream* bs) { self(bs)->free(); },
        .reserved = {},
        .flags = BUFSTREAM_WRITER,
        .state = [](bufstream* bs) { return self(bs)->state(); },
        .context = this,
    };
    return QvStatus::ok;
}

unsigned Bufstream::auxinfo(unsigned, unsigned, void*, unsigned) { QV_FAIL("self->m_bs.auxinfo"); }
unsigned Bufstream::split() { QV_FAIL("self->m_bs.split"); }
void Bufstream::done(int) { QV_FAIL("self->m_bs.done"); }
void Bufstream::free() {}
unsigned Bufstream::state() { QV_FAIL("self->m_bs.state"); }
