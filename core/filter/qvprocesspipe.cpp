#include "core/filter/qvprocesspipe.h"

#include <memory>

#include "core/engine/modules/qvregistry.h"

namespace {

template <class Pipe>
Pipe* createPipe(const char* module) {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(module));
    auto* pipe = dynamic_cast<Pipe*>(codec.get());
    if (pipe) codec.release();
    return pipe;
}

}  // namespace

QvVProcessPipe* QvVProcessPipe::create() { return createPipe<QvVProcessPipe>("vprocess"); }

QvAProcessPipe* QvAProcessPipe::create() { return createPipe<QvAProcessPipe>("aprocess"); }
