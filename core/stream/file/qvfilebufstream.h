// Streams that end in a file, or nowhere.
//
// Parameter "size" (Int32, default 8,388,608, stored back): bytes of the buffer, which is also the largest
// block. Names are String or WString. Failures of the file reach the writer as a null block or a short count,
// and stay in ioError(), those of closing included.
#pragma once

#include <memory>

#include "core/arch/widename.h"
#include "core/stream/qvbufstrm.h"

// Reads the file "infilename" if that is set; otherwise writes "outfilename".
//
// A written file may be split into numbered files, patched (BUF_SEEK_INFO, BUF_SEEK_REORDER) when it is
// finished, and have its DVD navigation packs corrected.
class QV_API QvFileBufStream : public QvBufStream {
  public:
    explicit QvFileBufStream(QvCodec* owner = nullptr);
    QvFileBufStream(const QvFileBufStream&);
    QvFileBufStream& operator=(const QvFileBufStream&);
    ~QvFileBufStream() override;

    using QvBufStream::init;
    int init(const AnyDict& params) override;  // -1 if the file can't be opened
    // Closes the file and then applies the patches, none with `abort`. May take as long as rewriting the
    // file.
    void destroy(int abort) override;
    // Reading: drops what is buffered. Writing: applies the patches collected so far, and collects no more;
    // destroy() still has to close the file.
    void flush() override;
    bufstream* input() override;   // asserts a stream that is not inited; null when reading
    bufstream* output() override;  // likewise; null when writing
    int registerObserver(QvAuxInfoObserver* observer) override;
    int unregisterObserver(QvAuxInfoObserver* observer) override;
    int unregisterAllObservers() override;
    TPtrList<QvAuxInfoObserver>* observers() override;

    // Brings what is buffered to the file system; the stream stays open. 0, or -1 with ioError() on failure
    // and when reading. Records confirm into the buffer, so a full disc may show only here or in destroy().
    int writeOut();

  protected:
    struct Records;
    std::shared_ptr<Records> records_;

  private:
    int openOutput(const QvWideString& name);
    int openInput(const QvWideString& name);

    TPtrList<QvAuxInfoObserver> observers_;
};

// Writes "outfilename" and can go back in it and read: FILE_SEEK, FILE_MODE_READ, FILE_MODE_WRITE. Patches
// are applied at once. Observers can be registered but are never called.
class QV_API QvFileBufStreamRwWrite : public QvFileBufStream {
  public:
    using QvFileBufStream::QvFileBufStream;
    ~QvFileBufStreamRwWrite() override;

    using QvBufStream::init;
    int init(const AnyDict& params) override;
    void destroy(int abort) override;  // with `abort` the buffer is not written
    void flush() override;             // writes the buffer and closes the file
    bufstream* input() override;
    bufstream* output() override;
};

// Counts what is written to it and drops it.
class QV_API QvNullBufStream : public QvBufStream {
  public:
    explicit QvNullBufStream(QvCodec* owner = nullptr);
    QvNullBufStream(const QvNullBufStream&);
    QvNullBufStream& operator=(const QvNullBufStream&);
    ~QvNullBufStream() override;

    using QvBufStream::init;
    int init(const AnyDict& params) override;  // asserts that there is memory
    void destroy(int abort) override;
    void flush() override;
    bufstream* input() override;   // null before init
    bufstream* output() override;  // null

  private:
    struct Record;
    std::shared_ptr<Record> record_;
};
