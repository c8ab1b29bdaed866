#include "plugins/av/decoder/avdec.h"

#include <algorithm>
#include <cstring>
#include <new>

#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/qvbytesource.h"
#include "plugins/av/decoder/filmfacts.h"
#include "plugins/av/decoder/filmlength.h"
#include "plugins/av/decoder/filmstreams.h"
#include "plugins/av/decoder/picturefiles.h"
#include "plugins/av/index/packetindex.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/boxes.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

using Settings = AvDec::Settings;

int setSource(Settings& settings, const Any& value) {
    settings.source = qvSourceOf(value);
    return value.isValid() && !settings.source ? QvStatus::invalidParam : QvStatus::ok;
}

constexpr QvParamRow<Settings> rows[] = {
    {.name = qvSourceParam,
     .member = QvParamAccess<Settings>{setSource, nullptr},
     .flags = qvParamWriteOnly,
     .help = "a byte source in the place of the file",
     .type = Any::Generic},
    {.name = "threads",
     .member = &Settings::threads,
     .flags = qvParamStored,
     .min = 0,
     .max = 64,
     .help = "threads of each stream's codec; 0: one a core"},
    {.name = "upright",
     .member = &Settings::upright,
     .flags = qvParamStored,
     .min = 0,
     .max = 1,
     .help = "1: pictures are turned as the film says; 0: they are as they are coded"},
    {.name = "exact",
     .member = &Settings::exact,
     .flags = qvParamPlain,
     .min = 0,
     .max = 1,
     .help = "1: packets are counted by reading all of the file; 0: by its table, where it has a whole one"},
    {.name = "survey",
     .member = &Settings::survey,
     .flags = qvParamPlain,
     .min = 0,
     .max = 1,
     .help = "1: only to say what the film is; counts are those of its tables, and nothing can be read"},
    {.name = "pictures",
     .member = &Settings::pictures,
     .flags = qvParamStored,
     .min = 0,
     .max = 10'000'000,
     .help =
         "how many files, counted on from the number in the name, are a frame each; 0: the file is a film"},
    {.name = "framerate",
     .member = &Settings::rate,
     .flags = qvParamStored,
     .help = "of frames that are files"},
    {.name = "container",
     .member = &Settings::container,
     .flags = qvParamStored,
     .help = "the format of the file by the name that the libraries have for it; empty: found out"},
};
static_assert(qvParamTableOk<Settings>(rows));

// A picture of the cover or of a title, which is no film, unless there is nothing else.
bool isCover(const AVStream& stream) { return (stream.disposition & AV_DISPOSITION_ATTACHED_PIC) != 0; }

}  // namespace

AvDec::~AvDec() { AvDec::close(); }

// Parameters in a dictionary, as an application opens or restores with. The first failure counts.
int AvDec::setAll(const Any& value) {
    if (!value.isDict()) return QvStatus::invalidParam;
    int result = QvStatus::ok;
    for (const auto [key, entry] : value.asDict())
        if (const int status = setParam(key, *entry); result == QvStatus::ok) result = status;
    return result;
}

int AvDec::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "openParameters") == 0 || std::strcmp(name, "settings") == 0) return setAll(value);
    if (auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return BaseDecodePipe::setParam(name, value);
}

void AvDec::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "filesize") == 0) {
        value = fileSize_;
    } else if (std::strcmp(name, "inputFiles") == 0 && settings_.pictures > 0) {
        value = inputFiles_;
    } else if (std::strcmp(name, "meta") == 0) {
        value = facts_;
    } else if (std::strcmp(name, "store") == 0) {
        AnyDict settings;
        qvStoreParamRows<Settings>(rows, settings_, settings);
        value = AnyDict("settings", settings);
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value)) {
        BaseDecodePipe::getParam(name, value);
    }
}

int AvDec::refuse(const std::string& reason) {
    dropStreams();
    index_.reset();
    bytes_.reset();
    const Any name = filename().toString();
    return setError(QvStatus::cannotParse, "Can not read %s: %s", name.asString(""), reason.c_str());
}

int AvDec::open() {
    if (getState() == stateOpen) close();
    bytes_ = settings_.source ? std::make_unique<MediaBytes>(*settings_.source, filename())
                              : std::make_unique<MediaBytes>(filename());
    return settings_.pictures > 0 ? openPictures() : openFilm();
}

int AvDec::openPictures() {
    const Any name = filename().toString();
    const auto files = numberedFrom(name.asString(""), settings_.pictures);
    if (files.empty()) return refuse("its name has no number to count from");
    std::string reason;
    auto pictures = PictureFiles::open(files, settings_.rate, settings_.upright != 0, reason);
    if (!pictures) return refuse(reason);
    inputFiles_.clear();
    for (const std::string& file : files) inputFiles_.append(Any(file.c_str()));
    addStream(std::make_unique<PictureStream>(std::move(pictures), nullptr));
    return BaseDecodePipe::open();
}

