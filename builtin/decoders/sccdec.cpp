#include "builtin/decoders/sccdec.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <memory>
#include <string>

#include "builtin/creators.h"
#include "builtin/decoders/sourceparam.h"
#include "core/arch/qvassert.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = SccDec::Settings;
constexpr int fields = CCStream::fields;
constexpr long long farthestFrame = 1LL << 40;
constexpr double farthestSecond = 1e9;

int setName(Any& name, const Any& value) {
    if (value.isValid() && !value.isText()) return QvStatus::invalidParam;
    name = value;
    return QvStatus::ok;
}

int setNames(Settings& settings, const Any& value) {
    if (!value.isVector() || value.asVector().size() > fields) return QvStatus::invalidParam;
    for (const Any& name : value.asVector())
        if (!name.isText()) return QvStatus::invalidParam;
    int field = 0;
    for (Any& name : settings.filenames)
        name = value.asVector().at(field++);  // none for those after the last
    return QvStatus::ok;
}

void getNames(const Settings& settings, Any& value) {
    AnyVector names;
    for (const Any& name : settings.filenames)
        if (name.isValid()) names.append(name);
    value = names;
}

int setRate(Any& rate, const Any& value) {
    QvFramerate given;
    if (!value.isValid()) {
        rate = value;
        return QvStatus::ok;
    }
    if (!qvparam::convert(value, given) || !(given.rate().ratio() > 0)) return QvStatus::invalidParam;
    rate = given;
    return QvStatus::ok;
}

int setOffset(Settings& settings, const Any& value) {
    MediaTime offset;
    double seconds = 0;
    if (qvparam::convert(value, seconds)) {
        if (!(std::abs(seconds) < farthestSecond)) return QvStatus::invalidParam;
        offset = MediaTime(seconds);
    } else if (!qvparam::convert(value, offset)) {
        return QvStatus::invalidParam;
    }
    if (offset.timescale() != MediaTime::defaultTimescale) offset = MediaTime(offset.seconds());
    settings.offset = offset;
    return QvStatus::ok;
}

using Access = QvParamAccess<Settings>;
constexpr QvParamRow<Settings> rows[] = {
    sourceRow<Settings>,
    {.name = "filenames", .member = Access{setNames, getNames}, .help = "one file for each field"},
    {.name = "filenameField1",
     .member = Access{[](Settings& s, const Any& v) { return setName(s.filenames[0], v); },
                      [](const Settings& s, Any& v) { v = s.filenames[0]; }},
     .help = "captions of field 1",
     .type = Any::String},
    {.name = "filenameField2",
     .member = Access{[](Settings& s, const Any& v) { return setName(s.filenames[1], v); },
                      [](const Settings& s, Any& v) { v = s.filenames[1]; }},
     .help = "captions of field 2",
     .type = Any::String},
    {.name = "offset",
     .member = Access{setOffset, nullptr},
     .flags = qvParamWriteOnly,
     .unit = "s",
     .help = "subtracted from all times; also a media time",
     .type = Any::Float},
    {"timeOffset", &Settings::offset, qvParamReadOnly},
    {.name = "framerate",
     .member = Access{[](Settings& s, const Any& v) { return setRate(s.framerate, v); }, nullptr},
     .flags = qvParamWriteOnly,
     .help = "of the timecodes; not set: derived from them",
     .type = Any::Framerate},
    {.name = "readRate",
     .member = Access{[](Settings& s, const Any& v) { return setRate(s.readRate, v); }, nullptr},
     .flags = qvParamWriteOnly,
     .help = "at which the captions are read",
     .type = Any::Framerate},
    {.name = "dropFrameLines",
     .member = &Settings::dropFrameLines,
     .help = "1: a timecode with ; is drop frame"},
};
static_assert(qvParamTableOk<Settings>(rows));

std::string textOf(const Any& name) {
    const Any text = name.toString();
    return text.isString() ? text.asString() : "";
}

}  // namespace

// --- The stream.

CCStream::CCStream() : DPipeStream(qvSubpicStream) {}

