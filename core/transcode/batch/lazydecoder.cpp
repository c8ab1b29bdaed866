#include <algorithm>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/batch/lazydecoder_p.h"

namespace {

// A stream's selection and where the next read starts.
struct Place {
    bool selected = false;
    bool userData = false;  // is read
    long long next = 0;
    bool sought = false;  // `next` may not be where the source stands when it is opened
    int fault = 0;        // of the last attempt to go there
};

bool isOfStream(const char* name) {
    for (const char* prefix : {"video", "audio", "subpic"})
        if (std::strncmp(name, prefix, std::strlen(prefix)) == 0) return true;
    return false;
}

}  // namespace

struct LazyDecoder::Source {
    std::shared_ptr<const SourceFacts> facts;
    Opener opener;
    std::unique_ptr<QvDecodePipe> decoder;  // while it is open
    OpenDecoders::Order::iterator own;      // end() while it is closed or `forGood`
    bool forGood = false;
    bool spoiled = false;  // it has failed, so no other segment takes it over
    std::vector<Place> video, audio, subpic;

    std::vector<Place>& of(int type) {
        return type == qvVideoStream ? video : type == qvAudioStream ? audio : subpic;
    }
    Place* place(int type, int number) {
        auto& all = of(type);
        return number >= 0 && static_cast<std::size_t>(number) < all.size()
                   ? &all[static_cast<std::size_t>(number)]
                   : nullptr;
    }
    bool anySelected() {
        for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
            for (const Place& place : of(type))
                if (place.selected) return true;
        return false;
    }
    void go(int type, int number) {
        Place& place = *this->place(type, number);
        if (!place.sought || type == qvSubpicStream) return;
        place.fault = type == qvVideoStream ? decoder->seekToFrame(place.next, number)
                                            : decoder->seekToSample(place.next, number);
    }
    // Selection and positions into a decoder that has just been opened, or was in use elsewhere.
    void takeUp(bool used) {
        for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
            for (std::size_t i = 0; i < of(type).size(); ++i) {
                Place& place = of(type)[i];
                const int number = static_cast<int>(i);
                place.sought |= used;
                if (place.selected != decoder->isSelected(type, number))
                    place.selected ? decoder->select(type, number) : decoder->deselect(type, number);
                if (type == qvVideoStream && place.userData != decoder->readUserData(type, number))
                    decoder->setReadUserData(type, number, place.userData);
                if (place.selected) go(type, number);
            }
        spoiled = false;
    }
};

// --- The open sources of a task.

void OpenDecoders::makeRoom() {
    while (count() >= limit_) {
        if (!idle_.empty())
            idle_.pop_back();
        else
            order_.back()->rest();
    }
}

std::unique_ptr<QvDecodePipe> OpenDecoders::take(const std::shared_ptr<const SourceFacts>& facts) {
    const auto found =
        std::find_if(idle_.begin(), idle_.end(), [&](const Idle& idle) { return idle.facts == facts; });
    if (found == idle_.end()) return nullptr;
    std::unique_ptr<QvDecodePipe> decoder = std::move(found->decoder);
    idle_.erase(found);
    return decoder;
}

// --- One of them.

LazyDecoder::LazyDecoder(std::shared_ptr<OpenDecoders> others, std::shared_ptr<const SourceFacts> facts,
                         Opener opener)
    : source_(std::make_unique<Source>()), others_(std::move(others)) {
    source_->facts = std::move(facts);
    source_->opener = std::move(opener);
    source_->own = others_->order_.end();
    for (const int type : {qvVideoStream, qvAudioStream, qvSubpicStream})
        for (const SourceFacts::Stream& stream : source_->facts->of(type))
            source_->of(type).push_back({.selected = stream.selected, .userData = stream.readsUserData});
    setState(stateInitialised);
}

LazyDecoder::~LazyDecoder() {
    source_->forGood = false;
    rest();
}

// --- Opening and closing.

bool LazyDecoder::isAwake() const { return source_->decoder != nullptr; }

void LazyDecoder::leave() {
    if (source_->own != others_->order_.end()) others_->order_.erase(source_->own);
    source_->own = others_->order_.end();
}

void LazyDecoder::rest() {
    if (!source_->decoder || source_->forGood) return;
    leave();
    source_->decoder.reset();  // which closes it
}

void LazyDecoder::giveUp() {
    if (!source_->decoder || source_->forGood) return;
    if (source_->spoiled) return rest();
    leave();
    others_->keep({source_->facts, std::move(source_->decoder)});
}

QvDecodePipe* LazyDecoder::awake() const {
    Source& source = *source_;
    auto& order = others_->order_;
    if (source.decoder) {
        if (source.own != order.end()) order.splice(order.begin(), order, source.own);
        return source.decoder.get();
    }
    std::unique_ptr<QvDecodePipe> opened = others_->take(source.facts);
    const bool used = opened != nullptr;
    if (!used) {
        others_->makeRoom();
        opened.reset(source.opener());
    }
    if (!opened) return nullptr;
    source.own = order.insert(order.begin(), const_cast<LazyDecoder*>(this));
    source.decoder = std::move(opened);
    source.takeUp(used);
    return source.decoder.get();
}

