#include "plugins/av/mux/unitstream.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>

#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"
#include "core/stream/auxinfoid.h"
#include "core/stream/buf_impl_base.h"
#include "core/stream/iofailure.h"
#include "plugins/av/mux/filmwriter.h"
#include "plugins/av/mux/multiplexer.h"
#include "plugins/av/mux/unitlog.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

constexpr unsigned firstBytes = 4096;
constexpr unsigned chunkBytes = 1 << 20;
constexpr unsigned mostBytes = limits::allocation - chunkBytes;
constexpr int soundBlocks = 25;      // of raw sound a second
constexpr unsigned headerBytes = 6;  // before it

struct FreeBuffer {
    void operator()(AVBufferRef* buffer) const { av_buffer_unref(&buffer); }
};

// A record of a size that the writer had; what is missing is 0.
template <class T>
bool read(T& to, const void* info, unsigned size) {
    if (!info || size < sizeof(std::uint32_t)) return false;
    std::memcpy(&to, info, std::min<std::size_t>(size, sizeof to));
    return true;
}

}  // namespace

class UnitStream::Record : public Bufstream {
  public:
    virtual bool finish() = 0;

    unsigned chunksize() override { return chunkBytes; }
    unsigned split() override { return BUFSTREAM_FAILED; }
    void done(int) override {}
    void free() override {}
};

class UnitStream::FilmRecord final : public Record {
  public:
    FilmRecord(UnitStream& stream, FilmWriter& film, std::size_t track)
        : stream_(stream), film_(film), track_(track), raw_(film.track(track).raw()) {
        init();
        const MuxTrack& is = film.track(track);
        if (raw_ && !is.video()) {
            sample_ = static_cast<unsigned>(is.sampleBytes());
            block_ = static_cast<unsigned>(std::max(is.parameters().sample_rate / soundBlocks, 1)) * sample_;
            headerDue_ = film.hasSoundHeader();
        }
    }

    unsigned usable() override { return mostBytes - filled_; }
    unsigned char* request(unsigned n) override {
        if (film_.failed() || n > usable() || !reserve(n)) return nullptr;
        return buffer_->data + filled_;
    }
    unsigned confirm(unsigned n) override {
        n = buffer_ ? std::min(n, capacity_ - filled_) : 0;
        filled_ += n;
        if (headerDue_) dropHeader();
        return sample_ == 0 || filled_ < block_ || putSound() ? n : 0;
    }
    unsigned copybytes(unsigned char* p, unsigned n) override {
        unsigned char* const to = request(n);
        if (!to) {
            noteFailure();
            return 0;
        }
        std::memcpy(to, p, n);
        return confirm(n);
    }
    unsigned auxinfo(unsigned, unsigned id, void* info, unsigned size) override {
        bool ok = true;
        switch (id) {
            case QvAuxId::VIDEO_STREAM_INFO: ok = head<QvWire::VideoHead>(info, size); break;
            case QvAuxId::AUDIO_STREAM_INFO: ok = head<QvWire::AudioHead>(info, size); break;
            case QvAuxId::VIDEO_AU_CODE: ok = videoUnit(info, size); break;
            case QvAuxId::AUDIO_AU_CODE: ok = audioUnit(info, size); break;
            default: return 0;
        }
        if (!ok) noteFailure();
        // Encoders of raw data ask the stream for the reason only if it took the announcement.
        return ok || raw_ ? 0 : BUFSTREAM_FAILED;
    }

    bool finish() override {
        if (sample_ > 0) return putSound() && filled_ == 0;
        return filled_ == 0;
    }

  private:
    UnitStream& stream_;
    FilmWriter& film_;
    std::size_t track_;
    bool raw_;
    unsigned sample_ = 0;  // bytes of raw sound, all channels; 0 for all other streams
    unsigned block_ = 0;   // of it
    std::unique_ptr<AVBufferRef, FreeBuffer> buffer_;
    unsigned filled_ = 0, capacity_ = 0, lastUnit_ = 0;

    bool headerDue_ = false;

    // "LPCM" and two bytes of its form, which the encoder's parameters say, too.
    void dropHeader() {
        static constexpr char mark[] = {'L', 'P', 'C', 'M'};
        if (filled_ < headerBytes) return;
        headerDue_ = false;
        if (std::memcmp(buffer_->data, mark, sizeof mark) != 0) return;
        filled_ -= headerBytes;
        std::memmove(buffer_->data, buffer_->data + headerBytes, filled_);
    }

    bool isVideo() const { return film_.track(track_).video(); }

