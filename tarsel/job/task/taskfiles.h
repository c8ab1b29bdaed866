// The names of files that a stored task holds.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

enum class TaskFileUse {
    input,         // a source, or the picture that a generated one shows
    output,        //
    filterReads,   // fonts, subtitles, pictures that are drawn over others
    filterWrites,  //
};

// Puts `other(name, use)` in the place of each name. One file may have several names in a task; a generated
// source has none. The engine has to be started, as filters are asked which of their parameters are files.
void changeTaskFiles(AnyDict& state,
                     const std::function<std::string(const std::string& name, TaskFileUse use)>& other);

// Takes the logs of encoding quality out of a state and returns their names. Encoders write them in place,
// over whatever is there.
std::vector<std::string> takeQualityLogs(AnyDict& state);