QvDecodePipe& LazyDecoder::mustBeAwake() const {
    QvDecodePipe* decoder = awake();
    QV_ASSERT_MSG(decoder, "The input can't be opened any more");
    return *decoder;
}

QvDecodePipe& LazyDecoder::forGood() const {
    QvDecodePipe& decoder = mustBeAwake();
    if (!std::exchange(source_->forGood, true)) others_->order_.erase(source_->own);
    source_->own = others_->order_.end();
    return decoder;
}

int LazyDecoder::copyError(int result) {
    if (result >= 0 || result == QvStatus::endOfStream) return result;
    source_->spoiled = true;
    return setError(result, "%s", source_->decoder->errorDesc());
}

int LazyDecoder::close() {
    source_->forGood = false;
    rest();
    return QvDecodePipe::close();
}

// --- What is known.

const char* LazyDecoder::name() const { return source_->facts->name.c_str(); }

int LazyDecoder::nrStreams(int type) const {
    if (source_->forGood) return source_->decoder->nrStreams(type);
    int count = 0;
    for (const int one : {qvVideoStream, qvAudioStream, qvSubpicStream})
        if (qvStreamTypeMatches(one, type)) count += static_cast<int>(source_->facts->of(one).size());
    return count;
}

void LazyDecoder::getParam(const char* name, Any& value) const {
    if (source_->forGood || value.isValid()) return mustBeAwake().getParam(name, value);
    if (isOfStream(name)) return QvDecodePipe::getParam(name, value);
    if (std::strcmp(name, "filename") == 0) {
        value = source_->facts->filename;
        return;
    }
    auto& answers = source_->facts->answers;
    auto known = answers.find(name);
    if (known == answers.end()) {
        Any answer;
        mustBeAwake().getParam(name, answer);
        known = answers.emplace(name, answer).first;
    }
    value = known->second;
}

void LazyDecoder::getStreamParams(int type, int stream, AnyDict& params) const {
    const SourceFacts::Stream* known = source_->facts->stream(type, stream);
    if (source_->forGood || !known)
        mustBeAwake().getStreamParams(type, stream, params);
    else
        params = known->params;
}

void LazyDecoder::getStreamParam(int type, int stream, const char* name, Any& value) const {
    const SourceFacts::Stream* known = source_->facts->stream(type, stream);
    if (source_->forGood || !known || value.isValid())
        return mustBeAwake().getStreamParam(type, stream, name, value);
    if (known->params.isSet(name)) {
        value = known->params.get(name);
        return;
    }
    const std::string key = std::to_string(type) + "/" + std::to_string(stream) + "/" + name;
    auto& answers = source_->facts->answers;
    auto answered = answers.find(key);
    if (answered == answers.end() || isAwake()) {  // counts change while it is read
        Any answer;
        mustBeAwake().getStreamParam(type, stream, name, answer);
        answered = answers.insert_or_assign(key, answer).first;
    }
    value = answered->second;
}

int LazyDecoder::nrFrames(int stream) const {
    const SourceFacts::Stream* known = source_->facts->stream(qvVideoStream, stream);
    return source_->forGood || !known ? mustBeAwake().nrFrames(stream) : static_cast<int>(known->units);
}

long long LazyDecoder::nrSamples(int stream) const {
    const SourceFacts::Stream* known = source_->facts->stream(qvAudioStream, stream);
    return source_->forGood || !known ? mustBeAwake().nrSamples(stream) : known->units;
}

MediaTime LazyDecoder::duration(int type, int stream) {
    const SourceFacts::Stream* known =
        type == qvSubpicStream ? nullptr : source_->facts->stream(type, stream);
    return source_->forGood || !known ? mustBeAwake().duration(type, stream) : known->duration;
}

void LazyDecoder::store(AnyDict& dict) const {
    if (source_->forGood)
        source_->decoder->store(dict);
    else
        dict = source_->facts->stored;
}

// --- Streams and positions.

int LazyDecoder::select(int type, int stream) {
    Place* place = source_->place(type, stream);
    if (source_->decoder || !place) {
        const int result = mustBeAwake().select(type, stream);
        if (result != QvStatus::ok || !place) return copyError(result);
        if (!place->selected) source_->go(type, stream);
    }
    place->selected = true;
    return QvStatus::ok;
}

int LazyDecoder::deselect(int type, int stream) {
    Place* place = source_->place(type, stream);
    if (source_->decoder || !place) {
        const int result = mustBeAwake().deselect(type, stream);
        if (result != QvStatus::ok || !place) return copyError(result);
    }
    place->selected = false;
    if (!source_->anySelected()) giveUp();
    return QvStatus::ok;
}

