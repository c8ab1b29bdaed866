#include "core/transcode/batch/qvbatchtask.h"

#include <algorithm>
#include <set>
#include <string>
#include <utility>

#include "core/arch/qvassert.h"
#include "core/arch/qvexception.h"
#include "core/arch/undo_p.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/transcode/batch/qvbatchdecoder.h"
#include "core/transcode/batch/segmentinputs_p.h"
#include "core/transcode/batch/segmentjoin_p.h"
#include "core/transcode/batch/segmentspan_p.h"
#include "core/transcode/task/postprocess_p.h"
#include "core/transcode/task/qvtaskstate.h"
#include "core/transcode/task/segmentdurations_p.h"

namespace {

constexpr const char* unhandled = "QvBatchTask.initFromState: unhandled condition";

QvIStreamList fedStreams(const QvInputSegment& segment) {
    QvIStreamList list;
    for (const auto& stream : segment.streams)
        if (stream->decoder) list.append(stream.get());
    return list;
}

}  // namespace

QvBatchTask::QvBatchTask() = default;

QvBatchTask::~QvBatchTask() = default;

int QvBatchTask::nrSegments() const { return static_cast<int>(segments_.size()); }

const QvInputSegment& QvBatchTask::segment(int index) const {
    QV_ASSERT(index >= 0 && index < nrSegments());
    return *segments_[static_cast<std::size_t>(index)];
}

int QvBatchTask::indexOfActualSegment(int index) const {
    for (int i = 0; i < nrSegments(); ++i)
        if (segment(i).status == QvInputSegment::opened && index-- == 0) return i;
    return -1;
}

int QvBatchTask::checkDurations() {
    for (const auto& segment : segments_)
        if (segment->status == QvInputSegment::opened) qvAdjustSegmentDurations(fedStreams(*segment));
    return QvStatus::ok;
}

Any QvBatchTask::currentPostprocessCommand() const {
    if (!batchDecoder_) return QvTask::currentPostprocessCommand();
    QvDPipeList inputs;
    std::set<std::string> names;
    for (const auto& segment : segments_)
        for (QvDecodePipe* decoder : segment->decoders) {
            const Any name = decoder->QvCodec::getParam("filename").toString();
            if (names.insert(name.asString("")).second) inputs.append(decoder);
        }
    return qvPostprocessCommand(postprocessCommand(), inputs, encoder());
}

// --- Opening.

// How many segments are open; 0 also when one that has to be is not.
int QvBatchTask::openFiles(const QvTaskState& state, int options, QvFileOpenCb* callback,
                           QvDPipeList& opened) {
    if (state.nrSegments() < 1) {
        qv_dbg()->error("[Task] BatchTask.openFiles: invalid TaskState structure - no input segments");
        return QvStatus::failed;
    }
    SegmentInputs inputs(state, callback);
    int open = 0;
    for (int i = 0; i < state.nrSegments(); ++i) {
        QvInputSegment& segment = *segments_.emplace_back(std::make_unique<QvInputSegment>());
        if ((options & skipDisabled) && !state.isSegmentEnabled(i)) {
            segment.status = QvInputSegment::disabled;
            continue;
        }
        std::string error;
        // Until they stand in the list nobody else knows the decoders.
        int kept = 0;
        Undo closing([&] {
            for (; kept > 0; --kept) segment.decoders.remove(0);
            segment.decoders.deleteAll();
        });
        const int result = inputs.open(i, segment, error);
        if (result == QvStatus::ok) {
            for (QvDecodePipe* decoder : segment.decoders) {
                opened.append(decoder);
                ++kept;
            }
            closing.dismiss();
            segment.status = QvInputSegment::opened;
            ++open;
            continue;
        }
        setError(result, "%s", error.c_str());
        qv_dbg()->error("[Task] Cannot add input segment %d", i);
        segment.streams.clear();
        segment.decoders.deleteAll();
        closing.dismiss();
        if (!(options & everySegmentOpens)) continue;
        segments_.clear();
        opened.deleteAll();
        return 0;
    }
    logSegments();
    return open;
}

