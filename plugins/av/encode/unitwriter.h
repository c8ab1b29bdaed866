// Units of an encoder, into the stream that its multiplexer gave it.
#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "plugins/wire.h"

class QvBufStream;

namespace av {

// Takes the lock of the stream for each call. After a failure, which problem() describes, the stream takes
// nothing more.
class UnitWriter {
  public:
    UnitWriter() = default;
    explicit UnitWriter(QvBufStream& stream) : stream_(&stream) {}

    bool head(const QvWire::VideoHead& head);
    bool head(const QvWire::AudioHead& head);
    // `prefix` comes before the bytes and is part of the unit, as parameter sets or an ADTS header are.
    // `unit.bytes` is set here.
    bool unit(std::span<const std::uint8_t> prefix, std::span<const std::uint8_t> bytes,
              QvWire::VideoUnit unit);
    bool unit(std::span<const std::uint8_t> prefix, std::span<const std::uint8_t> bytes,
              QvWire::AudioUnit unit);
    bool end();  // no unit follows
    const std::string& problem() const { return problem_; }

  private:
    QvBufStream* stream_ = nullptr;
    std::string problem_;

    template <class Record>
    bool whole(std::span<const std::uint8_t> prefix, std::span<const std::uint8_t> bytes, unsigned id,
               Record record);
    bool put(std::span<const std::uint8_t> bytes);
    bool say(unsigned id, void* record, unsigned size);
    bool fail();
};

}  // namespace av
