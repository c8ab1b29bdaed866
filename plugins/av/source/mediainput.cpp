#include "plugins/av/source/mediainput.h"

#include <algorithm>
#include <array>
#include <climits>
#include <cstring>
#include <utility>

#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/boxes.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

constexpr int bufferBytes = 64 * 1024;

// The library's names of the containers that are allowed. Those that refer to other files (playlists,
// concatenations) are not.
constexpr const char* containers =
    "mov,mp4,matroska,webm,avi,mxf,mpegts,mpeg,mpegvideo,dv,gxf,ogg,flv,yuv4mpegpipe,asf,nut,ivf,wtv,"
    "h264,hevc,m4v,mjpeg,obu,vc1,"
    "mp3,aac,flac,ac3,eac3,aiff,caf,w64,wav,au,amr,wv,tta,dts,truehd,ape,"
    "png_pipe,jpeg_pipe,tiff_pipe,dpx_pipe,exr_pipe";

// One reader of a shared source, with a position of its own.
class SharedReader : public QvByteSource {
  public:
    explicit SharedReader(QvByteSource& source) : source_(source) {}

  protected:
    long long readSome(void* to, std::size_t count) override {
        if (source_.position() != at_ && !source_.seek(at_)) return fail();
        const std::size_t got = source_.read(to, count);
        at_ += static_cast<long long>(got);
        if (got == 0 && source_.failed()) return fail();
        return static_cast<long long>(got);
    }
    bool canMove() const override { return source_.seekable(); }
    bool moveTo(long long position) override {
        at_ = position;
        return source_.seekable();
    }
    long long length() override { return source_.size(); }

  private:
    QvByteSource& source_;
    long long at_ = 0;

    long long fail() {
        problem_ = source_.problem();
        setReason(problem_.c_str());
        return -1;
    }
    std::string problem_;
};

std::string lower(std::string text) {
    for (char& c : text)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return text;
}

// The library's reason as a part of a sentence.
std::string reasonOf(int code) {
    if (code == AVERROR_INVALIDDATA) return "it is damaged, or not of a kind that is known";
    if (code == AVERROR_EOF) return "it ends before its first stream";
    if (code == AVERROR(ENOMEM)) return "out of memory";
    return lower(errorText(code));
}

// What the library reads from. See MediaInput::leaveBytes: then reads return at once, with undefined bytes.
struct Bytes {
    std::unique_ptr<QvByteSource> source;
    long long left = -1;  // the position while no bytes are read; -1: bytes are read
};

int readBytes(void* opaque, std::uint8_t* to, int count) {
    auto& bytes = *static_cast<Bytes*>(opaque);
    QvByteSource& source = *bytes.source;
    if (bytes.left >= 0) {
        const long long there = std::min<long long>(count, source.size() - bytes.left);
        if (there <= 0) return AVERROR_EOF;
        bytes.left += there;
        return static_cast<int>(there);
    }
    const std::size_t got = source.read(to, static_cast<std::size_t>(count));
    if (got > 0) return static_cast<int>(got);
    return source.failed() ? AVERROR(EIO) : AVERROR_EOF;
}

std::int64_t seekBytes(void* opaque, std::int64_t offset, int whence) {
    auto& bytes = *static_cast<Bytes*>(opaque);
    QvByteSource& source = *bytes.source;
    const long long size = source.size();
    const bool known = size != QvByteSource::unknown;
    long long from = 0;
    switch (whence & ~AVSEEK_FORCE) {
        case AVSEEK_SIZE: return known ? size : AVERROR(ENOSYS);
        case SEEK_SET: break;
        case SEEK_CUR: from = bytes.left >= 0 ? bytes.left : source.position(); break;
        case SEEK_END:
            if (!known) return AVERROR(ENOSYS);
            from = size;
            break;
        default: return AVERROR(EINVAL);
    }
    if (offset > INT64_MAX - from) return AVERROR(EINVAL);
    offset += from;
    if (offset < 0) return AVERROR(EINVAL);
    if (bytes.left >= 0) return bytes.left = offset;
    return source.seek(offset) ? offset : AVERROR(EIO);
}

int openNothing(AVFormatContext*, AVIOContext**, const char*, int, AVDictionary**) { return AVERROR(EACCES); }

// Whether the packet is the one of the key.
bool same(const PacketKey& key, const AVPacket& packet, bool byPosition) {
    const bool placed = key.position >= 0 && packet.pos >= 0;
    if (placed && key.position != packet.pos) return false;
    if (placed && byPosition) return true;
    // Packets with the same position have different times. Decoding times count where the index has no
    // others.
    if (key.pts != AV_NOPTS_VALUE) return key.pts == packet.pts;
    if (key.dts != AV_NOPTS_VALUE) return packet.pts == AV_NOPTS_VALUE && key.dts == packet.dts;
    return placed;
}

