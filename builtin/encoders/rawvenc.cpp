#include "builtin/encoders/rawvenc.h"

#include <algorithm>
#include <climits>
#include <cstring>
#include <exception>
#include <mutex>

#include "builtin/creators.h"
#include "builtin/encoders/rawvencformats.h"
#include "builtin/shared/rawoutput.h"
#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/filter/qvfilter.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr int queuedFrames = 3;
constexpr unsigned announcedInfoBytes = 32;

// All rows of a plane, the part of one included that an odd height leaves at the end of the chroma.
void copyPlane(QvFrame& to, const QvFrame& from, int plane) {
    const int toStride = to.stride(plane);
    const int fromStride = from.stride(plane);
    const auto row = static_cast<size_t>(std::min(toStride, fromStride));
    int rows = to.plane_bytes(plane) / toStride;
    unsigned char* target = to.plane(plane);
    const unsigned char* source = from.plane(plane);
    for (; rows > 0; --rows, target += toStride, source += fromStride) std::memcpy(target, source, row);
    std::memcpy(target, source, static_cast<size_t>(to.plane_bytes(plane) % toStride));
}

// Into a frame with the default strides. Unlike a frame's own assignment this takes every row of I422.
int copyPacked(QvFrame& to, const QvFrame& from) {
    if (to.four_cc() != from.four_cc() || to.width() != from.width() || to.height() != from.height() ||
        !to.inited())
        if (const int result = to.init(from.four_cc(), from.width(), from.height())) return result;
    if (to.total_bytes() == from.total_bytes())
        std::memcpy(to.plane(), from.plane(), static_cast<size_t>(to.total_bytes()));
    else
        for (int plane = 0; plane < to.planes(); ++plane) copyPlane(to, from, plane);
    to.copyMeta(from);
    return QvStatus::ok;
}

}  // namespace

RawVideoEnc::RawVideoEnc() = default;

RawVideoEnc::~RawVideoEnc() {
    if (getState() == qvStateOpen) finish(true);
}

int RawVideoEnc::init() {
    if (const int result = QvVideoEncoder::init()) return result;
    return remake(720, 576, QvFourcc::BGR3);
}

unsigned RawVideoEnc::frameType() const { return type_ == QvFourcc::v210 ? QvFourcc::Y216 : type_; }

// Leaves everything as it was when such a frame can't be made.
int RawVideoEnc::remake(int width, int height, unsigned type) {
    if (!qvPixelFormat(type)) return setError(QvStatus::invalidParam, "Unknown type 0x%08x", type);
    const long long bytes = rawvenc::frameBytesBound(width, height);
    if (width < 1 || height < 1 || bytes > INT_MAX / 2)
        return setError(QvStatus::invalidParam, "Invalid frame size %dx%d", width, height);
    unsigned char place = 0;  // for the shape alone: nothing is allocated or touched
    QvFrame shape;
    if (shape.init(type == QvFourcc::v210 ? QvFourcc::Y216 : type, width, height, &place) != 0)
        return setError(QvStatus::invalidParam, "Invalid frame size %dx%d", width, height);
    width_ = width;
    height_ = height;
    type_ = type;
    frameBytes_ = type == QvFourcc::v210 ? rawvenc::v210Bytes(width, height) : shape.total_bytes();
    last_ = nullptr;
    return QvStatus::ok;
}

int RawVideoEnc::attachOutStream(QvBufStream* stream) {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    return QvVideoEncoder::attachOutStream(stream);
}

int RawVideoEnc::open() {
    QV_ASSERT_MSG(getState() != stateCreated, "not initialized");
    if (getState() != stateInitialised) return setError(QvStatus::failed, "Not initialized");
    if (!outStream()) return setError(QvStatus::failed, "Output stream not attached");
    failure_ = {};
    if (accelerated_) {
        if (const int result = queue_.init(queuedFrames)) return setError(result, "Out of memory");
        stop_ = discard_ = false;
        worker_ = qv_platform().startThread([this] { work(); });
        if (!worker_.joinable()) {
            queue_.destroy();
            return setError(QvStatus::failed, "Can not start the writing thread");
        }
    }
    setState(qvStateOpen);
    return QvStatus::ok;
}

bool RawVideoEnc::accepts(const QvFrame& frame) const {
    return frame.planes() > 0 && frame.width(0) == width_ && frame.height(0) == height_ &&
           qvEqualFourcc(frame.four_cc(), frameType());
}

int RawVideoEnc::writeFrame(QvFrame* frame) {
    if (getState() != qvStateOpen) return setError(QvStatus::illegalState, "Not opened");
    if (!frame) return setError(QvStatus::invalidArgument, "No frame given");
    if (!accepts(*frame))
        return setError(QvStatus::invalidArgument, "A frame of %dx%d %s does not fit the output of %dx%d",
                        frame->planes() > 0 ? frame->width(0) : 0, frame->planes() > 0 ? frame->height(0) : 0,
                        frame->planes() > 0 ? frame->str_four_cc() : "no format", width_, height_);
    if (worker_.joinable()) return enqueue(*frame);
    last_ = nullptr;
    if (const int result = copyPacked(picture_, *frame)) return setError(result, "Out of memory");
    last_ = &picture_;
    // A block that an output without a known fault does not give is a broken contract.
    const auto outcome = writeOut(picture_);
    const int result = report(outcome);
    QV_ASSERT_MSG(!outcome.noBlock, errorDesc());
    return result;
}

QvFrame* RawVideoEnc::lastFrame() { return last_; }

