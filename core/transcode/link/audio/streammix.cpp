#include "core/transcode/link/audio/streammix_p.h"

#include <algorithm>
#include <cstring>

#include "core/engine/status.h"

int StreamMix::channelNr(int stream, int channel) const {
    int before = 0;
    for (const Part& part : parts_) {
        if (part.stream == stream) return before + channel;
        before += part.channels;
    }
    return silentChannel;
}

AnyVector StreamMix::numbered(const ChannelMatrix& matrix) const {
    AnyVector result;
    for (const ChannelMatrix::Row& row : matrix.rows()) {
        AnyVector channels;
        for (const ChannelSource& source : row)
            channels.append(Any(channelNr(source.stream, source.channel)));
        result.append(channels.empty() ? Any(silentChannel) : Any(channels));
    }
    return result;
}

bool StreamMix::prepare(const QvPcm& first, int samples, int channels) {
    const bool fits = buffer_.inited() && buffer_.size() >= samples && buffer_.channels() == channels &&
                      buffer_.bytesPerSample() == first.bytesPerSample();
    if (!fits && buffer_.init(samples, channels, first.bytesPerSample(), first.samplerate()) != QvStatus::ok)
        return false;
    buffer_.copyMeta(first);
    buffer_.setSamples(samples);
    return true;
}

QvPcm* StreamMix::interleave(const std::vector<const QvPcm*>& inputs) {
    if (inputs.empty() || inputs.size() != parts_.size()) return nullptr;
    int samples = 0;
    int channels = 0;
    for (const auto* input : inputs) {
        if (!input || !input->inited() || input->bytesPerSample() != inputs.front()->bytesPerSample())
            return nullptr;
        samples = input == inputs.front() ? input->samples() : std::min(samples, input->samples());
        channels += input->channels();
    }
    if (!prepare(*inputs.front(), samples, channels)) return nullptr;
    for (int i = 0; i < samples; ++i) {
        auto* to = buffer_.ptr(i);
        for (const auto* input : inputs) {
            const int bytes = input->samples2bytes(1);
            std::memcpy(to, input->ptr(i), static_cast<std::size_t>(bytes));
            to += bytes;
        }
    }
    return &buffer_;
}
