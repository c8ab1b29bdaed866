// Opening the chain from its end to its start, and finishing it the other way.
#include <algorithm>
#include <cstring>
#include <new>
#include <string>

#include "builtin/pipes/encodepipe2.h"
#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/stream/qvbufstrm.h"

namespace {

constexpr double avchdTotalBitrate = 22536000;  // bits a second of video and audio
constexpr int defaultChunk = 0x40001;           // of a bitstream that has none set

double number(const QvCodec& codec, const char* name) {
    const Any value = codec.getParam(name);
    return value.isInt() || value.isFloat() ? value.toDouble() : 0.0;
}

bool isModule(const QvCodec* codec, const char* name) {
    return codec && std::strcmp(codec->name(), name) == 0;
}

// Runs one step of finishing; when it fails, `tell` takes the result and the reason. Neither a broken
// contract in one member nor want of memory may leave the others open.
template <class Step, class Tell>
int finishing(const QvCodec& member, Step step, Tell tell) {
    int result = QvStatus::failed;
    try {
        try {
            result = step();
            if (result != QvStatus::ok) tell(result, std::string(member.errorDesc()));
        } catch (const QvException& failure) {
            tell(result = QvStatus::failed, std::string(failure.what()));
        }
    } catch (const std::bad_alloc&) {
        result = QvStatus::outOfMemory;
    }
    return result;
}

}  // namespace

void EncodePipe2::prepare() {
    prepareBuffers();
    spreadFramerate();
    limitAvchdBitrate();
    if (isModule(muxer_.get(), "mptsmux"))
        for (const auto& stream : streams_)
            if (stream->type == qvAudioStream && isModule(stream->encoder, "aacaenc"))
                forward(stream->encoder, "aacTsAdjust", 1);
}

void EncodePipe2::prepareBuffers() {
    for (const auto& stream : streams_) {
        if (stream->type != qvVideoStream || !stream->encoder) continue;
        const Any size = stream->encoder->getParam("dstBuffSize");
        if (!size.isInt()) continue;
        const int bytes = size.toInt32();
        if (!muxer_) {
            forward(sink_.get(), "bufsize", bytes);
            stream->encoder->attachOutStream(sink_->stream());
        } else if (isModule(muxer_.get(), "rawmux") || !stream->bitstream->inited()) {
            stream->bitstream->setParam("size", bytes);
        } else {
            const Any& chunk = stream->bitstream->getParam("chunk");
            stream->bitstream->resize(bytes,
                                      std::min(bytes, chunk.isInt32() ? chunk.asInt32() : defaultChunk));
        }
    }
}

void EncodePipe2::spreadFramerate() {
    const auto* first = videoEncoder(0);
    if (!first) return;
    const Any rate = static_cast<const QvCodec*>(first)->getParam("framerate");
    if (!rate.isValid()) return;
    for (const auto& stream : streams_)
        if (stream->encoder && stream->encoder != first) forward(stream->encoder, "framerate", rate);
    forwardToMuxer("framerate", rate);
}

void EncodePipe2::limitAvchdBitrate() {
    auto* video = videoEncoder(0);
    const auto* audio = audioEncoder(0);
    if (!muxer_ || !video || !audio) return;
    if (!static_cast<const QvCodec*>(video)->getParam("_isAVCHD").isTrue()) return;
    const double maximum = number(*video, "maxVBitrate");
    const double average = number(*video, "vBitrate");
    const double sound = number(*audio, "aBitrate") * 1000;
    qv_dbg()->debug("vb=%d, max vb=%d, ab =%d", static_cast<int>(average), static_cast<int>(maximum),
                    static_cast<int>(sound));
    if (maximum + sound <= avchdTotalBitrate) return;
    qv_dbg()->warning(
        "Total bitrate %d bps(%d bps video, and %d bps audio) larger than maximal allowed for AVCHD, "
        "adjusting video bitrate to match",
        static_cast<int>(maximum + sound), static_cast<int>(maximum), static_cast<int>(sound));
    const double left = avchdTotalBitrate - sound;
    forward(video, "maxVBitrate", left);
    if (average > left) forward(video, "vBitrate", left);
}

