#include "builtin/sinks/qvfilebuiltins.h"

#include <cstring>
#include <mutex>

#include "builtin/creators.h"
#include "builtin/shared/donothing.h"
#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr int largestBuffer = 1 << 30;

using Settings = FileSink::Settings;

constexpr QvParamRow<Settings> rows[] = {
    {.name = "filename", .member = &Settings::filename, .help = "the output", .type = Any::String},
    {"bufsize", &Settings::bufsize, qvParamPlain, 1, largestBuffer, "", "bytes"},
};
static_assert(qvParamTableOk<Settings>(rows));

// For messages only.
std::string shown(const Any& name) {
    const Any text = name.toString();
    return text.isString() ? text.asString() : "(no name)";
}

}  // namespace

FileSink::~FileSink() {
    if (getState() == qvStateOpen) finish(1);
}

int FileSink::init() { return QvSink::init(); }

int FileSink::setParam(const char* name, const Any& value) {
    _traceParam(name, value);
    if (getState() == stateCreated) return setError(QvStatus::failed, "not inited");
    if (auto result = qvSetParamRow<Settings>(rows, settings_, name, value)) return *result;
    return QvSink::setParam(name, value);
}

void FileSink::getParam(const char* name, Any& value) const {
    if (qvGetParamRow<Settings>(rows, settings_, name, value)) return;
    if (!name || std::strcmp(name, "filesWritten") != 0) return QvSink::getParam(name, value);
    AnyVector files;
    if (written_.isText()) files.append(written_);
    value = files;
}

int FileSink::open() {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    if (getState() == qvStateOpen)
        if (const int result = close()) return result;
    written_.invalidate();
    const auto& nothing = stream_.getParam(qvSinkDoNothing);
    doNothing_ = nothing.isInt32() && nothing.asInt32() != 0;
    Undo closing([this] { stream_.destroy(1); });
    if (!doNothing_) {
        if (!settings_.filename.isText() || settings_.filename.isFalse())
            return setError(QvStatus::failed, "Failed to open output file: no name is set");
        stream_.setParam("size", settings_.bufsize);
        stream_.setParam("outfilename", settings_.filename);
        if (stream_.init() != 0) {
            qv_dbg()->error("Can not create file %s", shown(settings_.filename).c_str());
            return setError(QvStatus::failed, "Failed to open output file");
        }
        written_ = settings_.filename;
    }
    closing.dismiss();
    setState(qvStateOpen);
    return QvStatus::ok;
}

// A multiplexer may have had the corrections made already, after which the record takes nothing more.
int FileSink::writeOut() {
    std::lock_guard lock(stream_);
    if (stream_.writeOut() != QvStatus::ok) return QvStatus::failed;
    auto* out = stream_.input();
    out->auxinfo(out, 0, QvAuxId::FLUSH_BUFFER, nullptr, 0);
    return stream_.ioError() == 0 ? QvStatus::ok : QvStatus::failed;
}

int FileSink::failFlush() {
    qv_dbg()->error("FileSink, Error, can not flush %s", shown(settings_.filename).c_str());
    const auto reason = stream_.ioErrorText();
    return setError(QvStatus::failed, "%s",
                    reason.empty() ? "Can not write to the output file" : reason.c_str());
}

void FileSink::finish(int abort) {
    if (!doNothing_) stream_.destroy(abort);
    setState(stateInitialised);
}

int FileSink::close() {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    if (getState() != qvStateOpen) return QvStatus::ok;
    int result = QvStatus::ok;
    {
        const Undo finishing([this] { finish(0); });
        if (!doNothing_) result = writeOut();
    }
    if (result != QvStatus::ok || (!doNothing_ && stream_.ioError() != 0)) return failFlush();
    return QvStatus::ok;
}

int FileSink::flush() {
    if (getState() != qvStateOpen || doNothing_ || !stream_.inited()) return QvStatus::ok;
    return writeOut() == QvStatus::ok ? QvStatus::ok : failFlush();
}

int FileSink::abort() {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    if (getState() == qvStateOpen) finish(1);
    return QvStatus::ok;
}

QvBufStream* FileSink::stream() const {
    if (getState() != stateCreated) return &stream_;
    const_cast<FileSink*>(this)->setError(QvStatus::failed, "Not inited");
    return nullptr;
}

NullSink::~NullSink() { stream_.destroy(1); }

int NullSink::open() {
    QV_ASSERT_MSG(getState() != stateCreated, "not inited");
    stream_.setParam("size", bufsize_);
    if (stream_.init() != 0) return setError(QvStatus::failed, "Failed to init bufstream object");
    setState(qvStateOpen);
    return QvStatus::ok;
}

int NullSink::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    stream_.destroy(0);
    setState(stateInitialised);
    return QvStatus::ok;
}

QvBufStream* NullSink::stream() const { return &stream_; }

QvCodec* newFilesink() { return new FileSink; }

QvCodec* newNullsink() { return new NullSink; }