    bool reserve(unsigned n) {
        const unsigned needed = filled_ + n;
        if (buffer_ && needed <= capacity_) return true;
        const unsigned room = std::max({needed, firstBytes, std::min(filled_ * 2, mostBytes), lastUnit_});
        AVBufferRef* buffer = buffer_.release();
        const bool ok = av_buffer_realloc(&buffer, room + AV_INPUT_BUFFER_PADDING_SIZE) >= 0;
        buffer_.reset(buffer);
        if (ok) capacity_ = room;
        return ok || film_.fail("There is no memory for a unit");
    }

    // The first of the gathered bytes as a packet; the rest stays.
    PacketPtr cut(unsigned bytes) {
        PacketPtr unit(av_packet_alloc());
        if (!unit || (bytes > 0 && !buffer_)) return nullptr;
        const unsigned rest = filled_ - bytes;
        std::unique_ptr<AVBufferRef, FreeBuffer> old = std::move(buffer_);
        filled_ = 0;
        capacity_ = 0;
        if (rest > 0) {
            if (!reserve(rest)) return nullptr;
            std::memcpy(buffer_->data, old->data + bytes, rest);
            filled_ = rest;
        }
        if (old) {
            std::memset(old->data + bytes, 0, AV_INPUT_BUFFER_PADDING_SIZE);
            unit->data = old->data;
            unit->buf = old.release();
        }
        unit->size = static_cast<int>(bytes);
        lastUnit_ = bytes;
        return unit;
    }

    bool put(unsigned bytes, std::int64_t pts, std::int64_t dts, std::int64_t duration, bool key) {
        if (bytes != filled_ && sample_ == 0)
            return film_.fail(film_.track(track_).place() + ": a unit of " + std::to_string(bytes) +
                              " bytes was announced, and " + std::to_string(filled_) + " bytes had come");
        PacketPtr unit = cut(bytes);
        if (!unit) return film_.fail("There is no memory for a unit");
        unit->pts = pts;
        unit->dts = dts;
        unit->duration = duration;
        if (key) unit->flags |= AV_PKT_FLAG_KEY;
        return film_.unit(track_, std::move(unit));
    }

    bool putSound() {
        const unsigned samples = filled_ / sample_;
        if (samples == 0) return true;
        if (put(samples * sample_, AV_NOPTS_VALUE, AV_NOPTS_VALUE, samples, true)) return true;
        noteFailure();
        return false;
    }

    template <class Head>
    bool head(const void* info, unsigned size) {
        Head head{};
        constexpr bool video = std::is_same_v<Head, QvWire::VideoHead>;
        if (raw_ || video != isVideo() || !read(head, info, size))
            return film_.fail(film_.track(track_).place() + ": its head is none of this kind of stream");
        if (head.version != QvWire::version)
            return film_.fail(film_.track(track_).place() + ": its head has the version " +
                              std::to_string(head.version) + ", known is " + std::to_string(QvWire::version));
        return film_.head(track_, head);
    }

    bool videoUnit(const void* info, unsigned size) {
        QvWire::VideoUnit unit{};
        if (!isVideo() || !read(unit, info, size)) return film_.fail("A unit of video has no record");
        if (raw_) return picture();
        const bool timed = (unit.flags & QvWire::unitTimed) != 0;
        return put(unit.bytes, timed ? unit.pts : AV_NOPTS_VALUE, timed ? unit.dts : AV_NOPTS_VALUE,
                   std::max<std::int64_t>(unit.duration, 1), (unit.flags & QvWire::unitKey) != 0);
    }

    // The count of a raw picture may be that of the frame before it was packed.
    bool picture() {
        if (filled_ != film_.track(track_).pictureBytes())
            return film_.fail(film_.track(track_).place() + ": a picture has " + std::to_string(filled_) +
                              " bytes, not " + std::to_string(film_.track(track_).pictureBytes()));
        return put(filled_, AV_NOPTS_VALUE, AV_NOPTS_VALUE, 1, true);
    }

    bool audioUnit(const void* info, unsigned size) {
        QvWire::AudioUnit unit{};
        if (isVideo() || !read(unit, info, size)) return film_.fail("A unit of sound has no record");
        if (raw_) return putSound();
        const std::int64_t time = unit.timed() ? unit.pts : AV_NOPTS_VALUE;
        const std::uint32_t samples = unit.sampleCount();
        const int usual = film_.track(track_).frameSize();
        return put(unit.bytes, time, time, samples > 0 ? samples : usual, true);
    }

