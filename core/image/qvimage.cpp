#include "core/image/qvimage.h"

#include <cerrno>
#include <cstdio>
#include <memory>
#include <string>

#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/filter/qvfilter.h"
#include "core/image/bmpfile_p.h"
#include "core/image/picturefile_p.h"
#include "core/image/pngfile_p.h"
#include "core/image/wholepicture_p.h"
#include "core/media/qvframe.h"
#include "core/value/any.h"

namespace {

struct CloseFile {
    void operator()(std::FILE* file) const { std::fclose(file); }
};
using File = std::unique_ptr<std::FILE, CloseFile>;

// The name in UTF-8.
std::string fileName(const Any& path) {
    const Any text = path.toString();
    return text.asString("");
}

constexpr int videoFilterInterface = 12;

// The frame as BGR3, made by `scaler`, which owns it. Null, with a message, if that can't be had.
const QvFrame* asBgr3(const QvFrame& frame, std::unique_ptr<QvCodec>& scaler) {
    scaler.reset(qv_registry()->newCodec("scaler"));
    auto* filter = scaler ? static_cast<QvVideoFilter*>(scaler->getInterface(videoFilterInterface)) : nullptr;
    if (!filter) {
        qv_log()->error("[Save image] Can not create scaler.");
        return nullptr;
    }
    filter->setParam("outWidth", frame.width());
    filter->setParam("outHeight", frame.height());
    filter->setParam("FOURCC", "BGR3");
    QvFrame input(frame);
    if (filter->open() != QvStatus::ok || filter->write(input) != QvStatus::ok || filter->ready() < 1) {
        qv_log()->error("[Save image] Can not convert %s frame.", frame.str_four_cc());
        return nullptr;
    }
    return filter->frame();
}

}  // namespace

int QvImage::saveFrame(const QvFrame& frame, const Any& path, int format) {
    QV_ASSERT(frame.inited());
    QV_ASSERT(format != bmp || frame.four_cc() == QvFourcc::BGR3);
    std::unique_ptr<QvCodec> scaler;
    const QvFrame* picture = frame.four_cc() == QvFourcc::BGR3 ? &frame : asBgr3(frame, scaler);
    if (!picture) {
        errno = 0;
        return QvStatus::failed;
    }
    const std::string name = fileName(path);
    PictureFile file;
    if (!file.open(name, nullptr)) {
        const int reason = errno;
        qv_log()->error(qvPictureNotOpened, name.c_str());
        errno = reason;
        return QvStatus::failed;
    }
    errno = 0;
    const bool written = format == bmp ? qvWriteBmp(*picture, file.get()) : qvWritePng(*picture, file.get());
    if (file.finish(written)) return QvStatus::ok;
    const int reason = errno;
    qv_log()->error(qvPictureNotWritten);
    errno = reason;
    return QvStatus::failed;
}

int qvLoadWhole(QvFrame& picture, const Any& path, QvFrame* alpha) {
    const std::string name = fileName(path);
    const File file(qv_platform().openFile(name.c_str(), "rb"));
    if (!file) {
        qv_log()->error("Can not open %s for reading", name.c_str());
        return QvStatus::failed;
    }
    if (!qvIsPng(file.get())) return QvStatus::failed;
    return qvReadPng(file.get(), name.c_str(), picture, alpha);
}

int QvImage::loadFrame(QvFrame& picture, const Any& path, QvFrame* alpha, unsigned) {
    const int result = qvLoadWhole(picture, path, alpha);
    return result == QvStatus::cannotParse ? QvStatus::ok : result;
}
