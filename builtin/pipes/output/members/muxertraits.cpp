#include "builtin/pipes/output/members/muxertraits.h"

#include <cstring>

#include "core/encode/qvmuxer.h"
#include "core/engine/modules/qvmodule.h"

namespace {

struct Row {
    const char* module;
    const char* companionSink;
    bool anyCodec;
    bool transportStream;
    bool manyPrograms;
    bool sizedStreams;
};

// clang-format off
//   module       companion   any    transport  many      sized
//                sink        codec  stream     programs  streams
constexpr Row rows[] = {
    {"nullmux",   "nullsink", true,  false,     false,    false},
    {"memmux",    "memsink",  true,  false,     false,    false},
    {"mptsmux",   "",         false, true,      true,     false},
    {"mpegtsmux", "",         false, true,      false,    false},
    {"rawmux",    "",         false, false,     false,    true },
};
// clang-format on

void read(const QvModule& module, const char* attribute, bool& trait) {
    const Any value = module.getAttr(attribute);
    if (value.isInt32()) trait = value.asInt32() != 0;
}

}  // namespace

MuxerTraits MuxerTraits::of(const char* name, const QvModule* module) {
    MuxerTraits traits;
    for (const auto& row : rows)
        if (std::strcmp(row.module, name) == 0)
            traits = {row.companionSink, row.anyCodec, row.transportStream, row.manyPrograms,
                      row.sizedStreams};
    if (!module) return traits;
    if (const Any sink = module->getAttr("companionSink"); sink.isString())
        traits.companionSink = sink.asString();
    read(*module, "anyCodec", traits.anyCodec);
    read(*module, "transportStream", traits.transportStream);
    read(*module, "manyPrograms", traits.manyPrograms);
    read(*module, "sizedStreams", traits.sizedStreams);
    return traits;
}

MuxerTraits MuxerTraits::of(const QvMuxer* muxer) {
    return muxer ? of(muxer->name(), muxer->module()) : MuxerTraits();
}