int AvDec::openFilm() {
    std::string reason;
    {
        const auto probe = bytes_->open(reason);
        if (!probe) return refuse(reason);
        fileSize_ = probe->size();
        if (!probe->seekable()) return refuse("it has to be sought, and a pipe can't be; put it into a file");
        extent_ = extentOf(*probe);
        if (packetsOfTables(*probe) > limits::packets) return refuse(PacketIndex::tooMany);
    }
    const auto input = MediaInput::open(*bytes_, settings_.container, reason);
    if (!input) return refuse(reason);
    const bool intact = !extent_.broken && extent_.bytes <= fileSize_;
    const auto from = settings_.exact              ? PacketIndex::From::packets
                      : settings_.survey && intact ? PacketIndex::From::survey
                                                   : PacketIndex::From::table;
    index_ = PacketIndex::build(*input, reason, from);
    if (!index_) return refuse(reason);
    addStreams(*input, reason);
    if (streams().empty()) return refuse(reason.empty() ? "it has neither pictures nor sound" : reason);
    return BaseDecodePipe::open();
}

// Pictures first: sound goes by the time of the first one. A stream that can't be decoded is left out, with a
// line in the log; `reason` is the first of these.
void AvDec::addStreams(MediaInput& input, std::string& reason) {
    const AVFormatContext& container = input.context();
    const FilmLength length(container, *index_, fileSize_, extent_);
    FilmZero zero;
    const auto leaveOut = [&](unsigned number, const std::string& why) {
        qv_log()->warning("Stream %u of '%s' is left out: %s", number, filename().toString().asString(""),
                          why.c_str());
        if (reason.empty()) reason = why;
    };
    const auto addPictures = [&](bool covers) {
        for (unsigned i = 0; i < container.nb_streams; ++i) {
            const AVStream& stream = *container.streams[i];
            if (stream.codecpar->codec_type != AVMEDIA_TYPE_VIDEO || isCover(stream) != covers) continue;
            std::string why;
            const long long lost = covers ? 0 : length.lost(stream);
            auto reader = FrameReader::open(*bytes_, settings_.container, static_cast<int>(i), index_,
                                            {settings_.threads, settings_.upright != 0, lost > 0}, why);
            if (!reader) {
                leaveOut(i, why);
                continue;
            }
            const FrameReader& opened = *reader;
            if (!zero.known && !covers) zero = {true, opened.zero(), opened.zeroBase()};
            if (settings_.upright && reader->format().turn.any())
                qv_log()->warning("Stream %u of '%s' is not turned upright: its pixel format can't be turned",
                                  i, filename().toString().asString(""));
            auto* const added = addStream(std::make_unique<PictureStream>(std::move(reader), &stream));
            const PictureFormat& format = added->reader().format();
            if (lost > 0) added->setLost(lost);
            if (covers) continue;
            const double start = static_cast<double>(opened.zero()) / static_cast<double>(opened.zeroBase());
            const long long announced =
                length.announced(stream, format.rate.rate().ratio(), format.frames, start);
            if (length.isCut(stream)) added->setTruncated(announced);
            if (index_->isPartial()) added->setEstimated(announced);
        }
    };
    if (!index_->damage().empty())
        qv_log()->warning("'%s' is damaged: %s", filename().toString().asString(""),
                          index_->damage().c_str());
    addPictures(false);
    const double start = static_cast<double>(zero.time) / static_cast<double>(zero.base);
    for (unsigned i = 0; i < container.nb_streams; ++i) {
        const AVStream& stream = *container.streams[i];
        if (stream.codecpar->codec_type != AVMEDIA_TYPE_AUDIO) continue;
        std::string why;
        auto reader = SampleReader::open(*bytes_, settings_.container, static_cast<int>(i), index_,
                                         zero.known, zero.time, zero.base, why);
        if (!reader) {
            leaveOut(i, why);
            continue;
        }
        if (const std::string& lost = reader->format().lost; !lost.empty())
            qv_log()->warning("The sound of stream %u of '%s' is not all there: %s", i,
                              filename().toString().asString(""), lost.c_str());
        auto* const added = addStream(std::make_unique<SoundStream>(std::move(reader), stream));
        const SoundFormat& format = added->reader().format();
        const long long announced = length.announced(stream, format.samplerate, format.samples, start);
        if (length.isCut(stream)) added->setTruncated(announced);
        if (index_->isPartial()) added->setEstimated(announced);
    }
    if (streams().empty()) addPictures(true);
    for (unsigned i = 0; zero.known && i < container.nb_streams; ++i) {
        const AVStream& stream = *container.streams[i];
        if (!SubtitleReader::isText(stream)) continue;
        addStream(std::make_unique<SubtitleStream>(
            std::make_unique<SubtitleReader>(*bytes_, settings_.container, stream, index_, zero.time,
                                             zero.base),
            stream, !index_->isPartial()));
    }
    facts_ = filmFacts(container, zero);
}

