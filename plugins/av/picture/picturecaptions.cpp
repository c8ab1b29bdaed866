#include "plugins/av/picture/picturecaptions.h"

#include "core/caption/cc/qvcc.h"
#include "core/media/qvframe.h"

namespace av {

void carryCaptions(const AVFrame& picture, const MediaTime& time, QvFrame& to) {
    constexpr std::size_t tripletBytes = 3, validBit = 4;
    const AVFrameSideData* const block = av_frame_get_side_data(&picture, AV_FRAME_DATA_A53_CC);
    QvCcData captions;
    for (std::size_t at = 0; block && at + tripletBytes <= block->size; at += tripletBytes) {
        const std::uint8_t* const triplet = block->data + at;
        if (triplet[0] & validBit)
            captions.append(QvCcBytePair(time, triplet[0] & 3, triplet[1], triplet[2], true));
    }
    if (captions.count() == 0) {
        if (to.subpic()) to.clearSubpic();
        return;
    }
    AnyDict carried;
    captions.store(carried);
    to.setSubpic(carried);
}

}  // namespace av
