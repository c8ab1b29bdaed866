// Settings of the encoders and multiplexers that were replaced in a pipe, by module name. A module that comes
// back gets the settings that it had last.
#pragma once

#include <map>
#include <string>

#include "core/value/anycontainer.h"

class QvCodec;

class SavedSettings {
  public:
    // Replaces what was kept for the codec's module by what its store() writes.
    void keep(const QvCodec& codec);
    // Null when nothing was kept. Borrowed until the next keep().
    const AnyDict* of(const char* module) const;

  private:
    std::map<std::string, AnyDict, std::less<>> byModule_;
};
