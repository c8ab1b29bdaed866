#include "core/transcode/link/video/streamicon_p.h"

#include <memory>

#include "core/encode/qvencodepipe.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/image/qvimage.h"
#include "core/measure/fourcc.h"

namespace {

constexpr int iconWidth = 80;
constexpr int iconHeight = 60;

}  // namespace

void qvMakeStreamIcon(QvEncodePipe& pipe, QvFrame* frame) {
    auto* muxer = pipe.getMuxer();
    if (!muxer || !frame || !pipe.videoEncoder(0) || !muxer->getParam("needBMP").isTrue()) return;
    const Any name = QvFile::changeExt(muxer->getParam("filename"), "BMP");
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("scaler2"));
    auto* scaler =
        codec ? static_cast<QvVideoFilter*>(codec->getInterface(QvModuleType::videoFilter)) : nullptr;
    if (!scaler) return;
    scaler->setParam("outWidth", iconWidth);
    scaler->setParam("outHeight", iconHeight);
    scaler->setParam("FOURCC", static_cast<int>(QvFourcc::BGR3));
    if (scaler->open() != QvStatus::ok || scaler->write(*frame) != QvStatus::ok || scaler->ready() == 0)
        return;
    qv_log()->info("Creating video stream icon %s", name.toString().asString(""));
    QvImage::saveFrame(*scaler->frame(), name, QvImage::bmp);
    scaler->close();
}
