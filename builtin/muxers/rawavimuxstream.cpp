#include "builtin/muxers/rawavimuxstream.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include "builtin/shared/rawoutput.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"
#include "core/measure/exactmath_p.h"
#include "core/stream/buf_impl_base.h"
#include "core/stream/iofailure.h"

// --- Interleaver.

bool AviInterleaver::open(QvBufStream& output, std::vector<Source> sources, const AviFile::Limits& limits) {
    feeds_.clear();
    std::vector<AviTrack> tracks;
    for (auto& source : sources) {
        Feed feed{std::move(source.picture)};
        if (!source.track.video) {
            feed.capacity = std::max(source.track.rate / 2, 1u) * size_t{source.track.unitBytes};
            feed.held.reserve(feed.capacity);
        }
        feeds_.push_back(std::move(feed));
        tracks.push_back(std::move(source.track));
    }
    const auto& name = output.getParam("outfilename");
    name_ = name.isText() ? qv_wide_name(qv_os_name(name)) : QvWideString();
    return file_.open(output, std::move(tracks), limits);
}

bool AviInterleaver::picture(size_t track, const unsigned char* frame) {
    const std::lock_guard lock(lock_);
    auto& picture = feeds_[track].picture;
    return writeDueSound() && file_.beginChunk(track, static_cast<uint32_t>(picture.fileBytes()), 1) &&
           picture.write(
               frame, [this](const unsigned char* data, size_t bytes) { return file_.put(data, bytes); }) &&
           file_.endChunk();
}

bool AviInterleaver::sound(size_t track, const unsigned char* data, size_t bytes) {
    const std::lock_guard lock(lock_);
    auto& feed = feeds_[track];
    while (bytes > 0) {
        const size_t now = std::min(bytes, feed.capacity - feed.held.size());
        feed.held.insert(feed.held.end(), data, data + now);
        data += now;
        bytes -= now;
        if (feed.held.size() == feed.capacity && !writeSound(track, std::numeric_limits<int64_t>::max()))
            return false;
    }
    return file_.errorCode() == 0;
}

bool AviInterleaver::writeSound(size_t track, int64_t samples) {
    auto& held = feeds_[track].held;
    const int64_t unit = file_.track(track).unitBytes;
    samples = std::min(samples, static_cast<int64_t>(held.size()) / unit);
    if (samples <= 0) return true;
    const auto bytes = static_cast<size_t>(samples * unit);
    if (!file_.beginChunk(track, static_cast<uint32_t>(bytes), samples) || !file_.put(held.data(), bytes) ||
        !file_.endChunk())
        return false;
    held.erase(held.begin(), held.begin() + static_cast<std::ptrdiff_t>(bytes));
    return true;
}

// All sound before the time up to which every picture is written, in the whole samples in which a job makes
// it: so a file is the same whether its sound comes frame by frame or all at once.
bool AviInterleaver::writeDueSound() {
    for (size_t i = 0; i < feeds_.size(); ++i) {
        const auto& sound = file_.track(i);
        if (sound.video) continue;
        int64_t due = std::numeric_limits<int64_t>::max();
        for (size_t v = 0; v < feeds_.size(); ++v) {
            const auto& video = file_.track(v);
            if (!video.video) continue;
            due = std::min<int64_t>(due, qvmath::mulDiv(video.units, sound.rate, video.scale, video.rate));
        }
        if (!writeSound(i, due - sound.units)) return false;
    }
    return true;
}

bool AviInterleaver::close() {
    const std::lock_guard lock(lock_);
    for (size_t i = 0; i < feeds_.size(); ++i)
        if (!file_.track(i).video && !writeSound(i, std::numeric_limits<int64_t>::max())) return false;
    return file_.close();
}

bool AviInterleaver::tell(QvIoFailure& failure) {
    const std::lock_guard lock(lock_);
    if (file_.errorCode() == 0) return false;
    failure.note(file_.errorCode(), file_.problem(), name_);
    return true;
}

// --- Streams.

class AviStream::Record final : public Bufstream {
  public:
    Record(AviStream& stream, AviInterleaver& to, size_t track, bool video)
        : stream_(stream),
          to_(to),
          track_(track),
          video_(video),
          unit_(video ? to.frameBytes(track) : to.soundBytes(track)) {
        init();
    }

    unsigned usable() override { return static_cast<unsigned>(unit_ - filled_); }
    unsigned chunksize() override { return static_cast<unsigned>(unit_); }
    unsigned char* request(unsigned n) override {
        if (n > usable()) return nullptr;
        block_.resize(unit_);
        return block_.data() + filled_;
    }
    unsigned confirm(unsigned n) override {
        n = std::min(n, usable());
        if (!video_) {
            write(block_.data(), n);
            return n;
        }
        filled_ += n;
        if (filled_ == unit_) {
            filled_ = 0;
            write(block_.data(), unit_);
        }
        return n;
    }
    unsigned copybytes(unsigned char* p, unsigned n) override {
        if (!video_) return write(p, n) ? n : 0;
        for (unsigned left = n; left > 0;) {
            const unsigned now = std::min(left, usable());
            if (now == unit_) {
                if (!write(p, now)) return 0;
            } else {
                std::memcpy(request(now), p, now);
                confirm(now);
                if (stream_.ioError() != 0) return 0;
            }
            p += now;
            left -= now;
        }
        return n;
    }
    unsigned auxinfo(unsigned, unsigned id, void*, unsigned) override {
        return id == QvAuxId::VIDEO_AU_CODE && filled_ != 0 ? BUFSTREAM_FAILED : 0;
    }
    unsigned split() override { return BUFSTREAM_FAILED; }
    void done(int) override {}
    void free() override {}
    bool holdsPart() const { return filled_ != 0; }

  private:
    bool write(const unsigned char* data, size_t bytes) {
        if (video_ ? to_.picture(track_, data) : to_.sound(track_, data, bytes)) return true;
        to_.tell(*stream_.failure());
        return false;
    }

    AviStream& stream_;
    AviInterleaver& to_;
    size_t track_;
    bool video_;
    size_t unit_;  // a picture as it comes; the most sound that is asked for at once
    std::vector<unsigned char> block_;
    size_t filled_ = 0;
};

AviStream::AviStream(QvCodec* owner) : QvBufStream(owner) { setParam(rawWriteThrough, 1); }

AviStream::~AviStream() = default;

bufstream* AviStream::input() { return record_ ? record_->record() : nullptr; }

bool AviStream::holdsPart() const { return record_ && record_->holdsPart(); }

int AviStream::begin(AviInterleaver& to, size_t track, bool video) {
    if (const int result = QvBufStream::init(params())) return result;
    record_ = std::make_unique<Record>(*this, to, track, video);
    setInited(true);
    return QvStatus::ok;
}

void AviStream::destroy(int) {
    record_.reset();
    setInited(false);
}
