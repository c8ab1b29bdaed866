#include "core/compose/qvaudiomixdecsetup.h"

#include <cmath>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/compose/qvmetafile.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/job/filtersstate.h"

namespace {

constexpr const char* stateName = "AudioMixSetup";
constexpr const char* elementName = "AudioInterleave";
constexpr int mostReplaced = 16;  // channels that setNrOutChannels gives up
constexpr double maxWeight = 32767.0;

bool within(int index, int size) { return index >= 0 && index < size; }

AnyDict emptyChannel() { return AnyDict("source", AnyVector()); }

const AnyVector& sourcesOf(const Any& channel) {
    const Any& sources = channel.isDict() ? channel.asDict().get("source") : Any::invalid();
    return sources.isVector() ? sources.asVector() : AnyVector::null();
}

// For each source of each channel, in order.
template <class Action>
void forSources(const AnyVector& channels, Action action) {
    for (const Any& channel : channels)
        for (const Any& source : sourcesOf(channel))
            if (source.isDict()) action(source.asDict());
}

std::string shown(const Any& text) { return text.toString().asString(""); }

bool isNumber(const Any& value) { return value.isInt() || value.isFloat(); }

// Why a source would not be mixed as it says.
std::string sourceFault(const Any& source) {
    if (!source.isDict()) return "it is no dictionary";
    const AnyDict& dict = source.asDict();
    if (!dict.get("src").isText() || dict.get("src").size() == 0) return "it names no file";
    const std::string file = "'" + shown(dict.get("src")) + "': ";
    for (const char* key : {"stream", "channel"}) {
        const Any& value = dict.get(key);
        if (!value.isInt32()) return file + key + " is no number";
        if (value.asInt32() < 0 || value.asInt32() >= QvAudioMixDecSetup::maxChannels)
            return file + key + " " + std::to_string(value.asInt32()) + " can't be";
    }
    const Any& weight = dict.get("weight");
    if (!isNumber(weight)) return file + "the weight is no number";
    if (!(std::fabs(weight.toDouble()) <= maxWeight)) return file + "the weight is beyond +-32767";
    return "";
}

std::string channelFault(const Any& channel) {
    if (!channel.isDict()) return "it is no dictionary";
    const Any& sources = channel.asDict().get("source");
    if (!sources.isValid()) return "";
    if (!sources.isVector()) return "its sources are no list";
    for (int i = 0; i < sources.asVector().size(); ++i)
        if (const std::string fault = sourceFault(sources.asVector().at(i)); !fault.empty())
            return "source " + std::to_string(i) + ": " + fault;
    return "";
}

bool isDecoder(const char* name) {
    const QvModule* module = qv_registry()->module(name);
    return module && module->getAttr("type") == Any(QvModuleType::decoder);
}

int failedToLoad(const Any& path, const char* reason, int code) {
    qv_log()->error("[audiomixdec]Failed to open %s, %s", shown(path).c_str(), reason);
    return code;
}

}  // namespace

// --- Files.

int QvAudioMixDecSetup::setInFileNames(const AnyVector& names) {
    AnyVector kept = names;  // may be our own
    inFileNames_.swap(kept);
    decoders_.clear();
    decoders_.resize(inFileNames_.size());
    _createMuteChannels(inFileNames_.size());
    return QvStatus::ok;
}

Any QvAudioMixDecSetup::inFileName(int file) const { return inFileNames_.at(file); }

int QvAudioMixDecSetup::setDecoder(int file, const char* name) {
    if (!name || !within(file, inFileNames_.size())) return QvStatus::failed;
    decoders_.set(file, Any(name));
    return QvStatus::ok;
}

int QvAudioMixDecSetup::setDecoder(const Any& file, const char* name) {
    return setDecoder(inFileNames_.indexOf(file), name);
}

const char* QvAudioMixDecSetup::decoder(int file) const { return decoders_.at(file).asString(nullptr); }

