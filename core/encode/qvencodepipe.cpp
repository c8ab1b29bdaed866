#include "core/encode/qvencodepipe.h"

#include <optional>
#include <string>

#include "core/arch/qvassert.h"
#include "core/encode/muxerlimits_p.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/job/filtersstate.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/fifo/qvbufmem.h"
#include "core/stream/qvbufstrm.h"

namespace {

MuxerLimits limitsOf(const QvMuxer* muxer) {
    return MuxerLimits::of(muxer,
                           "EncodePipe.maxStreams: muxer '%s' does not implement 'maxStreams' parameter");
}

const char* channelsText(int channels) {
    return channels == 1 ? "mono" : channels == 2 ? "stereo" : "multi ch.";
}

std::optional<int> intParam(const QvCodec& codec, const char* name) {
    Any value;
    codec.getParam(name, value);
    if (!value.isInt()) return std::nullopt;
    return value.toInt32();
}

void describeBitrate(const QvEncoder& encoder, AnyVector& out) {
    Any rate;
    encoder.getParam("bitrate", rate);
    if (rate.isBitrate()) out.append(rate.asBitrate().desc());
}

void describeVideo(const QvEncoder& encoder, AnyVector& out) {
    const auto width = intParam(encoder, "width");
    const auto height = intParam(encoder, "height");
    if (width && height) out.append(Any::sprintf("%dx%d", *width, *height));
    Any rate;
    encoder.getParam("framerate", rate);
    if (rate.isFramerate()) out.append(rate.asFramerate().desc(false, false));
}

void describeAudio(const QvEncoder& encoder, AnyVector& out) {
    if (const auto rate = intParam(encoder, "samplerate")) out.append(Any::sprintf("%dHz", *rate));
    if (const auto channels = intParam(encoder, "channels")) out.append(Any(channelsText(*channels)));
}

}  // namespace

QvOStream::QvOStream(int streamType) : type(streamType), filters_(std::make_unique<FiltersState>()) {}

QvOStream::~QvOStream() = default;

bool QvOStream::enabled() const { return bitstream && bitstream->enabled(); }

void QvOStream::setEnabled(bool on) {
    if (bitstream) bitstream->setEnabled(on);
}

QvEncodePipe* QvEncodePipe::create() {
    return static_cast<QvEncodePipe*>(qv_registry()->newCodec("encpipe"));
}

void QvEncodePipe::setCancel(const std::shared_ptr<QvCancel>& cancel) {
    QvMuxer* muxer = getMuxer();
    for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
        for (int nr = 0; muxer && nr < muxer->nrStreams(type); ++nr)
            muxer->stream(type, nr)->setCancel(cancel);
    QvSink* end = sink();
    if (QvBufStream* stream = end && end->getState() != stateCreated ? end->stream() : nullptr)
        stream->setCancel(cancel);
}

int QvEncodePipe::flush() {
    int result = 0;
    if (auto* muxer = getMuxer()) result |= muxer->flush();
    if (auto* end = sink()) result |= end->flush();
    return result;
}

int QvEncodePipe::addSubpicStream(const Any& params) { return addStream(qvSubpicStream, params); }

int QvEncodePipe::canAddStreams(int type) const {
    return qvStreamRoom(getMuxer(), type, nrStreams(type), nrStreams(qvAllStreams));
}

int QvEncodePipe::maxStreams(QvAVS3plet<int>* limits) const {
    const auto all = limitsOf(getMuxer());
    if (limits) *limits = {all.video, all.audio, all.subpic};
    return all.total;
}

int QvEncodePipe::maxStreams(int type) const { return limitsOf(getMuxer()).ofType(type); }

bool QvEncodePipe::programsSupported() const {
    const auto* muxer = getMuxer();
    if (!muxer) return false;
    Any answer;
    muxer->getParam("programsSupported", answer);
    return answer.isTrue();
}

QvIProgramSetup* QvEncodePipe::programSetup() const {
    if (const auto* muxer = getMuxer())
        return static_cast<QvIProgramSetup*>(muxer->getInterface(qvProgramSetupInterface));
    qv_dbg()->error("EncodePipe.programSetup: muxer is null.");
    return nullptr;
}

int QvEncodePipe::setFilename(const Any& name) { return setParam("filename", name); }

Any QvEncodePipe::getFilename() { return getParam("filename"); }

void QvEncodePipe::setFilters(QvOStream* stream, const FiltersState& filters) {
    QV_ASSERT_MSG(stream, "Invalid stream");
    stream->filters() = filters;
}

const FiltersState& QvEncodePipe::filters(QvOStream* stream) const {
    QV_ASSERT_MSG(stream, "Invalid stream");
    return stream->filters();
}

QvAuQueuePoll* QvEncodePipe::outputQueue() const {
    if (const auto* end = sink())
        return static_cast<QvAuQueuePoll*>(end->getInterface(qvOutputQueueInterface));
    qv_dbg()->error("EncodePipe.outputQueue: sink is null.");
    return nullptr;
}

void* QvEncodePipe::getInterface(int kind) const {
    return kind == 3 ? const_cast<QvEncodePipe*>(this) : nullptr;
}

void QvEncodePipe::setFilters(int type, int nr, const FiltersState& filters) {
    setFilters(stream(type, nr), filters);
}

const FiltersState& QvEncodePipe::filters(int type, int nr) const { return filters(stream(type, nr)); }

void QvEncodePipe::getStreamDesc(int type, int nr, AnyVector& out) const {
    out.clear();
    const auto* found = stream(type, nr);
    if (!found || !found->encoder) return;
    if (type == qvVideoStream)
        describeVideo(*found->encoder, out);
    else
        describeAudio(*found->encoder, out);
    describeBitrate(*found->encoder, out);
}
