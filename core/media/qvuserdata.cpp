#include "core/media/qvuserdata.h"

#include "core/arch/qvassert.h"

std::span<const unsigned char> QvUserData::packet(int index) const {
    QV_ASSERT(index >= 0 && index < count());
    return packets_[static_cast<std::size_t>(index)];
}

void QvUserData::append(std::span<const unsigned char> packet) {
    packets_.emplace_back(packet.begin(), packet.end());
}

void QvUserData::extend(const QvUserData& other) {
    const std::size_t added = other.packets_.size();
    packets_.reserve(packets_.size() + added);
    for (std::size_t i = 0; i < added; ++i) packets_.push_back(other.packets_[i]);
}
