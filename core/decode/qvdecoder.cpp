#include "core/decode/qvdecoder.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <utility>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"

struct QvDecodePipe::Private {
    std::vector<std::unique_ptr<QvAudioStreamReport>> reports;  // one an audio stream, null until asked for
    AnyVector videoOverrides;
    AnyVector audioOverrides;
    AnyVector subpicOverrides;
    // Stream data is being fetched. A subclass may answer "video0" from getParam or from getStreamParams, and
    // the default of each asks the other: this ends the circle.
    bool inside = false;
};

namespace {

class SetFor {
  public:
    explicit SetFor(bool& flag) : flag_(flag), before_(std::exchange(flag, true)) {}
    SetFor(const SetFor&) = delete;
    SetFor& operator=(const SetFor&) = delete;
    ~SetFor() { flag_ = before_; }

  private:
    bool& flag_;
    bool before_;
};

// The part before the number in "video0" and its like.
const char* prefixOf(int type) {
    switch (type) {
        case qvVideoStream: return "video";
        case qvAudioStream: return "audio";
        case qvSubpicStream: return "subpic";
        default: return "other";
    }
}

struct StreamName {
    int type;
    int stream;
    const char* rest;  // after the number
};

bool startsLikeStream(const char* name) {
    for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
        if (std::strncmp(name, prefixOf(type), std::strlen(prefixOf(type))) == 0) return true;
    return false;
}

// Takes "audio12/samplerate" apart; false when there is no number.
bool parseStreamName(const char* name, StreamName& out) {
    for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream}) {
        const std::size_t length = std::strlen(prefixOf(type));
        if (std::strncmp(name, prefixOf(type), length) != 0) continue;
        int used = 0;
        if (std::sscanf(name + length, "%9d%n", &out.stream, &used) != 1) return false;
        out.type = type;
        out.rest = name + length + used;
        return true;
    }
    return false;
}

bool isEmptyDicts(const AnyVector& vector) {
    for (int i = 0; i < vector.size(); ++i)
        if (!vector.at(i).asDict().empty()) return false;
    return true;
}

void appendDicts(AnyVector& to, int count) {
    for (int i = 0; i < count; ++i) to.append(AnyDict());
}

}  // namespace

QvDecodePipe::QvDecodePipe(const QvModule* module) : QvCodec(module), p_(std::make_unique<Private>()) {}

QvDecodePipe::~QvDecodePipe() = default;

void* QvDecodePipe::getInterface(int kind) const {
    return kind == 2 ? const_cast<QvDecodePipe*>(this) : nullptr;
}

int QvDecodePipe::open() {
    QV_ASSERT(p_->reports.empty());
    appendDicts(p_->videoOverrides, nrStreams(qvVideoStream));
    const int audios = nrStreams(qvAudioStream);
    p_->reports.resize(static_cast<std::size_t>(std::max(audios, 0)));
    appendDicts(p_->audioOverrides, audios);
    appendDicts(p_->subpicOverrides, nrStreams(qvSubpicStream));
    setState(stateOpen);
    return QvStatus::ok;
}

int QvDecodePipe::close() {
    p_->reports.clear();
    p_->videoOverrides.clear();
    p_->audioOverrides.clear();
    p_->subpicOverrides.clear();
    setState(stateInitialised);
    return QvStatus::ok;
}

// --- Parameters.

void QvDecodePipe::getParam(const char* name, Any& value) const {
    StreamName parsed{};
    if (p_->inside || !startsLikeStream(name) || !parseStreamName(name, parsed))
        return QvCodec::getParam(name, value);
    if (*parsed.rest == '/') {
        const SetFor inside(p_->inside);
        getStreamParam(parsed.type, parsed.stream, parsed.rest + 1, value);
    } else if (*parsed.rest == 0) {
        AnyDict params;
        getStreamParams(parsed.type, parsed.stream, params);
        value = params;
    } else {
        QvCodec::getParam(name, value);
    }
}

void QvDecodePipe::getStreamParam(int type, int stream, const char* name, Any& value) const {
    AnyDict params;
    getStreamParams(type, stream, params);
    if (params.isSet(name)) value = params.get(name);
}

void QvDecodePipe::getStreamParams(int type, int stream, AnyDict& params) const {
    char name[32];
    std::snprintf(name, sizeof name, "%s%d", prefixOf(type), stream);
    Any value;
    {
        const SetFor inside(p_->inside);
        getParam(name, value);
    }
    if (value.isDict())
        params = value.asDict();
    else
        params.clear();
}

int QvDecodePipe::setStreamParam(int, int, const char* name, const Any&) { return _raiseInvalidParam(name); }