void CCStream::read(long long n, const QvFramerate& rate, QvCcData& result) const {
    const MediaTime from = MediaTime(n, rate, MediaTime::defaultTimescale) + timeOffset;
    const MediaTime end = MediaTime(n + 1, rate, MediaTime::defaultTimescale) + timeOffset;
    result.clear();
    for (std::size_t field = 0; field < fields; ++field) {
        if (!hasData[field]) continue;
        const auto pairs = data[field].pairs();
        auto pair = std::lower_bound(pairs.begin(), pairs.end(), from,
                                     [](const QvCcBytePair& p, const MediaTime& t) { return p.time < t; });
        for (; pair != pairs.end() && pair->time < end; ++pair) result.append(*pair);
    }
    result.shiftTimes(MediaTime() - timeOffset);
}

MediaTime CCStream::begin() const {
    const auto first = [this](std::size_t field) { return data[field].minTime(true) - timeOffset; };
    return !hasData[1] ? first(0) : !hasData[0] ? first(1) : std::min(first(0), first(1));
}

MediaTime CCStream::end() const {
    MediaTime last;
    for (std::size_t field = 0; field < fields; ++field)
        if (hasData[field]) last = std::max(last, data[field].maxTime(true) - timeOffset);
    return last;
}

// --- Parameters.

CCStream* SccDec::captions() const { return static_cast<CCStream*>(findStream(qvSubpicStream, 0)); }

CCStream& SccDec::requireCaptions(int stream) const {
    checkState(stateOpen, nullptr);
    checkStream(qvSubpicStream, stream, nullptr);
    return *captions();
}

const QvFramerate& SccDec::readRate() const {
    return settings_.readRate.isValid() ? settings_.readRate.asFramerate() : captions()->framerate;
}

// A comma may stand in the name of a file.
int SccDec::setFilename(const Any& value) {
    if (!value.isText()) return QvStatus::invalidParam;
    BaseDecodePipe::setParam("filename", value);
    settings_.filenames = {value, Any()};
    if (QvFile::isFile(value)) return QvStatus::ok;
    const AnyVector names = value.split(",");
    settings_.filenames = {names.at(0), names.at(1)};
    return QvStatus::ok;
}

// Parameters in a dictionary, as an application opens or restores with. The first failure counts.
int SccDec::setAll(const Any& value) {
    if (!value.isDict()) return QvStatus::invalidParam;
    int result = QvStatus::ok;
    for (const auto [key, entry] : value.asDict())
        if (const int status = setParam(key, *entry); result == QvStatus::ok) result = status;
    return result;
}

int SccDec::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "filename") == 0) return setFilename(value);
    if (std::strcmp(name, "openParameters") == 0 || std::strcmp(name, "settings") == 0) return setAll(value);
    const auto result = _setRow<Settings>(rows, settings_, name, value);
    if (!result) return BaseDecodePipe::setParam(name, value);
    if (CCStream* stream = captions(); stream && !(stream->timeOffset == settings_.offset)) {
        stream->timeOffset = settings_.offset;
        describe(*stream);
    }
    return *result;
}

void SccDec::getParam(const char* name, Any& value) const {
    const CCStream* stream = captions();
    if (std::strcmp(name, "filename") == 0)
        value = shownNames();
    else if (std::strcmp(name, "filesize") == 0)
        value = fileSize_;
    else if (std::strcmp(name, "store") == 0)
        value = AnyDict("settings", storedSettings());
    else if (std::strcmp(name, "framerate") == 0)
        value = stream ? Any(stream->framerate) : settings_.framerate;
    else if (std::strcmp(name, "readRate") == 0)
        value = stream ? Any(readRate()) : settings_.readRate;
    else if (std::strcmp(name, "inOut") == 0)
        value = inOut();
    else if (!qvGetParamRow<Settings>(rows, settings_, name, value))
        BaseDecodePipe::getParam(name, value);
}

Any SccDec::shownNames() const {
    const auto& [first, second] = settings_.filenames;
    return second.isValid() ? Any::strcat(Any::strcat(first, Any(",")), second) : first;
}

