#include "plugins/av/mux/filmwriter.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <cstring>
#include <functional>
#include <string_view>
#include <utility>

#include "core/engine/log/qvlog.h"
#include "plugins/av/mux/filmwords.h"
#include "plugins/av/mux/muxoptions.h"

namespace av {

namespace {

constexpr std::int64_t mostWaiting = std::int64_t{1} << 30;  // bytes of units before the header is written

int openNothing(AVFormatContext*, AVIOContext**, const char*, int, AVDictionary**) { return AVERROR(EPERM); }

// Two of the codes of ISO 639-2 stand for one language. QuickTime's list has the older ones.
std::string languageFor(const char* format, const std::string& language) {
    static constexpr std::pair<std::string_view, std::string_view> older[] = {
        {"deu", "ger"}, {"nld", "dut"}, {"ces", "cze"}, {"zho", "chi"}, {"ell", "gre"}, {"fas", "per"},
        {"ron", "rum"}, {"slk", "slo"}, {"sqi", "alb"}, {"hye", "arm"}, {"eus", "baq"}, {"mya", "bur"},
        {"kat", "geo"}, {"isl", "ice"}, {"mkd", "mac"}, {"msa", "may"}, {"bod", "tib"}, {"cym", "wel"},
    };
    if (std::string_view(format) != "mov") return language;
    for (const auto& [code, old] : older)
        if (language == code) return std::string(old);
    return language;
}

}  // namespace

FilmWriter::FilmWriter(QvBufStream& output, FilmJob job, std::vector<MuxTrack> tracks)
    : job_(std::move(job)),
      bytes_(output, job_.seekable),
      tracks_(std::move(tracks)),
      written_(tracks_.size(), 0) {
    if (!bytes_.io()) fail("There is no memory for the output");
}

FilmWriter::~FilmWriter() = default;

bool FilmWriter::fail(const std::string& problem) {
    const std::lock_guard lock(lock_);
    if (!failed_) {
        problem_ = problem;
        failed_ = true;
    }
    return false;
}

bool FilmWriter::failWith(const char* what, int code) {
    if (bytes_.failed()) return fail(bytes_.problem());
    return fail(std::string(job_.container->module().displayName) + ": " + what + ": " + errorText(code));
}

bool FilmWriter::unit(std::size_t track, PacketPtr unit) {
    const std::lock_guard lock(lock_);
    if (failed()) return false;
    if (!tracks_[track].described())
        return fail(tracks_[track].place() + ": its encoder sends units, but has not described them");
    if (!tracks_[track].take(std::move(unit), made_)) return fail(tracks_[track].problem());
    return beginIfReady() && putMade(track);
}

bool FilmWriter::putMade(std::size_t track) {
    bool ok = true;
    for (PacketPtr& unit : made_) {
        if (begun_) {
            ok = ok && put(track, *unit);
            continue;
        }
        waitingBytes_ += unit->size;
        waiting_.push_back({track, std::move(unit)});
    }
    if (waitingBytes_ > mostWaiting) {
        const auto late = std::find_if(tracks_.begin(), tracks_.end(),
                                       [](const MuxTrack& other) { return !other.ready(); });
        if (late != tracks_.end())
            return fail(late->place() + ": nothing has come of it, and the others can't wait any longer");
    }
    made_.clear();
    return ok;
}

bool FilmWriter::put(std::size_t track, AVPacket& unit) {
    const MuxTrack& from = tracks_[track];
    av_packet_rescale_ts(&unit, from.timeBase(), from.stream->time_base);
    unit.stream_index = from.stream->index;
    if (unit.size > 0) ++written_[track];
    const int result = av_interleaved_write_frame(film_.get(), &unit);
    return result >= 0 || failWith("a unit could not be written", result);
}

// --- The header.

bool FilmWriter::beginIfReady() {
    if (begun_) return true;
    const bool ready =
        std::all_of(tracks_.begin(), tracks_.end(), [](const MuxTrack& track) { return track.ready(); });
    return !ready || begin();
}

void FilmWriter::chooseFormat() {
    const auto all = [this](auto is) { return std::all_of(tracks_.begin(), tracks_.end(), is); };
    const auto isNoPcm = [](const MuxTrack& track) { return track.codec().codec != MuxCodec::pcm; };
    const auto old = [](const MuxTrack& track) {
        return track.codec().codec == MuxCodec::mpeg1 || track.codec().codec == MuxCodec::mp2;
    };
    // The library has PCM for QuickTime only, which readers of MP4 know.
    if (job_.format == std::string_view("mp4") && !all(isNoPcm)) {
        qv_log()->warning("'%s' has the form of QuickTime, as MP4 can't be written with PCM",
                          job_.name.c_str());
        job_.format = "mov";
    }
    // Its own box is that of 3GP, which is otherwise the same.
    const auto isNoH263 = [](const MuxTrack& track) { return track.codec().codec != MuxCodec::h263; };
    if (job_.format == std::string_view("mp4") && !all(isNoH263)) {
        qv_log()->warning("'%s' has the form of 3GP, as MP4 has no word for H.263", job_.name.c_str());
        job_.format = "3gp";
    }
    if (job_.container->silent && all(std::mem_fn(&MuxTrack::video))) job_.format = job_.container->silent;
    if (job_.container->mpeg1 && all(old)) job_.format = job_.container->mpeg1;
}

// The library joins no sound with 720 lines of DVCPRO HD, and finds out at the second picture.
bool FilmWriter::canJoin() {
    if (job_.format != std::string_view("dv") || tracks_.front().parameters().height != 720) return true;
    return fail(std::string(job_.container->module().displayName) +
                " does not hold DVCPRO HD of 720 lines with sound, but AVI and MXF do");
}

// The library writes every picture of JPEG 2000 as a whole one.
bool FilmWriter::losesFields() const {
    return job_.format == std::string_view("mxf") &&
           std::any_of(tracks_.begin(), tracks_.end(), [](const MuxTrack& track) {
               return track.codec().codec == MuxCodec::jpeg2000 &&
                      track.parameters().field_order > AV_FIELD_PROGRESSIVE;
           });
}

bool FilmWriter::begin() {
    AVFormatContext* made = nullptr;
    chooseFormat();
    if (!canJoin()) return false;
    int result = avformat_alloc_output_context2(&made, nullptr, job_.format, nullptr);
    film_.reset(made);
    if (result < 0) return failWith("the libraries do not have it", result);
    made->pb = bytes_.io();
    made->flags |= AVFMT_FLAG_CUSTOM_IO;
    made->flush_packets = 0;
    made->io_open = openNothing;
    // What the libraries call experimental is the usual form by now: FLAC in MP4, deep colour in Y4M.
    made->strict_std_compliance = FF_COMPLIANCE_EXPERIMENTAL;
    for (MuxTrack& track : tracks_)
        if (!addStream(track)) return failWith("a stream could not be made", AVERROR(ENOMEM));
    std::string lost = setFilmWords(*made, *job_.container, job_.meta, seconds(), startTime());
    if (losesFields()) lost += (lost.empty() ? "" : ", ") + std::string("the order of its fields");
    if (!lost.empty()) qv_log()->warning("'%s' does not hold: %s", job_.name.c_str(), lost.c_str());
    OptionList options;
    setOptions(options);
    result = avformat_write_header(made, options.raw());
    if (result < 0) return failWith("it can't be begun with these streams", result);
    begun_ = true;
    bool ok = true;
    for (Waiting& first : waiting_) ok = ok && put(first.track, *first.unit);
    waiting_.clear();
    waiting_.shrink_to_fit();
    waitingBytes_ = 0;
    return ok;
}

bool FilmWriter::addStream(MuxTrack& track) {
    AVStream* const stream = avformat_new_stream(film_.get(), nullptr);
    if (!stream || avcodec_parameters_copy(stream->codecpar, &track.parameters()) < 0) return false;
    track.stream = stream;
    stream->time_base = track.timeBase();
    if (track.video()) {
        stream->avg_frame_rate = stream->r_frame_rate = track.rate();
        stream->sample_aspect_ratio = track.aspect();
    }
    const bool first = std::find_if(tracks_.begin(), tracks_.end(), [&track](const MuxTrack& other) {
                           return other.video() == track.video();
                       })->place() == track.place();
    if (first) stream->disposition |= AV_DISPOSITION_DEFAULT;
    if (!track.language.empty() && (job_.container->words & FilmWord::language))
        setEntry(stream->metadata, "language", languageFor(job_.format, track.language));
    if (!track.title.empty() && (job_.container->words & FilmWord::commonTags))
        setEntry(stream->metadata, "title", track.title);
    return true;
}

double FilmWriter::seconds() const {
    for (const MuxTrack& track : tracks_)
        if (track.video()) return job_.frames * av_q2d(track.timeBase());
    return 0;
}

// Where the library moves all times for packets of priming that come before the film, in whole milliseconds.
// Other containers have lists of edits, or their own word for priming, as Matroska has for Opus.
double FilmWriter::startTime() const {
    const std::string_view format = job_.format;
    if (format != "matroska" && format != "webm") return 0;
    double longest = 0;
    for (const MuxTrack& track : tracks_) {
        const AVCodecParameters& is = track.parameters();
        if (track.video() || is.codec_id == AV_CODEC_ID_OPUS || is.sample_rate < 1) continue;
        longest = std::max(longest, std::round(1000.0 * is.initial_padding / is.sample_rate) / 1000);
    }
    return longest;
}

// The index of MP4: per unit its length, of video also its times; per chunk, which is a run of units of one
// stream, its place and its count.
long long FilmWriter::indexBytes() const {
    constexpr long long head = 16384, picture = 4 + 8 + 4, sound = 4, chunk = 8 + 12;
    long long bytes = head;
    for (const MuxTrack& track : tracks_) {
        const AVCodecParameters& is = track.parameters();
        const double samples = seconds() * is.sample_rate;
        const auto units = track.video()
                               ? static_cast<long long>(job_.frames)
                               : static_cast<long long>(samples / std::max(is.frame_size, 1024)) + 64;
        bytes += 1024 + units * (track.video() ? picture : sound) +
                 std::min<long long>(units, job_.frames + 1) * chunk;
    }
    return bytes;
}

void FilmWriter::setOptions(OptionList& options) {
    const Container& container = *job_.container;
    if (container.is(MuxTrait::indexInFront)) {
        const bool pipe = !job_.seekable;
        // Only a header that waits for the first units can say when the streams start.
        const char* const flags = pipe ? "+write_colr+frag_keyframe+delay_moov+default_base_moof"
                                  : makesFragments(job_.options) ? "+write_colr+delay_moov+default_base_moof"
                                                                 : "+write_colr";
        options.set("movflags", flags);
        if (pipe) {
            options.set("min_frag_duration", "1000000");
            options.set("frag_duration", "10000000");
        } else if (job_.fastStart && job_.frames > 0 && indexBytes() < INT_MAX &&
                   !makesFragments(job_.options)) {
            options.set("moov_size", std::to_string(indexBytes()));
            spaceKept_ = true;
        }
        if (av_dict_get(film_->metadata, "timecode", nullptr, 0)) options.set("write_tmcd", "1");
    }
    if (!job_.seekable && container.pipe == PipeForm::live) options.set("live", "1");
    // Packets with a time before each are those of disks, which have no other sound.
    const bool disk = std::none_of(tracks_.begin(), tracks_.end(), [](const MuxTrack& track) {
        return !track.video() && track.codec().codec != MuxCodec::ac3 &&
               track.codec().codec != MuxCodec::eac3;
    });
    if (disk && (job_.extension == "m2ts" || job_.extension == "mts")) options.set("mpegts_m2ts_mode", "1");
    OptionList own;
    parseMuxOptions(job_.options, job_.format, own);
    const AVDictionaryEntry* entry = nullptr;
    while ((entry = own.next(entry))) {
        // Flags come on top of those that the film needs.
        const bool flags = std::strcmp(entry->key, "movflags") == 0;
        const bool listed = *entry->value == '+' || *entry->value == '-';
        const std::string value = (flags && !listed ? "+" : "") + std::string(entry->value);
        options.set(entry->key, value, flags || *entry->value == '+' ? AV_DICT_APPEND : 0);
    }
}

// --- The end.

bool FilmWriter::close() {
    const std::lock_guard lock(lock_);
    if (failed()) return false;
    for (std::size_t i = 0; i < tracks_.size(); ++i) {
        if (!tracks_[i].finish(made_)) return fail(tracks_[i].problem());
        if (!putMade(i)) return false;
    }
    if (!begun_) {
        for (const MuxTrack& track : tracks_)
            if (!track.ready())
                return fail(track.place() + (track.described() ? ": there is nothing in it"
                                                               : ": its encoder has not described it"));
        if (!begin()) return false;
    }
    int result = av_write_trailer(film_.get());
    avio_flush(bytes_.io());
    if (result < 0 && !bytes_.failed() && spaceKept_ && bytes_.moveFromGap()) {
        qv_dbg()->info("The index of '%s' does not fit into the space kept for it and is at the end",
                       job_.name.c_str());
        result = 0;
    }
    if (result >= 0) result = std::min(bytes_.io()->error, 0);
    if (result < 0 || bytes_.failed()) return failWith("it could not be finished", result);
    return bytes_.finish() || fail(bytes_.problem());
}

}  // namespace av
