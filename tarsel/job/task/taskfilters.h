// The files that the filters of a stored task read and write.
#pragma once

#include <string>
#include <vector>

#include "tarsel/job/task/storedtask.h"

// To be called before the task is opened, which opens filters of a join. Throws Failure for a file that a
// filter can't use, and for one that the filter of a segment would write: each segment would begin it again,
// past the protection that outputs have. `acceptPartial`: subtitles that can't be read may be left out.
void checkTaskFilters(const StoredTask& task, bool acceptPartial);
// What the filters of all segments read, each file once.
std::vector<std::string> filesOfFilters(const StoredTask& task);
