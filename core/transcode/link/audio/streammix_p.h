// Several input streams as one buffer, whose channels are those of the streams one after the other.
//
//     stream 0   L R L R L R      mix   L R M L R M L R M
//     stream 2   M M M
#pragma once

#include <vector>

#include "core/media/qvbuffer.h"
#include "core/transcode/link/audio/channelmatrix_p.h"

class StreamMix {
  public:
    static constexpr int silentChannel = -1;

    struct Part {
        int stream;
        int channels;
    };

    StreamMix() = default;
    explicit StreamMix(std::vector<Part> parts) : parts_(std::move(parts)) {}

    const std::vector<Part>& parts() const { return parts_; }
    // The place of a channel in the mix; silentChannel for a stream that takes no part.
    int channelNr(int stream, int channel) const;
    // A matrix with these places: for each output channel a vector of them, or silentChannel.
    AnyVector numbered(const ChannelMatrix& matrix) const;
    // The samples that all inputs have, interleaved, in a buffer that lives until the next call. One input a
    // part, in the same order. Null without a part, without a buffer, for inputs of different widths, or for
    // lack of memory.
    QvPcm* interleave(const std::vector<const QvPcm*>& inputs);

  private:
    bool prepare(const QvPcm& first, int samples, int channels);

    std::vector<Part> parts_;
    QvPcm buffer_;
};