AnyDict SccDec::storedSettings() const {
    AnyDict stored("offset", settings_.offset, "dropFrameLines", settings_.dropFrameLines ? 1 : 0);
    if (settings_.framerate.isValid()) stored.set("framerate", settings_.framerate);
    return stored;
}

AnyDict SccDec::inOut() const {
    static constexpr const char* keys[fields][2] = {{"inField1", "outField1"}, {"inField2", "outField2"}};
    AnyDict times;
    const CCStream* stream = captions();
    for (std::size_t field = 0; stream && field < fields; ++field) {
        if (!stream->hasData[field]) continue;
        times.set(keys[field][0], stream->data[field].minTime(true));
        times.set(keys[field][1], stream->data[field].maxTime(true));
    }
    return times;
}

// --- Open and close.

// The pairs of a field from its file or, of field 1, from the source.
int SccDec::readPairs(CCStream& stream, int field, bool detect, QvFramerate& rate, const bool* dropFrame) {
    const auto index = static_cast<std::size_t>(field);
    const Any& name = settings_.filenames[index];
    QvCcData& data = stream.data[index];
    QvByteSource* const source = field == 0 ? settings_.source : nullptr;
    const int result = !source ? data.readScc(name, field, detect, rate, dropFrame, settings_.dropFrameLines)
                       : source->seek(0) ? data.readScc(*source, name, field, detect, rate, dropFrame,
                                                        settings_.dropFrameLines)
                                         : QvStatus::noSegment;
    if (result == QvStatus::ok) return result;
    std::string why = source ? source->problem() : "";
    if (!why.empty()) why = ": " + why;
    return setError(QvStatus::cannotParse, "Failed to open field %d scc file %s%s", field + 1,
                    textOf(name).c_str(), why.c_str());
}

long long SccDec::bytesOf(int field) const {
    if (field == 0 && settings_.source) return settings_.source->position();
    return std::max(QvFile::flength(settings_.filenames[static_cast<std::size_t>(field)]), 0LL);
}

// Reads a field's file, if there is one. `rate` becomes its rate.
int SccDec::readField(CCStream& stream, int field, QvFramerate& rate) {
    const auto index = static_cast<std::size_t>(field);
    const Any& file = settings_.filenames[index];
    const bool fromSource = field == 0 && settings_.source;
    if (!fromSource && (!file.isText() || file.size() == 0)) return QvStatus::ok;
    if (!fromSource && !QvFile::isFile(file)) {
        qv_log()->warning("There is no file %s for the captions of field %d", textOf(file).c_str(),
                          field + 1);
        return QvStatus::ok;
    }
    QvCcData& data = stream.data[index];
    const bool fixed = settings_.framerate.isValid();
    if (fixed) rate = settings_.framerate.asFramerate();
    const bool df = rate.df();
    if (const int result = readPairs(stream, field, !fixed, rate, fixed ? &df : nullptr)) return result;
    stream.hasData[index] = data.count() > 0;
    if (stream.hasData[index])
        qv_dbg()->info("Opened field %d scc file %s, fr detected as %s", field + 1, textOf(file).c_str(),
                       rate.desc(true, false).asString());
    else  // always with the name of field 1
        qv_dbg()->info("Opened empty field %d scc file %s.", field + 1,
                       textOf(settings_.filenames[0]).c_str());
    return QvStatus::ok;
}

// Two fields of one programme have one rate; the times of the one that was taken for slower are made anew.
int SccDec::readAtOneRate(CCStream& stream, std::array<QvFramerate, fields>& rates) {
    qv_log()->warning("Detected framerates differ, using higher one");
    const std::size_t higher = rates[1].rate().ratio() > rates[0].rate().ratio() ? 1 : 0;
    QvFramerate rate = rates[higher];
    // 23.976 has no drop frame; a rate that has it comes from a file that says so.
    rate.setDf(rates[0].df() || rates[1].df());
    rates.fill(rate);
    for (int field = 0; field < fields; ++field) {
        const bool df = rate.df();
        if (const int result = readPairs(stream, field, false, rate, &df)) return result;
    }
    return QvStatus::ok;
}