// Whether the packet comes after the one of the key, in its stream.
bool after(const PacketKey& key, const AVPacket& packet) {
    if (key.dts != AV_NOPTS_VALUE && packet.dts != AV_NOPTS_VALUE) return packet.dts > key.dts;
    return key.position >= 0 && packet.pos > key.position;
}

// An elementary stream without a container. Its packets are identified by their positions, as their times
// depend on where reading started.
bool isBare(const AVFormatContext& context) {
    return context.nb_streams == 1 && (context.iformat->flags & AVFMT_GENERIC_INDEX) &&
           !(context.iformat->flags & AVFMT_NO_BYTE_SEEK) && lower(context.iformat->name) != "ogg";
}

bool isEncrypted(const AVStream& stream) {
    const unsigned tag = stream.codecpar->codec_tag;
    return tag == MKTAG('e', 'n', 'c', 'v') || tag == MKTAG('e', 'n', 'c', 'a') ||
           av_stream_get_side_data(&stream, AV_PKT_DATA_ENCRYPTION_INIT_INFO, nullptr);
}

// Codecs whose packets the library can describe without their bytes. Captions and DV with sound are not among
// them: the demultiplexer splits their packets.
bool isKnownByTable(const AVCodecParameters& codec) {
    if (codec.codec_tag == MKTAG('v', 'd', 'v', 'a') || codec.codec_tag == MKTAG('d', 'v', 'c', 'a'))
        return false;
    switch (codec.codec_id) {
        case AV_CODEC_ID_EIA_608: return false;
        case AV_CODEC_ID_H264:
        case AV_CODEC_ID_HEVC:
        case AV_CODEC_ID_MPEG4:
        case AV_CODEC_ID_PRORES:
        case AV_CODEC_ID_DNXHD:
        case AV_CODEC_ID_MJPEG:
        case AV_CODEC_ID_DVVIDEO:
        case AV_CODEC_ID_JPEG2000:
        case AV_CODEC_ID_RAWVIDEO:
        case AV_CODEC_ID_AAC: return true;
        default: break;
    }
    if (codec.codec_type != AVMEDIA_TYPE_AUDIO) return codec.codec_type != AVMEDIA_TYPE_VIDEO;
    return codec.codec_id >= AV_CODEC_ID_FIRST_AUDIO && codec.codec_id < AV_CODEC_ID_ADPCM_IMA_QT;
}

bool isPicture(const std::string& name) {
    return av_match_ext(name.c_str(), "png,jpg,jpeg,tif,tiff,dpx,exr") != 0;
}

// Program and transport streams, whose bytes a parser divides into packets.
bool isCutByParser(const AVFormatContext& context) {
    const std::string name = context.iformat->name;
    return name == "mpeg" || name == "mpegts";
}

std::string unfit(const AVFormatContext& context) {
    if (context.nb_streams == 0) return "it has no stream";
    bool media = false;
    for (unsigned i = 0; i < context.nb_streams; ++i) {
        const AVCodecParameters& codec = *context.streams[i]->codecpar;
        if (codec.width > limits::side || codec.height > limits::side ||
            std::int64_t{codec.width} * codec.height > limits::pixels)
            return "its pictures are larger than " + std::to_string(limits::side) + " pixels";
        if (isEncrypted(*context.streams[i])) return "it is encrypted";
        media = media || codec.codec_type == AVMEDIA_TYPE_VIDEO || codec.codec_type == AVMEDIA_TYPE_AUDIO ||
                codec.codec_type == AVMEDIA_TYPE_SUBTITLE;
    }
    return media ? "" : "it has neither pictures nor sound";
}

}  // namespace

MediaBytes::MediaBytes(const Any& filename) : name_(filename) {}
MediaBytes::MediaBytes(QvByteSource& source, const Any& name) : name_(name), source_(&source) {}

std::unique_ptr<QvByteSource> MediaBytes::open(std::string& reason) const {
    if (source_) return std::make_unique<SharedReader>(*source_);
    auto file = qvFileSource(name_, 1);  // the demultiplexer has a buffer
    if (!file) reason = "it can't be opened";
    return file;
}

bool MediaBytes::seekable() const {
    if (source_) return source_->seekable();
    const auto file = qvFileSource(name_, 1);
    return file && file->seekable();
}

struct MediaInput::State {
    Bytes bytes;
    AVIOContext* io = nullptr;
    AVFormatContext* context = nullptr;
    PacketPtr found;  // of a seek: what the next read delivers
    bool hasFound = false;

