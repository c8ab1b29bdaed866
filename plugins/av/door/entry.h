// What the two libraries of the plug-in know of each other.
#pragma once

class QvCodec;

namespace av {

inline constexpr const char* codecsFile = "av_codecs.so";

// A new codec of that module, without a module yet, owned by the caller; null for an unknown name.
using CreateCodec = QvCodec* (*)(const char* module);
inline constexpr const char* createSymbol = "av_create_codec";

// When the plug-in is unloaded: what the codec libraries report no longer goes to the engine.
using Leave = void (*)();
inline constexpr const char* leaveSymbol = "av_leave";

}  // namespace av
