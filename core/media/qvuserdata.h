// The user data of a picture: packets of bytes as a decoder found them in the coded stream (ATSC A/53
// captions, AFD, bar data and the like), in stream order. Their contents are not looked into.
#pragma once

#include <span>
#include <vector>

#include "core/arch/api.h"

// A frame borrows its user data: they belong to the decoder or filter that set them and are valid until it
// makes its next frame. To keep them longer, copy the packets.
class QV_API QvUserData {
  public:
    int count() const { return static_cast<int>(packets_.size()); }
    bool empty() const { return packets_.empty(); }
    // An assertion outside the list. Valid until the list changes.
    std::span<const unsigned char> packet(int index) const;

    void append(std::span<const unsigned char> packet);  // a copy of the bytes; it may have none
    void extend(const QvUserData& other);                // copies of all packets; `other` may be this list
    void clear() { packets_.clear(); }

    bool operator==(const QvUserData&) const = default;

  private:
    std::vector<std::vector<unsigned char>> packets_;
};
