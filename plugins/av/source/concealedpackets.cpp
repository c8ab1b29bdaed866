#include "plugins/av/source/concealedpackets.h"

#include <algorithm>
#include <cstring>

#include "plugins/av/source/avheaders.h"

namespace av {

void ConcealedPackets::watch(AVCodecContext& codec) { codec.opaque = this; }

bool ConcealedPackets::has(std::size_t packet) const {
    const std::lock_guard lock(mutex_);
    return std::find(packets_.begin(), packets_.end(), packet) != packets_.end();
}

// The line "concealing %d DC, %d AC, %d MV errors" comes once for each damaged picture, from the context of
// the thread that decodes it, which is a copy of the one that is watched.
void ConcealedPackets::heard(void* object, const char* format) {
    constexpr char line[] = "concealing ";
    if (!object || std::strncmp(format, line, sizeof line - 1) != 0) return;
    if (*static_cast<const AVClass* const*>(object) != avcodec_get_class()) return;
    const auto& codec = *static_cast<const AVCodecContext*>(object);
    auto* const damage = static_cast<ConcealedPackets*>(codec.opaque);
    if (!damage || codec.codec_type != AVMEDIA_TYPE_VIDEO || !av_codec_is_decoder(codec.codec)) return;
    const auto packet = static_cast<std::size_t>(codec.reordered_opaque);
    const std::lock_guard lock(damage->mutex_);
    if (damage->packets_.empty() || damage->packets_.back() != packet) damage->packets_.push_back(packet);
}

}  // namespace av
