// Which codecs go together: a dictionary from a codec's name to the vector of names that it goes with.
#pragma once

#include "core/arch/api.h"
#include "core/value/anycontainer.h"

class QV_API CodecCompat : public AnyDict {
  public:
    // Makes an empty entry for a codec; an existing one stays.
    void addCodec(const char* codec);
    // Adds and removes a name of the codec's entry, which must exist (an assertion). What is there already,
    // or is not there, changes nothing.
    void add(const char* codec, const char* name);
    void removeName(const char* codec, const char* name);

    bool isCompatible(const char* codec, const char* name) const;  // false without an entry
    const AnyVector& names(const char* codec) const;               // empty without an entry
};