bool LazyDecoder::isSelected(int type, int stream) const {
    const Place* place = source_->place(type, stream);
    return place ? place->selected : mustBeAwake().isSelected(type, stream);
}

int LazyDecoder::selected(AnyDict& dict) const { return mustBeAwake().selected(dict); }

int LazyDecoder::seekToFrame(long long frame, int stream) {
    Place* place = source_->place(qvVideoStream, stream);
    if (!place) return copyError(forGood().seekToFrame(frame, stream));
    place->next = frame;
    place->sought = true;
    place->fault = source_->decoder ? copyError(source_->decoder->seekToFrame(frame, stream)) : QvStatus::ok;
    return place->fault;
}

int LazyDecoder::seekToSample(long long sample, int stream) {
    Place* place = source_->place(qvAudioStream, stream);
    if (!place) return copyError(forGood().seekToSample(sample, stream));
    place->next = sample;
    place->sought = true;
    place->fault =
        source_->decoder ? copyError(source_->decoder->seekToSample(sample, stream)) : QvStatus::ok;
    return place->fault;
}

int LazyDecoder::readFrame(int stream) {
    QvDecodePipe* decoder = awake();
    if (!decoder) return refuse();
    Place* place = source_->place(qvVideoStream, stream);
    if (place && place->fault < 0) return copyError(place->fault);
    const int result = decoder->readFrame(stream);
    if (result == QvStatus::ok && place) {
        ++place->next;
        place->sought = true;
    }
    return copyError(result);
}

int LazyDecoder::readSamples(int count, int stream) {
    QvDecodePipe* decoder = awake();
    if (!decoder) return refuse();
    Place* place = source_->place(qvAudioStream, stream);
    if (place && place->fault < 0) return copyError(place->fault);
    const int result = decoder->readSamples(count, stream);
    if (result > 0 && place) {
        place->next += result;
        place->sought = true;
    }
    return copyError(result);
}

int LazyDecoder::refuse() const {
    const Any name = source_->facts->filename.toString();
    return const_cast<LazyDecoder*>(this)->setError(QvStatus::failed, "Failed to open file '%s' using '%s'.",
                                                    name.asString(""), this->name());
}

QvFrame* LazyDecoder::getFramePtr(int stream) {
    return source_->decoder ? source_->decoder->getFramePtr(stream) : nullptr;
}

QvPcm* LazyDecoder::getAudioPtr(int stream) {
    return source_->decoder ? source_->decoder->getAudioPtr(stream) : nullptr;
}

// --- What only the source can do.

int LazyDecoder::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "clipRange") == 0) {  // of the next reads alone, so it need not stay open for this
        QvDecodePipe* decoder = awake();
        return decoder ? decoder->setParam(name, value) : refuse();
    }
    return copyError(forGood().setParam(name, value));
}

int LazyDecoder::process() { return copyError(mustBeAwake().process()); }

void* LazyDecoder::getInterface(int kind) const {
    if (void* own = QvDecodePipe::getInterface(kind)) return own;
    return forGood().getInterface(kind);
}

int LazyDecoder::restore(const AnyDict& state) { return copyError(forGood().restore(state)); }

void LazyDecoder::elementaryStream(int type, int stream, QvElementaryStream* out) const {
    mustBeAwake().elementaryStream(type, stream, out);
}

int LazyDecoder::setStreamParam(int type, int stream, const char* name, const Any& value) {
    return copyError(forGood().setStreamParam(type, stream, name, value));
}

int LazyDecoder::readMeta(int stream, int kind, AnyDict& out) {
    return copyError(forGood().readMeta(stream, kind, out));
}

AnyVector LazyDecoder::overridableParams(int type, int stream) {
    return mustBeAwake().overridableParams(type, stream);
}

int LazyDecoder::setOverride(int type, int stream, const char* name, const Any& value) {
    return copyError(forGood().setOverride(type, stream, name, value));
}

const Any& LazyDecoder::override(int type, int stream, const char* name) {
    return forGood().override(type, stream, name);
}

const AnyVector& LazyDecoder::overrides(int type) const { return forGood().overrides(type); }

int LazyDecoder::encodedFrameSize(int stream) { return forGood().encodedFrameSize(stream); }

int LazyDecoder::readEncodedFrame(int stream, unsigned char* to) {
    return copyError(forGood().readEncodedFrame(stream, to));
}

// Links ask every segment for it, so it must not open their sources.
int LazyDecoder::setReadUserData(int type, int stream, bool on) {
    Place* place = source_->place(type, stream);
    if (!place || source_->decoder) {
        const int result = mustBeAwake().setReadUserData(type, stream, on);
        if (result != QvStatus::ok || !place) return result;
    }
    place->userData = on;
    return QvStatus::ok;
}

bool LazyDecoder::readUserData(int type, int stream) const {
    const Place* place = source_->place(type, stream);
    return place && !source_->decoder ? place->userData : mustBeAwake().readUserData(type, stream);
}
