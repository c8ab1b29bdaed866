#include "core/media/qvframe.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/framefields_p.h"
#include "core/media/framefill_p.h"
#include "core/media/frameparts_p.h"
#include "core/value/ptrlist.h"

namespace {

constexpr std::align_val_t alignment{64};
constexpr long long maxBytes = std::numeric_limits<int>::max();

// Metadata with operations of its own.
constexpr char timestampKey[] = "timestamp";
constexpr char matrixKey[] = "_yuvMatrix";
constexpr char userDataKey[] = "userData";
constexpr char subpicKey[] = "subpic";

// Strides and sizes of up to three planes.
struct Layout {
    long long stride[3] = {};
    long long bytes[3] = {};
    long long total = 0;
};

long long wishedStride(const AnyVector* strides, int plane) {
    if (!strides || plane >= strides->size() || !strides->at(plane).isInt()) return 0;
    return strides->at(plane).toInt64();
}

// False if the picture can't be addressed with 32 bits.
bool layOut(const QvPixelFormat& format, int width, int height, const AnyVector* strides, Layout& layout) {
    if (width < 0 || height < 0) return false;
    for (int p = 0; p < format.planes(); ++p) {
        long long stride = qvDefaultStride(format, width);
        if (p > 0) stride = format.sampleBytes == 2 ? layout.stride[0] / 2 : width / 2;
        layout.stride[p] = std::max(stride, wishedStride(strides, p));
        if (layout.stride[p] > maxBytes) return false;
        layout.bytes[p] = layout.stride[p] * height;
        if (p > 0 && format.chroma == QvChroma::quarter) layout.bytes[p] /= 2;
        if (layout.bytes[p] > maxBytes) return false;
        layout.total += layout.bytes[p];
    }
    return layout.total + QvFrame::spareBytes <= maxBytes;
}

}  // namespace

void QvFrame::Release::operator()(unsigned char* memory) const { ::operator delete[](memory, alignment); }

QvFrame::QvFrame() = default;

QvFrame::QvFrame(const QvFrame& other) { copy(other); }

QvFrame& QvFrame::operator=(const QvFrame& other) {
    copy(other);
    return *this;
}

QvFrame::~QvFrame() = default;

int QvFrame::init(unsigned four_cc, int width, int height, unsigned char* buffer, const AnyVector* strides) {
    destroy();
    const auto* format = qvPixelFormat(four_cc);
    if (!format) qv_dbg()->error("Unknown fourCC :%s", qvFourccText(four_cc).data());
    QV_ASSERT(format != nullptr);
    Layout layout;
    if (!layOut(*format, width, height, strides, layout)) return QvStatus::outOfMemory;
    if (!buffer) {
        const auto total = static_cast<std::size_t>(layout.total);
        memory_.reset(
            static_cast<unsigned char*>(::operator new[](total + spareBytes, alignment, std::nothrow)));
        if (!memory_) return QvStatus::outOfMemory;
        // What kernels read past the last row is the same in every run.
        std::memset(memory_.get() + total, 0, spareBytes);
    }
    external_ = buffer != nullptr;
    format_ = format;
    planes_ = format->planes();
    tt_ = {.width = width, .height = height, .four_cc = four_cc};
    text_ = qvFourccText(four_cc);
    unsigned char* next = buffer ? buffer : memory_.get();
    for (int p = 0; p < planes_; ++p) {
        tt_.planes[p] = next;
        tt_.strides[p] = static_cast<int>(layout.stride[p]);
        planeBytes_[p] = static_cast<int>(layout.bytes[p]);
        next += layout.bytes[p];
    }
    totalBytes_ = static_cast<int>(layout.total);
    inited_ = true;
    if (!buffer) clearTails();
    frameNr = -1;
    framerate.setInterlaced(0);
    return QvStatus::ok;
}

// What no picture operation writes reaches files with the rest of the block, and must not show what the
// memory held before: the end of each row from the last whole pixel group on, and the rows that odd heights,
// and the lower half of I422's chroma, leave below height(plane).
void QvFrame::clearTails() {
    for (int p = 0; p < planes_; ++p) {
        const int stride = tt_.strides[p];
        const int pairs = width(p) & ~1;  // packed formats store pixels in pairs
        const int used = format_->pixelBytes < 0 ? width(p) / 6 * 16 : pairs * format_->pixelBytes;
        const std::ptrdiff_t rows = std::ptrdiff_t{height(p)} * stride;
        unsigned char* const plane = tt_.planes[p];
        if (used < stride)
            for (std::ptrdiff_t row = 0; row < rows; row += stride)
                std::memset(plane + row + used, 0, static_cast<std::size_t>(stride - used));
        std::memset(plane + rows, 0, static_cast<std::size_t>(planeBytes_[p] - rows));
    }
}