    ~State() {
        avformat_close_input(&context);
        if (io) av_freep(&io->buffer);
        avio_context_free(&io);
    }
    int open(const MediaBytes& from, const std::string& format);
    void takeBytes();
};

// Continues with real bytes; those that the library has buffered are not from the file.
void MediaInput::State::takeBytes() {
    if (bytes.left < 0) return;
    bytes.source->seek(bytes.left);
    bytes.left = -1;
    io->buf_ptr = io->buf_end = io->buffer;
    io->eof_reached = 0;
    context->flags &= ~AVFMT_FLAG_NOPARSE;
}

int MediaInput::State::open(const MediaBytes& from, const std::string& format) {
    auto* buffer = static_cast<unsigned char*>(av_malloc(bufferBytes));
    if (!buffer) return AVERROR(ENOMEM);
    io = avio_alloc_context(buffer, bufferBytes, 0, &bytes, readBytes, nullptr, seekBytes);
    context = avformat_alloc_context();
    found.reset(av_packet_alloc());
    if (!io) av_free(buffer);
    if (!io || !context || !found) return AVERROR(ENOMEM);
    io->seekable = bytes.source->seekable() ? AVIO_SEEKABLE_NORMAL : 0;
    context->pb = io;
    context->flags |= AVFMT_FLAG_CUSTOM_IO;
    context->io_open = openNothing;
    context->probesize = limits::probeBytes;
    context->max_analyze_duration = limits::probeMicroseconds;
    context->max_probe_packets = limits::probePackets;
    context->max_streams = static_cast<int>(limits::streams);
    context->format_whitelist = av_strdup(containers);
    context->protocol_whitelist = av_strdup("none");
    const AVInputFormat* forced = nullptr;
    if (!format.empty() && !(forced = av_find_input_format(format.c_str()))) return AVERROR_DEMUXER_NOT_FOUND;
    const Any name = from.name().toString();
    // From the name of a picture the library would look for a numbered sequence.
    int result =
        avformat_open_input(&context, isPicture(name.asString("")) ? "" : name.asString(""), forced, nullptr);
    if (result >= 0) result = avformat_find_stream_info(context, nullptr);
    return result;
}

MediaInput::MediaInput() = default;
MediaInput::~MediaInput() = default;

AVFormatContext& MediaInput::context() { return *state_->context; }
const AVFormatContext& MediaInput::context() const { return *state_->context; }

long long MediaInput::size() const { return state_->bytes.source->size(); }

std::unique_ptr<MediaInput> MediaInput::open(const MediaBytes& bytes, const std::string& format,
                                             std::string& reason) {
    std::unique_ptr<MediaInput> input(new MediaInput);
    input->bytes_ = &bytes;
    input->format_ = format;
    if (!input->openState(reason)) return nullptr;
    return input;
}

bool MediaInput::openState(std::string& reason) {
    state_ = std::make_unique<State>();
    State& state = *state_;
    state.bytes.source = bytes_->open(reason);
    if (!state.bytes.source) return false;
    const int result = state.open(*bytes_, format_);
    if (result < 0) {
        const std::string problem = state.bytes.source->failed() ? state.bytes.source->problem() : "";
        reason = problem.empty() ? reasonOf(result) : problem;
        return false;
    }
    reason = unfit(*state.context);
    return reason.empty();
}

void MediaInput::selectOnly(int stream) {
    only_ = stream;
    AVFormatContext& all = context();
    for (unsigned i = 0; i < all.nb_streams; ++i)
        all.streams[i]->discard =
            stream < 0 || static_cast<int>(i) == stream ? AVDISCARD_DEFAULT : AVDISCARD_ALL;
}

MediaInput::Read MediaInput::read(AVPacket& packet) {
    if (std::exchange(state_->hasFound, false)) {
        av_packet_move_ref(&packet, state_->found.get());
        return Read::packet;
    }
    // Several failures may follow each other while the library looks for the next intact packet.
    for (int failures = 0;;) {
        const int result = av_read_frame(state_->context, &packet);
        if (result >= 0) {
            if (only_ < 0 || packet.stream_index == only_) return Read::packet;
            av_packet_unref(&packet);
            continue;
        }
        if (state_->bytes.source->failed()) {
            failure_ = state_->bytes.source->problem();
            return Read::failed;
        }
        const bool noMemory = result == AVERROR(ENOMEM);
        if (!noMemory && (result == AVERROR_EOF || state_->io->eof_reached)) return Read::end;
        if (result == AVERROR(EAGAIN) && ++failures < 100) continue;
        lost_ = true;
        failure_ = reasonOf(result);
        return Read::failed;
    }
}

