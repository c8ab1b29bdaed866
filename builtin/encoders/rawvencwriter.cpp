#include "builtin/encoders/rawvencwriter.h"

#include "builtin/shared/rawoutput.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/filter/qvfilter.h"
#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr unsigned announcedInfoBytes = 32;

// An output that takes access units apart needs the bytes that it was given; for others the announced count
// is that of the frame that came in.
RawVideoOutcome writePicture(const QvFrame& picture, QvBufStream& stream, int announced) {
    RawOutput output(stream);
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

}  // namespace

RawVideoWriter::RawVideoWriter() = default;

RawVideoWriter::~RawVideoWriter() = default;

void RawVideoWriter::reset() { converter_.reset(); }

RawVideoOutcome RawVideoWriter::write(const QvFrame& frame, QvBufStream& output, int v210Bytes) {
    if (v210Bytes == 0) return writePicture(frame, output, frame.total_bytes());
    const QvFrame* picture = nullptr;
    if (auto outcome = convert(frame, v210Bytes, picture); outcome.status != 0) return outcome;
    auto outcome = writePicture(*picture, output, frame.total_bytes());
    converter_->next();
    return outcome;
}

RawVideoOutcome RawVideoWriter::convert(const QvFrame& frame, int bytes, const QvFrame*& picture) {
    if (!converter_)
        if (auto outcome = openConverter(frame); outcome.status != 0) return outcome;
    if (const int result = converter_->write(const_cast<QvFrame&>(frame)))
        return {result, false, 0, "Can not convert the frame to v210"};
    if (const int result = converter_->process())
        return {result, false, 0, "Can not convert the frame to v210"};
    picture = converter_->frame();
    if (!picture || picture->four_cc() != QvFourcc::v210 || picture->total_bytes() != bytes)
        return {QvStatus::failed, false, 0, "Can not convert the frame to v210"};
    return {};
}

RawVideoOutcome RawVideoWriter::openConverter(const QvFrame& frame) {
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