void QvFrame::destroy() {
    if (!inited_) return;
    inited_ = false;
    frameNr = -1;
    framerate = QvFramerate(QvRatio(25, 1));
    next_ = prev_ = nullptr;
    std::fill(std::begin(planeBytes_), std::end(planeBytes_), 0);
    format_ = nullptr;
    text_ = {};
    tt_ = {};
    totalBytes_ = planes_ = 0;
    external_ = false;
    meta_.clear();
    memory_.reset();
}

int QvFrame::plane_bytes(int plane) const { return plane >= 0 && plane < planes_ ? planeBytes_[plane] : 0; }

int QvFrame::bytes(int plane) const {
    QV_ASSERT(plane >= 0 && plane < planes_);
    return planeBytes_[plane];
}

const char* QvFrame::str_four_cc() const {
    QV_ASSERT(inited_);
    return text_.data();
}

int QvFrame::bitsPerPixel(unsigned four_cc) {
    const auto* format = qvPixelFormat(four_cc);
    QV_ASSERT(format && format->bitsPerPixel > 0);
    return format->bitsPerPixel;
}

int QvFrame::bitDepth(unsigned four_cc) {
    const auto* format = qvPixelFormat(four_cc);
    QV_ASSERT(format != nullptr);
    return format->bitDepth;
}

int QvFrame::pixelBytes(int plane) const {
    QV_ASSERT(plane >= 0 && plane < planes_);
    return format_->pixelBytes;
}

bool QvFrame::isRGB() const { return inited_ && format_->rgb; }

bool QvFrame::is420() const { return four_cc() == QvFourcc::I420 || four_cc() == QvFourcc::YV12; }

bool QvFrame::is422() const {
    return four_cc() == QvFourcc::YUYV || four_cc() == QvFourcc::UYVY || four_cc() == QvFourcc::YUY2 ||
           four_cc() == QvFourcc::I422;
}

void QvFrame::get422offsets(int* y0, int* y1, int* u, int* v) const {
    const bool chromaFirst = four_cc() == QvFourcc::UYVY;
    if (!chromaFirst && four_cc() != QvFourcc::YUY2 && four_cc() != QvFourcc::YUYV) return;
    *y0 = chromaFirst ? 1 : 0;
    *y1 = chromaFirst ? 3 : 2;
    *u = chromaFirst ? 0 : 1;
    *v = chromaFirst ? 2 : 3;
}

const unsigned char* QvFrame::plane(int plane, bool flip) const {
    QV_ASSERT(inited_ && plane >= 0 && plane < 4);
    if (plane >= planes_) return nullptr;
    const unsigned char* first = tt_.planes[plane];
    return flip ? first + planeBytes_[plane] - tt_.strides[plane] : first;
}

unsigned char* QvFrame::plane(int plane, bool flip) {
    return const_cast<unsigned char*>(std::as_const(*this).plane(plane, flip));
}

int QvFrame::stride(int plane, bool flip) const {
    QV_ASSERT(inited_ && plane >= 0 && plane < 4);
    return flip ? -tt_.strides[plane] : tt_.strides[plane];
}

std::ptrdiff_t QvFrame::pixelOffset(int x, int y, int plane) const {
    QV_ASSERT(inited_ && plane >= 0 && plane < planes_);
    const long long row = static_cast<long long>(y) * tt_.strides[plane];
    const long long column =
        format_->pixelBytes < 0 ? x / 6 * 16LL : static_cast<long long>(x) * format_->pixelBytes;
    QV_ASSERT(row + column >= 0 && row + column < planeBytes_[plane]);
    return static_cast<std::ptrdiff_t>(row + column);
}

unsigned char* QvFrame::pixelPtr(int x, int y, int plane) {
    const auto offset = pixelOffset(x, y, plane);
    return tt_.planes[plane] + offset;
}

const unsigned char* QvFrame::pixelPtr(int x, int y, int plane) const {
    const auto offset = pixelOffset(x, y, plane);
    return tt_.planes[plane] + offset;
}

int QvFrame::changeFOURCC(unsigned four_cc) {
    if (!qvExchangeableFourcc(tt_.four_cc, four_cc)) return QvStatus::failed;
    tt_.four_cc = four_cc;
    format_ = qvPixelFormat(four_cc);
    text_ = qvFourccText(four_cc);
    return QvStatus::ok;
}

// --- Pictures and their parts

