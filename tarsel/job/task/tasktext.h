// A task file as people read it: a line for each input, stream, segment and filter.
#pragma once

#include <string>

#include "tarsel/job/task/storedtask.h"

std::string taskText(const StoredTask& task);
// Only the segments, if there are several.
std::string segmentsText(const StoredTask& task);
// One JSON object, with a newline at its end.
std::string taskJson(const StoredTask& task);
