// The connection matrix of an audio link: which input channels feed each output channel.
//
//     row 0 (output channel 0)   { stream 0, channel 0 }
//     row 1                      { stream 0, channel 1 } + { stream 1, channel 0 }     mixed
//     row 2                      no source: silence
#pragma once

#include <string>
#include <vector>

#include "core/value/anycontainer.h"

struct ChannelSource {
    int stream = -1;
    int channel = -1;  // -1 when the source names none
    enum Form { good, noDictionary, noChannel } form = good;
};

class ChannelMatrix {
  public:
    using Row = std::vector<ChannelSource>;

    ChannelMatrix() = default;
    // `entries`: for each output channel a vector of source dictionaries, one such dictionary, or anything
    // else for silence. A source without "stream" is of `ownStream`.
    ChannelMatrix(const AnyVector& entries, int ownStream);

    // Why it does not suit an output of so many channels, as a line for the log; empty when it does.
    // `inChannels` has one element a stream of the input: its channels, or -1 where it does not say.
    std::string fault(int outChannels, const std::vector<int>& inChannels) const;
    // The streams with a source that names a channel, each once, in rising order.
    std::vector<int> streams() const;
    // "[stream:0, channel:1] + [stream:1, channel:0]", or "MUTE".
    std::string describe(int row) const;

    const AnyVector& entries() const { return entries_; }
    const std::vector<Row>& rows() const { return rows_; }
    int size() const { return entries_.size(); }

  private:
    AnyVector entries_;
    std::vector<Row> rows_;
};