Any QvDecodePipe::getStreamParam(int type, int stream, const char* name) const {
    Any value;
    getStreamParam(type, stream, name, value);
    return value;
}

Any QvDecodePipe::getVideoParam(int stream, const char* name) const {
    return getStreamParam(qvVideoStream, stream, name);
}

Any QvDecodePipe::getAudioParam(int stream, const char* name) const {
    return getStreamParam(qvAudioStream, stream, name);
}

Any QvDecodePipe::getSubpicParam(int stream, const char* name) const {
    return getStreamParam(qvSubpicStream, stream, name);
}

void QvDecodePipe::elementaryStream(int type, int stream, QvElementaryStream* out) const {
    QV_ASSERT_MSG(out, "Invalid stream pointer");
    QV_ASSERT_MSG(type == qvVideoStream || type == qvAudioStream, "Invalid stream type");
    QV_ASSERT_MSG(stream >= 0 && stream <= nrStreams(type), "Invalid stream number");
    AnyDict params;
    if (stream < nrStreams(type)) getStreamParams(type, stream, params);
    QV_ASSERT_MSG(!params.empty(), "Internal decoder error");

    *out = QvElementaryStream();
    out->type = type;
    out->filename = getParam("filename");
    const Any filesize = getParam("filesize");
    if (filesize.isInt()) out->filesize = filesize.toInt64();
    if (type == qvVideoStream) {
        const double rate = params.getDouble("vBitrate", 0.0);
        if (rate > 0 && rate < 1e18) out->rate = static_cast<long long>(rate);
        if (params["framerate"].isFramerate()) out->framerate = params["framerate"].asFramerate();
        if (params["videoCodec"].isText()) out->videoCodec = params["videoCodec"];
    } else {
        out->rate = params.getInt32("aBitrate", 0) * 1000LL;
    }
    const Any& codecParams = params["codecParams"];
    if (codecParams.isDict() && codecParams.asDict()["pid"].isInt())
        out->pid = codecParams.asDict()["pid"].toInt32();
}

// --- Position.

int QvDecodePipe::readMeta(int, int, AnyDict&) { QV_FAIL_PLAIN(); }

int QvDecodePipe::seek(const MediaTime& time, int type, int stream) {
    switch (type) {
        case qvVideoStream: {
            const Any rate = getVideoParam(stream, "framerate");
            QV_ASSERT_MSG(rate.isFramerate(), "Could not get 'framerate' from decoder");
            return seekToFrame(time.position(rate.asFramerate()), stream);
        }
        case qvAudioStream: {
            const Any rate = getAudioParam(stream, "samplerate");
            QV_ASSERT_MSG(rate.isInt(), "Could not get 'samplerate' from decoder");
            return seekToSample(time.position(rate.toInt32()), stream);
        }
        case qvSubpicStream: {
            if (stream < nrStreams(qvVideoStream)) return seek(time, qvVideoStream, stream);
            const Any rate = getParam("framerate");
            QV_ASSERT_MSG(rate.isFramerate(), "Could not get 'framerate' from decoder");
            return seekToFrame(time.position(rate.asFramerate()), stream);
        }
        default: QV_FAIL_PLAIN();
    }
}

int QvDecodePipe::seekAll(const MediaTime& time) {
    int sum = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int i = 0; i < nrStreams(type); ++i) sum += seek(time, type, i);
    return sum == 0 ? QvStatus::ok : QvStatus::failed;
}

MediaTime QvDecodePipe::duration(int type, int stream) {
    if (type == qvVideoStream) {
        const Any rate = getVideoParam(stream, "framerate");
        QV_ASSERT_MSG(rate.isFramerate(), "Could not get 'framerate' from decoder");
        return MediaTime(nrFrames(stream), rate.asFramerate(), MediaTime::defaultTimescale);
    }
    QV_ASSERT(type == qvAudioStream);
    const Any rate = getAudioParam(stream, "samplerate");
    QV_ASSERT_MSG(rate.isInt(), "Could not get 'samplerate' from decoder");
    return MediaTime(nrSamples(stream), rate.toInt32(), MediaTime::defaultTimescale);
}

// --- Overrides.

AnyVector QvDecodePipe::overridableParams(int, int) { return AnyVector(); }

AnyVector* QvDecodePipe::overrideList(int type) const {
    switch (type) {
        case qvVideoStream: return &p_->videoOverrides;
        case qvAudioStream: return &p_->audioOverrides;
        case qvSubpicStream: return &p_->subpicOverrides;
        default: return nullptr;
    }
}

