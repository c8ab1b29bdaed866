#include "plugins/av/mux/filefeed.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <utility>
#include <vector>

#include "core/arch/qvcancel.h"
#include "core/encode/qvfilemux.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/stream/qvbufstrm.h"
#include "core/stream/qvbytesource.h"
#include "plugins/av/mux/containers.h"
#include "plugins/av/mux/picturetiming.h"
#include "plugins/av/mux/unitlog.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/mediainput.h"
#include "plugins/wire.h"

namespace av {

namespace {

constexpr int soundBlocks = 25;  // of raw sound a second

// What the multiplexer asks of the encoder of raw data.
class FileStream : public QvEncoder {
  public:
    FileStream(const QvModule* module, const QvFileMuxStream& stream) : QvEncoder(module), stream_(stream) {
        init();
    }
    using QvCodec::getParam;
    int setParam(const char* name, const Any& value) override { return QvCodec::setParam(name, value); }
    void getParam(const char* name, Any& value) const override {
        const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
        if (stream_.params.isSet(name))
            value = stream_.params.get(name);
        else if (is("framerate"))
            value = stream_.framerate;
        else if (is("samplerate"))
            value = stream_.samplerate;
        else if (is("channels"))
            value = stream_.channels;
        else if (is("bitsPerSample"))
            value = stream_.bitsPerSample;
        else
            QvCodec::getParam(name, value);
    }
    int open() override { return QvStatus::ok; }
    int close() override { return QvStatus::ok; }
    void* getInterface(int) const override { return nullptr; }

  private:
    const QvFileMuxStream& stream_;
};

class Feed {
  public:
    // `number`: of the stream within its type.
    Feed(const QvFileMuxStream& stream, int number, const QvModule* module)
        : stream_(stream), number_(number), encoder_(module, stream) {}
    Feed(const Feed&) = delete;
    Feed& operator=(const Feed&) = delete;
    ~Feed() {
        if (to_) to_->setAtachee(nullptr);
    }

    // All: "" or why it failed.
    std::string join(QvMuxer& muxer);
    std::string begin();
    std::string step();

    bool done() const { return done_; }
    double seconds() const { return static_cast<double>(next_) / perSecond_; }
    double part() const { return bytes_ > 0 ? static_cast<double>(read_) / static_cast<double>(bytes_) : 1; }

  private:
    const QvFileMuxStream& stream_;
    const int number_;
    FileStream encoder_;
    QvBufStream* to_ = nullptr;
    std::unique_ptr<MediaInput> input_;     // of coded data
    std::unique_ptr<QvByteSource> source_;  // of raw data
    PacketPtr packet_{av_packet_alloc()};
    ShownOrder order_;
    std::vector<unsigned char> block_;
    long long whole_ = 0;  // bytes of a raw picture or sample
    long long next_ = 0;   // time of the next unit: pictures or samples
    std::size_t unit_ = 0;
    double perSecond_ = 1;
    long long bytes_ = 0, read_ = 0;
    bool done_ = false;
    UnitLogReader log_;  // of recorded units
    UnitLogEntry entry_;
    std::size_t file_ = 0;              // of them
    long long start_ = 0, frames_ = 0;  // pictures in front of that file and in it, as far as it was read
    long long leftOut_ = 0;             // units at its beginning, still to come
    std::vector<UnitLogEntry> heads_;   // of the first file
    std::size_t head_ = 0;              // of this one

