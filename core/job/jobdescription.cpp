#include "core/job/jobdescription.h"

AudioConversion::AudioConversion(const AnyDict& stored) {
    rateQuality = stored.getString("rateQuality", rateQuality.c_str());
    dither = stored.getString("dither", dither.c_str());
    clipWarning = stored.getInt32("clipWarning", clipWarning ? 1 : 0) != 0;
    padEnd = stored.getInt32("padEnd", padEnd ? 1 : 0) != 0;
}

AnyDict AudioConversion::stored() const {
    const AudioConversion plain;
    AnyDict dict;
    if (rateQuality != plain.rateQuality) dict.set("rateQuality", rateQuality.c_str());
    if (dither != plain.dither) dict.set("dither", dither.c_str());
    if (clipWarning != plain.clipWarning) dict.set("clipWarning", clipWarning ? 1 : 0);
    if (padEnd != plain.padEnd) dict.set("padEnd", padEnd ? 1 : 0);
    return dict;
}