const char* QvAudioMixDecSetup::decoder(const Any& file) const { return decoder(inFileNames_.indexOf(file)); }

// --- Channels.

void QvAudioMixDecSetup::_createMuteChannels(int n) {
    outChannels_.clear();
    for (int i = 0; i < n; ++i) outChannels_.append(emptyChannel());
}

int QvAudioMixDecSetup::setNrOutChannels(int n) {
    if (n < 0 || outChannels_.size() > mostReplaced) return QvStatus::failed;
    _createMuteChannels(n);
    return QvStatus::ok;
}

int QvAudioMixDecSetup::setChannelPosition(int channel, const char* position) {
    if (!position || !within(channel, outChannels_.size()) || !outChannels_.at(channel).isDict())
        return QvStatus::failed;
    outChannels_.at(channel).asDict().set("pos", position);
    return QvStatus::ok;
}

int QvAudioMixDecSetup::setWeight(int out, int file, int stream, int channel, double weight) {
    if (!within(file, inFileNames_.size())) return QvStatus::failed;
    return setWeight(out, inFileNames_.at(file), stream, channel, weight);
}

int QvAudioMixDecSetup::setWeight(int out, const Any& file, int stream, int channel, double weight) {
    if (!within(out, outChannels_.size()) || !outChannels_.at(out).isDict() || !inFileNames_.contains(file))
        return QvStatus::failed;
    const Any name = file;  // may be a part of what changes
    AnyDict& output = outChannels_.at(out).asDict();
    if (!output.get("source").isVector()) output.set("source", AnyVector());
    AnyVector& sources = output.get("source").asVector();
    for (Any& entry : sources) {
        if (!entry.isDict()) continue;
        AnyDict& source = entry.asDict();
        // No entry has "inChannel", which therefore reads 0: only channel 0 is found again.
        if (source.get("src") != name || source.get("stream") != Any(stream) ||
            source.getInt32("inChannel") != channel)
            continue;
        source.set("weight", weight);
        return QvStatus::ok;
    }
    sources.append(AnyDict("src", name, "stream", stream, "channel", channel, "weight", weight));
    return QvStatus::ok;
}

AnyVector QvAudioMixDecSetup::getFileActiveStreams(const Any& file) const {
    AnyVector streams;
    forSources(outChannels_, [&](const AnyDict& source) {
        const Any& stream = source.get("stream");
        if (source.get("src") == file && stream.isInt32() && !streams.contains(stream))
            streams.append(stream);
    });
    return streams;
}

// --- Filters.

namespace {

int indexOfFilters(const AnyVector& filters, const Any& file, int stream) {
    for (int i = 0; i < filters.size(); ++i) {
        if (!filters.at(i).isDict()) continue;
        const AnyDict& entry = filters.at(i).asDict();
        if (entry.get("file") == file && entry.get("stream") == Any(stream)) return i;
    }
    return -1;
}

}  // namespace

int QvAudioMixDecSetup::setFilters(int file, int stream, const FiltersState& filters) {
    if (!within(file, inFileNames_.size())) return QvStatus::failed;
    return setFilters(inFileNames_.at(file), stream, filters);
}

int QvAudioMixDecSetup::setFilters(const Any& file, int stream, const FiltersState& filters) {
    if (!inFileNames_.contains(file)) return QvStatus::failed;
    const AnyDict state = filters;
    const int index = indexOfFilters(filters_, file, stream);
    if (index < 0)
        filters_.append(AnyDict("file", file, "stream", stream, "filters", state));
    else
        filters_.at(index).asDict().set("filters", state);
    return QvStatus::ok;
}

const FiltersState* QvAudioMixDecSetup::filters(int file, int stream) const {
    return within(file, inFileNames_.size()) ? filters(inFileNames_.at(file), stream) : nullptr;
}

