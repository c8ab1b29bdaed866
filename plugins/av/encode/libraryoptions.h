// Options of the libraries' encoders by name, as a user gives them: "name=value:name=value".
#pragma once

#include <string>

#include "plugins/av/source/avheaders.h"

namespace av {

// Sets them one after the other. "" if all were taken, otherwise why one was not, with near names. Names of
// files are refused: a task that somebody sends must not write any. Refused, too, is what the encoder's
// parameters decide, as rates, channels, threads and passes: buffers are made for these.
std::string setOptions(AVCodecContext& context, const std::string& options);
// One option of the encoder or its library, which does not come from a user. False if there is no such option
// or value. Throws std::bad_alloc.
bool setOption(AVCodecContext& context, const char* name, const std::string& value);
// Adds "name=value:name=value" to what the option `name` has already. Throws std::bad_alloc.
bool addParameters(AVCodecContext& context, const char* name, const std::string& parameters);
// setOptions on a context of its own.
std::string checkOptions(const AVCodec& codec, const std::string& options);

}  // namespace av
