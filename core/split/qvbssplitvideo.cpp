#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <string>

#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreadpool.h"
#include "core/filter/qvcolorconvert.h"
#include "core/image/picturefile_p.h"
#include "core/image/qvimage.h"
#include "core/media/qvframe.h"
#include "core/split/picturequeue_p.h"
#include "core/split/qvbufstreamsplit.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/stream/iofailure.h"
#include "core/stream/observers_p.h"
#include "core/stream/stdfile_p.h"

namespace {

constexpr int widestNumber = 255;  // no file system takes longer names

}  // namespace

QvBsSplitVideo::QvBsSplitVideo(QvCodec* owner) : QvBufStreamFifoCb(owner) {}

QvBsSplitVideo::~QvBsSplitVideo() { QvBsSplitVideo::destroy(0); }

int QvBsSplitVideo::init(const AnyDict& newParams) {
    const Any& split = newParams.get("split");
    if (split.isInt32() && split.asInt32() == 0) return initPlain(newParams);
    if (inner_) destroy(0);
    split_ = true;
    Undo ending([this] { destroy(1); });
    if (const int status = QvBufStreamFifoCb::init(newParams)) return status;
    const Any& name = params().get("outfilename");
    QV_ASSERT(name.isText());
    nrDigits_ = params().getInt32("nrDigits", 0);
    path_ = QvFile::getPath(name);
    extension_ = QvFile::getExt(name, false);
    baseName_ = QvFile::getBasename(name);
    fileCounter_ = params().getInt32("firstNumber", 0);
    png_ = params().get("png").isTrue();
    if (const int status = png_ ? initPictures() : QvStatus::ok) return status;
    ending.dismiss();
    return QvStatus::ok;
}

int QvBsSplitVideo::initPictures() {
    extension_ = "png";
    width_ = params().getInt32("width", 0);
    height_ = params().getInt32("height", 0);
    fourcc_ = static_cast<unsigned>(params().getInt32("FOURCC", 0));
    if (params().get("parallel").isTrue())
        queue_ = std::make_unique<PictureQueue>(qvThreadPool(), width_, height_);
    if (fourcc_ == QvFourcc::BGR3) return QvStatus::ok;
    converted_ = std::make_unique<QvFrame>();
    if (converted_->init(QvFourcc::BGR3, width_, height_) != QvStatus::ok) {
        qv_log()->error("[split writer] There are no pictures of %dx%d.", width_, height_);
        return QvStatus::failed;
    }
    converter_ = std::make_unique<QvColorConverter>(QvFourcc::BGR3, false, false);
    return QvStatus::ok;
}

int QvBsSplitVideo::initPlain(const AnyDict& newParams) {
    AnyDict merged(params());
    merged.update(newParams);
    destroy(0);
    QvBufStream::init(merged);
    split_ = false;
    Undo ending([this] { destroy(1); });
    inner_ = std::make_unique<QvFileBufStream>(owner());
    shareFailure(*inner_);
    for (int i = 0; i < observers_.size(); ++i) inner_->registerObserver(observers_.at(i));
    if (const int status = inner_->init(merged)) return status;
    setInited(true);
    ending.dismiss();
    return QvStatus::ok;
}

void QvBsSplitVideo::destroy(int abort) {
    if (queue_) {
        if (abort)
            queue_->drop();
        else if (!queue_->finish())
            noteLost();
        queue_.reset();
    }
    if (split_) QvBufStreamFifoCb::destroy(abort);
    if (inner_) inner_->destroy(abort);
    inner_.reset();
    converter_.reset();
    converted_.reset();
    setInited(false);
}

void QvBsSplitVideo::flush() {
    if (queue_ && !queue_->finish()) {
        noteLost();
        stopProcessing();
    }
    if (split_)
        QvBufStreamFifoCb::flush();
    else if (inner_)
        inner_->flush();
}

bufstream* QvBsSplitVideo::input() {
    if (split_) return QvBufStreamFifoCb::input();
    QV_ASSERT(inner_);
    return inner_->input();
}

bufstream* QvBsSplitVideo::output() {
    if (split_) return QvBufStreamFifoCb::output();
    QV_ASSERT(inner_);
    return inner_->output();
}

int QvBsSplitVideo::registerObserver(QvAuxInfoObserver* observer) {
    if (const int status = addObserver(observers_, observer)) return status;
    if (inner_) inner_->registerObserver(observer);
    return QvStatus::ok;
}

