// A task file as people read it: a line for each input, stream, segment and filter.
#pragma once

#include <string>

#include "tarsel/job/task/storedtask.h"
#include "tarsel/words/json.h"

std::string taskText(const StoredTask& task);
// Only the segments, if there are several.
std::string segmentsText(const StoredTask& task);
// A line for each of the first segments, for the number of the others, and for the output; indented.
std::string taskBrief(const StoredTask& task);
// "segments" and "output" as in taskJson.
Json taskBriefJson(const StoredTask& task);
// One JSON object, with a newline at its end.
std::string taskJson(const StoredTask& task);
