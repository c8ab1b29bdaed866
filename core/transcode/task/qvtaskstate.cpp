#include "core/transcode/task/qvtaskstate.h"

#include <algorithm>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/measure/streamtype.h"

namespace {

// The place of a type in a triple of counts.
std::size_t placeOf(int type) {
    switch (type) {
        case qvVideoStream: return 0;
        case qvAudioStream: return 1;
        case qvSubpicStream: return 2;
    }
    QV_FAIL_PLAIN();
}

const AnyDict& dictOf(const Any& value) { return value.isDict() ? value.asDict() : AnyDict::null(); }

int typeOf(const AnyDict& stream) { return stream.getInt32("type", 0); }

int sourceCount(const Any& stream) { return dictOf(stream).getVector("sources").size(); }

Pair addressOf(const AnyDict& source) {
    return source.get("stream").isPair() ? source.get("stream").asPair() : Pair();
}

int count(const AnyVector& streams, std::array<int, 3>& counts) {
    counts = {};
    for (const Any& stream : streams) ++counts[placeOf(typeOf(dictOf(stream)))];
    return streams.size();
}

// The list under a key for changing; what is no list there becomes an empty one.
AnyVector& listIn(AnyDict& dict, const char* key) {
    if (!dict.get(key).isVector()) dict.set(key, AnyVector());
    return dict.get(key).asVector();
}

void insertAt(AnyVector& list, const Any& value, int position) {
    if (position < 0)
        list.append(value);
    else
        list.insert(value, position);
}

}  // namespace

// --- Sources and files.

int QvTaskState::Source::type() const { return addressOf(*this).first; }

int QvTaskState::Source::number() const { return addressOf(*this).second; }

ProcessParams QvTaskState::Source::processParams() const { return getDict("process"); }

AnyDict QvTaskState::Source::info() const { return getDict("info"); }

AnyDict QvTaskState::File::decoder() const { return getDict("decoder"); }

QvTaskState::Segment::Segment(std::vector<Source> sources)
    : sources_(std::make_shared<const std::vector<Source>>(std::move(sources))) {
    for (const Source& source : *sources_) append(&source);
}

// --- The task as a whole.

QvEncodePipeState QvTaskState::encoder() const { return getDict("encoder"); }

bool QvTaskState::isEnabled() const { return getInt32("enabled", 1) != 0; }

void QvTaskState::setEnabled(bool on) { set("enabled", on ? 1 : 0); }

AnyVector QvTaskState::inputFilenames() const {
    AnyVector names;
    for (const Any& file : inputFiles()) names.append(dictOf(file).get("filename"));
    return names;
}

// --- Streams.

const AnyDict& QvTaskState::stream_in(int index) const { return dictOf(streams_in().at(index)); }

const AnyDict& QvTaskState::stream_in(const Pair& address) const {
    int left = address.second;
    for (const Any& stream : streams_in())
        if (typeOf(dictOf(stream)) == address.first && left-- == 0) return dictOf(stream);
    return AnyDict::null();
}

int QvTaskState::nrStreams(int type) const {
    const AnyVector& all = streams_out();
    if (type == 0 || type == qvAllStreams) return all.size();
    return static_cast<int>(std::count_if(
        all.begin(), all.end(), [type](const Any& stream) { return (typeOf(dictOf(stream)) & type) != 0; }));
}

int QvTaskState::nrStreams(std::array<int, 3>& counts) const { return count(streams_out(), counts); }

int QvTaskState::nrValidStreams(std::array<int, 3>& counts) const {
    AnyVector fed;
    for (const Any& stream : streams_in())
        if (sourceCount(stream) > 0) fed.append(AnyDict("type", typeOf(stream.asDict())));
    return count(fed, counts);
}

int QvTaskState::nrSources(int stream) const { return sourceCount(streams_in().at(stream)); }

const AnyVector& QvTaskState::sources(int stream) const { return stream_in(stream).getVector("sources"); }

const AnyVector& QvTaskState::sources(const Pair& address) const {
    return stream_in(address).getVector("sources");
}

QvTaskState::Source QvTaskState::source(int stream, int segment) const {
    return dictOf(sources(stream).at(segment));
}

QvTaskState::Source QvTaskState::source(const Pair& address, int segment) const {
    return dictOf(sources(address).at(segment));
}

ProcessParams QvTaskState::processParams(int stream, int segment) const {
    return source(stream, segment).processParams();
}

ProcessParams QvTaskState::processParams(const Pair& address, int segment) const {
    return source(address, segment).processParams();
}

int QvTaskState::fileByFilename(const Any& name) const {
    const AnyVector& files = inputFiles();
    for (int i = 0; i < files.size(); ++i) {
        const Any& own = dictOf(files.at(i)).get("filename");
        QV_ASSERT(own.isText());
        if (own == name) return i;
    }
    return -1;
}

