#include "core/encode/basemuxer.h"

#include <algorithm>

#include "core/arch/qvassert.h"

BaseMuxer::BaseMuxer(const QvModule* module) : QvMuxer(module) {}

BaseMuxer::~BaseMuxer() = default;

int BaseMuxer::attachOutStream(QvBufStream* stream) { return QvMuxer::attachOutStream(stream); }

int BaseMuxer::detachOutStream() { return QvMuxer::detachOutStream(); }

BaseMuxer::StreamList& BaseMuxer::list(int type) {
    const auto place = std::find(streamTypes.begin(), streamTypes.end(), type);
    QV_ASSERT_MSG(place != streamTypes.end(), "Invalid stream type");
    return lists_[static_cast<size_t>(place - streamTypes.begin())];
}

const BaseMuxer::StreamList& BaseMuxer::list(int type) const {
    return const_cast<BaseMuxer*>(this)->list(type);
}

int BaseMuxer::nrStreams(int type) const {
    int count = 0;
    for (size_t i = 0; i < lists_.size(); ++i)
        if (type == 0 || type == qvAllStreams || type == streamTypes[i])
            count += static_cast<int>(lists_[i].size());
    return count;
}

QvBufStream* BaseMuxer::stream(int type, int nr) const {
    const auto& streams = list(type);
    QV_ASSERT_MSG(nr >= 0 && nr < static_cast<int>(streams.size()), "Invalid stream number");
    return streams[static_cast<size_t>(nr)].get();
}

void BaseMuxer::removeStreams(int mask) {
    for (size_t i = 0; i < lists_.size(); ++i)
        if (qvStreamTypeMatches(streamTypes[i], mask)) lists_[i].clear();
}

void BaseMuxer::removeStream(int type, int nr) {
    auto& streams = list(type);
    QV_ASSERT_MSG(nr >= 0 && nr < static_cast<int>(streams.size()), "Invalid stream number");
    streams.erase(streams.begin() + nr);
}

QvBufStream* BaseMuxer::keep(int type, std::unique_ptr<QvBufStream> stream) {
    return list(type).emplace_back(std::move(stream)).get();
}

bool BaseMuxer::anyEnabled() const {
    for (const auto& streams : lists_)
        for (const auto& stream : streams)
            if (stream->enabled()) return true;
    return false;
}