    // Whoever writes reads the reason from the stream.
    void noteFailure() {
        if (const int error = film_.outputError()) return stream_.failure()->take(error, film_.problem());
        const Any name = stream_.getParam("outfilename");
        static_cast<Multiplexer*>(stream_.owner())->refuse(film_.problem());
        stream_.failure()->note(EINVAL, film_.problem().c_str(),
                                name.isText() ? qv_wide_name(qv_os_name(name)) : QvWideString());
    }
};

// Bytes go to the log before there are more than a chunk of them, so that its memory is bounded.
class UnitStream::LogRecord final : public Record {
  public:
    LogRecord(UnitStream& stream, UnitLog& log, int type, int number) : stream_(stream), log_(log) {
        init();
        entry_.type = type;
        entry_.number = number;
    }

    unsigned usable() override { return chunkBytes; }
    unsigned char* request(unsigned n) override {
        if (n > chunkBytes || !log_.problem().empty()) return nullptr;
        if (filled_ + n > chunkBytes && !put(0)) return nullptr;
        entry_.bytes.resize(filled_ + n);
        return entry_.bytes.data() + filled_;
    }
    unsigned confirm(unsigned n) override {
        n = std::min(n, static_cast<unsigned>(entry_.bytes.size()) - filled_);
        filled_ += n;
        return n;
    }
    unsigned copybytes(unsigned char* p, unsigned n) override {
        for (unsigned copied = 0; copied < n;) {
            const unsigned now = std::min(n - copied, chunkBytes);
            unsigned char* const to = request(now);
            if (!to) return copied;
            std::memcpy(to, p + copied, now);
            copied += confirm(now);
        }
        return n;
    }
    unsigned auxinfo(unsigned, unsigned id, void* info, unsigned size) override {
        switch (id) {
            case QvAuxId::VIDEO_STREAM_INFO: return head<QvWire::VideoHead>(id, info, size);
            case QvAuxId::AUDIO_STREAM_INFO: return head<QvWire::AudioHead>(id, info, size);
            case QvAuxId::VIDEO_AU_CODE:
            case QvAuxId::AUDIO_AU_CODE: {
                const auto* const from = static_cast<const std::uint8_t*>(info);
                entry_.info.assign(from, from ? from + size : from);
                return put(id) ? 0 : BUFSTREAM_FAILED;
            }
            default: return 0;
        }
    }

    bool finish() override { return filled_ == 0 || put(0); }

  private:
    UnitStream& stream_;
    UnitLog& log_;
    UnitLogEntry entry_;
    unsigned filled_ = 0;

    bool put(unsigned id) {
        entry_.id = id;
        entry_.bytes.resize(filled_);
        const bool ok = log_.add(entry_);
        entry_.info.clear();
        filled_ = 0;
        if (!ok) stream_.failure()->take(log_.error(), log_.problem());
        return ok;
    }

    // Its own data take the place of the unit's bytes, as the address says nothing in another process.
    template <class Head>
    unsigned head(unsigned id, const void* info, unsigned size) {
        Head head{};
        if ((filled_ > 0 && !put(0)) || !read(head, info, size)) return BUFSTREAM_FAILED;
        const auto* const own = static_cast<const std::uint8_t*>(head.extradata);
        if (own) entry_.bytes.assign(own, own + head.extradataBytes);
        filled_ = static_cast<unsigned>(own ? head.extradataBytes : 0);
        head.extradata = nullptr;
        const auto* const from = reinterpret_cast<const std::uint8_t*>(&head);
        entry_.info.assign(from, from + sizeof head);
        return put(id) ? 0 : BUFSTREAM_FAILED;
    }
};

UnitStream::UnitStream(QvCodec* owner) : QvBufStream(owner) { setParam("writeThrough", 1); }

UnitStream::~UnitStream() = default;

bufstream* UnitStream::input() { return record_ ? record_->record() : nullptr; }

int UnitStream::begin(FilmWriter& film, std::size_t track) {
    return begin(std::make_unique<FilmRecord>(*this, film, track));
}

int UnitStream::begin(UnitLog& log, int type, int number) {
    return begin(std::make_unique<LogRecord>(*this, log, type, number));
}

int UnitStream::begin(std::unique_ptr<Record> record) {
    if (const int result = QvBufStream::init(params())) return result;
    record_ = std::move(record);
    setInited(true);
    return QvStatus::ok;
}

bool UnitStream::finish() { return !record_ || record_->finish(); }

void UnitStream::destroy(int) {
    record_.reset();
    setInited(false);
}

}  // namespace av
