#include "plugins/av/picture/picturecaptions.h"

#include <algorithm>

#include "core/engine/status.h"
#include "core/media/qvframe.h"

namespace av {

constexpr std::size_t tripletBytes = 3, mostDue = 4096;

void carryCaptions(const AVFrame& picture, const MediaTime& time, QvFrame& to) {
    constexpr std::size_t validBit = 4;
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

bool CaptionInput::attach(const QvFrame& from, AVFrame& picture) {
    QvCcData captions;
    if (from.subpic() && captions.restore(*from.subpic()) == QvStatus::ok)
        due_.insert(due_.end(), captions.pairs().begin(), captions.pairs().end());
    if (due_.empty()) return true;
    used_ = true;
    // At a rate far below the source's even the text has no room.
    if (due_.size() > QvCcData::maxBufferPairs)
        std::erase_if(due_, [](const QvCcBytePair& pair) { return pair.isFiller(); });
    if (due_.size() > mostDue) due_.resize(mostDue);
    if (due_.empty()) return true;
    const std::size_t count = std::min<std::size_t>(due_.size(), QvCcData::maxBufferPairs);
    AVFrameSideData* const block =
        av_frame_new_side_data(&picture, AV_FRAME_DATA_A53_CC, count * tripletBytes);
    if (!block) return false;
    for (std::size_t i = 0; i < count; ++i) {
        std::uint8_t* const triplet = block->data + i * tripletBytes;
        triplet[0] = due_[i].header;
        triplet[1] = due_[i].byte1;
        triplet[2] = due_[i].byte2;
    }
    due_.erase(due_.begin(), due_.begin() + static_cast<std::ptrdiff_t>(count));
    return true;
}

}  // namespace av
