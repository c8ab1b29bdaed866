#include "builtin/pipes/output/members/outputstreams.h"

#include <algorithm>

#include "builtin/pipes/output/members/pipehost.h"

void OutputStream::take(std::unique_ptr<QvEncoder> fresh) {
    encoder = fresh.get();
    owned_ = std::move(fresh);
}

int OutputStreams::count(int mask) const {
    return static_cast<int>(std::count_if(streams_.begin(), streams_.end(), [mask](const auto& stream) {
        return qvStreamTypeMatches(stream->type, mask);
    }));
}

OutputStream* OutputStreams::find(int type, int nr) const {
    if (nr < 0) return nullptr;
    for (const auto& stream : streams_)
        if (stream->type == type && nr-- == 0) return stream.get();
    return nullptr;
}

int OutputStreams::placeOf(const QvOStream* wanted) const {
    const auto place = std::find_if(streams_.begin(), streams_.end(),
                                    [wanted](const auto& stream) { return stream.get() == wanted; });
    return place == streams_.end() ? -1 : static_cast<int>(place - streams_.begin());
}

int OutputStreams::numberOf(const QvOStream& wanted) const {
    int nr = 0;
    for (const auto& stream : streams_) {
        if (stream.get() == &wanted) return nr;
        if (stream->type == wanted.type) ++nr;
    }
    return -1;
}

TPtrList<QvOStream> OutputStreams::list(int type) const {
    TPtrList<QvOStream> found;
    for (const auto& stream : streams_)
        if (type == -1 || stream->type == type) found.append(stream.get());
    return found;
}

QvEncoder* OutputStreams::encoder(int type, int nr) const {
    const auto* stream = find(type, nr);
    return stream ? stream->encoder : nullptr;
}

QvVideoEncoder* OutputStreams::videoEncoder(int nr) const {
    return static_cast<QvVideoEncoder*>(encoder(qvVideoStream, nr));
}

QvAudioEncoder* OutputStreams::audioEncoder(int nr) const {
    return static_cast<QvAudioEncoder*>(encoder(qvAudioStream, nr));
}

OutputStream& OutputStreams::append(std::unique_ptr<OutputStream> stream) {
    return *streams_.emplace_back(std::move(stream));
}

std::unique_ptr<OutputStream> OutputStreams::remove(std::size_t place) {
    auto removed = std::move(streams_[place]);
    streams_.erase(streams_.begin() + static_cast<std::ptrdiff_t>(place));
    return removed;
}

int OutputStreams::offer(int mask, const char* name, const Any& value) const {
    int result = 0;
    for (const auto& stream : streams_)
        if (stream->encoder && qvStreamTypeMatches(stream->type, mask))
            result |= qvOfferParam(*stream->encoder, name, value);
    return result;
}
