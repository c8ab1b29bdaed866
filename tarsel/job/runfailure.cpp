#include "tarsel/job/runfailure.h"

#include <algorithm>
#include <cerrno>
#include <new>

#include "tarsel/words/messages.h"

namespace {

bool failedForMemory(const JobParts& parts, const JobTranscoder& run) {
    const auto lacked = [](const QvCodec* codec) {
        return codec && codec->errorCode() == QvStatus::outOfMemory;
    };
    const auto fileLacked = [](const QvBufStream* file) { return file && file->ioError() == ENOMEM; };
    QvEncodePipe& pipe = *parts.pipe;
    if (lacked(&pipe) || lacked(pipe.getMuxer()) || lacked(pipe.sink())) return true;
    if (fileLacked(pipe.sink()->stream())) return true;
    return std::any_of(parts.plan.streams.begin(), parts.plan.streams.end(), [&](const PlannedStream& s) {
        const TransLink* link = run.linkOf(s);
        return lacked(&parts.source(s).decoder()) || lacked(parts.encoder(s)) ||
               (link && link->errorCode() == QvStatus::outOfMemory) || fileLacked(parts.file(s));
    });
}

void checkOutputFiles(const JobParts& parts) {
    for (const PlannedStream& s : parts.plan.streams) {
        const QvBufStream* file = parts.file(s);
        if (!file || file->ioError() == 0) continue;
        // A multiplexer that refuses what it gets has a reason of its own.
        if (file->ioError() == EINVAL && parts.pipe->getMuxer() && parts.pipe->getMuxer()->errorCode() != 0)
            continue;
        if (parts.outputs.stream() && file->ioError() == EPIPE)
            throw failure(Msg::streamReaderGone, {parts.plan.output.name});
        throw systemFailure(Msg::outputSystem, parts.plan.output.name, file->ioError());
    }
}

// What the first member of the output that failed says; empty if none did.
std::string outputReason(const JobParts& parts) {
    QvEncodePipe& pipe = *parts.pipe;
    // What an encoder says of its output comes from the multiplexer.
    std::vector<const QvCodec*> members = {pipe.getMuxer()};
    for (const PlannedStream& s : parts.plan.streams) members.push_back(parts.encoder(s));
    members.insert(members.end(), {pipe.sink(), &pipe});
    std::string reason;
    for (const QvCodec* member : members)
        if (reason.empty() && member && member->errorCode() != 0) reason = member->errorDesc();
    return reason;
}

}  // namespace

void throwRunFailure(const JobParts& parts, const JobTranscoder& run, int result) {
    const std::string& output = parts.plan.output.name;
    if (result == QvStatus::outOfMemory || failedForMemory(parts, run))
        throw failure(Msg::runOutOfMemory, {output});
    for (const auto& source : parts.sources)
        if (source->decoder().errorCode() < 0 && source->decoder().errorCode() != QvStatus::endOfStream)
            throw failure(Msg::readFailed, {source->name()});
    checkOutputFiles(parts);
    if (const std::string reason = outputReason(parts);
        !reason.empty() && parts.plan.output.place != OutputPlace::nowhere)
        throw writeFailure(output, parts.outputs.withFinalNames(reason));
    if (run.filterFailure()) throw *run.filterFailure();
    throw failure(Msg::jobFailed, {output, parts.outputs.withFinalNames(run.reason())});
}

void throwBetter(bool ranOut, const std::string& output) {
    try {
        throw;
    } catch (const Failure& failure) {
        if (!ranOut || failure.exit() >= Exit::hangup) throw;
    } catch (const QvMemoryFailure&) {
    } catch (const std::bad_alloc&) {
    } catch (const QvAssertFailure&) {
        if (!ranOut) throw failure(Msg::runBroken, {output});
    }
    throw failure(Msg::runOutOfMemory, {output});
}
