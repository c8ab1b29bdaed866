// The list of streams of an encode pipe, in the order in which they were added, and their numbers.
//
// A stream has a place among all streams and a number among those of its type:
//
//     place    0      1      2      3
//     type     video  audio  video  subpicture
//     number   0      0      1      0
#pragma once

#include <algorithm>
#include <cstddef>
#include <memory>
#include <vector>

#include "core/encode/qvencodepipe.h"

struct OutputStream final : QvOStream {
    using QvOStream::QvOStream;
    // Owns `fresh` from now on; the former encoder is deleted.
    void take(std::unique_ptr<QvEncoder> fresh);

  private:
    std::unique_ptr<QvEncoder> owned_;
};

class OutputStreams {
  public:
    bool empty() const { return streams_.empty(); }
    std::size_t size() const { return streams_.size(); }
    auto begin() const { return streams_.begin(); }
    auto end() const { return streams_.end(); }
    OutputStream& operator[](std::size_t place) const { return *streams_[place]; }

    int count(int mask) const;
    OutputStream* find(int type, int nr) const;   // null when absent
    int placeOf(const QvOStream* stream) const;   // -1 when absent
    int numberOf(const QvOStream& stream) const;  // -1 when absent
    TPtrList<QvOStream> list(int type) const;     // all of a type, or all for -1
    QvEncoder* encoder(int type, int nr) const;   // null for a stream that is absent or has none
    QvVideoEncoder* videoEncoder(int nr) const;
    QvAudioEncoder* audioEncoder(int nr) const;

    OutputStream& append(std::unique_ptr<OutputStream> stream);
    std::unique_ptr<OutputStream> remove(std::size_t place);
    // Moves the streams of the types of `mask` to the end, the last one first, and calls `leave` for each
    // before it moves. Takes no memory. The place of the first of them.
    template <class Leave>
    std::size_t gatherAtEnd(int mask, Leave leave) {
        auto kept = streams_.end();
        for (auto at = streams_.end(); at != streams_.begin();) {
            OutputStream& stream = **--at;
            if (!qvStreamTypeMatches(stream.type, mask)) continue;
            leave(stream);
            kept = std::rotate(at, at + 1, kept);
        }
        return static_cast<std::size_t>(kept - streams_.begin());
    }
    // Deletes all streams from that place on.
    void cutTo(std::size_t place) {
        streams_.erase(streams_.begin() + static_cast<std::ptrdiff_t>(place), streams_.end());
    }

    // To the encoders of the types of `mask`, as qvOfferParam does. Results ORed.
    int offer(int mask, const char* name, const Any& value) const;

  private:
    std::vector<std::unique_ptr<OutputStream>> streams_;
};