int QvDecodePipe::setOverride(int type, int stream, const char* name, const Any& value) {
    if (!overridableParams(type, stream).contains(Any(name))) {
        qv_dbg()->warning("[%s] Tried to override %s -  not allowed", this->name(), name);
        return QvStatus::failed;
    }
    AnyVector* list = overrideList(type);
    QV_ASSERT(list && stream >= 0 && stream < list->size());
    AnyDict& overridden = list->at(stream).asDict();
    const Any originalKey = Any::sprintf("%s_orig", name);
    const char* original = originalKey.asString();

    Any wanted = value;
    if (!wanted.isValid()) {
        if (overridden.isSet(original)) wanted = overridden.get(original);
        if (!wanted.isValid()) return QvStatus::ok;
    }
    if (!overridden.isSet(original)) overridden.set(original, getStreamParam(type, stream, name));
    overridden.set(name, wanted);
    return QvStatus::ok;
}

const Any& QvDecodePipe::override(int type, int stream, const char* name) {
    AnyVector* list = overrideList(type);
    if (!list) return Any::invalid();
    QV_ASSERT(stream >= 0 && stream < list->size());
    return list->at(stream).asDict().get(name);
}

const AnyVector& QvDecodePipe::overrides(int type) const {
    const AnyVector* list = overrideList(type);
    return list ? *list : AnyVector::null();
}

void QvDecodePipe::store(AnyDict& dict) const {
    dict.clear();
    const Any stored = getParam("store");
    if (stored.isDict()) dict = stored.asDict();
    if (!dict["name"].isString()) dict.set("name", Any(name()));
    if (!isEmptyDicts(p_->videoOverrides)) dict.set("vidsOverride", p_->videoOverrides);
    if (!isEmptyDicts(p_->audioOverrides)) dict.set("audsOverride", p_->audioOverrides);
    if (!isEmptyDicts(p_->subpicOverrides)) dict.set("subsOverride", p_->subpicOverrides);
}

// --- Coded frames and user data.

int QvDecodePipe::encodedFrameSize(int) { QV_FAIL("Not implemented"); }

int QvDecodePipe::readEncodedFrame(int, unsigned char*) { QV_FAIL("Not implemented"); }

int QvDecodePipe::setReadUserData(int, int, bool) { return QvStatus::failed; }

bool QvDecodePipe::readUserData(int, int) const { return false; }

// --- Peak levels.

namespace {

// Selects an audio stream that is not, for the time of its life.
class SelectedFor {
  public:
    SelectedFor(QvDecodePipe& decoder, int stream)
        : decoder_(decoder), stream_(stream), mine_(!decoder.isSelected(qvAudioStream, stream)) {
        if (mine_) decoder_.select(qvAudioStream, stream_);
    }
    SelectedFor(const SelectedFor&) = delete;
    SelectedFor& operator=(const SelectedFor&) = delete;
    ~SelectedFor() {
        if (mine_) decoder_.deselect(qvAudioStream, stream_);
    }

  private:
    QvDecodePipe& decoder_;
    int stream_;
    bool mine_;
};

}  // namespace

QvAudioStreamReport* QvDecodePipe::getAudioStreamReport(int stream, const QvReadWatch& watch) {
    if (stream < 0 || static_cast<std::size_t>(stream) >= p_->reports.size()) return nullptr;
    auto& kept = p_->reports[static_cast<std::size_t>(stream)];
    if (!kept) {
        const SelectedFor selection(*this, stream);
        kept = makeReport(stream, watch);
        seekToSample(0, stream);
    }
    return kept.get();
}

std::unique_ptr<QvAudioStreamReport> QvDecodePipe::makeReport(int stream, const QvReadWatch& watch) {
    const Any channels = getAudioParam(stream, "channels");
    const Any samplerate = getAudioParam(stream, "samplerate");
    const Any bits = getAudioParam(stream, "bitsPerSample");
    const long long total = nrSamples(stream);
    auto report = std::make_unique<QvAudioStreamReport>();
    if (report->init(total, channels.toInt32(), samplerate.toInt32(), bits.toInt32()) != QvStatus::ok)
        return nullptr;
    if (seekToSample(0, stream) != QvStatus::ok) return nullptr;

    int result = 1;
    for (long long left = total; left > 0 && result > 0; left -= result) {
        const int count = static_cast<int>(std::min<long long>(left, QvAudioStreamReport::groupSamples));
        result = readSamples(count, stream);
        if (result < 0 && result != QvStatus::endOfStream) return nullptr;
        const QvPcm* pcm = getAudioPtr(stream);
        if (!pcm) return nullptr;
        QV_ASSERT(result == QvStatus::endOfStream || pcm->samples() == count);
        report->processGroup(*pcm);
        if (watch && !watch(static_cast<double>(total - left) / static_cast<double>(total))) return nullptr;
    }
    return report;
}