RawVideoEnc::Outcome RawVideoEnc::writeOut(const QvFrame& frame) {
    if (type_ != QvFourcc::v210) return writePicture(frame, frame.total_bytes());
    const QvFrame* picture = nullptr;
    if (auto outcome = convert(frame, picture); outcome.status != 0) return outcome;
    auto outcome = writePicture(*picture, frame.total_bytes());
    converter_->next();
    return outcome;
}

// An output that takes access units apart needs the bytes that it was given; for others the announced count
// is that of the frame that came in.
RawVideoEnc::Outcome RawVideoEnc::writePicture(const QvFrame& picture, int announced) {
    RawOutput output(*outStream());
    const int bytes = picture.total_bytes();
    switch (output.put(picture.plane(0, false), static_cast<uint64_t>(bytes))) {
        case RawPutResult::ok: break;
        case RawPutResult::noBlock: return {QvStatus::failed, true, output.asked()};
        case RawPutResult::failed: return {QvStatus::failed, false, 0, output.fault()};
    }
    output.unlock();
    const int answer =
        output.announce(QvAuxId::VIDEO_AU_CODE, static_cast<uint64_t>(output.cutsUnits() ? bytes : announced),
                        announcedInfoBytes);
    if (answer != 0) return {answer, false, 0, "The output did not take the frame"};
    if (!output.sound()) return {QvStatus::failed, false, 0, output.fault()};
    return {};
}

int RawVideoEnc::report(const Outcome& outcome) {
    if (outcome.status == 0) return QvStatus::ok;
    if (!outcome.noBlock) return setError(outcome.status, "%s", outcome.text.c_str());
    const auto asked = static_cast<int>(outcome.asked);
    setError(outcome.status, "Error in raw encoder, can not allocate buffer, size=%d", asked);
    return outcome.status;
}

RawVideoEnc::Outcome RawVideoEnc::convert(const QvFrame& frame, const QvFrame*& picture) {
    if (!converter_)
        if (auto outcome = openConverter(frame); outcome.status != 0) return outcome;
    if (const int result = converter_->write(const_cast<QvFrame&>(frame)))
        return {result, false, 0, "Can not convert the frame to v210"};
    if (const int result = converter_->process())
        return {result, false, 0, "Can not convert the frame to v210"};
    picture = converter_->frame();
    if (!picture || picture->four_cc() != QvFourcc::v210 || picture->total_bytes() != frameBytes_)
        return {QvStatus::failed, false, 0, "Can not convert the frame to v210"};
    return {};
}

RawVideoEnc::Outcome RawVideoEnc::openConverter(const QvFrame& frame) {
    auto* codec = static_cast<QvVideoFilter*>(qv_registry()->newCodec("colorconv"));
    if (!codec) return {QvStatus::failed, false, 0, "There is no colour converter for v210"};
    std::unique_ptr<QvVideoFilter> made(codec);
    made->setParam("outWidth", frame.width(0));
    made->setParam("outHeight", frame.height(0));
    made->setParam("FOURCC", static_cast<int>(QvFourcc::v210));
    if (made->open() != 0) return {QvStatus::failed, false, 0, "Invalid input four cc given"};
    converter_ = std::move(made);
    return {};
}

int RawVideoEnc::enqueue(const QvFrame& frame) {
    std::unique_lock lock(queue_);
    slotFree_.wait(lock, [this] { return queue_.nrEmpty() > 0 || failure_.status != 0; });
    if (failure_.status != 0) return report(failure_);
    QvFrame* slot = queue_.emptyBuffer();  // stays at the head: the worker only appends
    lock.unlock();
    const int copied = copyPacked(*slot, frame);
    lock.lock();
    if (copied != QvStatus::ok) return setError(copied, "Out of memory");
    // The last to be taken for another picture: all slots that are empty by then have been so for longer.
    last_ = slot;
    queue_.moveToFull();
    workReady_.notify_one();
    return QvStatus::ok;
}

void RawVideoEnc::work() {
    std::unique_lock lock(queue_);
    while (failure_.status == 0) {
        workReady_.wait(lock, [this] { return stop_ || queue_.nrFull() > 0; });
        if (queue_.nrFull() == 0 || (stop_ && discard_)) break;
        const QvFrame& frame = *queue_.fullBuffer();
        lock.unlock();
        auto outcome = writeQueued(frame);
        lock.lock();
        failure_ = std::move(outcome);
        queue_.moveToEmpty();
        slotFree_.notify_one();
    }
    slotFree_.notify_all();
}

RawVideoEnc::Outcome RawVideoEnc::writeQueued(const QvFrame& frame) noexcept {
    try {
        return writeOut(frame);
    } catch (const QvException& failure) {
        return {QvStatus::failed, false, 0, failure.what()};
    } catch (const std::exception& failure) {
        return {QvStatus::failed, false, 0, failure.what()};
    }
}

int RawVideoEnc::close() { return getState() == qvStateOpen ? finish(false) : QvStatus::ok; }

int RawVideoEnc::abort() { return getState() == qvStateOpen ? finish(true) : QvStatus::ok; }

int RawVideoEnc::finish(bool discard) {
    int result = QvStatus::ok;
    if (worker_.joinable()) {
        {
            std::lock_guard lock(queue_);
            stop_ = true;
            discard_ = discard;
            workReady_.notify_one();
        }
        worker_.join();
        last_ = nullptr;
        queue_.destroy();
        result = report(failure_);
    }
    converter_.reset();
    picture_.destroy();
    last_ = nullptr;
    setState(stateInitialised);
    return result;
}

QvCodec* newRawvenc() { return new RawVideoEnc; }
