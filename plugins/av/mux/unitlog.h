// The units of encoders in a file, as they would have gone into a film: for films that several processes
// make a part of each.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <span>
#include <string>
#include <vector>

#include "core/value/any.h"

struct AVMurMur3;
class QvBufStream;
class QvByteSource;

namespace av {

// What an encoder said to the stream that its multiplexer gave it: bytes, and then side information with an
// identifier of core/stream/auxinfoid.h. Without an identifier (0) the bytes go on in the next entry.
struct UnitLogEntry {
    int type = 0, number = 0;  // of the stream
    unsigned id = 0;
    std::vector<std::uint8_t> info;
    std::vector<std::uint8_t> bytes;

    bool operator==(const UnitLogEntry&) const = default;
};

// A digest of all bytes, fed piece by piece.
class UnitDigest {
  public:
    static constexpr std::size_t kBytes = 16;

    UnitDigest();  // std::bad_alloc
    void add(std::span<const std::uint8_t> bytes);
    std::vector<std::uint8_t> finish();

  private:
    struct Free {
        void operator()(AVMurMur3* context) const;
    };
    std::unique_ptr<AVMurMur3, Free> context_;
};

// Several encoders may write at the same time.
class UnitLog {
  public:
    explicit UnitLog(QvBufStream& output);

    // Both: false after any failure, with a text in problem() and the system's number in error().
    bool add(const UnitLogEntry& entry);
    bool finish();  // no entry follows
    const std::string& problem() const { return problem_; }
    int error() const;

  private:
    QvBufStream& output_;
    UnitDigest digest_;
    std::mutex lock_;
    std::string problem_;
    bool begun_ = false;

    bool begin();
    bool put(std::span<const std::uint8_t> bytes);
};

// A file is hostile: an entry has a size of reason, and a file without its end or with another digest fails
// where it ends.
class UnitLogReader {
  public:
    enum class Read { entry, end, failed };

    UnitLogReader();
    ~UnitLogReader();

    // "" or why it can't be read.
    std::string open(const Any& file);
    // The next entry of a stream.
    Read next(int type, int number, UnitLogEntry& entry);
    const std::string& problem() const { return problem_; }

  private:
    std::unique_ptr<QvByteSource> source_;
    std::unique_ptr<UnitDigest> digest_;
    std::string problem_;

    Read fail(const std::string& why);
    bool take(void* to, std::size_t bytes);
    bool take(std::vector<std::uint8_t>& to, std::size_t bytes);
    Read atEnd();
};

}  // namespace av
