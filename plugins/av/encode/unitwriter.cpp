#include "plugins/av/encode/unitwriter.h"

#include <algorithm>
#include <cstring>

#include "core/stream/auxinfoid.h"
#include "core/stream/qvbufstrm.h"

namespace av {

namespace {

class Locked {
  public:
    explicit Locked(QvBufStream& stream) : stream_(stream) { stream_.lock(); }
    ~Locked() { stream_.unlock(); }
    Locked(const Locked&) = delete;
    Locked& operator=(const Locked&) = delete;

  private:
    QvBufStream& stream_;
};

}  // namespace

bool UnitWriter::fail() {
    problem_ = stream_->ioErrorText();
    if (problem_.empty()) problem_ = "The output did not take the stream";
    return false;
}

bool UnitWriter::put(std::span<const std::uint8_t> bytes) {
    bufstream* const out = stream_->input();
    if (!out) return fail();
    while (!bytes.empty()) {
        const std::size_t room = std::min(out->usable(out), out->chunksize(out));
        const auto piece = static_cast<unsigned>(std::min(room, bytes.size()));
        unsigned char* const block = piece > 0 ? out->request(out, piece) : nullptr;
        if (!block) return fail();
        std::memcpy(block, bytes.data(), piece);
        if (out->confirm(out, piece) != piece) return fail();
        bytes = bytes.subspan(piece);
    }
    return true;
}

bool UnitWriter::say(unsigned id, void* record, unsigned size) {
    bufstream* const out = stream_->input();
    if (!out || out->auxinfo(out, 0, id, record, size) != 0 || stream_->ioError() != 0) return fail();
    return true;
}

template <class Record>
bool UnitWriter::whole(std::span<const std::uint8_t> prefix, std::span<const std::uint8_t> bytes, unsigned id,
                       Record record) {
    const Locked locked(*stream_);
    record.bytes = static_cast<std::uint32_t>(prefix.size() + bytes.size());
    return put(prefix) && put(bytes) && say(id, &record, sizeof record);
}

bool UnitWriter::unit(std::span<const std::uint8_t> prefix, std::span<const std::uint8_t> bytes,
                      QvWire::VideoUnit unit) {
    return whole(prefix, bytes, QvAuxId::VIDEO_AU_CODE, unit);
}

bool UnitWriter::unit(std::span<const std::uint8_t> prefix, std::span<const std::uint8_t> bytes,
                      QvWire::AudioUnit unit) {
    return whole(prefix, bytes, QvAuxId::AUDIO_AU_CODE, unit);
}

bool UnitWriter::head(const QvWire::VideoHead& head) {
    const Locked locked(*stream_);
    QvWire::VideoHead copy = head;
    return say(QvAuxId::VIDEO_STREAM_INFO, &copy, sizeof copy);
}

bool UnitWriter::head(const QvWire::AudioHead& head) {
    const Locked locked(*stream_);
    QvWire::AudioHead copy = head;
    return say(QvAuxId::AUDIO_STREAM_INFO, &copy, sizeof copy);
}

bool UnitWriter::end() {
    const Locked locked(*stream_);
    return say(QvAuxId::STREAM_END_CODE, nullptr, 0);
}

}  // namespace av