int EncodePipe2::open() {
    QV_ASSERT_MSG(getState() != stateCreated, "EncodePipe2.open: invalid state");
    if (getState() == qvStateOpen) return QvStatus::ok;
    Undo finishing([this] { finish(false); });
    prepare();
    const int result = openAll();
    finishing.dismiss();
    return result;
}

int EncodePipe2::openAll() {
    makeOutFolder();
    if (const int result = sink_->open()) return failOpen(*sink_, result);
    if (muxer_)
        if (const int result = muxer_->open()) return failOpen(*muxer_, result);
    int place = 0;
    for (const auto& stream : streams_) {
        const int at = place++;
        if (!stream->encoder || !stream->enabled()) continue;
        const int result = stream->encoder->open();
        if (result == QvStatus::ok) continue;
        qv_dbg()->error("EncodePipe.open: error (%d) at stream %s #%d (%s)", result,
                        qvStreamTypeName(stream->type), at, stream->encoder->name());
        return failOpen(*stream->encoder, result);
    }
    setState(qvStateOpen);
    return QvStatus::ok;
}

// What was opened before is closed again; the member that failed has the say.
int EncodePipe2::failOpen(const QvCodec& member, int result) {
    const int code = member.errorCode() != 0 ? member.errorCode() : result;
    std::string text;
    {
        const Undo finishing([this] { finish(false); });
        text = member.errorDesc();
    }
    setError(code, "%s", text.c_str());
    return result;
}

void EncodePipe2::makeOutFolder() {
    if (!createOutFolder_) return;
    const Any name = getFilename();
    if (!name.isText() || name.isFalse()) return;
    const Any folder = QvFile::getPath(name);
    if (folder.isFalse() || QvFile::isDir(folder)) return;
    const std::string shown = qv_os_name(folder);
    if (QvFile::mkpath(folder) == 0)
        qv_dbg()->info("Created folder %s", shown.c_str());
    else
        qv_dbg()->error("Failed to create folder %s", shown.c_str());
}

int EncodePipe2::close() {
    QV_ASSERT_MSG(getState() != stateCreated, "EncodePipe.close: invalid state");
    return finish(false);
}

int EncodePipe2::abort() {
    QV_ASSERT_MSG(getState() != stateCreated, "EncodePipe.abort: invalid state");
    return finish(true);
}

int EncodePipe2::finish(bool aborting) {
    int result = finishEncoders(aborting);
    if (muxer_) result |= finishMuxer(aborting);
    if (sink_) result |= finishSink(aborting);
    setState(stateInitialised);
    return result;
}

int EncodePipe2::finishEncoders(bool aborting) {
    int all = 0;
    int place = 0;
    for (const auto& stream : streams_) {
        const int at = place++;
        auto* encoder = stream->encoder;
        if (!encoder) continue;
        const auto tell = [&](int result, const std::string& reason) {
            qv_dbg()->error("EncodePipe.%s: error (%d) at stream %s #%d (%s)", aborting ? "abort" : "close",
                            result, qvStreamTypeName(stream->type), at, encoder->name());
            setError(result, "%s", reason.c_str());
        };
        all |= finishing(
            *encoder, [&] { return aborting ? encoder->abort() : encoder->close(); }, tell);
    }
    return all;
}

int EncodePipe2::finishMuxer(bool aborting) {
    const auto tell = [&](int, const std::string& reason) {
        setError(QvStatus::failed, aborting ? "Aborting muxer '%s' failed." : "Closing muxer '%s' failed.",
                 muxer_->displayName());
        tellUser(reason);
    };
    return finishing(
        *muxer_, [&] { return aborting ? muxer_->abort() : muxer_->close(); }, tell);
}

int EncodePipe2::finishSink(bool aborting) {
    const auto tell = [&](int, const std::string& reason) {
        setError(QvStatus::failed, "%s", aborting ? "Aborting sink failed." : "Closing sink failed.");
        tellUser(reason);
    };
    return finishing(
        *sink_, [&] { return aborting ? sink_->abort() : sink_->close(); }, tell);
}

// The pipe's text says who failed; why is in a message of its own.
void EncodePipe2::tellUser(const std::string& reason) {
    qv_log()->error("%s", errorDesc());
    if (!reason.empty()) qv_log()->error("%s", reason.c_str());
}
