#include "core/transcode/push/pushencoder.h"

#include <algorithm>
#include <cstdint>
#include <string>

#include "core/arch/qvassert.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/job/streamformat.h"
#include "core/stream/qvbufstrm.h"
#include "core/transcode/link/linkopen_p.h"
#include "core/transcode/push/pushinput_p.h"
#include "core/transcode/push/pushworker_p.h"

namespace {

constexpr int stateClosed = 2;
constexpr int stateOpen = 3;
constexpr int defaultSamples = 48000;
constexpr int defaultFrames = 4;
constexpr int unknownFrames = 0xccccccc;  // a push stream has no known end
constexpr int highestSamplerate = 96000;

int bytesOfBits(int bits) {
    switch (bits) {
        case 8: return 1;
        case 16: return 2;
        case 20:
        case 24: return 3;
        default: QV_FAIL("Illegal bitsPerSample");
    }
}

bool isLegalWidth(int bits, int bytes) {
    return (bits == 8 || bits == 16 || bits == 20 || bits == 24 || bits == 32) && bytes == (bits + 7) / 8;
}

}  // namespace

// What is set before a run, and the objects that take part in one.
struct QvPushEncoder::PushEncoder_p {
    PushEncoder_p() { input.init(); }

    int openLinks();
    int openVideoLink();
    int openAudioLink();
    int setError(int code, const std::string& text);

    QvEncodePipe* encoder = nullptr;
    int state = stateClosed;
    std::string error;  // of the application's calls

    PushChange change;
    PushFailure failure;
    PushQueues queues{change, failure};
    PushInput input{queues};
    PushWorker worker{queues, change, failure};
};

using PushEncoder = QvPushEncoder;

int PushEncoder::PushEncoder_p::setError(int code, const std::string& text) {
    error = text;
    return code;
}

// --- Opening.

int PushEncoder::PushEncoder_p::openVideoLink() {
    input.select(qvVideoStream, 0);
    if (encoder->nrVideoStreams() == 0) return setError(QvStatus::failed, "The output has no video stream");
    if (const int result = worker.videoLink().init(&input, 0, encoder, 0)) return result;
    encoder->videoStream(0)->setEnabled(true);
    LinkOpen open;
    if (const auto filters = queues.firstVideoProcess().filters()) open.effects = *filters;
    const int result = worker.videoLink().openWith(open);
    return result == QvStatus::ok ? result : setError(result, worker.videoLink().errorDesc());
}

int PushEncoder::PushEncoder_p::openAudioLink() {
    input.select(qvAudioStream, 0);
    if (encoder->nrAudioStreams() == 0) return setError(QvStatus::failed, "The output has no audio stream");
    if (const int result = worker.audioLink().init(&input, 0, encoder, 0)) return result;
    encoder->audioStream(0)->setEnabled(true);
    LinkOpen open;
    const auto& process = queues.firstAudioProcess();
    if (const auto filters = process.filters()) open.takeAudioEffects(*filters);
    if (const auto* map = process.audioChannelMap()) open.connMatrix = *map;
    if (const auto conversion = process.audioConversion()) open.conversion = *conversion;
    const int result = worker.audioLink().openWith(open);
    return result == QvStatus::ok ? result : setError(result, worker.audioLink().errorDesc());
}

int PushEncoder::PushEncoder_p::openLinks() {
    worker.videoLink().close();
    worker.audioLink().close();
    if (input.getState() != QvCodec::stateInitialised) input.close();
    if (const int result = input.open()) return setError(result, input.errorDesc());
    int result = QvStatus::ok;
    if (queues.hasVideo()) result |= openVideoLink();
    if (queues.hasAudio()) result |= openAudioLink();
    return result;
}

// --- The application's side.

QvPushEncoder::QvPushEncoder() : p_(std::make_unique<PushEncoder_p>()) {}

QvPushEncoder::~QvPushEncoder() { close(true); }

int QvPushEncoder::setEncoder(QvEncodePipe* encoder) {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    p_->encoder = encoder;
    return QvStatus::ok;
}