int SccDec::open() {
    if (getState() == stateOpen) close();
    auto stream = std::make_unique<CCStream>();
    std::array<QvFramerate, fields> rates;
    for (int field = 0; field < fields; ++field)
        if (const int result = readField(*stream, field, rates[static_cast<std::size_t>(field)]))
            return result;
    const auto [first, second] = stream->hasData;
    if (!first && !second) return setError(QvStatus::cannotParse, "No input files found, exiting");
    if (first && second && !(rates[0] == rates[1]))
        if (const int result = readAtOneRate(*stream, rates)) return result;

    stream->framerate = rates[first ? 0 : 1];
    stream->timeOffset = settings_.offset;
    fileSize_ = 0;
    for (std::size_t field = 0; field < fields; ++field) {
        if (!stream->hasData[field]) continue;
        fileSize_ += bytesOf(static_cast<int>(field));
        // A file may go back in time; a search does not.
        if (!stream->data[field].isSorted()) stream->data[field].sort();
    }
    next_ = 0;
    frame_.clear();
    describe(*addStream(std::move(stream)));
    return QvDecodePipe::open();
}

int SccDec::close() {
    frame_.clear();
    return BaseDecodePipe::close();
}

void SccDec::describe(CCStream& stream) const {
    const int frames = framesUntilEnd(stream.framerate);
    stream.params.set("codec", "CEA-608");
    stream.params.set("framerate", stream.framerate);
    stream.params.set("frames", frames);
    stream.params.set("duration", MediaTime(frames, stream.framerate, MediaTime::defaultTimescale).seconds());
    stream.params.set("pairs", stream.data[0].count() + stream.data[1].count());
    stream.params.set("first", stream.begin());
    stream.params.set("last", stream.end());
}

int SccDec::framesUntilEnd(const QvFramerate& rate) const {
    constexpr long long most = std::numeric_limits<int>::max();
    return static_cast<int>(std::clamp(captions()->end().position(rate) + 1, 0LL, most));
}

// --- Reading.

int SccDec::seek(const MediaTime& time, int type, int stream) {
    if (type != qvSubpicStream) return BaseDecodePipe::seek(time, type, stream);
    requireCaptions(stream);
    return seekToFrame(time.position(readRate()), stream);
}

int SccDec::seekToFrame(long long frame, int stream) {
    requireCaptions(stream);
    if (frame < 0 || frame > farthestFrame) return QvStatus::endOfStream;
    next_ = frame;
    frame_.clear();
    return QvStatus::ok;
}

int SccDec::readFrame(int stream) {
    CCStream& captions = requireCaptions(stream);
    const long long frame = next_;
    if (frame < farthestFrame) ++next_;
    captions.read(frame, readRate(), frame_);
    if (frame_.count() > 0 && qv_dbg()->hasTarget())
        qv_dbg()->debug("[read] %d, %f, %s", static_cast<int>(frame),
                        MediaTime(frame, readRate(), MediaTime::defaultTimescale).seconds(),
                        frame_.dbgDump(&captions.framerate).c_str());
    return frame_.count() == 0 && captions.end() < MediaTime(frame, readRate(), MediaTime::defaultTimescale)
               ? QvStatus::endOfStream
               : QvStatus::ok;
}

int SccDec::readMeta(int stream, int, AnyDict& out) {
    requireCaptions(stream);
    if (frame_.count() == 0) return QvStatus::failed;
    frame_.store(out);
    return QvStatus::ok;
}

int SccDec::nrFrames(int stream) const {
    requireCaptions(stream);
    return framesUntilEnd(readRate());
}

MediaTime SccDec::duration(int type, int stream) {
    if (type != qvSubpicStream) return BaseDecodePipe::duration(type, stream);
    const QvFramerate& rate = requireCaptions(stream).framerate;
    return MediaTime(framesUntilEnd(rate), rate, MediaTime::defaultTimescale);
}

QvCodec* newSccdec() { return new SccDec; }