const FiltersState* QvAudioMixDecSetup::filters(const Any& file, int stream) const {
    const int index = indexOfFilters(filters_, file, stream);
    const Any& state = index < 0 ? Any::invalid() : filters_.at(index).asDict().get("filters");
    asked_ = state.isDict() ? std::make_shared<FiltersState>(state.asDict()) : nullptr;
    return asked_.get();
}

// --- Stored.

void QvAudioMixDecSetup::store(AnyDict& dict) const {
    AnyVector named;
    for (int i = 0; i < decoders_.size(); ++i)
        if (const char* name = decoder(i)) named.append(AnyDict("file", inFileNames_.at(i), "dec", name));
    dict.set("name", stateName);
    dict.set("outChannels", outChannels_);
    if (!named.empty()) dict.set("decoders", std::move(named));
    if (!filters_.empty()) dict.set("filters", filters_);
}

int QvAudioMixDecSetup::restore(const AnyDict& dict) {
    if (dict.get("name") != stateName || !dict.get("outChannels").isVector()) return QvStatus::failed;
    outChannels_ = dict.getVector("outChannels");
    inFileNames_.clear();
    forSources(outChannels_, [this](const AnyDict& source) {
        const Any& file = source.get("src");
        if (file.isText() && !inFileNames_.contains(file)) inFileNames_.append(file);
    });
    decoders_.clear();
    decoders_.resize(inFileNames_.size());
    for (const Any& entry : dict.getVector("decoders")) {
        if (!entry.isDict()) continue;
        const int file = inFileNames_.indexOf(entry.asDict().get("file"));
        if (file >= 0 && entry.asDict().get("dec").isString()) decoders_.set(file, entry.asDict().get("dec"));
    }
    filters_.clear();
    if (dict.get("filters").isVector()) filters_ = dict.getVector("filters");
    return QvStatus::ok;
}

int QvAudioMixDecSetup::save(const Any& path) const {
    AnyDict dict;
    store(dict);
    QvMetafile file;
    file.addElement(elementName, dict);
    return file.save(path);
}

int QvAudioMixDecSetup::load(const Any& path) {
    const QvMetafile file(path);
    if (file.errorCode() != QvStatus::ok) return failedToLoad(path, file.errorDesc(), file.errorCode());
    const Any& element = file.element(elementName);
    if (!element.isDict()) return failedToLoad(path, "metafile contents not supported", QvStatus::failed);
    return restore(element.asDict());
}

std::string QvAudioMixDecSetup::check(const AnyDict& dict) {
    if (dict.get("name") != stateName || !dict.get("outChannels").isVector()) return "it is no mix set-up";
    const AnyVector& channels = dict.getVector("outChannels");
    if (channels.empty()) return "it has no channel";
    if (channels.size() > maxChannels)
        return "it has " + std::to_string(channels.size()) + " channels, more than " +
               std::to_string(maxChannels);
    bool sounds = false;
    for (int i = 0; i < channels.size(); ++i) {
        if (const std::string fault = channelFault(channels.at(i)); !fault.empty())
            return "channel " + std::to_string(i) + ": " + fault;
        sounds |= !sourcesOf(channels.at(i)).empty();
    }
    if (!sounds) return "no channel has a source";
    for (const Any& entry : dict.getVector("decoders")) {
        const char* name = entry.isDict() ? entry.asDict().getString("dec") : nullptr;
        if (name && !isDecoder(name)) return std::string("there is no decoder '") + name + "'";
    }
    return "";
}

QvDecodePipe* QvAudioMixDecSetup::createMixDecoder(int targetSamplerate) const {
    AnyDict dict;
    store(dict);
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("aumixdec"));
    auto* decoder = codec ? static_cast<QvDecodePipe*>(codec->getInterface(QvModuleType::decoder)) : nullptr;
    if (!decoder) return nullptr;
    decoder->setParam("metaState", dict);
    decoder->setParam("targetSamplerate", targetSamplerate);
    if (decoder->open() != QvStatus::ok) return nullptr;
    codec.release();
    return decoder;
}