void QvBatchTask::logSegments() const {
    qv_dbg()->info("[Task] Input segment information:");
    const auto failed = std::count_if(segments_.begin(), segments_.end(), [](const auto& segment) {
        return segment->status == QvInputSegment::failed;
    });
    if (failed > 0)
        qv_dbg()->info("[Task] * Failed to open required input file(s) for %d input segment(s).",
                       static_cast<int>(failed));
    for (int i = 0; i < nrSegments(); ++i) {
        qv_dbg()->info("[Task] Input segment #%d:", i);
        if (segment(i).status == QvInputSegment::failed)
            qv_dbg()->info("[Task] * Ignored: could not open required file(s)");
        else if (segment(i).status == QvInputSegment::disabled)
            qv_dbg()->info("[Task] + Skipped because disabled");
        else
            for (std::size_t k = 0; k < segment(i).streams.size(); ++k) {
                const QvIStream& stream = *segment(i).streams[k];
                if (stream.decoder)
                    qv_dbg()->info("[Task] + stream %d: %s (%p)", static_cast<int>(k),
                                   qvStreamLabel(stream).c_str(), static_cast<void*>(stream.decoder));
            }
    }
}

// --- Restoring.

int QvBatchTask::restorePipe(const QvTaskState& state, QvEncodePipe& pipe) {
    if (const int result = pipe.restore(state.getDict("encoder")); result != QvStatus::ok) {
        qv_dbg()->error("BachTask.restore: EncodePipe.restore failed.");
        return setError(result, "%s", pipe.errorDesc());
    }
    if (state.outputFilename().isText()) pipe.setFilename(state.outputFilename());
    const QvEncodePipeState stored = state.encoder();
    bool same = pipe.nrStreams() == stored.nrStreams();
    for (int i = 0; same && i < pipe.nrStreams(); ++i) {
        const QvOStream& made = *pipe.streamAt(i);
        same = made.type == stored.stream(i).type() &&
               (made.type == qvSubpicStream ||
                (made.encoder && stored.stream(i).codecName() == made.encoder->name()));
    }
    QV_ASSERT_MSG(same, "BatchTask.initFromState: invalid output stream ordering in ep/ts");
    return QvStatus::ok;
}

void QvBatchTask::drop() {
    unlink();
    batchDecoder_.reset();
    segments_.clear();
}

// What a restore makes. It goes with everything that points to it, unless it is kept.
class QvBatchTask::Attempt {
  public:
    explicit Attempt(QvBatchTask& task) : task_(task) {}
    Attempt(const Attempt&) = delete;
    Attempt& operator=(const Attempt&) = delete;
    ~Attempt() {
        if (kept_) return;
        task_.drop();
        task_.setEncoder(nullptr);
        decoders.deleteAll();
    }
    QvEncodePipe* keep() {
        kept_ = true;
        return pipe.release();
    }

    QvDPipeList decoders;
    std::unique_ptr<QvEncodePipe> pipe;

  private:
    QvBatchTask& task_;
    bool kept_ = false;
};

int QvBatchTask::restore(const QvTaskState& state, QvDPipeList& decoders, QvEncodePipe** encoderOut,
                         int options, QvFileOpenCb* callback) {
    drop();
    const bool settings = !state.getDict("encoder").empty();
    if (state.streams_in().empty() || (settings && state.streams_out().empty())) {
        setError(QvStatus::invalidStructure,
                 "QvBatchTask::initFromState - invalid task struct, no output streams defined.");
        QV_FAIL(errorDesc());
    }
    if (!settings)
        return setError(QvStatus::invalidStructure, "Invalid task structure - missing encoder settings");
    Attempt made(*this);
    made.pipe.reset(QvEncodePipe::create());
    QV_ASSERT_MSG(made.pipe, "Task.restore: could not create EncodePipe");
    if (const int result = restorePipe(state, *made.pipe); result != QvStatus::ok) return result;
    if (state.nrSegments() < 1) {
        setError(QvStatus::invalidStructure,
                 "[Task] BatchTask.initFromState: No input segments defined, invalid task structure.");
        QV_FAIL(errorDesc());
    }
    const int open = openFiles(state, options, callback, made.decoders);
    if (open == 0) {
        constexpr const char* text =
            "BatchTask.initFromState: No sucessfully opened / enabled input segments, bailing out.";
        qv_dbg()->error("%s", text);
        const std::string reason = *errorDesc() ? errorDesc() : text;  // which file, if one is to blame
        return setError(QvStatus::noSegment, "%s", reason.c_str());
    }
    checkDurations();
    setEncoder(made.pipe.get());
    if (open > 1) {
        linkJoined();
    } else {
        const int place = indexOfActualSegment(0);
        QV_ASSERT_MSG(place >= 0, "BatchTask.restore: invalid condition, no valid segment(s) found.");
        linkSegment(segment(place));
    }
    QvDPipeList all = decoders;
    for (QvDecodePipe* decoder : made.decoders) all.append(decoder);
    setPostprocessCommand(state.postprocessCommand());
    QvEncodePipe* const pipe = made.keep();
    decoders = std::move(all);  // only on success: a failed attempt has deleted them
    if (encoderOut) *encoderOut = pipe;
    return QvStatus::ok;
}

