#include "core/job/jobdescription.h"

AudioConversion::AudioConversion(const AnyDict& stored) {
    rateQuality = stored.getString("rateQuality", rateQuality.c_str());
    dither = stored.getString("dither", dither.c_str());
}

AnyDict AudioConversion::stored() const {
    const AudioConversion plain;
    AnyDict dict;
    if (rateQuality != plain.rateQuality) dict.set("rateQuality", rateQuality.c_str());
    if (dither != plain.dither) dict.set("dither", dither.c_str());
    return dict;
}
