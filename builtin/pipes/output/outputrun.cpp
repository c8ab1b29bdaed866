#include "builtin/pipes/output/outputrun.h"

#include <new>

#include "builtin/pipes/output/members/pipehost.h"
#include "core/arch/qvexception.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"

namespace {

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

int OutputRun::open(bool makeFolder) {
    Undo finishing([this] { finish(false); });
    preparation_.run();
    if (makeFolder) makeOutFolder();
    const int result = openAll();
    finishing.dismiss();
    return result;
}

int OutputRun::openAll() {
    if (const int result = end_.sink()->open()) return failOpen(*end_.sink(), result);
    if (auto* muxer = end_.muxer())
        if (const int result = muxer->open()) return failOpen(*muxer, result);
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
    return QvStatus::ok;
}

// What was opened before is closed again; the failure that counts is the member's.
int OutputRun::failOpen(const QvCodec& member, int result) {
    const int code = member.errorCode() != 0 ? member.errorCode() : result;
    std::string text;
    {
        const Undo finishing([this] { finish(false); });
        text = member.errorDesc();
    }
    host_.fail(code, "%s", text.c_str());
    return result;
}

void OutputRun::makeOutFolder() const {
    const Any name = end_.filename();
    if (!name.isText() || name.isFalse()) return;
    const Any folder = QvFile::getPath(name);
    if (folder.isFalse() || QvFile::isDir(folder)) return;
    const std::string shown = qv_os_name(folder);
    if (QvFile::mkpath(folder) == 0)
        qv_dbg()->info("Created folder %s", shown.c_str());
    else
        qv_dbg()->error("Failed to create folder %s", shown.c_str());
}

int OutputRun::finish(bool aborting) {
    int result = finishEncoders(aborting);
    if (end_.muxer()) result |= finishMuxer(aborting);
    if (end_.sink()) result |= finishSink(aborting);
    return result;
}

int OutputRun::finishEncoders(bool aborting) {
    int all = 0;
    int place = 0;
    for (const auto& stream : streams_) {
        const int at = place++;
        auto* encoder = stream->encoder;
        if (!encoder) continue;
        const auto tell = [&](int result, const std::string& reason) {
            qv_dbg()->error("EncodePipe.%s: error (%d) at stream %s #%d (%s)", aborting ? "abort" : "close",
                            result, qvStreamTypeName(stream->type), at, encoder->name());
            host_.fail(result, "%s", reason.c_str());
        };
        all |= finishing(
            *encoder, [&] { return aborting ? encoder->abort() : encoder->close(); }, tell);
    }
    return all;
}

int OutputRun::finishMuxer(bool aborting) {
    auto& muxer = *end_.muxer();
    const auto tell = [&](int, const std::string& reason) {
        host_.fail(QvStatus::failed, aborting ? "Aborting muxer '%s' failed." : "Closing muxer '%s' failed.",
                   muxer.displayName());
        logForUser(reason);
    };
    return finishing(
        muxer, [&] { return aborting ? muxer.abort() : muxer.close(); }, tell);
}

int OutputRun::finishSink(bool aborting) {
    auto& sink = *end_.sink();
    const auto tell = [&](int, const std::string& reason) {
        host_.fail(QvStatus::failed, "%s", aborting ? "Aborting sink failed." : "Closing sink failed.");
        logForUser(reason);
    };
    return finishing(
        sink, [&] { return aborting ? sink.abort() : sink.close(); }, tell);
}

// The pipe's text says which member failed; the reason is a message of its own.
void OutputRun::logForUser(const std::string& reason) const {
    qv_log()->error("%s", host_.lastFailure());
    if (!reason.empty()) qv_log()->error("%s", reason.c_str());
}
