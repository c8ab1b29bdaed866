// What the streams of the test generator have in common.
#pragma once

#include "core/measure/qvgeometry.h"
#include "core/value/anycontainer.h"

class GeneratorStream {
  public:
    GeneratorStream() = default;
    GeneratorStream(const GeneratorStream&) = delete;
    GeneratorStream& operator=(const GeneratorStream&) = delete;
    virtual ~GeneratorStream() = default;

    // Sets the stream up from its dictionary in "streams", see core/decode/qvtestgenerator.h. A dictionary
    // that lacks what it must have is an assertion.
    virtual int init(const AnyDict& dict) = 0;
    virtual void close() = 0;
    // Another length; the stream's params follow.
    virtual void setDuration(const MediaTime& length) = 0;

    AnyDict params;  // what getStreamParams answers
    bool selected = false;
    MediaTime duration;

  protected:
    // "duration" as MediaTime or seconds, else `countKey` at the rate. False when neither is there.
    template <class Rate>
    bool takeDuration(const AnyDict& dict, const char* countKey, const Rate& rate) {
        const Any& given = dict["duration"];
        if (given.isMediaTime())
            duration = given.asMediaTime();
        else if (given.isFloat())
            duration = MediaTime(given.asDouble(), MediaTime::defaultTimescale);
        else if (dict[countKey].isInt())
            duration = MediaTime(dict[countKey].toInt64(), rate, MediaTime::defaultTimescale);
        else
            return false;
        return true;
    }
};
