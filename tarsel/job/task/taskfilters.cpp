#include "tarsel/job/task/taskfilters.h"

#include <set>
#include <utility>

#include "tarsel/picture/overlays.h"
#include "tarsel/words/messages.h"

namespace {

void visitFiles(const StoredTask& task, const FilterFileVisit& visit) {
    const QvTaskState& state = task.state();
    const int streams = state.encoder().nrStreams();
    for (int segment = 0; segment < state.nrSegments(); ++segment) {
        if (!state.isSegmentEnabled(segment)) continue;
        for (int stream = 0; stream < streams; ++stream)
            if (const auto filters = state.source(stream, segment).processParams().filters())
                visitFilterFiles(*filters, visit);
    }
}

}  // namespace

void checkTaskFilters(const StoredTask& task, bool acceptPartial) {
    std::set<std::pair<std::string, std::string>> known;  // segments often share a file
    visitFiles(task, [&](const QvCodec& filter, const std::string& file, bool writes) {
        if (writes && task.isJoin()) throw failure(Msg::taskFilterWrites, {task.name(), filter.name(), file});
        if (!writes && known.emplace(filter.name(), file).second)
            requireFilterFile(filter, file, acceptPartial);
    });
}

std::vector<std::string> filesOfFilters(const StoredTask& task) {
    std::set<std::string> files;
    visitFiles(task, [&](const QvCodec&, const std::string& file, bool writes) {
        if (!writes) files.insert(file);
    });
    return {files.begin(), files.end()};
}
