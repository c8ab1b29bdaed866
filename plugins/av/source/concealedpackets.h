// The packets of a stream of pictures in which a codec has found errors and concealed them.
//
// The flags of a decoded picture can't say it: with threads of frames a picture may be handed out before the
// thread that decodes it has reached the error. What the codec logs is complete when it hands out a picture
// of a later packet or the packet itself, whatever the number of threads.
#pragma once

#include <cstddef>
#include <mutex>
#include <vector>

struct AVCodecContext;

namespace av {

// Outlives the codecs that it watches.
class ConcealedPackets {
  public:
    // The codec's `reordered_opaque` is the number of the packet that it is given.
    void watch(AVCodecContext& codec);
    bool has(std::size_t packet) const;

    // Of the callback for the libraries' log, on any thread: `object` says a line of this format.
    static void heard(void* object, const char* format);

  private:
    mutable std::mutex mutex_;
    std::vector<std::size_t> packets_;
};

}  // namespace av
