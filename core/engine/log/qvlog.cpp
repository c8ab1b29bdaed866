#include "core/engine/log/qvlog.h"

#include <cerrno>
#include <mutex>
#include <new>
#include <string>

#include "core/arch/formattext_p.h"
#include "core/arch/platform.h"
#include "core/arch/qvassert.h"
#include "core/engine/qvutil.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvtimer.h"

namespace {

constexpr std::size_t maxLine = 2047;
constexpr unsigned timeFormat = 0x686D736D;  // "hmsm"
constexpr int targetFailed = -8;

// Recursive, since a logger may log.
std::recursive_mutex& section() {
    static auto& lock = *new std::recursive_mutex;  // never destroyed: the log is used until the very end
    return lock;
}
using Lock = std::lock_guard<std::recursive_mutex>;

const char* tagOf(int mask) {
    switch (mask) {
        case QvLogMask::critical: return "[CRT]";
        case QvLogMask::error: return "[ERR]";
        case QvLogMask::warning: return "[WRN]";
        case QvLogMask::info: return "[INF]";
        case QvLogMask::debug: return "[DBG]";
        case QvLogMask::progress: return "[PRG]";
        default: return "";
    }
}

// Time, a blank and the text, on the stack: logging must not allocate for a stream.
class Line {
  public:
    explicit Line(const char* text) {
        char time[64] = "";
        QvTimer::strtime(time, QvTimer::time(), timeFormat);
        std::snprintf(line_, sizeof line_, "%s %s", time, text ? text : "");
        line_[qvCutLength(line_, maxLine)] = 0;
    }
    const char* text() const { return line_; }

  private:
    char line_[maxLine + 4];
};

void callLogger(QvLogBase& logger, int mask, const char* line) {
    constexpr unsigned short empty[] = {0};
    const Any wide = Any(line).toWString();
    logger.logs(mask, wide.asWString(empty));
}

bool isStandard(std::FILE* stream) { return stream == stdout || stream == stderr; }

Any wantedTarget(const Any* logfile) {
    std::string variable;
    qv_platform().environment("QVTARSEL_DEBUG", variable);
    if (!variable.empty() && variable[0] != '0') return Any(variable.c_str());
    return logfile ? logfile->toString() : Any();
}

}  // namespace

QvLogBase::~QvLogBase() = default;

// Closes the log file when the process ends; the log itself stays, without a target.
struct QvDbgLogCloser {
    QvDbgLog* log;
    ~QvDbgLogCloser() {
        Lock lock(section());
        log->closeStream();
    }
};

QvDbgLog* QvDbgLog::instance() {
    static QvDbgLog* log = [] {
        qvSetAssertLog([](const char* text) { qv_dbg()->logs(QvLogMask::error, text); });
        return new QvDbgLog;
    }();
    static QvDbgLogCloser closer{log};
    return log;
}

QvDbgLog* qv_dbg() { return QvDbgLog::instance(); }

bool QvDbgLog::hasTarget() const {
    return stream_.load(std::memory_order_relaxed) || logger() || debugger_.load(std::memory_order_relaxed);
}

QvLogBase* QvDbgLog::logger() const { return logger_.load(std::memory_order_acquire); }

void QvDbgLog::closeStream() {
    std::FILE* stream = stream_.exchange(nullptr);
    if (stream && !isStandard(stream)) std::fclose(stream);
}

int QvDbgLog::init(const Any* logfile, QvLogBase* logger) {
    Lock lock(section());
    logger_ = logger;
    Any target = wantedTarget(logfile);
    if (target == target_) return QvStatus::ok;
    closeStream();
    debugger_ = false;
    writeError_ = 0;
    target_.invalidate();
    const int result = openTarget(target);
    target_ = target;
    announce(target);
    return result;
}

// Sets the stream or the debugger flag. A file that can't be opened makes the standard error the target.
int QvDbgLog::openTarget(Any& target) {
    if (!target.isString() || target.size() < 1) return QvStatus::ok;
    if (target == "stderr")
        stream_ = stderr;
    else if (target == "stdout")
        stream_ = stdout;
    else if (target == "dbgout")
        debugger_ = true;
    else
        stream_ = qv_platform().openFile(target.asString(), "w");
    if (stream_ || debugger_) return QvStatus::ok;
    const Any redirected =
        Any::sprintf("[DbgLog] *** Failed to open logfile %s for writing -> redirecting output to stderr\n",
                     target.asString());
    qv_platform().debugOutput(redirected.asString());
    stream_ = stderr;
    target = "stderr";
    return targetFailed;
}

void QvDbgLog::announce(const Any& target) {
    info("Log file version %s %s %s", QvUtil::libraryVersion().asString(""), QvUtil::buildDate().asString(""),
         target.asString(""));
    logs(QvLogMask::info, QvUtil::cpuDescription().asString(""));
}

void QvDbgLog::setLogger(QvLogBase* logger) {
    Lock lock(section());
    if (!logger) {
        logger_ = nullptr;
        return;
    }
    const Any target = target_;
    init(&target, logger);
}

void QvDbgLog::logs(int mask, const char* text) {
    if (!hasTarget()) return;
    const Line line(text);
    Lock lock(section());
    if (std::FILE* stream = stream_) {
        const bool taken =
            std::fprintf(stream, "%s %s\n", tagOf(mask), line.text()) >= 0 && std::fflush(stream) == 0;
        if (!taken && writeError_ == 0) writeError_ = errno;
    }
    try {
        if (QvLogBase* receiver = logger()) callLogger(*receiver, mask, line.text());
        if (debugger_)
            qv_platform().debugOutput((std::string(tagOf(mask)) + " " + line.text() + "\n").c_str());
    } catch (const std::bad_alloc&) {
        // Clean-ups report too and must continue, so a line without memory is lost.
    }
}

void QvDbgLog::vlog(int mask, const char* format, va_list args) {
    if (hasTarget()) logs(mask, QvFormattedText<maxLine>(format, args).text());
}

void QvDbgLog::log(int mask, const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(mask, format, args);
    va_end(args);
}

void QvDbgLog::error(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(QvLogMask::error, format, args);
    va_end(args);
}

void QvDbgLog::warning(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(QvLogMask::warning, format, args);
    va_end(args);
}

void QvDbgLog::info(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(QvLogMask::info, format, args);
    va_end(args);
}

void QvDbgLog::debug(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(QvLogMask::debug, format, args);
    va_end(args);
}

void QvDbgLog::write(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(QvLogMask::debug, format, args);
    va_end(args);
}

void QvDbgLog::progress(const char* format, ...) {
    va_list args;
    va_start(args, format);
    vlog(QvLogMask::progress, format, args);
    va_end(args);
}
