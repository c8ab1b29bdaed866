#include <algorithm>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/decode/decodefactory.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/transcode/batch/segmentinputs_p.h"
#include "core/transcode/task/qvtaskstate.h"
#include "core/transcode/task/taskstore_p.h"

namespace {

// Room for the segment that is read and the next one, and enough that few files are opened twice.
constexpr int leastOpen = 16;

const AnyDict& sourceAt(const QvTaskState& state, int stream, int segment) {
    const Any& source = state.sources(stream).at(segment);
    return source.isDict() ? source.asDict() : AnyDict::null();
}

// Names of both widths.
std::string textOf(const Any& name) {
    const Any text = name.toString();
    return (name.isWString() ? "w" : "n") + std::string(text.asString(""));
}

std::string shown(const Any& name) { return textOf(name).substr(1); }

Pair addressOf(const AnyDict& source) {
    return source.get("stream").isPair() ? source.get("stream").asPair() : Pair();
}

const char* typeText(int type) {
    const bool known = type == qvVideoStream || type == qvAudioStream || type == qvSubpicStream;
    return known ? QvTask::typeName(type) : "unknown";
}

}  // namespace

SegmentInputs::SegmentInputs(const QvTaskState& state, QvFileOpenCb* callback)
    : state_(state), callback_(callback) {
    const AnyVector& files = state.inputFiles();
    for (int i = 0; i < files.size(); ++i)
        if (files.at(i).isDict()) places_.emplace(textOf(files.at(i).asDict().get("filename")), i);
    if (state.nrSegments() > 1)
        open_ = std::make_shared<OpenDecoders>(std::max(leastOpen, 2 * state.streams_in().size()));
}

QvDecodePipe* SegmentInputs::free(const QvInputSegment& segment, const AnyDict& source) const {
    const Pair address = addressOf(source);
    QvDecodePipe* decoder = segment.decoders.findByFilename(source.get("file"), nullptr);
    const auto taken = [&] {
        return std::any_of(segment.streams.begin(), segment.streams.end(), [&](const auto& stream) {
            return *stream == QvIStream(decoder, address.first, address.second);
        });
    };
    while (decoder && taken()) decoder = segment.decoders.findByFilename(source.get("file"), decoder);
    return decoder;
}

std::shared_ptr<const SourceFacts> SegmentInputs::factsOf(const AnyDict& file) {
    const std::string name = textOf(file.get("filename"));
    const auto [first, last] = known_.equal_range(name);
    for (auto known = first; known != last; ++known)
        if (known->second.file == file) return known->second.facts;
    std::shared_ptr<const SourceFacts> facts;
    if (const std::unique_ptr<QvDecodePipe> decoder{qvtaskstore::openInput(file, callback_)})
        facts = std::make_shared<const SourceFacts>(*decoder);
    known_.emplace(name, Known{file, facts});
    return facts;
}

// Null when the file can't be opened.
QvDecodePipe* SegmentInputs::make(const AnyDict& source) {
    const Any& name = source.get("file");
    const Pair address = addressOf(source);
    qv_dbg()->info("[Task] Need to make new decoder copy for stream %s#%d", typeText(address.first),
                   address.second);
    if (!name.isText()) return nullptr;
    AnyDict file;
    if (const auto place = places_.find(textOf(name)); place != places_.end()) {
        file = state_.inputFiles().at(place->second).asDict();
        QV_ASSERT(file.get("filename") == name);
    } else {
        qv_dbg()->info("File open data not found in input files section. Using default open for %s",
                       shown(name).c_str());
        file.set("filename", name);
    }
    if (!open_) return qvtaskstore::openInput(file, callback_);
    auto facts = factsOf(file);
    if (!facts) return nullptr;
    auto decoder = std::make_unique<LazyDecoder>(open_, std::move(facts),
                                                 [file] { return qvtaskstore::openInput(file, nullptr); });
    return decoder->open() == QvStatus::ok ? decoder.release() : nullptr;
}

int SegmentInputs::open(int index, QvInputSegment& segment, std::string& error) {
    QV_ASSERT_MSG(index >= 0 && index < state_.nrSegments(),
                  "Task.openFilesForSegment: segment index out of range");
    int result = QvStatus::ok;
    for (int i = 0; i < state_.streams_in().size(); ++i) {
        const AnyDict& source = sourceAt(state_, i, index);
        const Pair address = addressOf(source);
        auto stream = std::make_unique<QvIStream>(nullptr, address.first, address.second);
        if (source.empty()) {  // nothing feeds this output stream
            stream->type = state_.stream_in(i).getInt32("type", 0);
            segment.streams.push_back(std::move(stream));
            continue;
        }
        QvDecodePipe* decoder = free(segment, source);
        if (!decoder) {
            std::unique_ptr<QvDecodePipe> made(make(source));
            if (made) segment.decoders.append(made.get());
            decoder = made.release();
        }
        const bool present = decoder && address.second >= 0 &&
                             address.second < decoder->nrStreams(address.first) &&
                             (decoder->isSelected(address.first, address.second) ||
                              decoder->select(address.first, address.second) == QvStatus::ok);
        if (!present) {
            error = "Failed to open file '" + shown(source.get("file")) + "' in input segment " +
                    std::to_string(index);
            qv_dbg()->error("%s", error.c_str());
            result = QvStatus::failed;
            continue;
        }
        stream->decoder = decoder;
        if (const AnyDict& process = source.getDict("process"); !process.empty())
            stream->params = ProcessParams(process);
        segment.streams.push_back(std::move(stream));
    }
    return result;
}
