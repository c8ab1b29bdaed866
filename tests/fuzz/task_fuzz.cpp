// Any bytes as the file of a task: opening never throws, and leaves nothing when it fails; the segments of
// what could be read stay in step whatever is done to them, and the state stores as it was read.
#include <algorithm>
#include <memory>
#include <string>

#include "core/arch/qvexception.h"
#include "core/decode/qvdecoder.h"
#include "core/document/xmldom.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/init.h"
#include "core/transcode/batch/qvtaskfile.h"
#include "core/transcode/task/qvtaskstate.h"
#include "tests/fuzz/fuzz.h"

namespace {

void checkOpening(const MemoryFile& file) {
    for (const int options : {0, QvBatchTask::skipDisabled | QvBatchTask::everySegmentOpens}) {
        QvDPipeList decoders;
        QvEncodePipe* made = nullptr;
        QvTaskFault fault;
        std::unique_ptr<QvTask> task(
            QvTaskFile::open(file.name(), decoders, &made, nullptr, &fault, options));
        const std::unique_ptr<QvEncodePipe> pipe(made);
        require((task != nullptr) == (fault.status == 0));
        require(task || (!pipe && decoders.empty() && !fault.reason.empty()));
        task.reset();
        decoders.deleteAll();
    }
}

// True unless it is an assertion.
template <class Action>
bool done(Action action) {
    try {
        action();
        return true;
    } catch (const QvAssertFailure&) {
        return false;
    }
}

// All streams with sources have this many.
void checkCounts(const QvTaskState& state, int segments) {
    require(state.nrSegments() == segments && state.segments().size() == segments);
    for (int i = 0; i < state.streams_in().size(); ++i)
        require(segments == 0 || state.nrSources(i) == 0 || state.nrSources(i) == segments);
}

void checkSegments(QvTaskState state) {
    state.removeSlots();  // a segment added to one would be the only one there
    const int segments = state.nrSegments();
    QvTaskState::Segment segment;
    AnyVector files, sources;
    done([&] { state.getFilesForSegment(0, files); });
    require((state.getSegment(0, &segment) == 0) == (segments > 0));
    if (segments == 0) return;
    for (const QvTaskState::Source* source : segment) sources.append(static_cast<const AnyDict&>(*source));
    const QvTaskState before = state;
    require(done([&] { state.swapSegments(0, segments - 1); }));
    checkCounts(state, segments);
    if (done([&] { state.addSegment(sources, state.inputFiles(), segments / 2); }))
        checkCounts(state, segments + 1);
    else
        checkCounts(state, segments);
    if (done([&] { state.updateSegment(sources, state.inputFiles(), 0); }))
        require(state.source(0, 0) == before.source(0, 0));
    const int now = state.nrSegments();
    require(done([&] { state.removeSegment(now / 2); }));
    checkCounts(state, now - 1);
    done([&] { state.update(before, 0); });
    state.removeSlots();
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) { return init_wrapper(nullptr); }

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const MemoryFile file(data, size);
    AnyDict stored;
    Any root, version;
    if (XmlParser::restoreDict(file.name(), stored, root, version) == 0) checkSegments(stored);
    checkOpening(file);
    return 0;
}
