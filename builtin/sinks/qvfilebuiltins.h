// FileSink and NullSink: the ends of an output on a file and nowhere. Modules "filesink", "nullsink".
#pragma once

#include "builtin/sinks/filelesssink.h"
#include "core/engine/modules/qvmodule.h"
#include "core/stream/file/qvfilebufstream.h"

constexpr int qvSinkBufferSize = 0x800000;  // bytes, at first

// Parameters: "filename" (text) and "bufsize" (bytes, Int32). What could not be written is a status and a
// text of flush or close; the file is then left incomplete under its name. "filesWritten" answers the
// vector of that name when the last open made the file.
class FileSink : public QvSink {
  public:
    struct Settings {
        Any filename;
        int bufsize = qvSinkBufferSize;
    };

    FileSink() = default;
    ~FileSink() override;

    int init() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    int open() override;
    int close() override;
    int flush() override;
    int abort() override;
    QvBufStream* stream() const override;

  private:
    int writeOut();
    int failFlush();
    void finish(int abort);

    mutable QvFileBufStream stream_{this};
    Settings settings_;
    bool doNothing_ = false;
    Any written_;  // name of the file made by the last open, invalid for none
};

// Swallows everything.
class NullSink : public FilelessSink {
  public:
    NullSink() = default;
    ~NullSink() override;

    int open() override;
    int close() override;
    QvBufStream* stream() const override;

  private:
    mutable QvNullBufStream stream_{this};
    int bufsize_ = qvSinkBufferSize;
};
