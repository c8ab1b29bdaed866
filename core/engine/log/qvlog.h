// The two logs: QvDbgLog, the engine's trace of everything, and QvLogBuffer, the bounded list of messages
// that an application shows to its user. Both may be used from any thread.
#pragma once

#include <atomic>
#include <cstdarg>
#include <cstdio>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// Each message carries one of these bits, so that a receiver can filter with a mask.
namespace QvLogMask {
constexpr int critical = 1;
constexpr int error = 2;
constexpr int warning = 4;
constexpr int info = 8;
constexpr int header = 16;
constexpr int debug = 32;
constexpr int progress = 64;
}  // namespace QvLogMask

// An application's receiver of debug log lines. Its calls are serialised: they run inside the log's lock, on
// the thread that logs, so an implementation must neither wait for another thread that logs nor use
// qv_log(). What it throws reaches the code that logged.
class QV_API QvLogBase {
  public:
    virtual ~QvLogBase();
    // One whole line with its time, without level tag or newline: UTF-16 units, valid during the call.
    virtual void logs(int mask, const unsigned short* text) = 0;
};

// The debug log. A message reaches every target that is set: a stream, the logger, the debugger output.
// Without any target it vanishes. Lines of several threads never mix.
class QV_API QvDbgLog {
  public:
    static QvDbgLog* instance();

    // Opens the target and stores the logger (borrowed, may be null). The target is the environment variable
    // QVTARSEL_DEBUG unless that is empty or begins with "0", else `logfile`: "stdout", "stderr", "dbgout"
    // (debugger output) or the name of a file, which is overwritten; null or invalid: no target. The present
    // target, given again, is left alone. 0, or -8 if the file can't be opened: the standard error is used
    // then.
    int init(const Any* logfile, QvLogBase* logger);
    int setLogfile(Any* logfile) { return init(logfile, logger()); }
    // Null only stops the calls: when it returns, none is running on another thread.
    void setLogger(QvLogBase* logger);
    QvLogBase* logger() const;
    // False: whatever is logged vanishes, so a caller can spare itself the text.
    bool hasTarget() const;
    // The errno of the first line that the present stream did not take; 0 when it has taken all.
    int writeError() const { return writeError_.load(); }

    // Writes `text` as one line after the time, "h:mm:ss.mmm"; time and text have at most 2,047 characters.
    void logs(int mask, const char* text);

    // Formatted forms: at most 2,047 characters, then as logs.
    void log(int mask, const char* format, ...) QV_PRINTF(3, 4);
    void vlog(int mask, const char* format, va_list args) QV_PRINTF(3, 0);
    void error(const char* format, ...) QV_PRINTF(2, 3);
    void warning(const char* format, ...) QV_PRINTF(2, 3);
    void info(const char* format, ...) QV_PRINTF(2, 3);
    void debug(const char* format, ...) QV_PRINTF(2, 3);
    void write(const char* format, ...) QV_PRINTF(2, 3);  // the same level as debug
    void progress(const char* format, ...) QV_PRINTF(2, 3);

    QvDbgLog(const QvDbgLog&) = delete;
    QvDbgLog& operator=(const QvDbgLog&) = delete;

  private:
    QvDbgLog() = default;
    ~QvDbgLog() = default;
    void closeStream();
    int openTarget(Any& target);
    void announce(const Any& target);

    // Changed inside the lock only; read outside it to drop a line early when nothing listens.
    std::atomic<std::FILE*> stream_{nullptr};
    std::atomic<QvLogBase*> logger_{nullptr};
    Any target_;
    std::atomic<bool> debugger_{false};
    std::atomic<int> writeError_{0};

    friend struct QvDbgLogCloser;
};

// The shared list of user-facing messages is qv_log(); an application may have more of its own. Whatever is
// written also goes to the debug log. A message is a Dict with "text" (String) and "type" (Int32, the mask).
class QV_API QvLogBuffer {
  public:
    QvLogBuffer() = default;
    ~QvLogBuffer();
    QvLogBuffer(const QvLogBuffer&) = delete;
    QvLogBuffer& operator=(const QvLogBuffer&) = delete;

    // Null text only trims the list to its maximum. In the debug log "%%" of the text shows as "%".
    virtual void logs(int mask, const char* text);
    void logs(int mask, const Any& text);  // String or WString; any other type is dropped

    // Formatted forms: at most 2,047 characters, then as logs.
    void log(int mask, const char* format, ...) QV_PRINTF(3, 4);
    void error(const char* format, ...) QV_PRINTF(2, 3);
    void warning(const char* format, ...) QV_PRINTF(2, 3);
    void info(const char* format, ...) QV_PRINTF(2, 3);
    void header(const char* format, ...) QV_PRINTF(2, 3);
    void progress(const char* format, ...) QV_PRINTF(2, 3);
    void fappend(const char* format, ...) QV_PRINTF(2, 3);  // the same level as info
    void append(const char* text, int mask) { logs(mask, text); }
    void append(const Any& text, int mask) { logs(mask, text); }

    // Copies each message to this file from now on, one a line. False in the sense of Any: closes the file.
    // 0 if a file is open afterwards, else -1.
    int setLogFile(const Any& name);
    // Default 200. Takes effect at the next message, which comes on top: the list can hold one more.
    void setMaxMessages(int count);
    void clear();        // messages and counts
    void clearStatus();  // counts only

    int nrMessages() const;
    int nrErrors() const;      // also of messages that the list no longer holds
    int nrWarnings() const;    // likewise
    int getWriteCntr() const;  // moves on with each message and each clear

    // Replaces `out` with all messages, oldest first. Their number, or -1 if there are none.
    int getAll(AnyVector& out) const;
    // Replaces `out` with the messages from index last + 1 on, at least the last one. The number of messages
    // in the list, or -1 if there are none. A poller asks when getWriteCntr() has moved and passes the
    // previous result - 1, and -1 the first time.
    int getSince(AnyVector& out, int last) const;

  private:
    void trim();

    AnyVector messages_;
    int maxMessages_ = 200;
    int writeCounter_ = 0;
    std::FILE* copy_ = nullptr;
    int errors_ = 0;
    int warnings_ = 0;
};

QV_API QvDbgLog* qv_dbg();  // never null, also while the process ends
QV_API QvLogBuffer* qv_log();
