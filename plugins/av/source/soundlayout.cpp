#include "plugins/av/source/soundlayout.h"

namespace av {

bool setUsualLayout(AVChannelLayout& layout, int channels) {
    av_channel_layout_uninit(&layout);
    // The libraries have left, right and low frequencies for three, which hardly a codec holds.
    if (channels == 3) return av_channel_layout_from_mask(&layout, AV_CH_LAYOUT_SURROUND) >= 0;
    if (channels == 4) return av_channel_layout_from_mask(&layout, AV_CH_LAYOUT_QUAD) >= 0;
    av_channel_layout_default(&layout, channels);
    return true;
}

}  // namespace av