int QvBsSplitVideo::unregisterObserver(QvAuxInfoObserver* observer) {
    if (removeObserver(observers_, observer) == QvStatus::ok) return QvStatus::ok;
    if (inner_) inner_->unregisterObserver(observer);
    return QvStatus::failed;
}

int QvBsSplitVideo::unregisterAllObservers() {
    observers_.clear();
    if (inner_) inner_->unregisterAllObservers();
    return QvStatus::ok;
}

TPtrList<QvAuxInfoObserver>* QvBsSplitVideo::observers() { return &observers_; }

void QvBsSplitVideo::cbProgress(int) {}

void QvBsSplitVideo::cbAuxinfo(unsigned offset, unsigned id, void* info, unsigned size) {
    if (!inner_) notifyObservers(&observers_, offset, id, info, size);
    if (id != QvAuxId::VIDEO_AU_CODE) return;
    uint32_t bytes;
    QV_ASSERT(info && size >= sizeof bytes);
    std::memcpy(&bytes, info, sizeof bytes);
    writeAccessUnit(bytes);
}

Any QvBsSplitVideo::_currentFilename() const {
    char number[widestNumber + 16];
    const int width = std::min(nrDigits_, widestNumber);
    if (width >= 1)
        std::snprintf(number, sizeof number, "#%0*d.", width, fileCounter_);
    else
        std::snprintf(number, sizeof number, "#%d.", fileCounter_);
    const Any file = Any::strcat(Any::strcat(baseName_, number), extension_);
    return QvFile::joinPath(path_, file);
}

// A file that fails uses up its number too.
void QvBsSplitVideo::writeAccessUnit(unsigned bytes) {
    const std::lock_guard guard(*this);
    bufstream* ring = output();
    const Any name = _currentFilename();
    ++fileCounter_;
    if (!(png_ ? writePicture(ring, bytes, name) : writeFile(ring, bytes, name))) stopProcessing();
}

bool QvBsSplitVideo::writePicture(bufstream* ring, unsigned bytes, const Any& name) {
    QV_ASSERT(bytes <= ring->chunksize(ring));
    unsigned char* block = ring->request(ring, bytes);
    QV_ASSERT(block);
    QvFrame frame;
    if (frame.init(fourcc_, width_, height_, block)) return false;
    if (static_cast<unsigned>(frame.total_bytes()) > bytes) {
        qv_log()->error("[split writer] A picture of %u bytes is too short for %s of %dx%d.", bytes,
                        frame.str_four_cc(), width_, height_);
        return false;
    }
    const bool saved = savePicture(frame, name);
    ring->confirm(ring, bytes);
    return saved;
}

bool QvBsSplitVideo::savePicture(const QvFrame& frame, const Any& name) {
    const QvFrame& picture = converter_ ? *converted_ : frame;
    if (converter_ && converter_->convert(frame, *converted_) != QvStatus::ok) return false;
    if (queue_) {
        if (queue_->put(picture, qv_os_name(name), cancel())) return true;
        noteLost();
        return false;
    }
    if (QvImage::saveFrame(picture, name, QvImage::png) == QvStatus::ok) return true;
    failure()->note(errno, "Failed to write to", qv_wide_name(qv_os_name(name)));
    return false;
}

// The queue's failure becomes the stream's, once.
void QvBsSplitVideo::noteLost() {
    const auto& lost = queue_->failure();
    if (failure()->code() != 0) return;
    failure()->note(lost.code, "Failed to write to", qv_wide_name(lost.name));
    if (lost.opened)
        qv_log()->error(qvPictureNotWritten);
    else
        qv_log()->error(qvPictureNotOpened, lost.name.c_str());
}

bool QvBsSplitVideo::writeFile(bufstream* ring, unsigned bytes, const Any& name) {
    const std::string narrow = qv_os_name(name);
    const QvWideString wide = qv_wide_name(narrow);
    StdFile file;
    if (!file.openOutput(wide, cancel())) {
        failure()->note(file.error(), "Can not open file", wide);
        qv_log()->error("[split writer] Failed to open %s.", narrow.c_str());
        return false;
    }
    const unsigned chunk = ring->chunksize(ring);
    bool written = true;
    while (written && bytes) {
        const unsigned piece = std::min(bytes, chunk);
        unsigned char* block = ring->request(ring, piece);
        QV_ASSERT(block && piece);
        written = file.write(block, piece);
        if (written) ring->confirm(ring, piece);
        bytes -= piece;
    }
    if (!file.close()) written = false;
    if (written) return true;
    failure()->note(file.error(), "Failed to write to", wide);
    qv_log()->error("[split writer] Failed to write to %s.", narrow.c_str());
    return false;
}
