#include "builtin/pipes/output/outputpreparation.h"

#include <algorithm>

#include "builtin/pipes/output/members/pipehost.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr double avchdTotalBitrate = 22536000;  // bits a second of video and audio
constexpr int defaultChunk = 0x40001;           // bytes, of a bitstream that has none set

double number(const QvCodec& codec, const char* name) {
    const Any value = codec.getParam(name);
    return value.isInt() || value.isFloat() ? value.toDouble() : 0.0;
}

}  // namespace

void OutputPreparation::run() const {
    sizeBuffers();
    spreadFramerate();
    limitBitrate();
    adjustAudio();
}

void OutputPreparation::sizeBuffers() const {
    for (const auto& stream : streams_) {
        if (stream->type != qvVideoStream || !stream->encoder) continue;
        const Any size = static_cast<const QvCodec*>(stream->encoder)->getParam("dstBuffSize");
        if (!size.isInt()) continue;
        const int bytes = size.toInt32();
        if (!end_.muxer()) {
            qvOfferParam(*end_.sink(), "bufsize", bytes);
            stream->encoder->attachOutStream(end_.sink()->stream());
        } else if (end_.traits().sizedStreams || !stream->bitstream->inited()) {
            stream->bitstream->setParam("size", bytes);
        } else {
            const Any& chunk = stream->bitstream->getParam("chunk");
            stream->bitstream->resize(bytes,
                                      std::min(bytes, chunk.isInt32() ? chunk.asInt32() : defaultChunk));
        }
    }
}

// The first video encoder's, to all other members.
void OutputPreparation::spreadFramerate() const {
    const auto* first = streams_.videoEncoder(0);
    if (!first) return;
    const Any rate = static_cast<const QvCodec*>(first)->getParam("framerate");
    if (!rate.isValid()) return;
    for (const auto& stream : streams_)
        if (stream->encoder && stream->encoder != first) qvOfferParam(*stream->encoder, "framerate", rate);
    end_.offer("framerate", rate);
}

void OutputPreparation::limitBitrate() const {
    auto* video = streams_.videoEncoder(0);
    const auto* audio = streams_.audioEncoder(0);
    if (!end_.muxer() || !video || !audio) return;
    if (!static_cast<const QvCodec*>(video)->getParam("_isAVCHD").isTrue()) return;
    const double maximum = number(*video, "maxVBitrate");
    const double average = number(*video, "vBitrate");
    const double sound = number(*audio, "aBitrate") * 1000;  // kilobits there
    qv_dbg()->debug("vb=%d, max vb=%d, ab =%d", static_cast<int>(average), static_cast<int>(maximum),
                    static_cast<int>(sound));
    if (maximum + sound <= avchdTotalBitrate) return;
    qv_dbg()->warning(
        "Total bitrate %d bps(%d bps video, and %d bps audio) larger than maximal allowed for AVCHD, "
        "adjusting video bitrate to match",
        static_cast<int>(maximum + sound), static_cast<int>(maximum), static_cast<int>(sound));
    const double left = avchdTotalBitrate - sound;
    qvOfferParam(*video, "maxVBitrate", left);
    if (average > left) qvOfferParam(*video, "vBitrate", left);
}

void OutputPreparation::adjustAudio() const {
    if (!end_.traits().manyPrograms) return;
    for (const auto& stream : streams_)
        if (stream->type == qvAudioStream && stream->encoder &&
            qvModuleTraits(*stream->encoder).family == CodecFamily::aac)
            qvOfferParam(*stream->encoder, "aacTsAdjust", 1);
}
