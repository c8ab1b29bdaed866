// The encoders by the names of their modules.
#pragma once

class QvCodec;

namespace av {

// Null for a name that no encoder has.
QvCodec* newEncoder(const char* module);

}  // namespace av