int QvTaskState::fileForSource(const Source& source) const { return fileByFilename(source.get("file")); }

AnyVector QvTaskState::streamsForFile(const Any& name) const {
    AnyVector found;
    for (const Any& stream : streams_in()) {
        const AnyDict& first = dictOf(dictOf(stream).getVector("sources").at(0));
        if (!first.empty() && first.get("file") == name) found.append(Any(addressOf(first)));
    }
    return found;
}

void QvTaskState::removeSlots() {
    AnyVector empty;
    for (int i = 0; i < std::max(streams_in().size(), streams_out().size()); ++i)
        if (nrSources(i) == 0) empty.append(Any(i));
    if (get("streams").isVector()) get("streams").asVector().removeMany(empty);
    if (AnyDict& output = get("encoder").asDict(); output.get("streams").isVector())
        output.get("streams").asVector().removeMany(empty);
}

// --- Changing the output.

void QvTaskState::updateOutput(const AnyDict& encoder, const Any& filename) {
    QV_ASSERT(encoder.getVector("streams").size() == streams_out().size());
    set("encoder", encoder);
    if (filename.isText()) setOutputFilename(filename);
}

void QvTaskState::update(const QvTaskState& other, int segment) {
    updateOutput(other.getDict("encoder"), other.outputFilename());
    // A name of the multiplexer brings the preset's name along as well; it is not copied itself.
    for (const char* key : {"presetName", "muxerName"})
        if (other.isSet(key)) set("presetName", other.get("presetName"));
    if (segment == -1 || other.nrSegments() < 1) return;
    AnyVector first;
    for (int i = 0; i < other.streams_in().size(); ++i) first.append(dictOf(other.sources(i).at(0)));
    QV_ASSERT_MSG(first.size() == streams_out().size(),
                  "[QvTaskState::update] Invalid number of input streams");
    updateSegment(first, other.inputFiles(), segment);
}

// --- Segments.

int QvTaskState::countSegments() const {
    int common = 0;
    for (const Any& stream : streams_in()) {
        const int own = sourceCount(stream);
        if (own == 0) continue;  // a free slot
        if (common != 0 && own != common) return -1;
        common = own;
    }
    return common;
}

int QvTaskState::_checkSegmentCounts() {
    const int counted = countSegments();
    set("#nsegs", counted);
    return counted;
}

int QvTaskState::nrSegments() {
    const Any& kept = get("#nsegs");
    return std::max(kept.isInt32() ? kept.asInt32() : _checkSegmentCounts(), 0);
}

int QvTaskState::nrSegments() const {
    const Any& kept = get("#nsegs");
    return std::max(kept.isInt32() ? kept.asInt32() : countSegments(), 0);
}

void QvTaskState::_initEnabledState() {
    if (!get("segments").isVector()) {
        QV_ASSERT(nrSegments() >= 1);
        set("segments", AnyVector());
    }
    // A list from elsewhere may be too short.
    AnyVector& enabled = get("segments").asVector();
    while (enabled.size() < nrSegments()) enabled.append(1);
}

AnyVector QvTaskState::segments() const {
    const AnyVector& kept = getVector("segments");
    AnyVector all;
    for (int i = 0; i < nrSegments(); ++i) all.append(kept.at(i).asInt32(1) != 0 ? 1 : 0);
    return all;
}

bool QvTaskState::isSegmentEnabled(int index) const {
    return getVector("segments").at(index).asInt32(1) != 0;
}

void QvTaskState::setSegmentEnabled(int index, bool on) {
    QV_ASSERT(index >= 0 && index < nrSegments());
    _initEnabledState();
    get("segments").asVector().set(index, on ? 1 : 0);
}

int QvTaskState::getSegment(int index, Segment* segment, std::vector<int>* fileIndices) const {
    QV_ASSERT(segment);
    *segment = Segment();
    if (fileIndices) fileIndices->clear();
    if (index < 0 || index >= nrSegments()) return QvStatus::invalidStructure;
    std::vector<Source> sources;
    for (int i = 0; i < streams_in().size(); ++i) {
        sources.push_back(source(i, index));
        if (fileIndices) fileIndices->push_back(fileForSource(sources.back()));
    }
    *segment = Segment(std::move(sources));
    return QvStatus::ok;
}

int QvTaskState::getFilesForSegment(int index, AnyVector& files) const {
    files.clear();
    Segment segment;
    std::vector<int> indices;
    if (const int result = getSegment(index, &segment, &indices); result != QvStatus::ok) return result;
    for (auto place = indices.begin(); place != indices.end(); ++place)
        if (*place >= 0 && std::find(indices.begin(), place, *place) == place)
            files.append(inputFiles().at(*place));
    return QvStatus::ok;
}

