// The audio link: its connection matrix, and what mixing several input streams needs.
#include <algorithm>
#include <cstring>
#include <string>

#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/transcode/link/translink.h"

namespace {

constexpr int silentChannel = -1;

// An entry of a matrix is a vector of sources, one source alone, or silence.
AnyVector sourcesOf(const Any& entry) {
    if (entry.isVector()) return entry.asVector();
    AnyVector sources;
    if (entry.isDict() && entry.isTrue()) sources.append(entry.asDict());
    return sources;
}

}  // namespace

struct TransALink::Source {
    int stream = -1;
    int channel = -1;  // -1 when the source names none
};

TransALink::Source TransALink::sourceOf(const Any& source) const {
    if (!source.isDict()) return {};
    return {source.asDict().getInt32("stream", decStreamNr_), source.asDict().getInt32("channel", -1)};
}

bool TransALink::_verifyConnMatrix() const {
    if (connMatrix_.empty()) {
        qv_dbg()->debug(
            "Not using audio channel map, it is 0 size, reverting to default audio channel mode.");
        return false;
    }
    if (connMatrix_.size() != outChannels_) {
        qv_dbg()->debug("Not using audio channel map, it has %d out channels, and encoder has %d.",
                        connMatrix_.size(), outChannels_);
        return false;
    }
    for (int i = 0; i < connMatrix_.size(); ++i) {
        const AnyVector sources = sourcesOf(connMatrix_.at(i));
        for (int j = 0; j < sources.size(); ++j)
            if (!verifySource(sources.at(j), i, j)) return false;
    }
    logMatrix();
    return true;
}

bool TransALink::verifySource(const Any& source, int channel, int index) const {
    if (!source.isDict()) {
        qv_dbg()->debug("Invalid channel map at %d, %d", channel, index);
        return false;
    }
    if (!source.asDict().get("channel").isInt32()) {
        qv_dbg()->debug("Invalid channel map at %d, %d, channel", channel, index);
        return false;
    }
    const Source from = sourceOf(source);
    if (from.stream < 0 || from.stream >= decoder_->nrAudioStreams()) {
        qv_dbg()->debug(
            "Invalid channel map for out channel %d, input stream number (%d)>= nr of input streams(%d)",
            channel, from.stream, decoder_->nrAudioStreams());
        return false;
    }
    const Any name = Any::sprintf("audio%d/channels", from.stream);
    const Any channels = decoder_->getParam(name.asString());
    if (!channels.isInt32()) {
        qv_dbg()->debug("Invalid channel map at %d, %d, , can not get %s", channel, index, name.asString());
        return false;
    }
    if (from.channel < 0 || from.channel >= channels.asInt32()) {
        qv_dbg()->debug(
            "Invalid channel map for out channel %d, input channel (%d)>= nr of input cannels(%d)", channel,
            from.channel, channels.asInt32());
        return false;
    }
    return true;
}

void TransALink::logMatrix() const {
    qv_dbg()->debug("Audio channel map OK");
    for (int i = 0; i < connMatrix_.size(); ++i) {
        std::string line;
        for (const Any& source : sourcesOf(connMatrix_.at(i))) {
            const Source from = sourceOf(source);
            if (!line.empty()) line += " + ";
            line += Any::sprintf("[stream:%d, channel:%d]", from.stream, from.channel).asString();
        }
        qv_dbg()->debug("%i <- %s", i, line.empty() ? "MUTE" : line.c_str());
    }
}

AnyVector TransALink::_getNeededInputStreams(const AnyVector& matrix, AnyVector& newlySelected, bool select) {
    AnyVector streams;
    for (const Any& entry : matrix)
        for (const Any& source : sourcesOf(entry)) {
            const Source from = sourceOf(source);
            if (from.channel >= 0 && !streams.contains(Any(from.stream))) streams.append(Any(from.stream));
        }
    streams.sort(false);
    if (!select) return streams;
    for (const Any& stream : streams) {
        if (decoder_->isSelected(qvAudioStream, stream.asInt32())) continue;
        if (decoder_->select(qvAudioStream, stream.asInt32()) == QvStatus::ok)
            newlySelected.append(stream);
        else
            qv_dbg()->log(QvLogMask::error, "ALink.open: Can not select stream %d", stream.asInt32());
    }
    selectedStreams_.extend(newlySelected);
    muxStreams_ = streams;
    muxChannels_.clear();
    for (const Any& stream : streams)
        muxChannels_.append(Any(decoder_->getAudioParam(stream.asInt32(), "channels").asInt32(0)));
    return streams;
}

int TransALink::_filterChannelNr(const AnyVector& streams, int stream, int channel) const {
    int before = 0;
    for (const Any& candidate : streams) {
        if (candidate.asInt32() == stream) return before + channel;
        before += decoder_->getAudioParam(candidate.asInt32(), "channels").asInt32(0);
    }
    return silentChannel;
}

AnyVector TransALink::_connMatrixToFilter(const AnyVector& matrix) const {
    AnyVector numbered;
    for (const Any& entry : matrix) {
        AnyVector channels;
        for (const Any& source : sourcesOf(entry)) {
            const Source from = sourceOf(source);
            channels.append(Any(_filterChannelNr(muxStreams_, from.stream, from.channel)));
        }
        if (channels.empty())
            numbered.append(Any(silentChannel));
        else
            numbered.append(Any(channels));
    }
    return numbered;
}

QvPcm* TransALink::_muxStreams() {
    std::vector<const QvPcm*> inputs;
    int count = 0;
    int channels = 0;
    for (const Any& stream : muxStreams_) {
        const auto* pcm = decoder_->getAudioPtr(stream.asInt32());
        if (!pcm || !pcm->inited()) return nullptr;
        count = inputs.empty() ? pcm->samples() : std::min(count, pcm->samples());
        channels += pcm->channels();
        if (!inputs.empty() && pcm->bytesPerSample() != inputs.front()->bytesPerSample()) return nullptr;
        inputs.push_back(pcm);
    }
    if (inputs.empty()) return nullptr;
    const int width = inputs.front()->bytesPerSample();
    if (!muxBuffer_.inited() || muxBuffer_.size() < count || muxBuffer_.channels() != channels ||
        muxBuffer_.bytesPerSample() != width) {
        if (muxBuffer_.init(count, channels, width, inputs.front()->samplerate()) != QvStatus::ok)
            return nullptr;
    }
    muxBuffer_.copyMeta(*inputs.front());
    muxBuffer_.setSamples(count);
    for (int i = 0; i < count; ++i) {
        auto* to = muxBuffer_.ptr(i);
        for (const auto* input : inputs) {
            const int bytes = input->samples2bytes(1);
            std::memcpy(to, input->ptr(i), static_cast<std::size_t>(bytes));
            to += bytes;
        }
    }
    return &muxBuffer_;
}
