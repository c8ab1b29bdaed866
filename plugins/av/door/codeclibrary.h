// The library that has the codecs. The table of modules does without it; the first codec that is made loads
// it.
#pragma once

#include "plugins/av/door/entry.h"

class QvModule;

namespace av {

class CodecLibrary {
  public:
    CodecLibrary() = default;
    CodecLibrary(const CodecLibrary&) = delete;
    CodecLibrary& operator=(const CodecLibrary&) = delete;
    // The library stays in memory: some of those under it keep blocks and threads of their own to the end of
    // the program, and must not go earlier.
    ~CodecLibrary();

    // A new codec, owned by the caller. Null, with the reason in the log, if the library can't be used. It is
    // tried again each time: what was missing may have been installed.
    QvCodec* create(const QvModule& module);

  private:
    CreateCodec create_ = nullptr;
    Leave leave_ = nullptr;

    bool load(const QvModule& module);
};

}  // namespace av
