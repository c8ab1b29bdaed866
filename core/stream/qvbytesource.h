// QvByteSource: where a decoder reads bytes from, if not from a file by its name.
//
// The library's decoders, and those of plug-ins that know the parameter, take one as "source":
//
//     const auto source = qvBlockSource(data, bytes);
//     decoder->setParam("source", qvSourceValue(source.get()));
//     decoder->open();
//     ...
//     decoder->close();                        // now the source may be deleted
//
// The parameter is a borrowed pointer: the source has to exist until the decoder is closed. With a source,
// "filename" is only a name: for messages, and for decoders that look at its extension. With an invalid value
// the decoder reads the file again. QvDecFactory::decodeSource does all of this.
//
// A source belongs to the thread that drives its decoder, and to one decoder at a time. Callbacks run on that
// thread, within open, reads and seeks.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/value/any.h"

// Bytes that are read from a position on; the first has the position 0. To make a source, use a maker below,
// or derive and define the protected operations. The public operations are for decoders: whatever the source
// does, they return, throw nothing, and keep the reason of a failure.
class QV_API QvByteSource {
  public:
    static constexpr long long unknown = -1;  // size
    // A reader that keeps a whole source in memory takes no more than this from one of unknown size.
    static constexpr long long mostUnknown = 64LL << 20;

    QvByteSource() = default;
    QvByteSource(const QvByteSource&) = delete;
    QvByteSource& operator=(const QvByteSource&) = delete;
    // A subclass releases what it has in its own destructor, or when it is closed.
    virtual ~QvByteSource();

    // The next bytes, directly into the caller's memory. Fewer than `count` only at the end or after a
    // failure; problem() says which. After a failure nothing is read until seek succeeds.
    std::size_t read(void* to, std::size_t count);
    // Moves to a byte from the start. False for a negative position and for a source that can't move, except
    // to where it is. A position beyond the end is allowed; nothing is read there.
    bool seek(long long position);
    long long position() const { return position_; }
    // Bytes, or `unknown`; also `unknown` for an impossible size (above 2^60).
    long long size();
    bool seekable() const;
    // Ends its use and releases what it holds; nothing can be read after that. The second call does nothing.
    // The destructor does not call it.
    void close();

    bool failed() const { return failed_; }  // a read or a seek failed, and no seek succeeded since
    // Why there were fewer bytes than asked for, as a part of a sentence: what the source reported, or that
    // it ends before its size. "" for an end at its size, or at an unknown one.
    std::string problem();

  protected:
    // Puts 1 to `count` bytes to `to` and returns their number; 0 at the end; below 0 for a failure. `count`
    // is above 0. An exception is a failure, and its text the reason.
    virtual long long readSome(void* to, std::size_t count) = 0;
    virtual bool canMove() const;                         // base: false
    virtual bool moveTo(long long position);              // `position` is 0 or more. Base: false
    virtual long long length();                           // below 0: unknown. Base: unknown
    virtual void release();                               // the end of its use. Base: nothing
    void setReason(const char* text) { reason_ = text; }  // of a failure that is about to be returned

  private:
    long long position_ = 0;
    bool failed_ = false;
    bool closed_ = false;
    std::string reason_;

    template <class Operation>
    bool guarded(Operation&& operation);
    void fail(const char* what);
};

// The parameter's name.
inline constexpr const char* qvSourceParam = "source";
// A source as the value of a parameter; invalid for null. The second is the inverse: null for a value that is
// no pointer.
QV_API Any qvSourceValue(QvByteSource* source);
QV_API QvByteSource* qvSourceOf(const Any& value);

// --- Makers. The caller owns the result.

// A block of memory. The first borrows it: it has to exist as long as the source. The second owns it.
QV_API std::unique_ptr<QvByteSource> qvBlockSource(const void* data, std::size_t bytes);
QV_API std::unique_ptr<QvByteSource> qvBlockSource(std::vector<unsigned char> data);

// A file of that name, closed with the source. Null, with a line in the debug log, if it can't be opened.
// Reads smaller than `bufferBytes` (above 0) go through a buffer of that size. A pipe has no size and can't
// be sought.
QV_API std::unique_ptr<QvByteSource> qvFileSource(const Any& name, std::size_t bufferBytes = 64 * 1024);

// Operations of the application's own. What they refer to has to exist as long as the source.
struct QvSourceCallbacks {
    // Puts 1 to `count` bytes to `to` and returns their number; 0 at the end; below 0 for a failure. It may
    // throw: that is a failure, too.
    std::function<long long(void* to, std::size_t count)> read;
    // Moves to a byte from the start; false for a failure. Empty: the source can't be sought.
    std::function<bool(long long position)> seek = {};
    std::function<long long()> size = {};  // bytes. Empty, or below 0: unknown
    std::function<void()> close = {};      // called once, when the source is closed or goes. May be empty
};
// Null without a `read`.
QV_API std::unique_ptr<QvByteSource> qvCallbackSource(QvSourceCallbacks callbacks);