int AvDec::close() {
    const int result = BaseDecodePipe::close();
    facts_ = {};
    index_.reset();
    bytes_.reset();
    return result;
}

int AvDec::refuseSurvey() { return setError(QvStatus::notSupported, "The film is only open for a survey"); }

int AvDec::seekToFrame(long long frame, int stream) {
    checkStream(qvVideoStream, stream, "seekToFrame");
    if (settings_.survey) return refuseSurvey();
    auto& pictures = static_cast<PictureStream&>(*findStream(qvVideoStream, stream));
    return pictures.seek(frame) ? QvStatus::ok : setError(QvStatus::endOfStream, "Seek failed");
}

int AvDec::seekToSample(long long sample, int stream) {
    checkStream(qvAudioStream, stream, "seekToSample");
    if (settings_.survey) return refuseSurvey();
    auto& sound = static_cast<SoundStream&>(*findStream(qvAudioStream, stream));
    return sound.seek(sample) ? QvStatus::ok : setError(QvStatus::endOfStream, "Seek failed");
}

int AvDec::readFrame(int stream) {
    checkStream(qvVideoStream, stream, "readFrame");
    if (settings_.survey) return refuseSurvey();
    auto& pictures = static_cast<PictureStream&>(*findStream(qvVideoStream, stream));
    const int result = pictures.read();
    if (result == QvStatus::cannotParse)
        return setError(result, "read frame failed: %s", pictures.reader().failure().c_str());
    return result;
}

int AvDec::readSamples(int count, int stream) {
    checkStream(qvAudioStream, stream, "readSamples");
    if (settings_.survey) return refuseSurvey();
    auto& sound = static_cast<SoundStream&>(*findStream(qvAudioStream, stream));
    const int result = sound.read(count);
    if (result == QvStatus::outOfMemory) return setError(result, "Out of memory");
    if (result == QvStatus::cannotParse)
        return setError(result, "read samples failed: %s", sound.reader().failure().c_str());
    return result;
}

// --- Subtitles go with the pictures.

int AvDec::pictureOf(int subpicture) const { return std::min(subpicture, nrStreams(qvVideoStream) - 1); }

void AvDec::getStreamParam(int type, int stream, const char* name, Any& value) const {
    if (type == qvSubpicStream && (std::strcmp(name, "subtitles") == 0 || std::strcmp(name, "lost") == 0)) {
        checkStream(type, stream, "getStreamParam");
        SubtitleReader& reader = static_cast<SubtitleStream&>(*findStream(type, stream)).reader();
        if (std::strcmp(name, "lost") == 0)
            value = reader.lost();
        else
            value = Any(reader.entries());
        if (!reader.failure().empty())
            qv_log()->warning("The subtitles of '%s' can't be read: %s", filename().toString().asString(""),
                              reader.failure().c_str());
        return;
    }
    BaseDecodePipe::getStreamParam(type, stream, name, value);
}

int AvDec::readMeta(int stream, int, AnyDict& out) {
    checkStream(qvSubpicStream, stream, "readMeta");
    const auto& pictures = static_cast<PictureStream&>(*findStream(qvVideoStream, pictureOf(stream)));
    QvSubtitles& texts =
        static_cast<SubtitleStream&>(*findStream(qvSubpicStream, stream)).reader().subtitles();
    const QvSubtitle* const shown = texts.find(pictures.shownAt());
    if (!shown) return QvStatus::failed;
    out.set("name", "subtitle");
    out.set("format", static_cast<int>(QvSubtitles::SRT));
    out.set("text", shown->text);
    out.set("rows", shown->rows);
    out.set("start", shown->start);
    out.set("end", shown->end);
    return QvStatus::ok;
}

int AvDec::seek(const MediaTime& time, int type, int stream) {
    if (type != qvSubpicStream) return BaseDecodePipe::seek(time, type, stream);
    checkStream(type, stream, "seek");
    return BaseDecodePipe::seek(time, qvVideoStream, pictureOf(stream));
}

MediaTime AvDec::duration(int type, int stream) {
    if (type != qvSubpicStream) return BaseDecodePipe::duration(type, stream);
    checkStream(type, stream, "duration");
    return static_cast<SubtitleStream&>(*findStream(type, stream)).reader().end();
}

QvFrame* AvDec::getFramePtr(int stream) {
    checkStream(qvVideoStream, stream, "getFramePtr");
    return &static_cast<PictureStream&>(*findStream(qvVideoStream, stream)).reader().frame();
}

QvPcm* AvDec::getAudioPtr(int stream) {
    checkStream(qvAudioStream, stream, "getAudioPtr");
    return findStream(qvAudioStream, stream)
               ? static_cast<SoundStream&>(*findStream(qvAudioStream, stream)).pcm.get()
               : nullptr;
}

}  // namespace av
