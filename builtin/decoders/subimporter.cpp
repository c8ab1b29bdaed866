#include "builtin/decoders/subimporter.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <string>

#include "builtin/creators.h"
#include "builtin/decoders/sourceparam.h"
#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"

namespace {

using Settings = SubImporter::Settings;

constexpr auto timescale = MediaTime::defaultTimescale;
constexpr long long farthestFrame = std::numeric_limits<int>::max();

bool isRate(const Any& value) { return value.isFramerate() && value.asFramerate().rate().ratio() > 0; }

int setFramerate(Settings& settings, const Any& value) {
    const Any rate = value.isFloat() ? Any(QvFramerate(value.asDouble())) : value;
    if (!isRate(rate)) return QvStatus::invalidParam;
    settings.framerate = rate.asFramerate();
    return QvStatus::ok;
}

void getFramerate(const Settings& settings, Any& value) { value = settings.framerate; }

int setReadRate(Settings& settings, const Any& value) {
    if (value.isValid() && !isRate(value)) return QvStatus::invalidParam;
    settings.readRate = value;
    return QvStatus::ok;
}

void getReadRate(const Settings& settings, Any& value) { value = settings.readRate; }

// The name of the file for messages.
std::string textOf(const Any& name) {
    const Any narrow = name.isWString() ? name.toString() : name;
    return narrow.asString("");
}

constexpr QvParamRow<Settings> rows[] = {
    sourceRow<Settings>,
    {.name = "framerate",
     .member = QvParamAccess<Settings>{setFramerate, getFramerate},
     .flags = qvParamStored,
     .help = "of the frame numbers in a .sub file"},
    {.name = "readRate",
     .member = QvParamAccess<Settings>{setReadRate, getReadRate},
     .help = "at which the subtitles are read"},
};
static_assert(qvParamTableOk<Settings>(rows));

}  // namespace

int SubImporter::setParam(const char* name, const Any& value) {
    if (const auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return BaseDecodePipe::setParam(name, value);
}

void SubImporter::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "filesize") == 0)
        value = fileSize_;
    else if (!qvGetParamRow<Settings>(rows, settings_, name, value))
        BaseDecodePipe::getParam(name, value);
}

int SubImporter::parse() {
    QvByteSource* const source = settings_.source;
    if (!source) return subtitles_->parseFile(filename(), settings_.framerate);
    return source->seek(0) ? subtitles_->parseSource(*source, filename(), settings_.framerate)
                           : QvStatus::failed;
}

int SubImporter::open() {
    if (getState() == stateOpen) close();
    subtitles_.emplace();
    if (parse() != QvStatus::ok) {
        const int before = subtitles_->nrSubtitles();
        const std::string name = textOf(filename());
        subtitles_.reset();
        if (before > 0)
            return setError(QvStatus::cannotParse, "Subtitle file %s: what follows subtitle %d is malformed",
                            name.c_str(), before);
        std::string why = settings_.source ? settings_.source->problem() : "";
        if (!why.empty()) why = ": " + why;
        return setError(QvStatus::cannotParse, "Subtitle file %s can't be read or is no text%s", name.c_str(),
                        why.c_str());
    }
    warn();
    fileSize_ = settings_.source ? settings_.source->position() : QvFile::flength(filename());
    end_ = MediaTime();
    for (int i = 0; i < subtitles_->nrSubtitles(); ++i) end_ = std::max(end_, subtitles_->at(i)->end);
    next_ = 0;
    shown_ = nullptr;
    addStream(std::make_unique<DPipeStream>(qvSubpicStream))->params = description();
    return QvDecodePipe::open();
}

int SubImporter::close() {
    shown_ = nullptr;
    const int result = BaseDecodePipe::close();
    subtitles_.reset();
    return result;
}

// What opens all the same, but may not be all that a user expects.
void SubImporter::warn() const {
    const std::string name = textOf(filename());
    if (subtitles_->unread() > 0)
        qv_log()->warning("Subtitle file %s: the last %lld bytes of its text are not read", name.c_str(),
                          subtitles_->unread());
    else if (subtitles_->nrSubtitles() == 0)
        qv_log()->warning("Subtitle file %s has no subtitles", name.c_str());
}

