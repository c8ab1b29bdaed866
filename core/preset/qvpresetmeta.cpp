#include "core/preset/qvpresetmeta.h"

bool QvPresetMeta::disableAdvanced(int part) const {
    const Any& parts = get("disableAdvanced");
    if (!parts.isDict()) return false;
    switch (part) {
        case video: return parts.asDict().get("video").isTrue();
        case audio: return parts.asDict().get("audio").isTrue();
        case muxer: return parts.asDict().get("muxer").isTrue();
        default: return false;
    }
}