bool MediaInput::leaveBytes() {
    AVFormatContext& all = context();
    Bytes& bytes = state_->bytes;
    if (av_match_name("mp4", all.iformat->name) <= 0 || !bytes.source->seekable()) return false;
    for (unsigned i = 0; i < all.nb_streams; ++i)
        if (!isKnownByTable(*all.streams[i]->codecpar)) return false;
    const long long at = bytes.source->position();
    const bool table = isOneTable(*bytes.source);
    if (!bytes.source->seek(at)) return false;
    if (!table) return false;
    bytes.left = at;
    all.flags |= AVFMT_FLAG_NOPARSE;
    return true;
}

bool MediaInput::rewind() {
    state_->takeBytes();
    state_->hasFound = false;
    av_packet_unref(state_->found.get());
    // The library's demultiplexer of WavPack keeps the header of a block after a seek.
    if (std::exchange(lost_, false) || std::strcmp(context().iformat->name, "wv") == 0) return reopen();
    AVFormatContext& all = context();
    if (isBare(all)) return av_seek_frame(&all, -1, 0, AVSEEK_FLAG_BYTE) >= 0;
    // The start of a film is not always a time of 0, and may be no key packet of any stream.
    if (avformat_seek_file(&all, -1, INT64_MIN, INT64_MIN, INT64_MAX, 0) >= 0) return true;
    // Matroska with no block that is marked as key has nothing to seek by, and other ways lose blocks.
    if (av_match_name("matroska", all.iformat->name) > 0) return reopen();
    if (avformat_seek_file(&all, -1, INT64_MIN, all.start_time, INT64_MAX, 0) >= 0) return true;
    if (av_seek_frame(&all, -1, 0, AVSEEK_FLAG_BYTE) >= 0) return true;
    failure_ = "it can't be read from its start again";
    return false;
}

bool MediaInput::reopen() {
    const int streams = static_cast<int>(context().nb_streams);
    if (!openState(failure_)) return false;
    if (static_cast<int>(context().nb_streams) < streams) {
        failure_ = "its streams have changed";
        return false;
    }
    selectOnly(only_);
    return true;
}

// Reads up to that packet. False if it does not follow.
bool MediaInput::find(int stream, const PacketKey& key) {
    const bool bare = isBare(context());
    // Where a parser divides the bytes into pictures, the first one after a seek may be the second half of an
    // earlier picture, with the time of this one.
    bool whole = !isCutByParser(context());
    // In Ogg times are counted back from the end of a page, and the last page may end early. The position of
    // the page and the packet's place in it identify the packet instead.
    const bool pages = lower(context().iformat->name) == "ogg";
    std::uint32_t before = 0;  // packets of the page that were read
    AVPacket& packet = *state_->found;
    while (read(packet) == Read::packet) {
        if (packet.stream_index == stream) {
            if (pages) {
                if (packet.pos > key.position) break;
                if (packet.pos == key.position && before++ == key.ordinal) return state_->hasFound = true;
            } else {
                if (whole && same(key, packet, bare)) return state_->hasFound = true;
                if (after(key, packet)) break;
            }
            whole = true;
        }
        av_packet_unref(&packet);
    }
    av_packet_unref(&packet);
    return false;
}

// Rewinds and reads up to the packet of that number.
bool MediaInput::count(int stream, std::size_t number) {
    if (!rewind()) return false;
    AVPacket& packet = *state_->found;
    while (read(packet) == Read::packet) {
        if (packet.stream_index == stream && number-- == 0) return state_->hasFound = true;
        av_packet_unref(&packet);
    }
    return false;
}

bool MediaInput::seekTo(int stream, const PacketKey& key, std::size_t number) {
    if (lost_ && !rewind()) return false;
    AVFormatContext& all = context();
    state_->hasFound = false;
    av_packet_unref(state_->found.get());
    const AVRational base = all.streams[stream]->time_base;
    const std::int64_t second = base.num > 0 ? std::max<std::int64_t>(base.den / base.num, 1) : 1;
    const std::int64_t time = key.dts != AV_NOPTS_VALUE ? key.dts : key.pts;
    if (isBare(all)) {
        if (key.position >= 0 && av_seek_frame(&all, -1, key.position, AVSEEK_FLAG_BYTE) >= 0 &&
            find(stream, key))
            return true;
    } else if (time != AV_NOPTS_VALUE) {
        for (const std::int64_t back : {std::int64_t{0}, second, 10 * second})
            if (av_seek_frame(&all, stream, time - back, AVSEEK_FLAG_BACKWARD) >= 0 && find(stream, key))
                return true;
    }
    if (count(stream, number)) return true;
    if (failure_.empty()) failure_ = "a packet that was there before was not found again";
    return false;
}

}  // namespace av
