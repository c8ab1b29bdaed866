// Limits that are honoured when the settings of a preset's profile are edited, or fitted to an input. All are
// optional; the shapes of the ranges are those that encoders answer, see QvFormatMatcher.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QV_API QvPresetMeta : public AnyDict {
  public:
    enum Part { audio = 8, video = 9, muxer = 10 };

    QvPresetMeta() = default;
    QvPresetMeta(const AnyDict& dict) : AnyDict(dict) {}

    // These are null when absent, and belong to the object.
    const char* preferredGroup() const { return getString("preferredGroup"); }
    const Any* palRange() const { return range("palRange"); }
    const Any* sizeRange() const { return range("sizeRange"); }
    const Any* aspectRange() const { return range("aspectRange"); }
    const Any* framerateRange() const { return range("framerateRange"); }
    const Any* bitrateRange() const { return range("bitrateRange"); }
    const Any* allowedTypes() const { return range("allowedTypes"); }

    // Whether the advanced settings of a Part are not to be shown; false for any other number.
    bool disableAdvanced(int part) const;

  private:
    const Any* range(const char* key) const { return isSet(key) ? &get(key) : nullptr; }
};