int QvFrame::copy(const QvFrame& src, bool flip) { return qvframes::copy(*this, src, flip); }
int QvFrame::copyFramett(const frame_tt& tt, bool keepStrides) {
    return qvframes::copyFramett(*this, tt, keepStrides);
}
int QvFrame::copyShifted(const QvFrame& src) { return qvframes::copyShifted(*this, src); }
int QvFrame::changeDominance(bool up) { return qvframes::changeDominance(*this, up); }
int QvFrame::copySwitched(const QvFrame& src) { return qvframes::copySwitched(*this, src); }
int QvFrame::interlace(const QvFrame& first, const QvFrame& second) {
    return qvframes::interlace(*this, first, second);
}
int QvFrame::combineFields(const QvFrame& first, const QvFrame& second) {
    return qvframes::combineFields(*this, first, second);
}
int QvFrame::copyDeinterlaced(const QvFrame& src, bool firstField) {
    return qvframes::copyDeinterlaced(*this, src, firstField);
}
int QvFrame::copyBob(const QvFrame& src) { return qvframes::copyBob(*this, src); }

int QvFrame::clip(const QvFrame& src, int srcX, int srcY, int dstX, int dstY, int width, int height) {
    QV_ASSERT(inited_);
    return qvframes::clip(*this, *format_, src, srcX, srcY, dstX, dstY, width, height);
}
int QvFrame::blend(int x, int y, const QvFrame& src, const QvFrame* mask, const QvFrame* chromaMask) {
    QV_ASSERT(inited_);
    return qvframes::blend(*this, *format_, x, y, src, mask, chromaMask);
}
int QvFrame::blend(int x, int y, const QvFrame& src, double alpha) {
    QV_ASSERT(inited_);
    return qvframes::blend(*this, *format_, x, y, src, alpha);
}

void QvFrame::setBlack() {
    QV_ASSERT(inited_);
    qvframes::setBlack(*this, *format_);
}
void QvFrame::setRGB(unsigned char r, unsigned char g, unsigned char b) { qvframes::setRGB(*this, r, g, b); }

// --- Metadata

void QvFrame::copyMeta(const QvFrame& src) { _copyMeta(src, nullptr); }

// Entry by entry: those that are there already take the new values without a new place in memory.
void QvFrame::_copyMeta(const QvFrame& src, const char* kept) {
    framerate = src.framerate;
    frameNr = src.frameNr;
    if (&src == this) return;
    for (int i = meta_.size() - 1; i >= 0; --i) {
        const char* key = meta_.getKey(i);
        if (!src.meta_.isSet(key) && !(kept && std::strcmp(key, kept) == 0)) meta_.remove(key);
    }
    for (auto [key, value] : src.meta_)
        if (!(kept && std::strcmp(key, kept) == 0)) meta_.set(key, *value);
}

long long QvFrame::getTimestamp() const { return meta_.getInt64(timestampKey, -1); }

void QvFrame::setTimestamp(long long timestamp) { meta_.set(timestampKey, Any(timestamp)); }

QvYUVMatrix QvFrame::YUVMatrix() const {
    return static_cast<QvYUVMatrix>(meta_.getInt32(matrixKey, qvMatrixNotSet));
}

void QvFrame::setYUVMatrix(QvYUVMatrix matrix) { meta_.set(matrixKey, Any(static_cast<int>(matrix))); }

void QvFrame::copyMeta(const QvFrame& src, QvYUVMatrix matrix) {
    _copyMeta(src, matrixKey);
    setYUVMatrix(matrix);
}

QvUserData* QvFrame::userData() const {
    return static_cast<QvUserData*>(meta_.get(userDataKey).asGeneric(nullptr));
}

void QvFrame::setUserData(QvUserData* data) { meta_.set(userDataKey, Any(static_cast<const void*>(data))); }

void QvFrame::clearUserData() { meta_.remove(userDataKey); }

AnyDict* QvFrame::subpic() {
    Any& value = meta_.get(subpicKey);
    return value.isDict() ? &value.asDict() : nullptr;
}

const AnyDict* QvFrame::subpic() const {
    const Any& value = meta_.get(subpicKey);
    return value.isDict() ? &value.asDict() : nullptr;
}

void QvFrame::setSubpic(const AnyDict& subpic) { meta_.set(subpicKey, subpic); }

void QvFrame::clearSubpic() { meta_.remove(subpicKey); }

// --- Views

void QvFrame_linkViews(const TPtrList<QvFrame>& views) {
    QvFrame* before = nullptr;
    for (QvFrame* frame : views) {
        frame->prev_ = before;
        frame->next_ = nullptr;
        if (before) before->next_ = frame;
        before = frame;
    }
}

int QvFrame_nrViews(const QvFrame* frame) {
    QV_ASSERT_MSG(frame->prevView() == nullptr, "f->_prev == 0");
    int count = 0;
    for (; frame; frame = frame->nextView()) ++count;
    return count;
}

int QvFrame_viewIndex(const QvFrame* frame) {
    int index = 0;
    while ((frame = frame->prevView())) ++index;
    return index;
}
