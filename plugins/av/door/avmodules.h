// The table of modules, by kind. Everything here is known without a codec library.
#pragma once

#include <memory>

class QvModule;
class QvPlugin;

namespace av {

// "av_codecs.so", loaded when the first codec is made. All modules of the plug-in share one.
class CodecLibrary;

// A module whose codecs come out of `library`; `type` is one of QvModuleType. The caller sets its attributes
// and gives it to the plug-in.
QvModule* newModule(const std::shared_ptr<CodecLibrary>& library, int type, const char* name,
                    const char* description, const char* displayName);

void addDecoders(QvPlugin& plugin, const std::shared_ptr<CodecLibrary>& library);
void addMultiplexers(QvPlugin& plugin, const std::shared_ptr<CodecLibrary>& library);
void addEncoders(QvPlugin& plugin, const std::shared_ptr<CodecLibrary>& library);  // and the presets
void addMissing(QvPlugin& plugin);

}  // namespace av
