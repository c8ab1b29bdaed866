#include "builtin/pipes/output/members/streamsnapshot.h"

#include "builtin/pipes/output/members/outputstreams.h"
#include "core/arch/qvassert.h"

std::vector<StreamSnapshot> StreamSnapshot::all(const OutputStreams& streams, const QvMuxer* muxer) {
    std::vector<StreamSnapshot> taken;
    for (const auto& stream : streams) {
        StreamSnapshot& shot = taken.emplace_back();
        shot.type = stream->type;
        if (stream->encoder) {
            stream->encoder->store(shot.settings);
            shot.codec = shot.settings.get("name").toString().asString("");
        } else {
            QV_ASSERT(stream->type == qvSubpicStream);
        }
        muxer->getStreamParams(stream->type, streams.numberOf(*stream), shot.params);
        shot.filters = stream->filters();
        shot.enabled = stream->enabled();
    }
    return taken;
}
