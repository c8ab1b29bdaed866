#include "core/transcode/batch/framewindow_p.h"

#include <algorithm>
#include <iterator>

#include "core/engine/status.h"

namespace {

bool sameShape(const frame_tt& a, const frame_tt& b) {
    return a.four_cc == b.four_cc && a.width == b.width && a.height == b.height &&
           std::equal(std::begin(a.strides), std::end(a.strides), std::begin(b.strides));
}

// Rows may be longer than a frame of its own would have them.
int adopt(QvFrame& frame, QvFrame& source) {
    const frame_tt& picture = *source.getFrame_tt();
    AnyVector strides;
    for (int i = 0; i < source.planes(); ++i) strides.append(Any(picture.strides[i]));
    return frame.init(picture.four_cc, picture.width, picture.height, source.plane(0), &strides);
}

}  // namespace

int FrameWindow::show(QvFrame& source) {
    if (!source.inited()) return QvStatus::failed;
    const frame_tt& picture = *source.getFrame_tt();
    if (!frame_.inited() || !sameShape(*frame_.getFrame_tt(), picture)) {
        if (adopt(frame_, source) != QvStatus::ok) return QvStatus::outOfMemory;
    }
    // A decoder may give its planes in any place and order.
    std::copy(std::begin(picture.planes), std::end(picture.planes), std::begin(frame_.getFrame_tt()->planes));
    std::copy(std::begin(picture.strides), std::end(picture.strides),
              std::begin(frame_.getFrame_tt()->strides));
    frame_.copyMeta(source);
    frame_.frameNr = ++number_;
    return QvStatus::ok;
}

void FrameWindow::restart() {
    number_ = -1;
    frame_.frameNr = -1;
}