AnyDict SubImporter::description() const {
    AnyDict format;
    const int count = subtitles_->nrSubtitles();
    format.set("type", 1);
    format.set("format", static_cast<int>(subtitles_->format()));
    format.set("count", count);
    format.set("encoding", 0);
    format.set("codec", subtitles_->formatName());
    format.set("textEncoding", subtitles_->encodingName());
    if (subtitles_->unread() > 0) {
        format.set("truncated", 1);
        format.set("unread", subtitles_->unread());
    }
    if (count == 0) return format;
    const MediaTime& first = subtitles_->at(0)->start;
    const MediaTime& last = subtitles_->at(count - 1)->start;
    format.set("first", first);
    format.set("last", last);
    format.set("duration", last - first);
    format.set("framerate", subtitles_->rate());
    format.set("end", end_);
    return format;
}

// --- What an open file is asked for.

const QvSubtitles& SubImporter::opened() const {
    QV_ASSERT_MSG(subtitles_.has_value(), "[SubImporter] Not opened");
    return *subtitles_;
}

const QvSubtitles& SubImporter::opened(int stream) const {
    const QvSubtitles& subtitles = opened();
    checkStream(qvSubpicStream, stream, nullptr);
    return subtitles;
}

const QvFramerate& SubImporter::readRate() const {
    return settings_.readRate.isValid() ? settings_.readRate.asFramerate() : subtitles_->rate();
}

int SubImporter::nrStreams(int type) const {
    opened();
    return BaseDecodePipe::nrStreams(type);
}

void SubImporter::getStreamParam(int type, int stream, const char* name, Any& value) const {
    opened();
    BaseDecodePipe::getStreamParam(type, stream, name, value);
}

void SubImporter::getStreamParams(int type, int stream, AnyDict& params) const {
    opened();
    BaseDecodePipe::getStreamParams(type, stream, params);
}

int SubImporter::select(int type, int stream) {
    opened();
    return BaseDecodePipe::select(type, stream);
}

int SubImporter::deselect(int type, int stream) {
    opened();
    return BaseDecodePipe::deselect(type, stream);
}

int SubImporter::seek(const MediaTime& time, int type, int stream) {
    opened();
    if (type != qvSubpicStream) return BaseDecodePipe::seek(time, type, stream);
    return seekToFrame(time.position(readRate()), stream);
}

int SubImporter::seekToFrame(long long frame, int stream) {
    opened(stream);
    if (frame < 0 || frame > farthestFrame) return QvStatus::endOfStream;
    next_ = frame;
    shown_ = nullptr;
    return QvStatus::ok;
}

int SubImporter::readFrame(int stream) {
    opened(stream);
    const MediaTime time(next_, readRate(), timescale);
    if (next_ < farthestFrame) ++next_;
    shown_ = subtitles_->find(time);
    return !shown_ && end_ < time ? QvStatus::endOfStream : QvStatus::ok;
}

int SubImporter::readMeta(int stream, int, AnyDict& out) {
    const QvSubtitles& subtitles = opened(stream);
    if (!shown_) return QvStatus::failed;
    out.set("name", "subtitle");
    out.set("format", static_cast<int>(subtitles.format()));
    out.set("text", shown_->text);
    out.set("rows", shown_->rows);
    out.set("start", shown_->start);
    out.set("end", shown_->end);
    return QvStatus::ok;
}

int SubImporter::nrFrames(int stream) const {
    if (opened(stream).nrSubtitles() == 0) return 0;
    return static_cast<int>(std::clamp(end_.position(readRate()) + 1, 0LL, farthestFrame));
}

MediaTime SubImporter::duration(int type, int stream) {
    if (type != qvSubpicStream) return BaseDecodePipe::duration(type, stream);
    opened(stream);
    return end_;
}

QvCodec* newSubimport() { return new SubImporter; }