int QvPushEncoder::addAudioStream(AnyDict& params, ProcessParams* process) {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    int length = params.getInt32("bufferLength", defaultSamples);
    if (length < 1) length = defaultSamples;
    const int samplerate = params.getInt32("samplerate", 0);
    const int channels = params.getInt32("channels", 0);
    int bytes = params.getInt32("bytesPerSample", 0);
    int bits = params.getInt32("bitsPerSample", 0);
    if (bits == 0 && bytes > 0) bits = 8 * std::min(bytes, INT32_MAX / 8);
    if (bytes == 0 && bits != 0) bytes = bytesOfBits(bits);
    bool legal = true;
    const auto refuse = [&](const char* problem, int value) {
        p_->error = Any::sprintf(problem, value).asString();
        qv_dbg()->error("%s", p_->error.c_str());
        legal = false;
    };
    if (channels < 1) refuse("[PushEncoder] addAudioStream - invalid # of channels (%d)", channels);
    if (!isLegalWidth(bits, bytes)) refuse("[PushEncoder] addAudioStream - invalid bitsPerSample (%d)", bits);
    if (samplerate < 1 || samplerate > highestSamplerate)
        refuse("[PushEncoder] addAudioStream - invalid samplerate (%d)", samplerate);
    if (!legal) return QvStatus::failed;

    auto stream = std::make_unique<AStream>();
    stream->channels = channels;
    stream->bytesPerSample = bytes;
    if (process) {
        if (const auto filters = process->filters()) stream->process.setFilters(*filters);
        if (const auto* map = process->audioChannelMap()) stream->process.setAudioChannelMap(*map);
        if (const auto conversion = process->audioConversion())
            stream->process.setAudioConversion(*conversion);
    }
    const long long sampleBytes = static_cast<long long>(channels) * bytes;
    if (sampleBytes * length > INT32_MAX) return p_->setError(QvStatus::outOfMemory, "Out of memory");
    if (const int result = stream->buffer.init(length, static_cast<int>(sampleBytes)))
        return p_->setError(result, "Out of memory");
    AnyDict format(params);
    format.set("bufferLength", length);
    format.set("bitsPerSample", bits);
    format.set("bytesPerSample", bytes);
    p_->input.addAudio(format);
    const int number = p_->queues.add(std::move(stream));
    qv_dbg()->debug("[PushEncoder] Initialized audio stream %d", number);
    QvUtil::debugOutDict(params);
    return QvStatus::ok;
}

int QvPushEncoder::addVideoStream(AnyDict& params, ProcessParams* process) {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    int length = params.getInt32("bufferLength", 0);
    if (length < 1) length = defaultFrames;
    const VideoFormat video(params);
    const bool hasRate = params["framerate"].isFramerate();
    if (!qvPixelFormat(video.fourcc) || video.width < 1 || video.height < 1 || !hasRate)
        return p_->setError(QvStatus::failed,
                            "The format of the video is not complete: FOURCC, width, height, framerate");
    auto stream = std::make_unique<VStream>();
    if (const int result =
            stream->buffer.init(length, video.fourcc, video.width, video.height, video.framerate))
        return p_->setError(result, "Out of memory");
    if (process)
        if (const auto filters = process->filters()) stream->process.setFilters(*filters);
    AnyDict format(params);
    format.remove("bufferLength");
    if (!format["frames"].isInt()) format.set("frames", unknownFrames);
    p_->input.addVideo(format);
    const int number = p_->queues.add(std::move(stream));
    qv_dbg()->debug("[PushEncoder] Initialized video stream %d", number);
    QvUtil::debugOutDict(params);
    return QvStatus::ok;
}

int QvPushEncoder::open() {
    QV_ASSERT_MSG(p_->state == stateClosed, "Invalid state");
    p_->failure.status = QvStatus::ok;
    p_->error.clear();
    if (!p_->encoder) return p_->setError(QvStatus::failed, "No encode pipe is set");
    if (const int result = p_->openLinks()) return result;
    if (const int result = p_->encoder->open()) return p_->setError(result, p_->encoder->errorDesc());
    p_->queues.startCounting();
    p_->state = stateOpen;
    return QvStatus::ok;
}

int QvPushEncoder::start() {
    QV_ASSERT_MSG(p_->state == stateOpen, "Invalid state");
    QV_ASSERT_MSG(!p_->worker.running(), "Thread already running!");
    if (p_->worker.start()) return QvStatus::ok;
    qv_dbg()->error("[PushEncoder] Failed to start thread");
    return p_->setError(QvStatus::failed, "[PushEncoder] Failed to start thread");
}

int QvPushEncoder::writeFrame(QvFrame* frame, int stream) { return p_->queues.writeFrame(frame, stream); }
int QvPushEncoder::writeSamples(QvPcm* samples, int stream) {
    return p_->queues.writeSamples(samples, stream);
}
bool QvPushEncoder::needsVideo(int stream) const { return p_->queues.needsVideo(stream); }
bool QvPushEncoder::needsAudio(int stream) const { return p_->queues.needsAudio(stream); }

int QvPushEncoder::process() {
    p_->change.wait([this] { return !p_->worker.running() || p_->queues.isAnyWaiting(); });
    return QvStatus::ok;
}

bool QvPushEncoder::running() const { return p_->worker.running(); }

int QvPushEncoder::close(bool abort) {
    if (p_->state != stateOpen) return QvStatus::ok;
    if (p_->worker.running()) {
        if (abort) p_->worker.stop();
        p_->queues.endAll();
    }
    p_->worker.wait();
    p_->state = stateClosed;
    p_->queues.clear();  // what is left belongs to no run any more
    return p_->failure.status;
}

QvEncodePipe* QvPushEncoder::encodePipe() const { return p_->encoder; }

const char* QvPushEncoder::errorDesc() const {
    return (p_->failure.status != QvStatus::ok ? p_->failure.text : p_->error).c_str();
}
