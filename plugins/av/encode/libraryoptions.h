// Options of the libraries' encoders by name, as a user gives them: "name=value:name=value".
#pragma once

#include <string>

#include "plugins/av/source/avheaders.h"

namespace av {

// Sets them one after the other. "" if all were taken, otherwise why one was not, with near names. Names of
// files are refused: a task that somebody sends must not write any.
std::string setOptions(AVCodecContext& context, const std::string& options);
// The same on a context of its own.
std::string checkOptions(const AVCodec& codec, const std::string& options);

}  // namespace av