AnyVector QvTaskState::newFiles(const AnyVector& files) const {
    AnyVector added;
    std::vector<Any> names;
    for (const Any& file : files) {
        if (!file.isDict()) continue;
        const Any& name = file.asDict().get("filename");
        if (fileByFilename(name) >= 0 || std::find(names.begin(), names.end(), name) != names.end()) continue;
        names.push_back(name);
        added.append(file);
    }
    return added;
}

int QvTaskState::addSegment(const AnyVector& sources, const AnyVector& files, int position) {
    QV_ASSERT(!streams_in().empty());
    AnyVector& streams = get("streams").asVector();
    if (sources.size() != streams.size()) {
        qv_dbg()->error("[TaskState] addSegment: Invalid number of streams in segment (%d), should be %d",
                        sources.size(), streams.size());
        QV_FAIL_PLAIN();
    }
    QV_ASSERT(get("segments").isVector() || nrSegments() >= 1);
    for (int i = 0; i < streams.size(); ++i) {
        const int type = addressOf(dictOf(sources.at(i))).first, wanted = typeOf(dictOf(streams.at(i)));
        if (type != wanted) {
            qv_dbg()->error("[TaskState] addSegment: Invalid stream type %d for stream %d, should be %d",
                            type, i, wanted);
            QV_FAIL_PLAIN();
        }
        QV_ASSERT(streams.at(i).isDict() && position >= -1 && position <= sourceCount(streams.at(i)));
    }
    const AnyVector added = newFiles(files);
    _initEnabledState();
    for (int i = 0; i < streams.size(); ++i)
        insertAt(listIn(streams.at(i).asDict(), "sources"), sources.at(i), position);
    _checkSegmentCounts();
    insertAt(get("segments").asVector(), isEnabled() ? 1 : 0, position);
    if (!added.empty()) listIn(*this, "files").extend(added);
    return QvStatus::ok;
}

int QvTaskState::updateSegment(const AnyVector& sources, const AnyVector& files, int position) {
    QV_ASSERT_MSG(position >= 0 && position < nrSegments(),
                  "[QvTaskState] updateSegment: invalid segment index.");
    AnyVector& streams = get("streams").asVector();
    bool elsewhere = false;
    for (int i = 0; i < streams.size(); ++i) {
        QV_ASSERT(sourceCount(streams.at(i)) > position);
        const AnyDict& now = dictOf(this->sources(i).at(position));
        const AnyDict& wanted = dictOf(sources.at(i));
        const Pair from = addressOf(now), to = addressOf(wanted);
        if (to.first != from.first) {
            qv_dbg()->error(
                "[TaskState] updateSegment(%d): Invalid stream type %d for stream %d, should be %d", position,
                to.first, i, from.first);
            QV_FAIL_PLAIN();
        }
        elsewhere |= wanted.get("file") != now.get("file") || to.second != from.second;
    }
    if (elsewhere && files.empty()) {
        qv_dbg()->error(
            "[TaskState] updateSegment: new segment has different src streams, but no file specs are given!");
        QV_FAIL_PLAIN();
    }
    const AnyVector added = elsewhere ? newFiles(files) : AnyVector();
    for (int i = 0; i < streams.size(); ++i)
        streams.at(i).asDict().get("sources").asVector().set(position, sources.at(i));
    if (!added.empty()) listIn(*this, "files").extend(added);
    return QvStatus::ok;
}

int QvTaskState::removeSegment(int index) {
    QV_ASSERT(index >= 0 && index < nrSegments());
    _initEnabledState();
    get("segments").asVector().remove(index);
    for (Any& stream : get("streams").asVector())
        if (sourceCount(stream) > 0) stream.asDict().get("sources").asVector().remove(index);
    _checkSegmentCounts();
    return QvStatus::ok;
}

int QvTaskState::swapSegments(int a, int b) {
    if (streams_in().empty()) return QvStatus::failed;
    AnyVector& streams = get("streams").asVector();
    QV_ASSERT(a >= 0 && b >= 0);
    for (const Any& stream : streams)
        if (const int own = sourceCount(stream); own > 0) QV_ASSERT(a < own && b < own);
    _initEnabledState();
    AnyVector& enabled = get("segments").asVector();
    QV_ASSERT(a < enabled.size() && b < enabled.size());
    if (a == b) return QvStatus::ok;
    for (Any& stream : streams) {
        if (sourceCount(stream) == 0) continue;
        AnyVector& sources = stream.asDict().get("sources").asVector();
        std::swap(sources.at(a), sources.at(b));
    }
    std::swap(enabled.at(a), enabled.at(b));
    return QvStatus::ok;
}