namespace {

// The chapters of a segment as frames of the output, of which `before` come in front of it. Returns how many
// the segment has.
long long addChapters(const QvIStream& stream, const QvFramerate& out, long long before, AnyVector& to) {
    const Any in = stream.decoder->getVideoParam(stream.number, "framerate");
    if (!in.isFramerate()) return 0;
    const QvRatio rate = in.asFramerate().rate();
    const SegmentSpan span = qvSegmentSpan(stream, rate, out.rate());
    if (const AnyVector* points = stream.params.chapterPoints())
        for (const Any& point : *points) {
            const long long frame = point.isInt() ? point.toInt64() - span.first : -1;
            if (frame < 0 || frame >= span.count) continue;
            to.append(Any(static_cast<int>(before + QvRatio::multyplyByRatio(frame, out.rate(), rate))));
        }
    return span.owed;
}

// What the segments have for the stream as a whole: their chapters at the places that they get there, and all
// logs of quality, each once.
ProcessParams joinedParams(const std::vector<std::unique_ptr<QvInputSegment>>& segments, std::size_t place,
                           const Any& rate) {
    std::vector<const QvIStream*> streams;
    bool chapters = false;
    AnyVector logs;
    ProcessParams params;
    for (const auto& segment : segments) {
        if (segment->status != QvInputSegment::opened || place >= segment->streams.size()) continue;
        const QvIStream& stream = *segment->streams[place];
        if (!stream.decoder) continue;
        streams.push_back(&stream);
        chapters |= stream.params.chapterPoints() != nullptr;
        for (const Any& log : stream.params.getVector("qualityStats"))
            if (!logs.contains(log)) logs.append(log);
    }
    if (!logs.empty()) params.setQualityLog(logs);
    if (!chapters || !rate.isFramerate()) return params;
    AnyVector all;
    long long before = 0;
    for (const QvIStream* stream : streams) before += addChapters(*stream, rate.asFramerate(), before, all);
    if (!all.empty()) params.setChapterPoints(all);
    return params;
}

}  // namespace

void QvBatchTask::linkJoined() {
    batchDecoder_ = qvJoinSegments(segments_, encoder());
    QV_ASSERT_MSG(batchDecoder_, unhandled);
    if (batchDecoder_->open() != QvStatus::ok) {
        setError(QvStatus::failed, "%s", batchDecoder_->errorDesc());
        qv_dbg()->error("QvBatchTask.initFromState: Failed to open BatchDecoder.");
        QV_FAIL_PLAIN();
    }
    // The joined streams count those of the output that are fed.
    const QvInputSegment& first = segment(indexOfActualSegment(0));
    int numbers[2] = {};
    for (const int type : {qvVideoStream, qvAudioStream})
        for (std::size_t i = 0; i < first.streams.size(); ++i) {
            if (!first.streams[i]->decoder || first.streams[i]->type != type) continue;
            const int number = qvOutputNumber(*encoder(), *first.streams[i], i);
            int& next = numbers[type == qvVideoStream ? 0 : 1];
            ProcessParams params;
            if (type == qvVideoStream)
                params = joinedParams(segments_, i, batchDecoder_->getVideoParam(next, "framerate"));
            QV_ASSERT_MSG(link(batchDecoder_.get(), type, next++, number, params) >= 0, unhandled);
        }
}

void QvBatchTask::linkSegment(const QvInputSegment& segment) {
    QV_ASSERT_MSG(segment.status == QvInputSegment::opened, "BatchTask.restore: invalid segment open status");
    for (std::size_t i = 0; i < segment.streams.size(); ++i) {
        const QvIStream& stream = *segment.streams[i];
        if (!stream.decoder) continue;
        const int number = qvOutputNumber(*encoder(), stream, i);
        QV_ASSERT_MSG(link(stream.decoder, stream.type, stream.number, number, stream.params) >= 0,
                      unhandled);
    }
}

QvBatchTask* QvBatchTask::fromState(const QvTaskState& state, QvDPipeList& decoders,
                                    QvEncodePipe** encoderOut, int options, QvFileOpenCb* callback,
                                    Any* error) {
    auto task = std::make_unique<QvBatchTask>();
    int result = QvStatus::ok;
    try {
        result = task->restore(state, decoders, encoderOut, options, callback);
    } catch (const QvException&) {
        if (error && *task->errorDesc()) *error = Any(task->errorDesc());
        throw;
    }
    if (result == QvStatus::ok || result == QvStatus::warning) return task.release();
    if (error) *error = Any(task->errorDesc());
    return nullptr;
}