    bool video() const { return stream_.type == qvVideoStream; }
    const AVStream& stream() const { return *input_->context().streams[0]; }
    std::string send(unsigned id, void* record, unsigned size);
    std::string put(const unsigned char* data, std::size_t bytes);
    std::string stepRaw();
    std::string openLog();
    std::string stepRecorded();
    std::string sendHead();
    std::string sendUnit();
    std::string sendVideo();
    std::string sendSound();
};

std::string Feed::join(QvMuxer& muxer) {
    if (!packet_) return "there is no memory for it";
    std::string problem;
    whole_ = stream_.wholeBytes(problem);
    if (!problem.empty()) return problem;
    if (stream_.recorded && !(problem = openLog()).empty()) return problem;
    perSecond_ = video() ? stream_.framerate.rate().ratio() : std::max(stream_.samplerate, 1);
    bytes_ = stream_.length();
    if (!stream_.recorded && whole_ > 0)
        source_ = stream_.parts.empty() ? qvFileSource(stream_.file, 1) : qvFilePartsSource(stream_.parts, 1);
    if (bytes_ < 1 || (!stream_.recorded && whole_ > 0 && !source_)) return "it can't be opened, or is empty";
    if (!stream_.recorded && whole_ == 0) {
        input_ = MediaInput::open(MediaBytes(stream_.file), "", problem);
        if (!input_) return problem;
        const AVMediaType type = stream().codecpar->codec_type;
        if (input_->context().nb_streams != 1 || type != (video() ? AVMEDIA_TYPE_VIDEO : AVMEDIA_TYPE_AUDIO))
            return "it is no elementary stream of this type";
        if (video() && !shownOrder(*input_, 0, order_, problem)) return problem;
        if (!video()) perSecond_ = std::max(stream().codecpar->sample_rate, 1);
    }
    AnyDict params = stream_.params;
    params.set("codec", stream_.codec);
    to_ = muxer.addStream(stream_.type, params);
    if (!to_) return std::string(muxer.name()) + " takes no further stream of this type";
    to_->setAtachee(&encoder_);
    return "";
}

std::string Feed::send(unsigned id, void* record, unsigned size) {
    bufstream* const out = to_->input();
    if (out && out->auxinfo(out, 0, id, record, size) == 0 && to_->ioError() == 0) return "";
    return to_->ioErrorText().empty() ? "the output did not take it" : to_->ioErrorText();
}

std::string Feed::begin() {
    if (whole_ > 0 || stream_.recorded) return "";
    const AVCodecParameters& is = *stream().codecpar;
    const std::uint32_t fourcc = muxFourcc(is.codec_id);
    if (video()) {
        const QvRatio rate = stream_.framerate.rate();
        QvWire::VideoHead head{};
        head.size = sizeof head;
        head.version = QvWire::version;
        head.codec = fourcc;
        head.fieldOrder = is.field_order == AV_FIELD_TT   ? QvWire::FieldOrder::topFirst
                          : is.field_order == AV_FIELD_BB ? QvWire::FieldOrder::bottomFirst
                                                          : QvWire::FieldOrder::progressive;
        head.rateNum = static_cast<std::int32_t>(rate.num);
        head.rateDen = static_cast<std::int32_t>(rate.den);
        head.width = is.width;
        head.height = is.height;
        head.aspectNum = is.sample_aspect_ratio.num;
        head.aspectDen = is.sample_aspect_ratio.den;
        head.primaries = static_cast<std::uint16_t>(is.color_primaries);
        head.transfer = static_cast<std::uint16_t>(is.color_trc);
        head.matrix = static_cast<std::uint16_t>(is.color_space);
        head.fullRange = is.color_range == AVCOL_RANGE_JPEG;
        head.delay = order_.delay;
        head.profile = is.profile;
        head.level = is.level;
        return send(QvAuxId::VIDEO_STREAM_INFO, &head, sizeof head);
    }
    QvWire::AudioHead head{};
    head.size = sizeof head;
    head.version = QvWire::version;
    head.codec = fourcc;
    head.rate = is.sample_rate;
    head.channels = is.ch_layout.nb_channels;
    head.bits = is.bits_per_raw_sample;
    head.frameSize = is.frame_size;
    head.bitrate = static_cast<std::int32_t>(std::clamp<std::int64_t>(is.bit_rate, 0, INT32_MAX));
    head.profile = -1;
    if (is.codec_id == AV_CODEC_ID_FLAC) {
        head.extradata = is.extradata;
        head.extradataBytes = static_cast<std::uint64_t>(is.extradata_size);
    }
    return send(QvAuxId::AUDIO_STREAM_INFO, &head, sizeof head);
}

std::string Feed::put(const unsigned char* data, std::size_t bytes) {
    bufstream* const out = to_->input();
    if (out && out->copybytes(out, const_cast<unsigned char*>(data), static_cast<unsigned>(bytes)) == bytes)
        return "";
    return to_->ioErrorText().empty() ? "the output did not take it" : to_->ioErrorText();
}

std::string Feed::step() {
    if (stream_.recorded) return stepRecorded();
    if (whole_ > 0) return stepRaw();
    const MediaInput::Read read = input_->read(*packet_);
    if (read == MediaInput::Read::failed) return input_->failure();
    done_ = read == MediaInput::Read::end;
    if (done_) return "";
    read_ += packet_->size;
    std::string why = put(packet_->data, static_cast<std::size_t>(packet_->size));
    if (why.empty()) why = video() ? sendVideo() : sendSound();
    av_packet_unref(packet_.get());
    return why;
}

std::string Feed::sendVideo() {
    if (unit_ >= order_.places.size()) return "it has changed meanwhile";
    QvWire::VideoUnit unit{};
    unit.bytes = static_cast<std::uint32_t>(packet_->size);
    unit.flags = QvWire::unitTimed | (packet_->flags & AV_PKT_FLAG_KEY ? QvWire::unitKey : 0);
    unit.pts = order_.places[unit_];
    unit.dts = static_cast<std::int64_t>(unit_) - order_.delay;
    unit.duration = 1;
    next_ = static_cast<long long>(++unit_);
    return send(QvAuxId::VIDEO_AU_CODE, &unit, sizeof unit);
}

std::string Feed::sendSound() {
    AVCodecParameters& is = *input_->context().streams[0]->codecpar;
    long long samples = av_get_audio_frame_duration2(&is, packet_->size);
    if (samples <= 0) samples = av_rescale_q(packet_->duration, stream().time_base, {1, is.sample_rate});
    QvWire::AudioUnit unit{
        static_cast<std::uint32_t>(packet_->size),
        static_cast<std::uint32_t>(std::clamp<long long>(samples, 1, 1 << 24)) | QvWire::unitTimed, next_};
    next_ += unit.sampleCount();
    return send(QvAuxId::AUDIO_AU_CODE, &unit, sizeof unit);
}

std::string Feed::stepRaw() {
    const long long units = video() ? 1 : std::max(stream_.samplerate / soundBlocks, 1);
    const long long bytes = std::min(units * whole_, bytes_ - read_);
    block_.resize(static_cast<std::size_t>(bytes));
    if (source_->read(block_.data(), block_.size()) != block_.size())
        return source_->problem().empty() ? "it could not be read to its end" : source_->problem();
    if (std::string why = put(block_.data(), block_.size()); !why.empty()) return why;
    read_ += bytes;
    next_ += bytes / whole_;
    done_ = read_ >= bytes_;
    if (!video()) return "";
    QvWire::VideoUnit unit{};
    unit.bytes = static_cast<std::uint32_t>(bytes);
    return send(QvAuxId::VIDEO_AU_CODE, &unit, sizeof unit);
}

// --- Recorded units.

std::string Feed::openLog() {
    head_ = 0;
    leftOut_ = stream_.parts.empty() ? 0 : stream_.parts[file_].first;
    start_ += std::exchange(frames_, leftOut_) - leftOut_;
    return log_.open(stream_.parts.empty() ? stream_.file : stream_.parts[file_].file);
}

std::string Feed::stepRecorded() {
    switch (log_.next(stream_.type, number_, entry_)) {
        case UnitLogReader::Read::failed: return "part " + std::to_string(file_ + 1) + ": " + log_.problem();
        case UnitLogReader::Read::end:
            done_ = ++file_ >= std::max<std::size_t>(stream_.parts.size(), 1);
            return done_ ? "" : openLog();
        default: break;
    }
    read_ += static_cast<long long>(entry_.bytes.size());
    if (entry_.id == QvAuxId::VIDEO_STREAM_INFO || entry_.id == QvAuxId::AUDIO_STREAM_INFO) return sendHead();
    if (leftOut_ > 0) {
        if (entry_.id != 0) --leftOut_;
        return "";
    }
    if (std::string why = put(entry_.bytes.data(), entry_.bytes.size()); !why.empty()) return why;
    if (whole_ > 0 && !video()) next_ += static_cast<long long>(entry_.bytes.size()) / whole_;
    return entry_.id == 0 ? "" : sendUnit();
}

// The parts have one head, or they are no parts of one stream.
std::string Feed::sendHead() {
    if (file_ > 0) {
        const UnitLogEntry* const first = head_ < heads_.size() ? &heads_[head_++] : nullptr;
        if (first && *first == entry_) return "";
        return "part " + std::to_string(file_ + 1) + " is coded in another way than the first";
    }
    heads_.push_back(entry_);
    const auto known = [&](auto head) {
        if (entry_.info.size() != sizeof head) return std::string("its head is none of this version");
        std::memcpy(&head, entry_.info.data(), sizeof head);
        head.extradata = entry_.bytes.data();
        head.extradataBytes = entry_.bytes.size();
        return send(entry_.id, &head, sizeof head);
    };
    return entry_.id == QvAuxId::VIDEO_STREAM_INFO ? known(QvWire::VideoHead{}) : known(QvWire::AudioHead{});
}

std::string Feed::sendUnit() {
    QvWire::VideoUnit unit{};
    if (!video()) {
        QvWire::AudioUnit sound{};
        if (entry_.info.size() == sizeof sound) {
            std::memcpy(&sound, entry_.info.data(), sizeof sound);
            next_ += sound.sampleCount();
        }
    } else if (entry_.info.size() == sizeof unit) {
        std::memcpy(&unit, entry_.info.data(), sizeof unit);
        const bool timed = (unit.flags & QvWire::unitTimed) != 0;
        constexpr std::int64_t far = std::int64_t{1} << 40;
        if (unit.pts < -far || unit.pts > far || unit.dts < -far || unit.dts > far)
            return "part " + std::to_string(file_ + 1) + " has an impossible time";
        const std::int64_t shown = std::max<std::int64_t>(unit.duration, 1);
        frames_ = timed ? std::max<long long>(frames_, unit.pts + shown) : frames_ + shown;
        if (timed) {
            unit.pts += start_;
            unit.dts += start_;
        }
        std::memcpy(entry_.info.data(), &unit, sizeof unit);
        ++next_;
    } else {
        ++frames_;
        ++next_;
    }
    return send(entry_.id, entry_.info.data(), static_cast<unsigned>(entry_.info.size()));
}

// The stream that is farthest behind is next.
int feedAll(std::vector<std::unique_ptr<Feed>>& feeds, QvFileMuxConfig& config, std::string& error) {
    for (;;) {
        std::size_t next = feeds.size();
        double part = 0;
        for (std::size_t i = 0; i < feeds.size(); ++i) {
            part += std::min(feeds[i]->part(), 1.0) / static_cast<double>(feeds.size());
            if (!feeds[i]->done() && (next == feeds.size() || feeds[i]->seconds() < feeds[next]->seconds()))
                next = i;
        }
        if (config.stopped() || (config.watch && !config.watch(part))) return QvFileMux::cancelled;
        if (next == feeds.size()) return QvStatus::ok;
        if (const std::string why = feeds[next]->step(); !why.empty()) {
            error = config.place(next) + ": " + why;
            return QvStatus::failed;
        }
    }
}

int run(QvMuxer& muxer, std::vector<std::unique_ptr<Feed>>& feeds, QvFileMuxConfig& config,
        std::string& error) {
    const auto fail = [&](std::size_t at, const std::string& why) {
        error = config.place(at) + ": " + why;
        return QvStatus::failed;
    };
    int numbers[] = {0, 0};  // of pictures and sounds
    for (std::size_t i = 0; i < config.streams.size(); ++i) {
        const QvFileMuxStream& stream = config.streams[i];
        const Any codec = stream.codec.toString();
        int& number = numbers[stream.type == qvVideoStream ? 0 : 1];
        feeds.push_back(std::make_unique<Feed>(stream, number++, qv_registry()->module(codec.asString(""))));
        if (const std::string why = feeds[i]->join(muxer); !why.empty()) return fail(i, why);
    }
    int result = muxer.open();
    for (std::size_t i = 0; result == QvStatus::ok && i < feeds.size(); ++i)
        if (const std::string why = feeds[i]->begin(); !why.empty()) return fail(i, why);
    if (result == QvStatus::ok) result = feedAll(feeds, config, error);
    if (result == QvStatus::ok) result = muxer.close();
    if (result < 0 && error.empty()) error = muxer.errorDesc();
    return result;
}

}  // namespace

int muxFiles(QvMuxer& muxer, QvFileMuxConfig& config, QvBufStream& output, std::string& error) {
    if (config.streams.empty() || muxer.nrStreams(0) != 0) {
        error = config.streams.empty() ? "There is no stream to multiplex"
                                       : "The multiplexer has streams already";
        return config.streams.empty() ? QvStatus::invalidArgument : QvStatus::illegalState;
    }
    const bool mine = output.atachee() != &muxer;
    if (mine && muxer.attachOutStream(&output) != QvStatus::ok) {
        error = "The output can't be attached";
        return QvStatus::failed;
    }
    std::vector<std::unique_ptr<Feed>> feeds;
    const int result = run(muxer, feeds, config, error);
    if (result != QvStatus::ok) muxer.abort();
    feeds.clear();
    muxer.removeStreams(qvAllStreams);
    if (mine) muxer.detachOutStream();
    return result;
}

}  // namespace av
